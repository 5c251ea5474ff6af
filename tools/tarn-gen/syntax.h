// The catalogue as written: one syntax tree per file, before any name is resolved.
#pragma once

#include <cstdint>
#include <optional>
#include <stdexcept>
#include <string>
#include <vector>

#include "orbit/Records.h"

namespace tarngen {

// A position in a catalogue file, for messages.
struct Location {
    std::string file;
    int line = 0;
    std::string ToString() const { return file + ":" + std::to_string(line); }
};

// Every catalogue error: "file:line: message". One thrown for a whole run holds the
// first error in its own fields and every error of the run, that one included, in `all`.
class CatalogueError : public std::runtime_error {
public:
    CatalogueError(const Location& where, const std::string& message)
        : std::runtime_error(where.ToString() + ": " + message), location(where) {}
    Location location;
    std::vector<std::string> all;
};

// Gathers the errors of a run, so that one run reports all of them.
class Diagnostics {
public:
    void Add(const CatalogueError& e) {
        if (_errors.empty()) _first = e;
        _errors.push_back(e.what());
    }
    bool Empty() const { return _errors.empty(); }
    // Throws the gathered errors, if any.
    void Check() const {
        if (_errors.empty()) return;
        CatalogueError out = *_first;
        out.all = _errors;
        throw out;
    }

private:
    std::optional<CatalogueError> _first;
    std::vector<std::string> _errors;
};

// The "##" lines standing right before a statement, without the marks.
using Doc = std::vector<std::string>;

struct ParamSyntax {
    Location where;
    Doc doc;
    std::string name;
    std::string type;
    std::uint32_t flags = 0;
    std::optional<std::string> version;
};

struct ResultSyntax {
    Location where;
    std::string type;
    std::uint32_t flags = 0;
    std::string version;
};

struct MethodSyntax {
    Location where;
    Doc doc;
    std::string name;
    std::optional<std::string> wsdlName;
    std::string version;
    bool task = false;
    std::optional<std::string> privilege;
    std::vector<ParamSyntax> params;
    std::optional<ResultSyntax> result;
    std::vector<std::pair<Location, std::string>> faults;
};

struct PropertySyntax {
    Location where;
    Doc doc;
    std::string name;
    std::string type;
    std::uint32_t flags = 0;
    std::string version;
    std::optional<std::string> privilege;
};

// The kinds a catalogue declares, valued as the runtime's records spell them.
enum class Kind : std::uint32_t {
    Data = Orbit::Kind::Data,
    Fault = Orbit::Kind::Fault,
    Managed = Orbit::Kind::Managed,
    Enum = Orbit::Kind::Enum,
};

struct TypeSyntax {
    Location where;
    Doc doc;
    Kind kind = Kind::Data;
    std::string ns;    // the namespace in force where it was declared
    std::string name;  // relative to ns, dotted when nested
    std::optional<std::string> base;
    std::string version;
    std::vector<PropertySyntax> properties;
    std::vector<MethodSyntax> methods;
    std::vector<std::string> tags;
    Location tagsWhere;
};

struct VersionSyntax {
    Location where;
    std::string name;
    std::string serviceNamespace;
    std::string versionId;
    std::uint32_t flag = 0;
    std::vector<std::string> includes;
};

// One catalogue file: a namespace file, a stand-in file or the version list.
struct FileSyntax {
    std::string path;
    std::string source;  // the name generated files give it, when not `path`
    bool standin = false;
    std::string unit;  // the namespace of a namespace file, the library of a stand-in file
    std::vector<TypeSyntax> types;
    std::vector<VersionSyntax> versions;
    std::vector<std::string> loaders;
    Location loadersWhere;
    std::vector<std::string> warnings;  // "file:line: warning: ..."
};

// Parses one file. A malformed line is reported to `diagnostics` and skipped (with the
// member lines of a type line that failed), so that one run finds every bad line.
FileSyntax ParseFile(const std::string& path, const std::string& text, Diagnostics& diagnostics);
// The same, throwing every error of the file at once.
FileSyntax ParseFile(const std::string& path, const std::string& text);

}  // namespace tarngen
