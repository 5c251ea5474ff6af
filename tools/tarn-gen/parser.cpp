// Line-based parser of the catalogue format (see idl/README.md).
#include <map>
#include <optional>
#include <set>
#include <sstream>
#include <utility>

#include "syntax.h"

namespace tarngen {
namespace {

std::vector<std::string> SplitWords(const std::string& line) {
    std::vector<std::string> words;
    std::istringstream in(line.substr(0, line.find('#')));
    for (std::string word; in >> word;) words.push_back(word);
    return words;
}

bool IsIdentifier(const std::string& word, bool dotted) {
    if (word.empty()) return false;
    bool atStart = true;
    for (char c : word) {
        if (c == '.' && dotted && !atStart) {
            atStart = true;
            continue;
        }
        bool letter = (c >= 'a' && c <= 'z') || (c >= 'A' && c <= 'Z') || c == '_';
        bool digit = c >= '0' && c <= '9';
        if (!(letter || (digit && !atStart))) return false;
        atStart = false;
    }
    return !atStart;
}

// The words of one statement after its keyword: leading positional words, then
// "key value" pairs and bare switches, each at most once.
class Statement {
public:
    Statement(Location where, std::vector<std::string> words, bool indented)
        : _where(std::move(where)), _words(std::move(words)), _indented(indented) {}

    const Location& Where() const { return _where; }
    bool Indented() const { return _indented; }
    const std::string& Keyword() const { return _words[0]; }

    std::string Positional(const char* what, bool dotted = true) {
        if (_next >= _words.size()) Fail(std::string("missing ") + what);
        const std::string& word = _words[_next++];
        if (!IsIdentifier(word, dotted)) Fail(std::string("bad ") + what + " '" + word + "'");
        return word;
    }

    // Reads the options; `keys` take a value, `switches` do not, `rest` takes all remaining words.
    void Options(std::set<std::string> keys, std::set<std::string> switches = {}, const std::string& rest = "") {
        while (_next < _words.size()) {
            const std::string& key = _words[_next++];
            if (!_seen.insert(key).second) Fail("'" + key + "' given twice");
            if (switches.count(key)) {
                _switches.insert(key);
            } else if (key == rest) {
                while (_next < _words.size()) _rest.push_back(_words[_next++]);
            } else if (keys.count(key)) {
                if (_next >= _words.size()) Fail("'" + key + "' needs a value");
                _values[key] = _words[_next++];
            } else {
                std::set<std::string> allowed = keys;
                allowed.insert(switches.begin(), switches.end());
                if (!rest.empty()) allowed.insert(rest);
                if (allowed.empty()) Fail("unexpected '" + key + "'; nothing more belongs on this line");
                std::string list;
                for (const std::string& word : allowed) list += (list.empty() ? "" : ", ") + word;
                Fail("unexpected '" + key + "'; expected one of: " + list);
            }
        }
    }

    std::optional<std::string> Value(const std::string& key) const {
        auto it = _values.find(key);
        return it == _values.end() ? std::nullopt : std::optional<std::string>(it->second);
    }
    std::string Required(const std::string& key) const {
        auto value = Value(key);
        if (!value) Fail("missing '" + key + "'");
        return *value;
    }
    bool Switch(const std::string& key) const { return _switches.count(key) != 0; }
    const std::vector<std::string>& Rest() const { return _rest; }

    // Every word not read yet, for statements that are plain lists.
    std::vector<std::string> Remaining() {
        std::vector<std::string> words(_words.begin() + _next, _words.end());
        _next = _words.size();
        return words;
    }

    std::uint32_t Number(const std::string& key, std::uint32_t max, std::uint32_t fallback) const {
        auto value = Value(key);
        if (!value) return fallback;
        std::uint32_t n = 0;
        for (char c : *value) {
            if (c < '0' || c > '9' || n > 100000) Fail("'" + key + "' must be a number from 0 to " + std::to_string(max));
            n = n * 10 + (c - '0');
        }
        if (value->empty() || n > max) Fail("'" + key + "' must be a number from 0 to " + std::to_string(max) + ", not " + *value);
        return n;
    }

