// Checked downcasts.
#pragma once

#include <string>
#include <type_traits>
#include <typeinfo>

#include "kernite/Exception.h"

namespace Kernite {

[[noreturn]] void ThrowTypeMismatch(const char* expected, const char* found);

// Null yields null; an object that is not a T throws TypeMismatchException naming
// the static types. Success allocates nothing.
template <class T, class U>
T* NarrowToType(U* p) {
    if (p == nullptr) return nullptr;
    if constexpr (!std::is_abstract_v<T> && requires { static_cast<T*>(p); }) {
        // Most objects are narrowed to exactly their own class, which needs no walk
        // of the class hierarchy.
        if (typeid(*p) == typeid(T)) return static_cast<T*>(p);
    }
    if (T* t = dynamic_cast<T*>(p)) return t;
    ThrowTypeMismatch(typeid(const T*).name(), typeid(const U*).name());
}

template <class T, class U>
const T* NarrowToType(const U* p) {
    return NarrowToType<T, U>(const_cast<U*>(p));
}

} // namespace Kernite
