// A small JSON reader for checking tarn-catalog's output: objects keep their keys
// in document order, numbers are read as long long (the tool writes integers only).
#pragma once

#include <cctype>
#include <stdexcept>
#include <string>
#include <utility>
#include <vector>

namespace CatalogTest {

struct Json {
    enum class Kind { Null, Bool, Number, String, Array, Object } kind = Kind::Null;
    bool boolean = false;
    long long number = 0;
    std::string text;
    std::vector<Json> items;
    std::vector<std::pair<std::string, Json>> members;

    bool IsNull() const { return kind == Kind::Null; }
    // The member `key`; throws when this is not an object that has it.
    const Json& operator[](const std::string& key) const {
        for (const auto& m : members)
            if (m.first == key) return m.second;
        throw std::runtime_error("no member \"" + key + "\"");
    }
    bool Has(const std::string& key) const {
        for (const auto& m : members)
            if (m.first == key) return true;
        return false;
    }
    std::vector<std::string> Keys() const {
        std::vector<std::string> keys;
        for (const auto& m : members) keys.push_back(m.first);
        return keys;
    }
    std::vector<std::string> Strings() const {
        std::vector<std::string> out;
        for (const Json& item : items) out.push_back(item.text);
        return out;
    }
};

class JsonReader {
public:
    explicit JsonReader(const std::string& text) : _s(text) {}

    Json Document() {
        Json value = Value();
        Space();
        if (_i != _s.size()) Fail("text after the document");
        return value;
    }

private:
    [[noreturn]] void Fail(const std::string& what) {
        throw std::runtime_error("JSON: " + what + " at offset " + std::to_string(_i));
    }
    void Space() {
        while (_i < _s.size() && std::isspace(static_cast<unsigned char>(_s[_i]))) ++_i;
    }
    bool Take(char c) {
        Space();
        if (_i < _s.size() && _s[_i] == c) {
            ++_i;
            return true;
        }
        return false;
    }
    void Expect(char c) {
        if (!Take(c)) Fail(std::string("expected '") + c + "'");
    }
    bool Word(const char* w) {
        std::string word(w);
        if (_s.compare(_i, word.size(), word) != 0) return false;
        _i += word.size();
        return true;
    }

    Json Value() {
        Space();
        if (_i >= _s.size()) Fail("unexpected end");
        Json v;
        char c = _s[_i];
        if (c == '{') {
            v.kind = Json::Kind::Object;
            ++_i;
            if (Take('}')) return v;
            do {
                Space();
                std::string key = String();
                Expect(':');
                v.members.emplace_back(std::move(key), Value());
            } while (Take(','));
            Expect('}');
        } else if (c == '[') {
            v.kind = Json::Kind::Array;
            ++_i;
            if (Take(']')) return v;
            do v.items.push_back(Value());
            while (Take(','));
            Expect(']');
        } else if (c == '"') {
            v.kind = Json::Kind::String;
            v.text = String();
        } else if (c == '-' || std::isdigit(static_cast<unsigned char>(c))) {
            v.kind = Json::Kind::Number;
            std::size_t used = 0;
            v.number = std::stoll(_s.substr(_i, 24), &used);
            _i += used;
        } else if (Word("true")) {
            v.kind = Json::Kind::Bool;
            v.boolean = true;
        } else if (Word("false")) {
            v.kind = Json::Kind::Bool;
        } else if (Word("null")) {
            v.kind = Json::Kind::Null;
        } else {
            Fail("unexpected character");
        }
        return v;
    }

    std::string String() {
        if (_i >= _s.size() || _s[_i] != '"') Fail("expected a string");
        ++_i;
        std::string out;
        while (_i < _s.size() && _s[_i] != '"') {
            char c = _s[_i++];
            if (static_cast<unsigned char>(c) < 0x20) Fail("raw control character in a string");
            if (c != '\\') {
                out += c;
                continue;
            }
            if (_i >= _s.size()) Fail("unfinished escape");
            char e = _s[_i++];
            switch (e) {
            case '"': case '\\': case '/': out += e; break;
            case 'n': out += '\n'; break;
            case 't': out += '\t'; break;
            case 'r': out += '\r'; break;
            case 'b': out += '\b'; break;
            case 'f': out += '\f'; break;
            case 'u': {
                if (_i + 4 > _s.size()) Fail("short \\u escape");
                unsigned code = std::stoul(_s.substr(_i, 4), nullptr, 16);
                _i += 4;
                if (code >= 0x80) Fail("non-ASCII \\u escape");  // the tool escapes control characters only
                out += static_cast<char>(code);
                break;
            }
            default: Fail("unknown escape");
            }
        }
        if (_i >= _s.size()) Fail("unfinished string");
        ++_i;
        return out;
    }

    const std::string& _s;
    std::size_t _i = 0;
};

}  // namespace CatalogTest
