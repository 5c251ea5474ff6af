// A bad catalogue stops the build with "file:line: message"; each row pins the line.
#include <gtest/gtest.h>

#include <cctype>

#include "model.h"

namespace tarngen {
namespace {

constexpr const char* kVersions =
    "version strata.version.version0 namespace - id - flag 0\n"
    "version tarn.version.version1 namespace svc-a id 1.0 flag 0 includes strata.version.version0\n";
constexpr const char* kV1 = " version tarn.version.version1";

// A catalogue of up to three files beside the version list; where it fails.
struct Case {
    Case(const char* what, std::string text, int line, const char* fragment, const char* file = "idl/tarn.t.idl",
         std::string loaders = "loaders tarn.t\n", std::string versions = kVersions, std::string other = "")
        : what(what), text(std::move(text)), line(line), fragment(fragment), file(file), loaders(std::move(loaders)),
          versions(std::move(versions)), other(std::move(other)) {}
    const char* what;
    std::string text;      // idl/tarn.t.idl
    int line;              // expected; 0 for a whole-catalogue error
    const char* fragment;  // expected in the message
    const char* file;
    std::string loaders;   // idl/library.idl
    std::string versions;  // idl/versions.idl
    std::string other;     // idl/tarn.u.idl, when not empty
};

// Test names and failures show the row, not its bytes.
void PrintTo(const Case& c, std::ostream* os) { *os << c.what; }

std::string T(const std::string& lines) { return "namespace tarn.t\n" + lines; }

CatalogueError Failure(const Case& c) {
    std::vector<FileSyntax> files;
    try {
        files.push_back(ParseFile("idl/versions.idl", c.versions));
        files.push_back(ParseFile("idl/library.idl", c.loaders));
        files.push_back(ParseFile("idl/tarn.t.idl", c.text));
        if (!c.other.empty()) files.push_back(ParseFile("idl/tarn.u.idl", c.other));
        Resolve(std::move(files));
    } catch (const CatalogueError& e) {
        return e;
    }
    return CatalogueError({}, "accepted");
}

const std::string kData = "data D" + std::string(kV1) + "\n";
std::string Prop(const std::string& name, const std::string& type, int flags = 0) {
    return "  property " + name + " " + type + " flags " + std::to_string(flags) + kV1 + "\n";
}
std::string Method(const std::string& name, const std::string& options = "") {
    return "  method " + name + options + kV1 + "\n";
}

const Case kCases[] = {
    // Versions and the loader order.
    {"no versions", T(""), 0, "no versions are catalogued", "idl", "loaders tarn.t\n", " "},
    {"version twice", T(""), 3, "declared twice", "idl/versions.idl", "loaders tarn.t\n",
     std::string(kVersions) + "version tarn.version.version1 namespace - id - flag 0\n"},
    {"unknown inclusion", T(""), 1, "unknown version 'nowhere'", "idl/versions.idl", "loaders tarn.t\n",
     "version a namespace - id - flag 0 includes nowhere\n"},
    {"inclusion cycle", T(""), 1, "cycle", "idl/versions.idl", "loaders tarn.t\n",
     "version a namespace - id - flag 0 includes b\nversion b namespace - id - flag 0 includes a\n"},
    {"unknown version", T("\ndata D version tarn.version.version9\n"), 3, "tarn.version.version9"},
    {"no loader order", T(""), 0, "no 'loaders' statement", "idl", " "},
    {"loader order twice", T(""), 1, "stated twice", "idl/tarn.u.idl", "loaders tarn.t\n", kVersions, "loaders tarn.t\n"},
    {"loader of no file", T(""), 1, "no catalogue file declares namespace 'tarn.other'", "idl/library.idl",
     "loaders tarn.t tarn.other\n"},
    {"loader listed twice", T(""), 1, "listed twice", "idl/library.idl", "loaders tarn.t tarn.t\n"},
    {"namespace not in the loader order", T(""), 1, "'tarn.u' is missing from the loader order", "idl/library.idl",
     "loaders tarn.t\n", kVersions, "namespace tarn.u\n"},
    {"namespace in two files", T(""), 1, "also catalogued in idl/tarn.t.idl", "idl/tarn.u.idl", "loaders tarn.t\n", kVersions,
     "namespace tarn.t\n"},
    // Types.
    {"lower-case type", T("data d" + std::string(kV1) + "\n"), 2, "must start with a capital letter"},
    {"type twice", T(kData + "\n" + kData), 4, "already declared (idl/tarn.t.idl:2)"},
    {"runtime type redeclared", "namespace strata\ndata DynamicData" + std::string(kV1) + "\n", 2, "already declared (the runtime)",
     "idl/tarn.t.idl", "loaders strata\n"},
    {"unknown property type", T(kData + Prop("p", "Nowhere")), 3, "unknown type 'Nowhere'"},
    {"root used as a value", T(kData + Prop("p", "strata.DynamicData", 2)), 3, "is a base, not a value type"},
    {"outer type missing", T("data Outer.Inner" + std::string(kV1) + "\n"), 2, "outer type 'tarn.t.Outer'"},
    {"nested in an enumeration", T("enum E" + std::string(kV1) + "\n  tags a\ndata E.F" + kV1 + "\n"), 4,
     "an enumeration cannot hold nested types"},
    {"unknown base", T("data D : Missing" + std::string(kV1) + "\n"), 2, "unknown base 'Missing'"},
    {"base of another kind", T(kData + "managed M : D" + kV1 + "\n"), 3, "must be another managed type"},
    {"base chain cycle", T("data A : B" + std::string(kV1) + "\ndata B : A" + kV1 + "\n"), 2, "is a cycle"},
    {"enumeration without tags", T("enum E" + std::string(kV1) + "\n"), 2, "has no tags"},
    {"tag twice", T("enum E" + std::string(kV1) + "\n  tags a b\n  tags a\n"), 3, "tag 'a' is given twice"},
    {"tags of one constant", T("enum E" + std::string(kV1) + "\n  tags ab AB\n"), 3, "gives the same constant"},
    // Members.
    {"property twice", T(kData + Prop("p", "int") + Prop("p", "int")), 4, "member 'p' is declared twice (first at idl/tarn.t.idl:3)"},
    {"method and property of one name", T("managed M" + std::string(kV1) + "\n" + Method("p") + Prop("p", "int")), 4,
     "member 'p' is declared twice"},
    {"parameter twice", T("managed M" + std::string(kV1) + "\n" + Method("m") + "    param a int\n    param a int\n"), 5,
     "parameter 'a' is declared twice (first at idl/tarn.t.idl:4)"},
    {"task wsdl name", T("managed M" + std::string(kV1) + "\n" + Method("m", " task")), 3, "must end in \"_Task\""},
    {"throws a non-fault", T("managed M" + std::string(kV1) + "\n" + Method("m") + "    throws M\n"), 4, "'M' is not a fault"},
    {"optional int by value", T("managed M" + std::string(kV1) + "\n" + Method("m") + "    param p int flags 2\n"), 4,
     "an optional int cannot be passed by value"},
    {"undeliverable result", T("managed M" + std::string(kV1) + "\n" + Method("m") + "    result double" + kV1 + "\n"), 4,
     "cannot be delivered by a managed member"},
    {"undeliverable property", T("managed M" + std::string(kV1) + "\n" + Prop("p", "int", 2)), 3,
     "cannot be delivered by a managed member"},
    {"property of a base", T(kData + Prop("p", "int") + "data E : D" + kV1 + "\n" + Prop("p", "int")), 5,
     "already a property of a base"},
    {"data accessors collide", T(kData + Prop("name", "string") + Prop("Name", "int")), 4,
     "collide with those of 'name' at idl/tarn.t.idl:3"},
    {"data accessor of the runtime", T(kData + Prop("refCount", "int")), 3, "'GetRefCount' of 'tarn.t.D' collides with the runtime's"},
    {"managed members collide", T("managed M" + std::string(kV1) + "\n" + Method("getName") + Prop("name", "string", 4)), 4,
     "GetName"},
    {"inherited managed members collide",
     T("managed A" + std::string(kV1) + "\n" + Method("run") + "managed B : A" + kV1 + "\n" + Method("Run")), 5,
     "collides with the member at idl/tarn.t.idl:3"},
    {"managed member of the runtime", T("managed M" + std::string(kV1) + "\n" + Prop("refCount", "int", 4)), 3,
     "collides with the runtime's 'GetRefCount'"},
    // Lines.
    {"indented type line", T(kData + Prop("a", "int") + "  data E" + kV1 + "\n" + Prop("b", "int")), 4,
     "indented among the members of 'D' (idl/tarn.t.idl:2)"},
    {"flags past 7", T(kData + Prop("p", "int", 8)), 3, "from 0 to 7"},
    {"property without flags", T(kData + "  property p int" + kV1 + "\n"), 3, "states its flags"},
    {"unknown option", T("data D" + std::string(kV1) + " colour blue\n"), 2, "unexpected 'colour'; expected one of: :, version"},
    {"unknown statement", T("struct S\n"), 2, "expected one of: data, enum, fault"},
    {"documentation of a tags line", T("enum E" + std::string(kV1) + "\n  ## the tags\n  tags a\n"), 3, "not a 'tags' line"},
    {"documentation of nothing", T(kData + "## dangling\n"), 3, "documents nothing"},
    {"member outside a type", T("  param p int\n"), 2, "outside a method"},
    {"method of a data object", T(kData + Method("m")), 3, "only a managed type has methods"},
    {"second result", T("managed M" + std::string(kV1) + "\n" + Method("m") + "    result int" + kV1 + "\n    result int" + kV1 + "\n"),
     5, "a method has one result"},
};

class CatalogueErrors : public ::testing::TestWithParam<Case> {};

TEST_P(CatalogueErrors, NameTheirFileAndLine) {
    const Case& c = GetParam();
    CatalogueError e = Failure(c);
    EXPECT_EQ(e.location.file, c.file) << e.what();
    EXPECT_EQ(e.location.line, c.line) << e.what();
    EXPECT_NE(std::string(e.what()).find(c.fragment), std::string::npos) << e.what();
}

INSTANTIATE_TEST_SUITE_P(Table, CatalogueErrors, ::testing::ValuesIn(kCases), [](const auto& info) {
    std::string name = info.param.what;
    for (char& ch : name)
        if (!std::isalnum(static_cast<unsigned char>(ch))) ch = '_';
    return name;
});

TEST(CatalogueWarnings, ATypeLineAmongMembersNamesBothLines) {
    FileSyntax file = ParseFile("idl/tarn.t.idl", T(kData + Prop("a", "int") + "data E" + kV1 + "\n" + Prop("b", "int")));
    ASSERT_EQ(file.warnings.size(), 1u);
    EXPECT_EQ(file.warnings[0].rfind("idl/tarn.t.idl:4: warning:", 0), 0u) << file.warnings[0];
    EXPECT_NE(file.warnings[0].find("members of 'D' (idl/tarn.t.idl:2)"), std::string::npos) << file.warnings[0];
    EXPECT_TRUE(ParseFile("idl/tarn.t.idl", T(kData + Prop("a", "int") + "\ndata E" + kV1 + "\n" + Prop("b", "int"))).warnings.empty())
        << "a blank line before a type line is the usual layout";
}

TEST(CatalogueErrors, AValidCatalogueResolves) {
    Case c{"valid",
           T("managed M" + std::string(kV1) + "\n" + Method("run", " wsdl Run") + "    param d D\n    result string version strata.version.version0\n" +
             Prop("name", "string", 4) + "\n" + kData + Prop("items", "D", 3) + "\nenum M.Mode" + kV1 + "\n  tags a b\n"),
           0, "accepted", ""};
    EXPECT_STREQ(Failure(c).what(), ":0: accepted");
}

// Every error of a run, in file and line order, and no echo of one: the member lines
// of a type or method line that failed are dropped with it.
TEST(CatalogueErrors, OneRunReportsEveryError) {
    Diagnostics parse;
    ParseFile("idl/tarn.t.idl",
              T(kData + Prop("p", "int", 9) +                                  // 3: flags
                "data Bad colour" + kV1 + "\n" + Prop("q", "int", 9) +           // 4: option; 5 dropped
                "managed M" + kV1 + "\n  method m wsdl" + kV1 + "\n    param a int flags 9\n" +  // 7: method; 8 dropped
                "  property r int flags 9" + kV1 + "\n"),                        // 9: flags
              parse);
    try {
        parse.Check();
        FAIL() << "accepted";
    } catch (const CatalogueError& e) {
        std::vector<int> lines;
        for (const std::string& message : e.all) lines.push_back(std::stoi(message.substr(std::string("idl/tarn.t.idl:").size())));
        EXPECT_EQ(lines, (std::vector<int>{3, 4, 7, 9})) << ::testing::PrintToString(e.all);
        EXPECT_EQ(e.location.line, 3);
    }

    std::vector<FileSyntax> files{ParseFile("idl/versions.idl", kVersions), ParseFile("idl/library.idl", "loaders tarn.t\n"),
                                  ParseFile("idl/tarn.t.idl", T(kData + Prop("p", "Nowhere") + Prop("q", "int") +
                                                                "data E" + kV1 + "\n" + Prop("r", "Elsewhere")))};
    try {
        Resolve(std::move(files));
        FAIL() << "accepted";
    } catch (const CatalogueError& e) {
        ASSERT_EQ(e.all.size(), 2u) << ::testing::PrintToString(e.all);
        EXPECT_NE(e.all[0].find("idl/tarn.t.idl:3: unknown type 'Nowhere'"), std::string::npos) << e.all[0];
        EXPECT_NE(e.all[1].find("idl/tarn.t.idl:6: unknown type 'Elsewhere'"), std::string::npos) << e.all[1];
    }
}

// "##" lines belong to the statement after them, blank lines between allowed.
TEST(CatalogueDocumentation, TravelsToTheModel) {
    std::vector<FileSyntax> files{
        ParseFile("idl/versions.idl", kVersions), ParseFile("idl/library.idl", "loaders tarn.t\n"),
        ParseFile("idl/tarn.t.idl", T("## A manager.\n##\n## Second paragraph.\n\nmanaged M" + std::string(kV1) +
                                      "\n  ## Runs.\n" + Method("run") + "    ## What to run.\n    param what string\n" +
                                      "    param how int\n  ## The name.  \n" + Prop("name", "string", 4)))};
    Model model = Resolve(std::move(files));
    const Type& m = *model.byWireName.at("tarn.t.M");
    EXPECT_EQ(m.doc, (Doc{"A manager.", "", "Second paragraph."}));
    ASSERT_EQ(m.methods.size(), 1u);
    EXPECT_EQ(m.methods[0].doc, Doc{"Runs."});
    EXPECT_EQ(m.methods[0].params[0].doc, Doc{"What to run."});
    EXPECT_TRUE(m.methods[0].params[1].doc.empty());
    EXPECT_EQ(m.properties[0].doc, Doc{"The name."});
}

}  // namespace
}  // namespace tarngen
