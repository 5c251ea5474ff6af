#include "args.h"

namespace tarncatalog {
namespace {

Options HelpOptions() {
    Options o;
    o.command = Command::Help;
    return o;
}

Options ToolVersionOptions() {
    Options o;
    o.command = Command::ToolVersion;
    return o;
}

}  // namespace

Options ParseArgs(const std::vector<std::string>& args) {
    Options o;
    std::vector<std::string> words;  // the command and its operands, options taken out
    bool json = false;
    std::optional<std::string> out;
    for (std::size_t i = 0; i < args.size(); ++i) {
        const std::string& a = args[i];
        if (a == "--help" || a == "-h") return HelpOptions();
        if (a == "--version") return ToolVersionOptions();
        if (a == "--json") {
            json = true;
        } else if (a == "--counters") {
            o.counters = true;
        } else if (a == "--out" || a.starts_with("--out=")) {
            if (out) throw UsageError("--out given twice");
            if (a == "--out" && (i + 1 >= args.size() || args[i + 1].empty())) throw UsageError("--out needs a directory");
            out = a == "--out" ? args[++i] : a.substr(6);
        } else if (a == "--api-version" || a.starts_with("--api-version=")) {
            if (o.version) throw UsageError("--api-version given twice");
            std::string value;
            if (a == "--api-version") {
                if (i + 1 >= args.size()) throw UsageError("--api-version needs a version name");
                value = args[++i];
            } else {
                value = a.substr(std::string("--api-version=").size());
            }
            if (value.empty() || value.starts_with("-")) throw UsageError("--api-version needs a version name");
            o.version = value;
        } else if (a.starts_with("-")) {
            throw UsageError("unknown option '" + a + "'");
        } else {
            words.push_back(a);
        }
    }

    const std::string command = words.empty() ? "list" : words[0];
    const std::size_t operands = words.empty() ? 0 : words.size() - 1;
    if (command == "help") return HelpOptions();
    if (command == "list" || command == "versions") {
        if (operands != 0) throw UsageError("'" + command + "' takes no operand");
        o.command = command == "list" ? Command::List : Command::Versions;
    } else if (command == "show") {
        if (operands != 1) throw UsageError("'show' needs exactly one type name, for example tarn.DebugManager");
        o.command = Command::Show;
        o.typeName = words[1];
    } else if (command == "wsdl") {
        if (operands != 0) throw UsageError("'wsdl' takes no operand");
        if (!o.version) throw UsageError("'wsdl' describes one API version: give --api-version NAME");
        o.command = Command::Wsdl;
    } else if (command == "dump") {
        if (operands != 0) throw UsageError("'dump' takes no operand");
        o.command = Command::Dump;
    } else if (command == "html") {
        if (operands != 0) throw UsageError("'html' takes no operand; the directory goes with --out");
        if (!out) throw UsageError("'html' needs --out DIR");
        o.command = Command::Html;
        o.outDir = *out;
    } else {
        throw UsageError("unknown command '" + command + "' (commands: list, show, versions, dump, wsdl, html)");
    }
    // dump always writes JSON; --json stays accepted there for older scripts.
    if (json && o.command != Command::Dump) throw UsageError("--json goes with 'dump' only");
    if (o.counters && o.command != Command::Dump) throw UsageError("--counters goes with 'dump' only");
    if (out && o.command != Command::Html) throw UsageError("--out goes with 'html' only");
    return o;
}

const char* HelpText() {
    return R"(Usage: tarn-catalog [--api-version NAME] [COMMAND]

Shows the tarn API as the runtime registered it when libtarn-types loaded: what
the loaders put in the runtime's type and version maps, read back from there.

Commands:
  list              (the default) the namespaces, in the order their loaders ran,
                    each with its types: kind, wire name, version, member counts
  show TYPE         one type, named by wire name (tarn.DebugManager), flat name
                    (TarnDebugManager) or C++ class (Tarn::DebugManager); stand-in
                    types of other libraries too (cairn.vm.ConfigSpec). Shows its
                    kind, C++ class, header to include, version, namespace and
                    base chain, then its own methods (member number, wsdl name,
                    privilege, task flag, parameters, result, faults), its own
                    properties (member number, or index for a data object), the
                    members it inherits and, for an enumeration, its tags with
                    their values. A name that matches nothing gets suggestions
  versions          the registered versions with their service namespace, id,
                    flag and the versions each one includes
  dump              everything in one JSON document:
                    {"loaders", "versions", "types"}, and "calls" (how often the
                    loaders called the registries) with --counters
  html --out DIR    the API reference as a static site in DIR: an index by
                    namespace, a page per type, and a version switch that shows
                    what each API version sees
  wsdl              with --api-version: the WSDL 1.1 document, with its XML
                    Schema, of exactly what that version sees on the wire

Options:
  --api-version NAME
                    restrict any command to what API version NAME sees: a
                    type, property or method is shown when NAME includes the
                    version that introduced it; versions are restricted to
                    those NAME includes; loaders and call counts stay as
                    registered
  --version         the tool's own version
  --counters        with 'dump': add the loaders' call counts
  --out DIR         with 'html': where the site goes
  -h, --help        this text

Types are listed by wire name ("tarn.vmprov.Action"); the types that members name,
ours or other libraries', by their header's flat name ("CairnTaskInfo", "String"),
which 'show' accepts as well.
Flags: 1 array, 2 optional, 4 carried to the runtime unchanged.

Exit status: 0 done; 1 unknown type or version, or a type the chosen version does
not see; 2 a command line that does not parse.

Examples:
  tarn-catalog --api-version tarn.version.version6
  tarn-catalog show tarn.DebugManager
  tarn-catalog --api-version tarn.version.version1 show tarn.ServiceInstance
  tarn-catalog show CairnVmConfigSpec
  tarn-catalog dump
  tarn-catalog wsdl --api-version tarn.version.version8
  tarn-catalog html --out api --api-version tarn.version.version6
)";
}

}  // namespace tarncatalog
