#include "names.h"

#include <set>
#include <sstream>

namespace tarngen::names {

std::string Capitalise(const std::string& word) {
    std::string out = word;
    if (!out.empty() && out[0] >= 'a' && out[0] <= 'z') out[0] = static_cast<char>(out[0] - 'a' + 'A');
    return out;
}

std::string Upper(const std::string& word) {
    std::string out;
    for (char c : word) {
        if (c >= 'a' && c <= 'z') out += static_cast<char>(c - 'a' + 'A');
        else if ((c >= 'A' && c <= 'Z') || (c >= '0' && c <= '9') || c == '_') out += c;
        else out += '_';
    }
    return out;
}

std::vector<std::string> Segments(const std::string& dotted) {
    std::vector<std::string> out;
    std::istringstream in(dotted);
    for (std::string segment; std::getline(in, segment, '.');) out.push_back(segment);
    return out;
}

std::string Flat(const std::string& wireName) {
    std::string out;
    for (const std::string& segment : Segments(wireName)) out += Capitalise(segment);
    return out;
}

std::string ClassPath(const std::string& wireName) {
    std::string out;
    for (const std::string& segment : Segments(wireName)) out += (out.empty() ? "" : "::") + Capitalise(segment);
    return out;
}

namespace {

// prefix + middle + suffix, appended in order: GCC 12 at -O3 warns (-Wrestrict, a
// false alarm) on a literal put in front of a temporary string with operator+.
std::string Around(const char* prefix, const std::string& middle, const char* suffix) {
    std::string out = prefix;
    out += middle;
    out += suffix;
    return out;
}

}  // namespace

std::string Record(const std::string& wireName) { return Around("g", Flat(wireName), "TypeInfo"); }

std::string RuntimeRecord(const std::string& symbol) { return Around("Orbit::g", symbol, "TypeInfo"); }

std::string MethodObjects(const std::string& wireName) { return Around("g", Flat(wireName), "MethodObjects"); }

std::string Loader(const std::string& unitName) { return Flat(unitName) + "TypeinfoTypeInfoLoader"; }

std::string MethodConstant(const std::string& methodName) { return "METHOD_" + Upper(methodName); }

std::string TagConstant(const std::string& enumName, const std::string& tag) {
    return Upper(enumName) + "_" + Upper(tag);
}

std::string Accessor(const char* prefix, const std::string& property) { return prefix + Capitalise(property); }

std::string Member(const std::string& property) { return property + "_"; }

std::string Identifier(const std::string& name) {
    static const std::set<std::string> keywords = {
        "alignas", "alignof", "and", "and_eq", "asm", "auto", "bitand", "bitor", "bool", "break", "case",
        "catch", "char", "char8_t", "char16_t", "char32_t", "class", "compl", "concept", "const", "consteval",
        "constexpr", "constinit", "const_cast", "continue", "co_await", "co_return", "co_yield", "decltype",
        "default", "delete", "do", "double", "dynamic_cast", "else", "enum", "explicit", "export", "extern",
        "false", "float", "for", "friend", "goto", "if", "inline", "int", "long", "mutable", "namespace", "new",
        "noexcept", "not", "not_eq", "nullptr", "operator", "or", "or_eq", "private", "protected", "public",
        "register", "reinterpret_cast", "requires", "return", "short", "signed", "sizeof", "static",
        "static_assert", "static_cast", "struct", "switch", "template", "this", "thread_local", "throw", "true",
        "try", "typedef", "typeid", "typename", "union", "unsigned", "using", "virtual", "void", "volatile",
        "wchar_t", "while", "xor", "xor_eq"};
    return keywords.count(name) ? name + "_" : name;
}

std::string SourceDir(const std::string& unitName) {
    std::string out = unitName;
    for (char& c : out)
        if (c == '.') c = '/';
    return out;
}

std::string Header(const std::string& unitName) {
    std::string dir = SourceDir(unitName);
    return unitName.find('.') == std::string::npos ? dir + "/" + unitName + ".h" : dir + ".h";
}

std::string DetailHeader(const std::string& header) {
    std::size_t slash = header.rfind('/');
    return header.substr(0, slash + 1) + "detail/" + header.substr(slash + 1);
}

}  // namespace tarngen::names