    [[noreturn]] void Fail(const std::string& message) const { throw CatalogueError(_where, message); }

private:
    Location _where;
    std::vector<std::string> _words;
    std::size_t _next = 1;
    std::set<std::string> _seen;
    std::map<std::string, std::string> _values;
    std::set<std::string> _switches;
    std::vector<std::string> _rest;
    bool _indented;
};

constexpr std::uint32_t kMaxFlags = Orbit::Flag::All;

class Parser {
public:
    Parser(const std::string& path) { _file.path = path; }

    // A type line directly between member lines of one indentation looks pasted there:
    // the members below it silently change owner. Said, not refused.
    void WarnIfAmongMembers(const Statement& s, int before, int after) {
        if (before <= 0 || before != after || _file.types.empty() || _skipping) return;
        const TypeSyntax& above = _file.types.back();
        _file.warnings.push_back(s.Where().ToString() + ": warning: type line among the members of '" + above.name +
                                 "' (" + above.where.ToString() + "); the member lines below it now belong to it");
    }

    void Line(Statement s) {
        const std::string& keyword = s.Keyword();
        if (keyword == "namespace") return Namespace(s);
        if (keyword == "standin") return Standin(s);
        if (keyword == "version") return Version(s);
        if (keyword == "loaders") return Loaders(s);
        if (_file.unit.empty()) s.Fail("the file must start with 'namespace', 'standin' or 'version'");
        if (keyword == "data") return Type(s, Kind::Data);
        if (keyword == "fault") return Type(s, Kind::Fault);
        if (keyword == "managed") return Type(s, Kind::Managed);
        if (keyword == "enum") return Type(s, Kind::Enum);
        if (keyword == "property") return Property(s);
        if (keyword == "tags") return Tags(s);
        if (keyword == "method") return Method(s);
        if (keyword == "param") return Param(s);
        if (keyword == "result") return Result(s);
        if (keyword == "throws") return Throws(s);
        s.Fail("unknown statement '" + keyword + "'; expected one of: data, enum, fault, loaders, managed, method, "
               "namespace, param, property, result, standin, tags, throws, version");
    }

    // "##" lines before a statement document what it declares.
    void TakeDoc(Doc doc) { _doc = std::move(doc); }

    // After a type or method line that failed, its member lines would land on the
    // type or method above: they are dropped instead.
    void Failed(const std::string& keyword) {
        if (keyword == "method") {
            _method = nullptr;
            _skippingMethod = true;
        }
        if (keyword != "data" && keyword != "fault" && keyword != "managed" && keyword != "enum") return;
        if (!_skipping) {
            _file.types.emplace_back();
            _file.types.back().kind = Kind::Managed;
        }
        _skipping = true;
        _method = nullptr;
    }

    FileSyntax Finish() {
        if (_skipping) _file.types.pop_back();
        return std::move(_file);
    }

private:
    void Namespace(Statement& s) {
        std::string ns = s.Positional("namespace");
        s.Options({});
        if (_file.unit.empty()) {
            _file.unit = ns;
        } else if (!_file.standin) {
            s.Fail("a namespace file has one namespace; only stand-in files switch namespaces");
        } else if (ns != _file.unit && ns.rfind(_file.unit + ".", 0) != 0) {
            s.Fail("namespace '" + ns + "' is outside the stand-in library '" + _file.unit + "'");
        }
        _ns = ns;
    }

    void Standin(Statement& s) {
        if (!_file.unit.empty()) s.Fail("'standin' must be the first statement");
        _file.unit = s.Positional("library name", false);
        _file.standin = true;
        s.Options({});
    }

    void Version(Statement& s) {
        if (!_file.types.empty() || !_file.unit.empty()) s.Fail("versions belong in a file of their own");
        VersionSyntax v;
        v.where = s.Where();
        v.name = s.Positional("version name");
        s.Options({"namespace", "id", "flag"}, {}, "includes");
        auto dashIsEmpty = [](const std::string& word) { return word == "-" ? std::string() : word; };
        v.serviceNamespace = dashIsEmpty(s.Required("namespace"));
        v.versionId = dashIsEmpty(s.Required("id"));
        v.flag = s.Number("flag", 0xFFFF, 0);
        if (!s.Value("flag")) s.Fail("missing 'flag'");
        v.includes = s.Rest();
        _file.versions.push_back(std::move(v));
    }

