// Small helpers shared by generated stubs and dispatch functions, so that the
// generated code stays one line per argument.
#pragma once

#include <cstddef>
#include <string>
#include <typeinfo>

#include "kernite/Assert.h"
#include "kernite/Exception.h"
#include "kernite/Narrow.h"
#include "kernite/Ref.h"
#include "orbit/Any.h"
#include "orbit/Primitive.h"

namespace Orbit {

[[noreturn]] void ThrowArgumentCount(std::size_t expected, std::size_t found);
[[noreturn]] void ThrowNullArgument(std::size_t index);
[[noreturn]] void ThrowMissingResult(const char* expected);

// Server side: the argument vector must have exactly `expected` entries.
inline void CheckArgumentCount(const Kernite::RefVector<Any>& args, std::size_t expected) {
    if (args.size() != expected) ThrowArgumentCount(expected, args.size());
}

// Server side: the value of a by-value argument; a missing box is refused rather
// than dereferenced, a box of another type is a type mismatch.
template <class T>
const T& UnboxArgument(const Kernite::RefVector<Any>& args, std::size_t index) {
    auto* box = Kernite::NarrowToType<Primitive<T>, Any>(args[index].Get());
    if (box == nullptr) ThrowNullArgument(index);
    return box->GetValue();
}

// Server side: an object argument narrowed to its class; null stays null.
template <class T>
T* NarrowArgument(const Kernite::RefVector<Any>& args, std::size_t index) {
    return Kernite::NarrowToType<T, Any>(args[index].Get());
}

// Client side: a by-value result. A call that answered nothing is a type mismatch
// naming what was expected and "null" as what was found.
template <class T>
T UnboxResult(const Kernite::Ref<Any>& result) {
    if (!result) ThrowMissingResult(typeid(const Primitive<T>*).name());
    return Kernite::NarrowToType<Primitive<T>, Any>(result.Get())->GetValue();
}

// Client side: a result delivered through a reference parameter; `out` changes
// only when the narrowing succeeds.
template <class T>
void NarrowResult(const Kernite::Ref<Any>& result, Kernite::Ref<T>& out) {
    out = Kernite::NarrowToType<T, Any>(result.Get());
}

// Client side: a method without a result must not receive one.
inline void CheckNoResult(const Kernite::Ref<Any>& result, const char* path, int line) {
    if (result) Kernite::PanicAssert("_resultObj == __null", path, line);
}

// Record functions: the caller's storage for a by-value property; null is refused.
template <class T>
const T& ReadValue(const void* value) {
    if (value == nullptr) throw Kernite::InvalidArgumentException(std::string("null"));
    return *static_cast<const T*>(value);
}

// Record functions: the caller's storage that receives a property; null is refused
// rather than written through.
template <class T>
T& WriteValue(void* value) {
    if (value == nullptr) throw Kernite::InvalidArgumentException(std::string("null"));
    return *static_cast<T*>(value);
}

// Record functions and dispatch: the object acted on, narrowed to its class. There
// is nothing to act on in null, so it is refused like a missing value.
template <class T, class U>
T* NarrowTarget(U* object) {
    T* self = Kernite::NarrowToType<T, U>(object);
    if (self == nullptr) throw Kernite::InvalidArgumentException(std::string("null"));
    return self;
}

// Record functions: an enumeration's value, which must name one of its `count` tags.
inline int ReadEnum(const void* value, int count) {
    int v = ReadValue<int>(value);
    if (v < 0 || v >= count) throw Kernite::InvalidArgumentException(v);
    return v;
}

// Record functions: a property held by reference receives the object itself.
inline Any* ReadObject(const void* value) { return static_cast<Any*>(const_cast<void*>(value)); }

// Deep copies of members: a clone of what `source` holds, or null.
template <class T>
Kernite::Ref<T> CloneOf(const Kernite::Ref<T>& source) {
    if (!source) return nullptr;
    T* clone = static_cast<T*>(source->_Clone());
    clone->IncRefNew();
    return Kernite::Ref<T>::Adopt(clone);
}

}  // namespace Orbit
