// A value that may be absent.
#pragma once

#include <memory>
#include <string>
#include <utility>

#include "kernite/Exception.h"

namespace Kernite {

[[noreturn]] void ThrowNotInitialized(const char* message);

// Scalars: a set flag and the value. An unset value reads as an error; the stored
// value of an unset optional is the type's default.
template <class T>
class Optional {
public:
    Optional() = default;
    Optional(const T& value) : _value(value), _set(true) {}

    bool IsSet() const noexcept { return _set; }
    const T& GetValue() const {
        if (!_set) ThrowNotInitialized("optional value not set");
        return _value;
    }
    void SetValue(const T& value) { _value = value; _set = true; }
    void Reset() noexcept { _value = T(); _set = false; }

    Optional& operator=(const T& value) { SetValue(value); return *this; }

    friend bool operator==(const Optional& a, const Optional& b) {
        return a._set == b._set && (!a._set || a._value == b._value);
    }

private:
    T _value{};
    bool _set = false;
};

// Strings live in their own heap allocation, absent while unset, so an unset
// optional string costs one pointer.
template <>
class Optional<std::string> {
public:
    Optional() noexcept = default;
    Optional(const std::string& value) : _value(std::make_unique<std::string>(value)) {}
    Optional(const char* value) : Optional(std::string(value)) {}
    Optional(const Optional& other)
        : _value(other._value ? std::make_unique<std::string>(*other._value) : nullptr) {}
    Optional(Optional&&) noexcept = default;
    Optional& operator=(const Optional& other) {
        if (this != &other) {
            _value = other._value ? std::make_unique<std::string>(*other._value) : nullptr;
        }
        return *this;
    }
    Optional& operator=(Optional&&) noexcept = default;
    Optional& operator=(const std::string& value) { SetValue(value); return *this; }

    bool IsSet() const noexcept { return _value != nullptr; }
    const std::string& GetValue() const {
        if (!_value) ThrowNotInitialized("Not initialized");
        return *_value;
    }
    void SetValue(const std::string& value) {
        if (_value) *_value = value;
        else _value = std::make_unique<std::string>(value);
    }
    void Reset() noexcept { _value.reset(); }

    friend bool operator==(const Optional& a, const Optional& b) {
        if (!a._value || !b._value) return !a._value && !b._value;
        return *a._value == *b._value;
    }

private:
    std::unique_ptr<std::string> _value;
};

} // namespace Kernite
