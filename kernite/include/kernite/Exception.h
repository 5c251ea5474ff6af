// Exceptions of the core library. Every class has Clone() (a heap copy of the
// most derived class) and Throw() (throws a copy as the most derived class), so an
// exception can be stored, handed across threads and rethrown without slicing.
#pragma once

#include <exception>
#include <string>
#include <type_traits>

namespace Kernite {

class Throwable : public std::exception {
public:
    explicit Throwable(const std::string& message);
    Throwable(const Throwable&) = default;
    Throwable& operator=(const Throwable&) = default;
    ~Throwable() override;

    const char* what() const noexcept override;
    // The stack at construction, as return addresses, innermost first.
    virtual const void* const* GetBacktrace(int& depth) const;
    // Message, location and backtrace as text.
    virtual std::string Dump() const;
    // The place the exception was raised, as "function" text of its innermost frame.
    virtual std::string Where() const;

    virtual Throwable* Clone() const;
    [[noreturn]] virtual void Throw() const;

private:
    static constexpr int kMaxFrames = 24;
    std::string _message;
    void* _frames[kMaxFrames];
    int _depth = 0;
};

class Exception : public Throwable {
public:
    using Throwable::Throwable;
    Exception* Clone() const override;
    [[noreturn]] void Throw() const override;
};

class TypeMismatchException : public Exception {
public:
    using Exception::Exception;
    TypeMismatchException* Clone() const override;
    [[noreturn]] void Throw() const override;
};

class NotInitializedException : public Exception {
public:
    using Exception::Exception;
    NotInitializedException* Clone() const override;
    [[noreturn]] void Throw() const override;
};

// "%1", "%2", ... in a pattern stand for the arguments, in order.
class MessageFormatter {
public:
    template <class... Args>
    static std::string ASPrint(const std::string& pattern, const Args&... args) {
        const std::string texts[] = {"", ToText(args)...};
        return Substitute(pattern, texts + 1, sizeof...(Args));
    }

private:
    static std::string ToText(const std::string& s) { return s; }
    static std::string ToText(const char* s) { return s ? s : ""; }
    template <class T, class = std::enable_if_t<std::is_arithmetic_v<T>>>
    static std::string ToText(T v) { return std::to_string(v); }
    static std::string Substitute(const std::string& pattern, const std::string* args, std::size_t n);
};

// "Invalid argument : " followed by the offending value.
class InvalidArgumentException : public Exception {
public:
    template <class T>
    explicit InvalidArgumentException(const T& value)
        : Exception("Invalid argument : " + MessageFormatter::ASPrint("%1", value)) {}
    InvalidArgumentException* Clone() const override;
    [[noreturn]] void Throw() const override;
};

} // namespace Kernite
