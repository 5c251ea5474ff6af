// The command line of tarn-catalog.
#pragma once

#include <optional>
#include <stdexcept>
#include <string>
#include <vector>

namespace tarncatalog {

enum class Command { List, Show, Versions, Dump, Wsdl, Html, Help, ToolVersion };

struct Options {
    Command command = Command::List;
    std::string typeName;               // show
    std::optional<std::string> version;  // --api-version
    bool counters = false;               // dump --counters
    std::string outDir;                  // html --out
};

// A command line that does not parse; the message says what is wrong.
class UsageError : public std::runtime_error {
public:
    using std::runtime_error::runtime_error;
};

Options ParseArgs(const std::vector<std::string>& args);

const char* HelpText();

}  // namespace tarncatalog
