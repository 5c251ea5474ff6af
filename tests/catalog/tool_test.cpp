// tarn-catalog run as a user runs it: a separate process, its output and exit
// status, compared with what this process sees in the same library's maps.
#include <gtest/gtest.h>
#include <sys/wait.h>
#include <unistd.h>

#include <algorithm>
#include <cstdio>
#include <fstream>
#include <nlohmann/json.hpp>
#include <set>
#include <sstream>
#include <string>
#include <vector>

#include "model.h"
#include "tarn/types.h"

namespace {

using Json = nlohmann::ordered_json;  // keeps the document's key order

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

std::vector<std::string> LoaderOrder() {
    std::ifstream in(std::string(TARN_IDL_DIR) + "/library.idl");
    std::stringstream text;
    text << in.rdbuf();
    return tarngen::ParseFile("idl/library.idl", text.str()).loaders;
}

// The tarn types of this process's type map, in registration order, as `version` sees them.
std::vector<std::string> TarnTypes(Orbit::Version* version = nullptr) {
    std::vector<std::string> out;
    for (Orbit::Type* t : Orbit::GetTypeMap()->GetTypes())
        if (t->GetName().starts_with("tarn.") && (version == nullptr || t->IsVisible(version))) out.push_back(t->GetName());
    return out;
}

Orbit::Version* V(const char* name) { return Orbit::GetVersionMap()->GetVersion(name); }

// A listing: namespace headings, and the wire names of the type lines below them.
std::pair<std::vector<std::string>, std::vector<std::string>> ParseListing(const std::string& out) {
    std::pair<std::vector<std::string>, std::vector<std::string>> l;
    auto lines = Lines(out);
    for (std::size_t i = 1; i < lines.size(); ++i) {  // line 0 is the summary
        std::istringstream words(lines[i]);
        std::string first, second;
        words >> first >> second;
        if (first.empty()) continue;
        if (lines[i].starts_with("  ")) l.second.push_back(second);
        else l.first.push_back(first);
    }
    return l;
}

Json Dump(const std::string& extra = "") {
    Result r = RunTool("dump " + extra);
    EXPECT_EQ(r.status, 0) << r.err;
    EXPECT_EQ(r.err, "");
    return Json::parse(r.out);
}

std::vector<std::string> Keys(const Json& object) {
    std::vector<std::string> keys;
    for (auto it = object.begin(); it != object.end(); ++it) keys.push_back(it.key());
    return keys;
}

TEST(Tool, ListsTheNamespacesInLoaderOrderWithWhatAVersionSees) {
    Result r = RunTool("");
    ASSERT_EQ(r.status, 0) << r.err;
    EXPECT_EQ(r.err, "");
    EXPECT_EQ(ParseListing(r.out).first, LoaderOrder());
    EXPECT_EQ(ParseListing(r.out).second, TarnTypes());
    EXPECT_EQ(RunTool("list").out, r.out);

    Result v6 = RunTool("--api-version tarn.version.version6");
    const auto visible = TarnTypes(V("tarn.version.version6"));
    EXPECT_EQ(ParseListing(v6.out).second, visible);
    EXPECT_LT(visible.size(), TarnTypes().size());
    EXPECT_NE(v6.out.find(std::to_string(visible.size()) + " of " + std::to_string(TarnTypes().size()) + " types"),
              std::string::npos);
    EXPECT_EQ(RunTool("--api-version=tarn.version.version6 list").out, v6.out);

    const auto lines = Lines(RunTool("--api-version tarn.version.version1 versions").out);
    const std::size_t included = V("tarn.version.version1")->GetIncluded().size();
    EXPECT_EQ(lines.at(0), "Versions that tarn.version.version1 includes: " + std::to_string(included));
    EXPECT_EQ(std::count_if(lines.begin(), lines.end(), [](const std::string& l) { return l.starts_with("  includes ("); }),
              static_cast<long>(included));
}

TEST(Tool, ShowsMembersByNumberAndHidesWhatTheVersionDoesNotSee) {
    Result r = RunTool("show tarn.DebugManager");
    ASSERT_EQ(r.status, 0) << r.err;
    EXPECT_NE(r.out.find("kind       managed (0x12)"), std::string::npos) << r.out;
    EXPECT_NE(r.out.find("param args: Any  flags 3 (array, optional)"), std::string::npos);
    std::vector<std::string> shown, expected;
    for (const std::string& line : Lines(r.out))
        if (line.starts_with("  #")) shown.push_back(line.substr(2, line.find_first_of(" :", line.find(' ', 3) + 1) - 2));
    auto* type = dynamic_cast<Orbit::ManagedObjectType*>(Orbit::GetType<Tarn::DebugManager>());
    for (const auto& m : type->GetMembers()) expected.push_back("#" + std::to_string(m->GetMemberNumber()) + " " + m->GetName());
    EXPECT_EQ(shown, expected);

    Result v1 = RunTool("--api-version tarn.version.version1 show tarn.ServiceInstance");
    EXPECT_NE(v1.out.find("#3 dbSerializer"), std::string::npos) << v1.out;
    EXPECT_EQ(v1.out.find("hostPicker"), std::string::npos) << v1.out;
    EXPECT_NE(v1.out.find("does not see 3 members"), std::string::npos) << v1.out;
    EXPECT_NE(RunTool("show tarn.LockStresser.LockMode").out.find("2 \"xall\""), std::string::npos);
}

// Any of a type's names finds it, the flat names that member lists print included,
// and the page tells how to reach the type from C++ and what it inherits.
TEST(Tool, ShowFindsATypeByAnyOfItsNames) {
    Result byWire = RunTool("show tarn.vmprov.FtSyncContext");
    ASSERT_EQ(byWire.status, 0) << byWire.err;
    EXPECT_EQ(RunTool("show TarnVmprovFtSyncContext").out, byWire.out);
    EXPECT_EQ(RunTool("show Tarn::Vmprov::FtSyncContext").out, byWire.out);
    for (const char* line : {"  C++ class  Tarn::Vmprov::FtSyncContext\n", "  header     #include \"tarn/vmprov.h\"\n",
                             "  base       tarn.vmprov.MigrateContext <- tarn.vmprov.MobilityContext <- tarn.vmprov.VmContext"
                             " <- tarn.vmprov.Context <- strata.DynamicData\n",
                             "\ninherited from tarn.vmprov.MigrateContext:\n", "\ninherited from tarn.vmprov.Context:\n"})
        EXPECT_NE(byWire.out.find(line), std::string::npos) << line << byWire.out;

    Result standin = RunTool("show CairnVmConfigSpec");
    ASSERT_EQ(standin.status, 0) << standin.err;
    EXPECT_TRUE(standin.out.starts_with("cairn.vm.ConfigSpec\n")) << standin.out;
    EXPECT_NE(standin.out.find("#include \"cairn/cairn.h\""), std::string::npos) << standin.out;
    EXPECT_NE(standin.out.find("stand-in"), std::string::npos) << standin.out;
}

// The document has the agreed shape, and every value in it is the runtime's.
TEST(ToolJson, TheDocumentIsTheRuntimesRegistration) {
    EXPECT_EQ(Keys(Dump()), (std::vector<std::string>{"loaders", "versions", "types"}));
    EXPECT_EQ(RunTool("dump --json").out, RunTool("dump").out) << "older scripts ask for JSON";
    Json doc = Dump("--counters");
    EXPECT_EQ(Keys(doc), (std::vector<std::string>{"loaders", "calls", "versions", "types"}));
    EXPECT_EQ(doc["loaders"].get<std::vector<std::string>>(), LoaderOrder());
    EXPECT_EQ(doc["calls"]["addType"], Orbit::GetTypeMap()->AddTypeCalls());

    const auto versions = Orbit::GetVersionMap()->GetVersions();
    ASSERT_EQ(doc["versions"].size(), versions.size());
    for (std::size_t i = 0; i < versions.size(); ++i) {
        const Json& v = doc["versions"][i];
        EXPECT_EQ(Keys(v), (std::vector<std::string>{"name", "serviceNamespace", "versionId", "flag", "includes"}));
        EXPECT_EQ(v["name"], versions[i]->GetName());
        EXPECT_EQ(v["flag"], versions[i]->GetFlags());
        std::set<std::string> included;
        for (const Orbit::Version* other : versions[i]->GetIncluded()) included.insert(other->GetName());
        EXPECT_EQ(v["includes"].get<std::set<std::string>>(), included);
    }

    std::vector<std::string> names;
    for (const Json& t : doc["types"]) {
        const std::string name = t["name"];
        names.push_back(name);
        Orbit::Type* type = Orbit::GetTypeMap()->GetType(name);
        ASSERT_NE(type, nullptr) << name;
        std::vector<std::string> keys = {"name", "flatName", "kind", "version", "namespace", "base", "properties"};
        if (t["kind"] == Orbit::Kind::Managed) keys.push_back("methods");
        if (t["kind"] == Orbit::Kind::Enum) keys.push_back("tags");
        EXPECT_EQ(Keys(t), keys) << name;
        EXPECT_EQ(t["flatName"], type->GetWsdlName());
        EXPECT_EQ(t["kind"], type->GetKind());
        EXPECT_EQ(t["base"], type->GetBaseType() ? Json(type->GetBaseType()->GetWsdlName()) : Json()) << name;
        auto* managed = dynamic_cast<Orbit::ManagedObjectType*>(type);
        if (!managed) continue;
        ASSERT_EQ(t["methods"].size() + t["properties"].size(), managed->GetMembers().size()) << name;
        for (std::size_t i = 0; i < t["methods"].size(); ++i) {
            const Json& m = t["methods"][i];
            const Orbit::ManagedMethod* method = managed->GetMembers()[i].Get();
            EXPECT_EQ(m["name"], method->GetName());
            EXPECT_EQ(m["wsdlName"], method->GetWsdlName());
            EXPECT_EQ(m["task"], method->IsTask() ? 1 : 0);
            EXPECT_EQ(m["params"].size(), method->GetParameters().size());
            EXPECT_EQ(m["faults"].size(), method->GetFaults().size());
        }
    }
    EXPECT_EQ(names, TarnTypes());
}

TEST(ToolJson, AVersionKeepsOnlyWhatItIncludes) {
    Json doc = Dump("--api-version tarn.version.version1");
    Orbit::Version* v1 = V("tarn.version.version1");
    std::set<std::string> seen;
    for (const Orbit::Version* v : v1->GetIncluded()) seen.insert(v->GetName());
    std::set<std::string> listed;
    for (const Json& v : doc["versions"]) listed.insert(v["name"].get<std::string>());
    EXPECT_EQ(listed, seen);
    EXPECT_EQ(doc["types"].size(), TarnTypes(v1).size());
    for (const Json& t : doc["types"]) {
        EXPECT_TRUE(seen.count(t["version"])) << t["name"];
        for (const Json& p : t["properties"]) EXPECT_TRUE(seen.count(p["version"])) << p["name"];
        for (const Json& m : t.value("methods", Json::array())) EXPECT_TRUE(seen.count(m["version"])) << m["name"];
    }
}

TEST(Tool, BadNamesAndBadCommandLinesFailClearly) {
    struct Case {
        const char* args;
        int status;
        const char* message;
    };
    const Case cases[] = {
        {"show tarn.NoSuchType", 1, "no type named 'tarn.NoSuchType'"},
        {"show tarn.DebugManagr", 1, "did you mean tarn.DebugManager"},
        {"show debugmanager", 1, "did you mean tarn.DebugManager"},
        {"--api-version tarn.version.version1 show tarn.AlertManager", 1, "not visible to version 'tarn.version.version1'"},
        {"--api-version tarn.version.version99", 1, "no version named 'tarn.version.version99'"},
        {"--api-version tarn.version.version99 dump --json", 1, "tarn.version.version99"},
        {"frobnicate", 2, "unknown command 'frobnicate'"},
        {"--frobnicate", 2, "unknown option '--frobnicate'"},
        {"--api-version", 2, "needs a version name"},
        {"--api-version tarn.version.version1 --api-version tarn.version.version6", 2, "twice"},
        {"show", 2, "exactly one type name"},
        {"show tarn.DebugManager tarn.LockStresser", 2, "exactly one type name"},
        {"list --json", 2, "--json"},
        {"list --counters", 2, "--counters goes with 'dump'"},
        {"html", 2, "needs --out"},
        {"list --out x", 2, "--out goes with 'html'"},
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
    for (const char* word : {"list", "show TYPE", "versions", "dump", "--counters", "html --out DIR", "--api-version NAME", "Exit status"})
        EXPECT_NE(r.out.find(word), std::string::npos) << word;
    EXPECT_EQ(RunTool("-h").out, r.out);
    EXPECT_EQ(RunTool("show --help").out, r.out);
    // --version is the tool's own version, whatever else the line holds.
    EXPECT_TRUE(RunTool("--version").out.starts_with("tarn-catalog " TARN_VERSION "\n"));
    EXPECT_EQ(RunTool("list --version").out, RunTool("--version").out);
}

}  // namespace