    void Loaders(Statement& s) {
        if (!_file.unit.empty() || !_file.loaders.empty()) s.Fail("'loaders' is stated once, outside namespace files");
        _file.loadersWhere = s.Where();
        _file.loaders = s.Remaining();
        if (_file.loaders.empty()) s.Fail("'loaders' needs at least one namespace");
    }

    void Type(Statement& s, Kind kind) {
        if (_skipping) {
            _file.types.pop_back();
            _skipping = false;
        }
        if (_ns.empty()) s.Fail("a stand-in file needs a 'namespace' before its types");
        // An indented type line reads as one more member of the type above, yet takes
        // every member line below it.
        if (s.Indented() && !_file.types.empty())
            s.Fail("type line indented among the members of '" + _file.types.back().name + "' (" +
                   _file.types.back().where.ToString() + "); a type line starts at the left margin");
        TypeSyntax t;
        t.where = s.Where();
        t.kind = kind;
        t.ns = _ns;
        t.name = s.Positional("type name");
        s.Options({"version", ":"});
        if (auto base = s.Value(":")) {
            if (kind == Kind::Enum) s.Fail("an enumeration has no base");
            if (!IsIdentifier(*base, true)) s.Fail("bad base '" + *base + "'");
            t.base = *base;
        }
        t.version = s.Required("version");
        t.doc = TakeDocFor(s);
        _file.types.push_back(std::move(t));
        _method = nullptr;
        _skippingMethod = false;
    }

    TypeSyntax& CurrentType(Statement& s, const char* what) {
        if (_file.types.empty()) s.Fail(std::string("'") + what + "' outside a type");
        if (_skipping) throw Skipped{};
        return _file.types.back();
    }

    Doc TakeDocFor(const Statement&) { return std::exchange(_doc, {}); }

    void Property(Statement& s) {
        TypeSyntax& t = CurrentType(s, "property");
        if (t.kind == Kind::Enum) s.Fail("an enumeration has tags, not properties");
        PropertySyntax p;
        p.where = s.Where();
        p.name = s.Positional("property name", false);
        p.type = s.Positional("property type");
        s.Options({"flags", "version", "privilege"});
        if (!s.Value("flags")) s.Fail("a property states its flags");
        p.flags = s.Number("flags", kMaxFlags, 0);
        p.version = s.Required("version");
        p.privilege = s.Value("privilege");
        p.doc = TakeDocFor(s);
        t.properties.push_back(std::move(p));
        _method = nullptr;
        _skippingMethod = false;
    }

    void Tags(Statement& s) {
        TypeSyntax& t = CurrentType(s, "tags");
        if (t.kind != Kind::Enum) s.Fail("only an enumeration has tags");
        std::vector<std::string> tags = s.Remaining();
        if (tags.empty()) s.Fail("'tags' needs at least one tag");
        for (const std::string& tag : tags) {
            if (!IsIdentifier(tag, false)) s.Fail("bad tag '" + tag + "'");
            t.tags.push_back(tag);
        }
        if (t.tagsWhere.line == 0) t.tagsWhere = s.Where();
    }

    void Method(Statement& s) {
        TypeSyntax& t = CurrentType(s, "method");
        if (t.kind != Kind::Managed) s.Fail("only a managed type has methods");
        MethodSyntax m;
        m.where = s.Where();
        m.name = s.Positional("method name", false);
        s.Options({"wsdl", "version", "privilege"}, {"task"});
        m.wsdlName = s.Value("wsdl");
        m.version = s.Required("version");
        m.privilege = s.Value("privilege");
        m.task = s.Switch("task");
        m.doc = TakeDocFor(s);
        t.methods.push_back(std::move(m));
        _skippingMethod = false;
        _method = &t.methods.back();
    }

    MethodSyntax& CurrentMethod(Statement& s, const char* what) {
        if (_skipping || _skippingMethod) throw Skipped{};
        if (_method == nullptr) s.Fail(std::string("'") + what + "' outside a method");
        return *_method;
    }

    void Param(Statement& s) {
        MethodSyntax& m = CurrentMethod(s, "param");
        ParamSyntax p;
        p.where = s.Where();
        p.name = s.Positional("parameter name", false);
        p.type = s.Positional("parameter type");
        s.Options({"flags", "version"});
        p.flags = s.Number("flags", kMaxFlags, 0);
        p.version = s.Value("version");
        p.doc = TakeDocFor(s);
        m.params.push_back(std::move(p));
    }

