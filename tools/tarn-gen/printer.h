// Text output from templates with named variables: "$name$" is replaced by the
// variable's value; a name without a value is a generator bug and fails loudly.
#pragma once

#include <map>
#include <stdexcept>
#include <string>
#include <string_view>

namespace tarngen {

class Printer {
public:
    using Vars = std::map<std::string, std::string>;

    void Print(std::string_view text, const Vars& vars = {}) {
        std::size_t pos = 0;
        while (pos < text.size()) {
            std::size_t open = text.find('$', pos);
            if (open == std::string_view::npos) {
                _out.append(text.substr(pos));
                break;
            }
            std::size_t close = text.find('$', open + 1);
            if (close == std::string_view::npos) throw std::logic_error("unclosed '$' in template: " + std::string(text));
            _out.append(text.substr(pos, open - pos));
            std::string name(text.substr(open + 1, close - open - 1));
            auto it = vars.find(name);
            if (it == vars.end()) throw std::logic_error("template variable '" + name + "' has no value");
            _out.append(it->second);
            pos = close + 1;
        }
    }

    void Raw(std::string_view text) { _out.append(text); }

    const std::string& Text() const { return _out; }

private:
    std::string _out;
};

}  // namespace tarngen
