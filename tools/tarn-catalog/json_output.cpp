#include "json_output.h"

#include <cstdio>
#include <vector>

#include "orbit/Records.h"

namespace tarncatalog {
namespace {

// Writes JSON as it goes: commas, escapes and indentation. A container opened
// flat keeps itself and everything in it on one line.
class JsonWriter {
public:
    explicit JsonWriter(std::ostream& out) : _out(out) {}

    void BeginObject(bool flat = false) { Open('{', flat); }
    void EndObject() { Close('}'); }
    void BeginArray(bool flat = false) { Open('[', flat); }
    void EndArray() { Close(']'); }

    void Key(const std::string& key) {
        Separate();
        Quoted(key);
        _out << ": ";
        _afterKey = true;
    }
    void String(const std::string& s) {
        Value();
        Quoted(s);
    }
    void String(const std::optional<std::string>& s) {
        if (s) String(*s);
        else Null();
    }
    void Number(long long n) {
        Value();
        _out << n;
    }
    void Null() {
        Value();
        _out << "null";
    }
    void Strings(const std::vector<std::string>& items, bool flat = true) {
        BeginArray(flat);
        for (const std::string& s : items) String(s);
        EndArray();
    }
    void Finish() { _out << "\n"; }

private:
    struct Level {
        bool flat;
        int count;
    };

    bool Flat() const { return !_levels.empty() && _levels.back().flat; }

    void Newline(std::size_t depth) {
        _out << "\n";
        for (std::size_t i = 0; i < depth; ++i) _out << "  ";
    }

    // Before a key or a value in a container: the comma and the line break.
    void Separate() {
        if (_levels.empty()) return;
        Level& level = _levels.back();
        if (level.count++ > 0) _out << (level.flat ? ", " : ",");
        if (!level.flat) Newline(_levels.size());
    }

    void Value() {
        if (_afterKey) {
            _afterKey = false;
            return;
        }
        Separate();
    }

    void Open(char bracket, bool flat) {
        Value();
        _out << bracket;
        _levels.push_back({flat || Flat(), 0});
    }

    void Close(char bracket) {
        Level level = _levels.back();
        _levels.pop_back();
        if (!level.flat && level.count > 0) Newline(_levels.size());
        _out << bracket;
    }

    void Quoted(const std::string& s) {
        _out << '"';
        for (unsigned char ch : s) {
            switch (ch) {
            case '"': _out << "\\\""; break;
            case '\\': _out << "\\\\"; break;
            case '\n': _out << "\\n"; break;
            case '\r': _out << "\\r"; break;
            case '\t': _out << "\\t"; break;
            case '\b': _out << "\\b"; break;
            case '\f': _out << "\\f"; break;
            default:
                if (ch < 0x20) {
                    char buffer[8];
                    std::snprintf(buffer, sizeof buffer, "\\u%04x", ch);
                    _out << buffer;
                } else {
                    _out << static_cast<char>(ch);  // UTF-8 passes through
                }
            }
        }
        _out << '"';
    }

    std::ostream& _out;
    std::vector<Level> _levels;
    bool _afterKey = false;
};

void Member(JsonWriter& w, const MemberEntry& m, bool withName, bool withPrivilege) {
    w.BeginObject(true);
    if (withName) {
        w.Key("name");
        w.String(m.name);
    }
    if (withPrivilege) {
        w.Key("privilege");
        w.String(m.privilege);
    }
    w.Key("type");
    w.String(m.type);
    w.Key("flags");
    w.Number(m.flags);
    w.Key("version");
    w.String(m.version);
    w.EndObject();
}

void Method(JsonWriter& w, const MethodEntry& m) {
    w.BeginObject();
    w.Key("name");
    w.String(m.name);
    w.Key("wsdlName");
    w.String(m.wsdlName);
    w.Key("privilege");
    w.String(m.privilege);
    w.Key("version");
    w.String(m.version);
    w.Key("task");
    w.Number(m.task ? 1 : 0);
    w.Key("result");
    Member(w, m.result, false, false);
    w.Key("params");
    w.BeginArray();
    for (const MemberEntry& p : m.params) Member(w, p, true, false);
    w.EndArray();
    w.Key("faults");
    w.Strings(m.faults);
    w.EndObject();
}

void Type(JsonWriter& w, const TypeEntry& t) {
    w.BeginObject();
    w.Key("name");
    w.String(t.name);
    w.Key("flatName");
    w.String(t.flatName);
    w.Key("kind");
    w.Number(t.kind);
    w.Key("version");
    w.String(t.version);
    w.Key("namespace");
    w.String(t.ns);
    w.Key("base");
    w.String(t.base);
    w.Key("properties");
    w.BeginArray();
    for (const MemberEntry& p : t.properties) Member(w, p, true, true);
    w.EndArray();
    if (t.kind == Orbit::Kind::Managed) {
        w.Key("methods");
        w.BeginArray();
        for (const MethodEntry& m : t.methods) Method(w, m);
        w.EndArray();
    }
    if (t.kind == Orbit::Kind::Enum) {
        w.Key("tags");
        w.Strings(t.tags);
    }
    w.EndObject();
}

void WriteCalls(JsonWriter& w, const Calls& calls);
void WriteRest(JsonWriter& w, const Catalog& c);

}  // namespace

void WriteJson(const Catalog& c, bool counters, std::ostream& out) {
    JsonWriter w(out);
    w.BeginObject();
    w.Key("loaders");
    w.Strings(c.loaders);
    if (counters) WriteCalls(w, c.calls);
    WriteRest(w, c);
    w.EndObject();
    w.Finish();
}

namespace {

void WriteCalls(JsonWriter& w, const Calls& calls) {
    w.Key("calls");
    w.BeginObject(true);
    w.Key("addVersion");
    w.Number(calls.addVersion);
    w.Key("addIncludedVersion");
    w.Number(calls.addIncludedVersion);
    w.Key("addType");
    w.Number(calls.addType);
    w.EndObject();
}

void WriteRest(JsonWriter& w, const Catalog& c) {
    w.Key("versions");
    w.BeginArray();
    for (const VersionEntry& v : c.versions) {
        w.BeginObject(true);
        w.Key("name");
        w.String(v.name);
        w.Key("serviceNamespace");
        w.String(v.serviceNamespace);
        w.Key("versionId");
        w.String(v.versionId);
        w.Key("flag");
        w.Number(v.flag);
        w.Key("includes");
        w.Strings(v.includes);
        w.EndObject();
    }
    w.EndArray();

    w.Key("types");
    w.BeginArray();
    for (const TypeEntry& t : c.types) Type(w, t);
    w.EndArray();
}

}  // namespace

}  // namespace tarncatalog
