// Helpers shared by the tests of the generated bindings.
#pragma once

#include <gtest/gtest.h>

#include <string>
#include <typeinfo>

#include "expect.h"
#include "orbit/Orbit.h"

namespace TypesTest {

using TestSupport::MessageOf;

// The text NarrowToType<T, U> puts into its TypeMismatchException.
template <class T, class U>
std::string MismatchText() {
    return std::string("Type Mismatch: expected: ") + typeid(const T*).name() + ", found: " + typeid(const U*).name();
}

// Every test of a fixture derived from this one must release all it made. The
// runtime makes its own types on first use and keeps them; they are made first.
class NoLeakTest : public ::testing::Test {
protected:
    void SetUp() override {
        for (Orbit::Type* runtimeType :
             {Orbit::GetType<Orbit::DynamicData>(), Orbit::GetType<Orbit::MethodFault>(),
              Orbit::GetType<Orbit::KeyAnyValue>(), Orbit::GetType<Orbit::ManagedObject>(),
              Orbit::GetType<Orbit::MoRef>(), Orbit::GetType<Orbit::Any>()})
            ASSERT_NE(runtimeType, nullptr);
        _live = Kernite::ObjectImpl::LiveObjects();
    }
    void TearDown() override { EXPECT_EQ(Kernite::ObjectImpl::LiveObjects(), _live) << "objects leaked"; }

private:
    long _live = 0;
};

// Size functions: the exact request, and an allocator that adds an 8-byte header
// and rounds to 16, so that f(a) + f(b) != f(a + b) and f(0) != 0.
inline unsigned int Exact(unsigned int n) { return n; }
inline unsigned int Rounded(unsigned int n) { return (n + 8 + 15) / 16 * 16; }

// The registration record of a data object class.
template <class T>
const Orbit::DataTypeInfo* RecordOf() {
    return Orbit::GetDoType<T>()->GetDataTypeInfo();
}

inline Kernite::Ref<Orbit::MoRef> Mo(const std::string& type, const std::string& id) {
    return Kernite::Ref<Orbit::MoRef>(new Orbit::MoRef(type, id));
}

// A fresh object held by a Ref (the Ref takes the first reference).
template <class T, class... Args>
Kernite::Ref<T> Make(Args&&... args) {
    return Kernite::Ref<T>(new T(std::forward<Args>(args)...));
}

}  // namespace TypesTest
