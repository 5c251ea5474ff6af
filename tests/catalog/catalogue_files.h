// What the catalogue files say, read independently of the generator: the expected
// side of the registration tests.
#pragma once

#include <fstream>
#include <sstream>
#include <string>
#include <vector>

namespace CatalogTest {

inline std::vector<std::string> Words(const std::string& line) {
    std::istringstream in(line.substr(0, line.find('#')));
    std::vector<std::string> words;
    for (std::string w; in >> w;) words.push_back(w);
    return words;
}

inline std::vector<std::vector<std::string>> Statements(const std::string& file) {
    std::ifstream in(std::string(TARN_IDL_DIR) + "/" + file);
    std::vector<std::vector<std::string>> out;
    for (std::string line; std::getline(in, line);)
        if (auto words = Words(line); !words.empty()) out.push_back(std::move(words));
    return out;
}

// The namespaces in the order library.idl gives their loaders.
inline std::vector<std::string> LoaderOrder() {
    for (auto& s : Statements("library.idl"))
        if (s[0] == "loaders") return {s.begin() + 1, s.end()};
    return {};
}

// The wire names of a namespace's types in the order its loader must register them:
// managed types, then data objects and faults, then enumerations, each group in the
// order the namespace's file declares them.
inline std::vector<std::string> DeclaredRegistrationOrder(const std::string& ns) {
    std::vector<std::string> groups[3];
    for (auto& s : Statements(ns + ".idl")) {
        if (s.size() < 2) continue;
        int group = s[0] == "managed" ? 0 : (s[0] == "data" || s[0] == "fault") ? 1 : s[0] == "enum" ? 2 : -1;
        if (group >= 0) groups[group].push_back(ns + "." + s[1]);
    }
    std::vector<std::string> out;
    for (auto& g : groups) out.insert(out.end(), g.begin(), g.end());
    return out;
}

// The namespace of a wire name: the longest loader namespace it lies in.
inline std::string NamespaceOf(const std::string& wireName, const std::vector<std::string>& namespaces) {
    std::string best;
    for (const std::string& ns : namespaces)
        if (wireName.starts_with(ns + ".") && ns.size() > best.size()) best = ns;
    return best;
}

}  // namespace CatalogTest
