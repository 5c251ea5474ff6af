// Boxed values: one immutable value of a primitive or enumeration type.
#pragma once

#include <string>
#include <type_traits>

#include "kernite/Assert.h"
#include "kernite/Narrow.h"
#include "kernite/System.h"
#include "orbit/Any.h"
#include "orbit/Type.h"

namespace Orbit {

template <class T>
class Primitive : public Any {
public:
    explicit Primitive(const T& value) : _value(value) {}

    const T& GetValue() const noexcept { return _value; }

    Type* _GetType() const override { return GetType<T>(); }
    unsigned int _GetSize(SizeFunction f) const override {
        unsigned int extra = 0;
        if constexpr (std::is_same_v<T, std::string> || std::is_same_v<T, MethodName>)
            extra = GetPrimitiveExtraSize(_value);
        return f(sizeof(Primitive)) + f(extra);
    }
    // Boxes never change, so they are shared rather than copied.
    Any* _Clone() const override { return const_cast<Primitive*>(this); }
    bool _IsEqual(Any* other, bool = true) const override {
        if (other == nullptr) Kernite::PanicAssert("obj", "orbit/Primitive", __LINE__);
        return Kernite::NarrowToType<Primitive, Any>(other)->_value == _value;
    }
    void _DiffProperties(Any* other, const std::string& path, PropertyDiffSet& diffs) const override {
        if (other == nullptr) Kernite::PanicAssert("obj", "orbit/Primitive", __LINE__);
        if (!(Kernite::NarrowToType<Primitive, Any>(other)->_value == _value)) diffs.Add(path);
    }

private:
    const T _value;
};

}  // namespace Orbit
