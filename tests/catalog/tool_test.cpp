// tarn-catalog run as a user runs it: a separate process, its output and exit
// status, compared with what this process sees in the same library's maps.
#include <gtest/gtest.h>
#include <sys/wait.h>
#include <unistd.h>

#include <algorithm>
#include <cstdio>
#include <fstream>
#include <set>
#include <sstream>
#include <string>
#include <vector>

#include "catalogue_files.h"
#include "mini_json.h"
#include "tarn/types.h"

namespace {

using CatalogTest::Json;

struct Result {
    int status = -1;
    std::string out;
    std::string err;
};

Result RunTool(const std::string& args) {
    char errPath[] = "/tmp/tarn-catalog-test-XXXXXX";
    int fd = mkstemp(errPath);
    if (fd < 0) return {};
    close(fd);
    Result r;
    std::string command = std::string(TARN_CATALOG) + " " + args + " 2>" + errPath;
    if (FILE* pipe = popen(command.c_str(), "r")) {
        char buffer[4096];
        for (std::size_t n; (n = fread(buffer, 1, sizeof buffer, pipe)) > 0;) r.out.append(buffer, n);
        int status = pclose(pipe);
        r.status = WIFEXITED(status) ? WEXITSTATUS(status) : -1;
    }
    std::ifstream err(errPath);
    r.err.assign(std::istreambuf_iterator<char>(err), std::istreambuf_iterator<char>());
    unlink(errPath);
    return r;
}

std::vector<std::string> Lines(const std::string& text) {
    std::vector<std::string> lines;
    std::istringstream in(text);
    for (std::string line; std::getline(in, line);) lines.push_back(line);
    return lines;
}

std::vector<std::string> Split(const std::string& line) {
    std::istringstream in(line);
    std::vector<std::string> words;
    for (std::string w; in >> w;) words.push_back(w);
    return words;
}

// The tarn types of this process's type map, in registration order, as `version` sees them.
std::vector<Orbit::Type*> TarnTypes(Orbit::Version* version = nullptr) {
    std::vector<Orbit::Type*> out;
    for (Orbit::Type* t : Orbit::GetTypeMap()->GetTypes())
        if (t->GetName().starts_with("tarn.") && (version == nullptr || t->IsVisible(version))) out.push_back(t);
    return out;
}

std::vector<std::string> Names(const std::vector<Orbit::Type*>& types) {
    std::vector<std::string> out;
    for (Orbit::Type* t : types) out.push_back(t->GetName());
    return out;
}

// A listing: namespace headings, and the wire names of the type lines below them.
struct Listing {
    std::vector<std::string> namespaces;
    std::vector<std::string> types;
};

Listing ParseListing(const std::string& out) {
    Listing l;
    auto lines = Lines(out);
    for (std::size_t i = 1; i < lines.size(); ++i) {  // line 0 is the summary
        const std::string& line = lines[i];
        if (line.empty()) continue;
        auto words = Split(line);
        if (line.starts_with("  ")) l.types.push_back(words.at(1));
        else l.namespaces.push_back(words.at(0));
    }
    return l;
}

Json Dump(const std::string& extra = "") {
    Result r = RunTool("dump --json " + extra);
    EXPECT_EQ(r.status, 0) << r.err;
    EXPECT_EQ(r.err, "");
    return CatalogTest::JsonReader(r.out).Document();
}

const Json& TypeNamed(const Json& doc, const std::string& name) {
    for (const Json& t : doc["types"].items)
        if (t["name"].text == name) return t;
    throw std::runtime_error("no type " + name);
}

const Json& MethodNamed(const Json& type, const std::string& name) {
    for (const Json& m : type["methods"].items)
        if (m["name"].text == name) return m;
    throw std::runtime_error("no method " + name);
}

// ---- Listing ----

TEST(Tool, ListsTheNamespacesInLoaderOrderWithEveryType) {
    Result r = RunTool("");
    ASSERT_EQ(r.status, 0) << r.err;
    EXPECT_EQ(r.err, "");
    Listing l = ParseListing(r.out);
    EXPECT_EQ(l.namespaces, CatalogTest::LoaderOrder());
    EXPECT_EQ(l.types, Names(TarnTypes()));
    EXPECT_EQ(RunTool("list").out, r.out);
}

TEST(Tool, VersionRestrictsTheListingToWhatItSees) {
    Orbit::Version* v6 = Orbit::GetVersionMap()->GetVersion("tarn.version.version6");
    ASSERT_NE(v6, nullptr);
    Result r = RunTool("--api-version tarn.version.version6");
    ASSERT_EQ(r.status, 0) << r.err;
    const auto visible = Names(TarnTypes(v6));
    EXPECT_EQ(ParseListing(r.out).types, visible);
    EXPECT_LT(visible.size(), TarnTypes().size());
    EXPECT_NE(r.out.find(std::to_string(visible.size()) + " of " + std::to_string(TarnTypes().size()) + " types"),
              std::string::npos);
    EXPECT_EQ(RunTool("--api-version=tarn.version.version6 list").out, r.out);
    // The development version includes every version that a tarn type names.
    EXPECT_EQ(ParseListing(RunTool("--api-version tarn.version.dev").out).types, Names(TarnTypes()));

    Result versions = RunTool("--api-version tarn.version.version1 versions");
    ASSERT_EQ(versions.status, 0) << versions.err;
    const auto lines = Lines(versions.out);
    EXPECT_EQ(lines.at(0), "Versions that tarn.version.version1 includes: 10");
    EXPECT_EQ(std::count_if(lines.begin(), lines.end(), [](const std::string& l) { return l.starts_with("  includes ("); }),
              10);
}

// ---- show ----

TEST(Tool, ShowsAManagedTypeWithItsMemberNumbers) {
    Result r = RunTool("show tarn.DebugManager");
    ASSERT_EQ(r.status, 0) << r.err;
    EXPECT_NE(r.out.find("kind       managed (0x12)"), std::string::npos) << r.out;
    EXPECT_NE(r.out.find("base       StrataManagedObject"), std::string::npos);
    EXPECT_NE(r.out.find("#4 traceOperation  wsdl \"DebugTraceOperation_Task\"  tarn.version.dev  task"),
              std::string::npos);
    EXPECT_NE(r.out.find("param args: Any  flags 3 (array, optional)"), std::string::npos);
    EXPECT_NE(r.out.find("result: TarnDebugManagerTraceResult  flags 0  tarn.version.dev"), std::string::npos);

    // "#n name" of every member line, against the runtime's member numbers.
    std::vector<std::string> shown;
    for (const std::string& line : Lines(r.out))
        if (line.starts_with("  #")) {
            auto words = Split(line);
            std::string name = words.at(1);
            if (name.ends_with(":")) name.pop_back();
            shown.push_back(words.at(0) + " " + name);
        }
    std::vector<std::string> expected;
    auto* type = dynamic_cast<Orbit::ManagedObjectType*>(Orbit::GetType<Tarn::DebugManager>());
    ASSERT_NE(type, nullptr);
    for (const auto& m : type->GetMembers()) expected.push_back("#" + std::to_string(m->GetMemberNumber()) + " " + m->GetName());
    EXPECT_EQ(shown, expected);
}

TEST(Tool, ShowHidesMembersTheVersionDoesNotSee) {
    Result r = RunTool("--api-version tarn.version.version1 show tarn.ServiceInstance");
    ASSERT_EQ(r.status, 0) << r.err;
    EXPECT_NE(r.out.find("#3 dbSerializer"), std::string::npos) << r.out;
    EXPECT_EQ(r.out.find("hostPicker"), std::string::npos) << r.out;
    EXPECT_NE(r.out.find("does not see 3 members"), std::string::npos) << r.out;
    EXPECT_NE(RunTool("--api-version tarn.version.version6 show tarn.ServiceInstance").out.find("#4 hostPicker"),
              std::string::npos);

    Result tags = RunTool("show tarn.LockStresser.LockMode");
    ASSERT_EQ(tags.status, 0);
    EXPECT_NE(tags.out.find("2 \"xall\""), std::string::npos) << tags.out;
}

// ---- dump --json ----

TEST(ToolJson, DocumentHasTheAgreedShape) {
    Json doc = Dump();
    EXPECT_EQ(doc.Keys(), (std::vector<std::string>{"loaders", "calls", "versions", "types"}));
    EXPECT_EQ(doc["loaders"].Strings(), CatalogTest::LoaderOrder());

    const auto versions = Orbit::GetVersionMap()->GetVersions();
    ASSERT_EQ(doc["versions"].items.size(), versions.size());
    std::size_t pairs = 0;
    for (std::size_t i = 0; i < versions.size(); ++i) {
        const Json& v = doc["versions"].items[i];
        EXPECT_EQ(v.Keys(), (std::vector<std::string>{"name", "serviceNamespace", "versionId", "flag", "includes"}));
        EXPECT_EQ(v["name"].text, versions[i]->GetName());
        EXPECT_EQ(v["flag"].number, versions[i]->GetFlags());
        const auto includes = v["includes"].Strings();
        EXPECT_EQ(std::count(includes.begin(), includes.end(), v["name"].text), 1) << "itself, once";
        pairs += includes.size();
    }
    EXPECT_EQ(pairs, 301u);
    EXPECT_EQ(doc["versions"].items[0]["includes"].Strings(),
              (std::vector<std::string>{"ferry.version.dev", "ferry.version.version1", "ferry.version.version2",
                                        "cairn.version.version1", "strata.query.version.version1",
                                        "strata.version.version0"}));

    std::vector<std::string> names;
    for (const Json& t : doc["types"].items) {
        names.push_back(t["name"].text);
        std::vector<std::string> keys = {"name", "flatName", "kind", "version", "namespace", "base", "properties"};
        if (t["kind"].number == Orbit::Kind::Managed) keys.push_back("methods");
        if (t["kind"].number == Orbit::Kind::Enum) keys.push_back("tags");
        EXPECT_EQ(t.Keys(), keys) << t["name"].text;
        EXPECT_EQ(t["base"].IsNull(), t["kind"].number == Orbit::Kind::Enum) << t["name"].text;
    }
    EXPECT_EQ(names, Names(TarnTypes()));
}

TEST(ToolJson, CallsAreTheRuntimeCounts) {
    Json calls = Dump()["calls"];
    const long loaders = static_cast<long>(CatalogTest::LoaderOrder().size());
    EXPECT_EQ(calls["addVersion"].number, loaders * 32);
    EXPECT_EQ(calls["addIncludedVersion"].number, loaders * 301);
    // Both processes load the same libraries: their loaders made the same calls.
    std::size_t standins = 0;
    for (Orbit::Type* t : Orbit::GetTypeMap()->GetTypes())
        standins += t->GetName().starts_with("cairn.") || t->GetName().starts_with("ferry.");
    EXPECT_EQ(calls["addType"].number, static_cast<long long>(TarnTypes().size() + standins));
}

TEST(ToolJson, TypesCarryTheirRecords) {
    Json doc = Dump();
    const Json& debug = TypeNamed(doc, "tarn.DebugManager");
    EXPECT_EQ(debug["namespace"].text, "tarn");
    EXPECT_EQ(debug["kind"].number, 0x12);
    const Json& shutdown = MethodNamed(debug, "shutdown");
    EXPECT_EQ(shutdown["wsdlName"].text, "DebugShutdown");
    EXPECT_EQ(shutdown["privilege"].text, "Global.HubServer");
    EXPECT_EQ(shutdown["task"].number, 0);
    EXPECT_TRUE(shutdown["result"]["type"].IsNull());
    EXPECT_EQ(shutdown["result"]["flags"].number, 0);
    EXPECT_EQ(shutdown["result"]["version"].text, "strata.version.version0");
    EXPECT_TRUE(shutdown["params"].items.empty());
    EXPECT_EQ(MethodNamed(debug, "traceOperation")["task"].number, 1);
    EXPECT_EQ(MethodNamed(TypeNamed(doc, "tarn.SecurityManager"), "reloadSslCertificate")["faults"].Strings(),
              std::vector<std::string>{"TarnFaultSecurityConfigFault"});

    const Json& trace = TypeNamed(doc, "tarn.DebugManager.TraceResult");
    EXPECT_EQ(trace["namespace"].text, "tarn");
    EXPECT_EQ(trace["base"].text, "StrataDynamicData");
    const Json& taskInfo = trace["properties"].items.at(2);
    EXPECT_EQ(taskInfo["name"].text, "taskInfo");
    EXPECT_EQ(taskInfo["type"].text, "CairnTaskInfo");
    EXPECT_EQ(taskInfo["flags"].number, 6);
    EXPECT_TRUE(taskInfo["privilege"].IsNull());

    EXPECT_EQ(TypeNamed(doc, "tarn.vmprov.FinallyAction")["base"].text, "TarnVmprovUndoableAction");
    EXPECT_EQ(TypeNamed(doc, "tarn.vmprov.UndoableAction.UndoInput")["base"].text, "TarnVmprovActionInput");
    EXPECT_EQ(TypeNamed(doc, "tarn.fault.SecurityConfigFault")["base"].text, "StrataMethodFault");
    EXPECT_EQ(TypeNamed(doc, "tarn.fault.SecurityConfigFault")["kind"].number, 0x11);
    EXPECT_EQ(TypeNamed(doc, "tarn.LockStresser.LockMode")["tags"].Strings(),
              (std::vector<std::string>{"x", "s", "xall", "sall"}));
}

TEST(ToolJson, VersionKeepsOnlyWhatItIncludes) {
    Json full = Dump();
    Json doc = Dump("--api-version tarn.version.version1");
    std::set<std::string> seen;
    for (const Json& v : full["versions"].items)
        if (v["name"].text == "tarn.version.version1")
            for (const std::string& name : v["includes"].Strings()) seen.insert(name);
    ASSERT_EQ(seen.size(), 10u);
    std::vector<std::string> versionNames;
    for (const Json& v : doc["versions"].items) versionNames.push_back(v["name"].text);
    EXPECT_EQ(std::set<std::string>(versionNames.begin(), versionNames.end()), seen);
    EXPECT_EQ(doc["loaders"].Strings(), full["loaders"].Strings());

    Orbit::Version* v1 = Orbit::GetVersionMap()->GetVersion("tarn.version.version1");
    EXPECT_EQ(doc["types"].items.size(), TarnTypes(v1).size());
    std::size_t members = 0;
    for (const Json& t : doc["types"].items) {
        EXPECT_TRUE(seen.count(t["version"].text)) << t["name"].text;
        for (const Json& p : t["properties"].items) EXPECT_TRUE(seen.count(p["version"].text)) << p["name"].text;
        if (t.Has("methods")) {
            for (const Json& m : t["methods"].items) EXPECT_TRUE(seen.count(m["version"].text)) << m["name"].text;
        }
        members += t["properties"].items.size() + (t.Has("methods") ? t["methods"].items.size() : 0);
    }
    EXPECT_GT(members, 0u);
    EXPECT_EQ(TypeNamed(doc, "tarn.ServiceInstance")["properties"].items.size(), 4u);
}

// ---- Errors and help ----

TEST(Tool, BadNamesAndBadCommandLinesFailClearly) {
    struct Case {
        const char* args;
        int status;
        const char* message;
    };
    const Case cases[] = {
        {"show tarn.NoSuchType", 1, "'tarn.NoSuchType'"},
        {"show cairn.TaskInfo", 1, "no tarn type"},
        {"--api-version tarn.version.version1 show tarn.AlertManager", 1, "not visible to version 'tarn.version.version1'"},
        {"--api-version tarn.version.version99", 1, "no version named 'tarn.version.version99'"},
        {"--api-version tarn.version.version99 dump --json", 1, "tarn.version.version99"},
        {"frobnicate", 2, "unknown command 'frobnicate'"},
        {"--frobnicate", 2, "unknown option '--frobnicate'"},
        {"--api-version", 2, "needs a version name"},
        {"--api-version tarn.version.version1 --api-version tarn.version.version6", 2, "twice"},
        {"show", 2, "exactly one wire name"},
        {"show tarn.DebugManager tarn.LockStresser", 2, "exactly one wire name"},
        {"dump", 2, "dump --json"},
        {"list --json", 2, "--json"},
    };
    for (const Case& c : cases) {
        Result r = RunTool(c.args);
        EXPECT_EQ(r.status, c.status) << c.args;
        EXPECT_EQ(r.out, "") << c.args;
        EXPECT_NE(r.err.find(c.message), std::string::npos) << c.args << ": " << r.err;
    }
}

TEST(Tool, HelpDocumentsEveryCommandAndOption) {
    Result r = RunTool("--help");
    ASSERT_EQ(r.status, 0);
    EXPECT_EQ(r.err, "");
    for (const char* word : {"list", "show WIRE-NAME", "versions", "dump --json", "--api-version NAME", "Exit status"})
        EXPECT_NE(r.out.find(word), std::string::npos) << word;
    EXPECT_EQ(RunTool("-h").out, r.out);
    EXPECT_EQ(RunTool("show --help").out, r.out);
    // --version is the tool's own version, whatever else the line holds.
    EXPECT_TRUE(RunTool("--version").out.starts_with("tarn-catalog " TARN_VERSION "\n"));
    EXPECT_EQ(RunTool("list --version").out, RunTool("--version").out);
}

}  // namespace
