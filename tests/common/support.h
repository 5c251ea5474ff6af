// Helpers shared by the test suites (and expect.h's MessageOf).
#pragma once

#include <gtest/gtest.h>

#include <string>
#include <typeinfo>

#include "expect.h"
#include "orbit/Orbit.h"

namespace TestSupport {

// The text NarrowToType<T, U> puts into its TypeMismatchException.
template <class T, class U>
std::string MismatchText() {
    return std::string("Type Mismatch: expected: ") + typeid(const T*).name() + ", found: " + typeid(const U*).name();
}

// Size functions: the exact request, and an allocator that adds an 8-byte header
// and rounds to 16, so that f(a) + f(b) != f(a + b) and f(0) != 0.
inline unsigned int Exact(unsigned int n) { return n; }
inline unsigned int Rounded(unsigned int n) { return (n + 8 + 15) / 16 * 16; }

// A fresh object held by a Ref (the Ref takes the first reference).
template <class T, class... Args>
Kernite::Ref<T> Make(Args&&... args) {
    return Kernite::Ref<T>(new T(std::forward<Args>(args)...));
}

// Every test of a fixture derived from this one must release all it made. Types
// and their array types live as long as the process, so all are made first.
class NoLeakTest : public ::testing::Test {
protected:
    void SetUp() override {
        for (Orbit::Type* type : Orbit::GetTypeMap()->GetTypes()) type->GetArrayType();
        for (Orbit::Type* type :
             {Orbit::GetType<std::string>(), Orbit::GetType<bool>(), Orbit::GetType<int>(), Orbit::GetType<long long>(),
              Orbit::GetType<double>(), Orbit::GetType<Kernite::System::DateTime>(),
              Orbit::GetType<Orbit::MethodName>(), Orbit::GetType<Orbit::Any>(), Orbit::GetType<Orbit::MoRef>(),
              Orbit::GetType<Orbit::DynamicData>(), Orbit::GetType<Orbit::MethodFault>(),
              Orbit::GetType<Orbit::KeyAnyValue>(), Orbit::GetType<Orbit::ManagedObject>()})
            type->GetArrayType();
        _live = Kernite::ObjectImpl::LiveObjects();
    }
    void TearDown() override { EXPECT_EQ(Kernite::ObjectImpl::LiveObjects(), _live) << "objects leaked"; }

private:
    long _live = 0;
};

}  // namespace TestSupport
