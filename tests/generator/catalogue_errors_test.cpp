// A bad catalogue stops the build with "file:line: message"; these pin the line.
#include <gtest/gtest.h>

#include "model.h"

namespace tarngen {
namespace {

const char* kVersions =
    "version strata.version.version0 namespace - id - flag 0\n"
    "version tarn.version.version1 namespace tarnd3 id 1.0 flag 0 includes strata.version.version0\n";

struct Outcome {
    int line = 0;
    std::string file;
    std::string message;
};

// Resolves `text` as the catalogue of namespace "tarn.t" beside a valid version list
// and loader order; returns where it failed (line 0: it did not fail).
Outcome Check(const std::string& text, const std::string& loaders = "loaders tarn.t\n") {
    Outcome outcome;
    try {
        std::vector<FileSyntax> files;
        files.push_back(ParseFile("idl/versions.idl", kVersions));
        files.push_back(ParseFile("idl/library.idl", loaders));
        files.push_back(ParseFile("idl/tarn.t.idl", text));
        Resolve(std::move(files));
    } catch (const CatalogueError& e) {
        outcome.line = e.location.line;
        outcome.file = e.location.file;
        outcome.message = e.what();
    }
    return outcome;
}

TEST(CatalogueErrors, ValidCatalogueResolves) {
    Outcome o = Check(
        "namespace tarn.t\n"
        "managed M version tarn.version.version1\n"
        "  method run wsdl Run version tarn.version.version1\n"
        "    param d D\n"
        "    result string version strata.version.version0\n"
        "  property name string flags 4 version tarn.version.version1\n"
        "data D version tarn.version.version1\n"
        "  property items D flags 3 version tarn.version.version1\n"
        "enum M.Mode version tarn.version.version1\n"
        "  tags a b\n");
    EXPECT_EQ(o.line, 0) << o.message;
}

TEST(CatalogueErrors, UnknownNamesAreReportedWhereTheyAreUsed) {
    Outcome type = Check("namespace tarn.t\ndata D version tarn.version.version1\n  property p Nowhere flags 0 version tarn.version.version1\n");
    EXPECT_EQ(type.line, 3);
    EXPECT_EQ(type.file, "idl/tarn.t.idl");
    EXPECT_NE(type.message.find("unknown type 'Nowhere'"), std::string::npos) << type.message;

    Outcome version = Check("namespace tarn.t\n\ndata D version tarn.version.version9\n");
    EXPECT_EQ(version.line, 3);
    EXPECT_NE(version.message.find("tarn.version.version9"), std::string::npos);

    Outcome base = Check("namespace tarn.t\ndata D : Missing version tarn.version.version1\n");
    EXPECT_EQ(base.line, 2);

    Outcome outer = Check("namespace tarn.t\ndata Outer.Inner version tarn.version.version1\n");
    EXPECT_EQ(outer.line, 2);
    EXPECT_NE(outer.message.find("outer type"), std::string::npos);
}

TEST(CatalogueErrors, DuplicatesNameTheSecondDeclaration) {
    Outcome type = Check("namespace tarn.t\ndata D version tarn.version.version1\n\ndata D version tarn.version.version1\n");
    EXPECT_EQ(type.line, 4);
    EXPECT_NE(type.message.find("idl/tarn.t.idl:2"), std::string::npos) << "names the first declaration: " << type.message;

    Outcome property = Check(
        "namespace tarn.t\ndata D version tarn.version.version1\n"
        "  property p int flags 0 version tarn.version.version1\n"
        "  property p int flags 0 version tarn.version.version1\n");
    EXPECT_EQ(property.line, 4);

    Outcome tag = Check("namespace tarn.t\nenum E version tarn.version.version1\n  tags a b\n  tags a\n");
    EXPECT_EQ(tag.line, 3);

    Outcome runtime = Check("namespace tarn.t\ndata D version tarn.version.version1\n", "loaders tarn.t tarn.t\n");
    EXPECT_NE(runtime.message.find("listed twice"), std::string::npos);
}

TEST(CatalogueErrors, FlagWordsAreZeroToSeven) {
    Outcome o = Check("namespace tarn.t\ndata D version tarn.version.version1\n  property p int flags 8 version tarn.version.version1\n");
    EXPECT_EQ(o.line, 3);
    EXPECT_NE(o.message.find("from 0 to 7"), std::string::npos) << o.message;
    EXPECT_EQ(Check("namespace tarn.t\ndata D version tarn.version.version1\n  property p int flags x version tarn.version.version1\n").line, 3);
    EXPECT_EQ(Check("namespace tarn.t\ndata D version tarn.version.version1\n  property p int version tarn.version.version1\n").line, 3)
        << "a property must state its flags";
}

TEST(CatalogueErrors, ManagedMembersMustNotCollide) {
    // The getter of "name" and the operation of "getName" are both GetName.
    Outcome own = Check(
        "namespace tarn.t\nmanaged M version tarn.version.version1\n"
        "  method getName version tarn.version.version1\n"
        "  property name string flags 4 version tarn.version.version1\n");
    EXPECT_EQ(own.line, 4);
    EXPECT_NE(own.message.find("GetName"), std::string::npos);

    // So do members inherited from a base interface.
    Outcome inherited = Check(
        "namespace tarn.t\nmanaged A version tarn.version.version1\n"
        "  method run version tarn.version.version1\n"
        "managed B : A version tarn.version.version1\n"
        "  method Run version tarn.version.version1\n");
    EXPECT_EQ(inherited.line, 5);

    Outcome runtime = Check(
        "namespace tarn.t\nmanaged M version tarn.version.version1\n"
        "  property refCount int flags 4 version tarn.version.version1\n");
    EXPECT_EQ(runtime.line, 3);
}

TEST(CatalogueErrors, KindsAndSignaturesAreChecked) {
    EXPECT_EQ(Check("namespace tarn.t\ndata D version tarn.version.version1\nmanaged M : D version tarn.version.version1\n").line, 3)
        << "a managed type cannot derive from a data object";
    EXPECT_EQ(Check("namespace tarn.t\nmanaged M version tarn.version.version1\n"
                    "  method m version tarn.version.version1\n    param p int flags 2\n").line, 4)
        << "an optional int cannot be passed by value";
    EXPECT_EQ(Check("namespace tarn.t\nmanaged M version tarn.version.version1\n"
                    "  method m version tarn.version.version1\n    throws M\n").line, 4)
        << "only faults can be thrown";
    EXPECT_EQ(Check("namespace tarn.t\nmanaged M version tarn.version.version1\n"
                    "  method m version tarn.version.version1 task\n").line, 3)
        << "a task method's wsdl name ends in _Task";
    EXPECT_EQ(Check("namespace tarn.t\ndata D version tarn.version.version1\n  method m version tarn.version.version1\n").line, 3);
    EXPECT_EQ(Check("namespace tarn.t\n  param p int\n").line, 2);
    EXPECT_EQ(Check("namespace tarn.t\ndata D version tarn.version.version1 colour blue\n").line, 2);
    EXPECT_EQ(Check("namespace tarn.t\ndata d version tarn.version.version1\n").line, 2) << "type names are capitalised";
}

TEST(CatalogueErrors, TheLoaderOrderNamesEveryNamespace) {
    Outcome missing = Check("namespace tarn.t\n", "loaders tarn.other\n");
    EXPECT_EQ(missing.line, 1);
    EXPECT_EQ(missing.file, "idl/library.idl");
}

TEST(CatalogueErrors, VersionInclusionsMustResolveAndNotCycle) {
    std::vector<FileSyntax> files;
    files.push_back(ParseFile("idl/versions.idl",
                              "version a namespace - id - flag 0 includes b\n"
                              "version b namespace - id - flag 0 includes a\n"));
    try {
        Resolve(std::move(files));
        FAIL() << "a cycle of inclusions was accepted";
    } catch (const CatalogueError& e) {
        EXPECT_NE(std::string(e.what()).find("cycle"), std::string::npos);
    }
}

}  // namespace
}  // namespace tarngen