    void Result(Statement& s) {
        MethodSyntax& m = CurrentMethod(s, "result");
        if (m.result) s.Fail("a method has one result");
        ResultSyntax r;
        r.where = s.Where();
        r.type = s.Positional("result type");
        s.Options({"flags", "version"});
        r.flags = s.Number("flags", kMaxFlags, 0);
        r.version = s.Required("version");
        m.result = std::move(r);
    }

    void Throws(Statement& s) {
        MethodSyntax& m = CurrentMethod(s, "throws");
        std::string fault = s.Positional("fault type");
        s.Options({});
        m.faults.emplace_back(s.Where(), fault);
    }

    FileSyntax _file;
    std::string _ns;
    MethodSyntax* _method = nullptr;
    Doc _doc;
    bool _skipping = false;        // the last type line failed: its members are dropped
    bool _skippingMethod = false;  // the last method line failed: its parameters are dropped

public:
    // A member line of a type line that failed, dropped without a word.
    struct Skipped {};
};

// "## text" -> "text"; nullopt for a line that is not a documentation line.
std::optional<std::string> DocLine(const std::string& line) {
    std::size_t start = line.find_first_not_of(" \t");
    if (start == std::string::npos || line.compare(start, 2, "##") != 0) return std::nullopt;
    std::string text = line.substr(start + 2);
    if (!text.empty() && text[0] == ' ') text.erase(0, 1);
    while (!text.empty() && (text.back() == ' ' || text.back() == '\r')) text.pop_back();
    return text;
}

}  // namespace

FileSyntax ParseFile(const std::string& path, const std::string& text) {
    Diagnostics diagnostics;
    FileSyntax file = ParseFile(path, text, diagnostics);
    diagnostics.Check();
    return file;
}

FileSyntax ParseFile(const std::string& path, const std::string& text, Diagnostics& diagnostics) {
    Parser parser(path);
    std::istringstream in(text);
    std::vector<std::string> lines;
    for (std::string line; std::getline(in, line);) lines.push_back(line);
    // Indentation of each statement line; -1 for a line without a statement.
    std::vector<int> indent(lines.size(), -1);
    for (std::size_t i = 0; i < lines.size(); ++i)
        if (!SplitWords(lines[i]).empty()) indent[i] = static_cast<int>(lines[i].find_first_not_of(" \t"));
    static const std::set<std::string> typeWords = {"data", "fault", "managed", "enum"};
    static const std::set<std::string> documented = {"data", "fault", "managed", "enum", "property", "method", "param"};
    Doc doc;
    Location docWhere;
    for (std::size_t i = 0; i < lines.size(); ++i) {
        Location where{path, static_cast<int>(i) + 1};
        if (auto line = DocLine(lines[i])) {
            if (doc.empty()) docWhere = where;
            doc.push_back(*line);
            continue;
        }
        std::vector<std::string> words = SplitWords(lines[i]);
        if (words.empty()) continue;
        Statement statement(where, std::move(words), indent[i] > 0);
        const std::string keyword = statement.Keyword();
        bool isType = typeWords.count(keyword) != 0;
        if (!doc.empty() && !documented.count(keyword)) {
            diagnostics.Add(CatalogueError(docWhere, "a '##' comment documents the type, property, method or parameter "
                                                     "on the line after it, not a '" + keyword + "' line"));
            doc.clear();
        }
        try {
            if (isType && indent[i] == 0 && i > 0 && i + 1 < lines.size())
                parser.WarnIfAmongMembers(statement, indent[i - 1], indent[i + 1]);
            parser.TakeDoc(std::exchange(doc, {}));
            parser.Line(std::move(statement));
        } catch (const CatalogueError& e) {
            diagnostics.Add(e);
            doc.clear();
            parser.Failed(keyword);
        } catch (const Parser::Skipped&) {
        }
    }
    if (!doc.empty()) diagnostics.Add(CatalogueError(docWhere, "a '##' comment at the end of the file documents nothing"));
    return parser.Finish();
}

}  // namespace tarngen
