#include "kernite/Exception.h"

#include <cxxabi.h>
#include <dlfcn.h>
#include <execinfo.h>

#include <algorithm>
#include <cstdio>
#include <cstdlib>
#include <cstring>
#include <memory>
#include <vector>

#include "kernite/Narrow.h"
#include "kernite/Optional.h"

namespace Kernite {
namespace {

std::string Demangle(const char* name) {
    int status = 0;
    std::unique_ptr<char, void (*)(void*)> out(abi::__cxa_demangle(name, nullptr, nullptr, &status), std::free);
    return status == 0 && out ? std::string(out.get()) : std::string(name);
}

// Base address of this library, so that frames of the exception machinery itself
// can be told apart from the code that raised the exception.
const void* OwnModule() {
    static const void* base = [] {
        Dl_info info{};
        return dladdr(reinterpret_cast<void*>(&OwnModule), &info) != 0 ? info.dli_fbase : nullptr;
    }();
    return base;
}

// The scopes of a demangled function name, template arguments dropped:
// "A::B<int>::C(int)" gives A, B, C.
std::vector<std::string> Scopes(const std::string& function) {
    std::vector<std::string> parts(1);
    int depth = 0;
    for (std::size_t i = 0; i < function.size(); ++i) {
        const char c = function[i];
        if (depth == 0 && c == '(') break;
        if (c == '<') {
            ++depth;
        } else if (c == '>') {
            --depth;
        } else if (depth == 0 && c == ':' && i + 1 < function.size() && function[i + 1] == ':') {
            parts.emplace_back();
            ++i;
        } else if (depth == 0) {
            parts.back() += c;
        }
    }
    return parts;
}

// Whether a frame belongs to the building of the exception itself: a constructor of
// an exception class, inherited ones included ("Kernite::Exception::Throwable(...)").
bool IsExceptionConstructor(const std::string& function) {
    const std::vector<std::string> scopes = Scopes(function);
    if (scopes.size() < 2) return false;
    const std::string& name = scopes.back();
    const std::string& owner = scopes[scopes.size() - 2];
    const bool constructor = name == owner || name == "Throwable";
    return constructor && (owner.find("Exception") != std::string::npos || owner == "Throwable");
}

std::string DescribeFrame(const void* frame) {
    char text[64];
    Dl_info info{};
    if (dladdr(frame, &info) == 0) {
        std::snprintf(text, sizeof text, "%p", frame);
        return text;
    }
    if (info.dli_sname != nullptr) return Demangle(info.dli_sname);
    const char* module = info.dli_fname ? info.dli_fname : "?";
    if (const char* slash = std::strrchr(module, '/')) module = slash + 1;
    std::snprintf(text, sizeof text, "+%#lx",
                  static_cast<unsigned long>(static_cast<const char*>(frame) -
                                             static_cast<const char*>(info.dli_fbase)));
    return module + std::string(text);
}

} // namespace

Throwable::Throwable(const std::string& message) : _message(message) {
    // One extra slot for this constructor's own frame, which is dropped.
    void* frames[kMaxFrames + 1];
    const int depth = backtrace(frames, kMaxFrames + 1);
    _depth = std::max(0, depth - 1);
    std::copy(frames + 1, frames + 1 + _depth, _frames);
    std::fill(_frames + _depth, _frames + kMaxFrames, nullptr);  // copies read every slot
}

Throwable::~Throwable() = default;

const char* Throwable::what() const noexcept { return _message.c_str(); }

const void* const* Throwable::GetBacktrace(int& depth) const {
    depth = _depth;
    return _frames;
}

std::string Throwable::Where() const {
    for (int i = 0; i < _depth; ++i) {
        Dl_info info{};
        if (dladdr(_frames[i], &info) != 0 && info.dli_fbase == OwnModule()) continue;
        std::string function = DescribeFrame(_frames[i]);
        if (!IsExceptionConstructor(function)) return function;
    }
    return _depth > 0 ? DescribeFrame(_frames[0]) : std::string("?");
}

std::string Throwable::Dump() const {
    std::string out = Demangle(typeid(*this).name()) + ": " + _message + "\n  raised in " + Where() + "\n";
    for (int i = 0; i < _depth; ++i) out += "    #" + std::to_string(i) + " " + DescribeFrame(_frames[i]) + "\n";
    return out;
}

Throwable* Throwable::Clone() const { return new Throwable(*this); }
void Throwable::Throw() const { throw *this; }

Exception* Exception::Clone() const { return new Exception(*this); }
void Exception::Throw() const { throw *this; }

TypeMismatchException* TypeMismatchException::Clone() const { return new TypeMismatchException(*this); }
void TypeMismatchException::Throw() const { throw *this; }

NotInitializedException* NotInitializedException::Clone() const { return new NotInitializedException(*this); }
void NotInitializedException::Throw() const { throw *this; }

InvalidArgumentException* InvalidArgumentException::Clone() const { return new InvalidArgumentException(*this); }
void InvalidArgumentException::Throw() const { throw *this; }

std::string MessageFormatter::Substitute(const std::string& pattern, const std::string* args, std::size_t n) {
    std::string out;
    out.reserve(pattern.size());
    for (std::size_t i = 0; i < pattern.size(); ++i) {
        const char c = pattern[i];
        if (c == '%' && i + 1 < pattern.size()) {
            const char next = pattern[i + 1];
            if (next == '%') {
                out += '%';
                ++i;
                continue;
            }
            if (next >= '1' && next <= '9' && static_cast<std::size_t>(next - '1') < n) {
                out += args[next - '1'];
                ++i;
                continue;
            }
        }
        out += c;
    }
    return out;
}

void ThrowTypeMismatch(const char* expected, const char* found) {
    throw TypeMismatchException(std::string("Type Mismatch: expected: ") + (expected ? expected : "") +
                                ", found: " + (found ? found : ""));
}

void ThrowNotInitialized(const char* message) { throw NotInitializedException(message ? message : ""); }

} // namespace Kernite
