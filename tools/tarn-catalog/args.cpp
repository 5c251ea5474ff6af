#include "args.h"

namespace tarncatalog {

Options ParseArgs(const std::vector<std::string>& args) {
    Options o;
    std::vector<std::string> words;  // the command and its operands, options taken out
    bool json = false;
    for (std::size_t i = 0; i < args.size(); ++i) {
        const std::string& a = args[i];
        if (a == "--help" || a == "-h") return Options{Command::Help, {}, {}};
        if (a == "--version") return Options{Command::ToolVersion, {}, {}};
        if (a == "--json") {
            json = true;
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
    if (command == "help") return Options{Command::Help, {}, {}};
    if (command == "list" || command == "versions") {
        if (operands != 0) throw UsageError("'" + command + "' takes no operand");
        o.command = command == "list" ? Command::List : Command::Versions;
    } else if (command == "show") {
        if (operands != 1) throw UsageError("'show' needs exactly one wire name, for example tarn.DebugManager");
        o.command = Command::Show;
        o.typeName = words[1];
    } else if (command == "wsdl") {
        if (operands != 0) throw UsageError("'wsdl' takes no operand");
        if (!o.version) throw UsageError("'wsdl' describes one API version: give --api-version NAME");
        o.command = Command::Wsdl;
    } else if (command == "dump") {
        if (operands != 0) throw UsageError("'dump' takes no operand");
        if (!json) throw UsageError("'dump' writes JSON only: use 'dump --json'");
        o.command = Command::Dump;
    } else {
        throw UsageError("unknown command '" + command + "'");
    }
    if (json && o.command != Command::Dump) throw UsageError("--json goes with 'dump' only");
    return o;
}

const char* HelpText() {
    return R"(Usage: tarn-catalog [--api-version NAME] [COMMAND]

Shows the tarn API as the runtime registered it when libtarn-types loaded: what
the loaders put in the runtime's type and version maps, read back from there.

Commands:
  list              (the default) the namespaces, in the order their loaders ran,
                    each with its types: kind, wire name, version, member counts
  show WIRE-NAME    one type: kind, flat name, version, namespace, base, then its
                    own methods (member number, wsdl name, privilege, task flag,
                    parameters, result, faults), its own properties (member
                    number, or index for a data object) and, for an enumeration,
                    its tags with their values
  versions          the registered versions with their service namespace, id,
                    flag and the versions each one includes
  dump --json       everything in one JSON document:
                    {"loaders", "calls", "versions", "types"}
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
  --json            with 'dump': write JSON
  -h, --help        this text

Types are named by wire name ("tarn.vmprov.Action"); the types that members name,
ours or other libraries', by their header's flat name ("CairnTaskInfo", "String").
Flags: 1 array, 2 optional, 4 carried to the runtime unchanged.

Exit status: 0 done; 1 unknown type or version, or a type the chosen version does
not see; 2 a command line that does not parse.

Examples:
  tarn-catalog --api-version tarn.version.version6
  tarn-catalog show tarn.DebugManager
  tarn-catalog --api-version tarn.version.version1 show tarn.ServiceInstance
  tarn-catalog dump --json
  tarn-catalog wsdl --api-version tarn.version.version8
)";
}

}  // namespace tarncatalog
