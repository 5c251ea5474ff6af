// Assertion helpers shared by the test suites.
#pragma once

#include <gtest/gtest.h>

#include <string>
#include <typeinfo>

namespace TestSupport {

// The message of the exception of class E (exactly E) that `f` throws; a failure
// when it throws nothing or something else.
template <class E, class F>
std::string MessageOf(F&& f) {
    try {
        f();
    } catch (const E& e) {
        EXPECT_EQ(typeid(e), typeid(E)) << "thrown as " << typeid(e).name();
        return e.what();
    } catch (const std::exception& e) {
        ADD_FAILURE() << "unexpected exception " << typeid(e).name() << ": " << e.what();
        return {};
    }
    ADD_FAILURE() << "nothing was thrown";
    return {};
}

}  // namespace TestSupport
