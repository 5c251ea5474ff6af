#include <gtest/gtest.h>

#include <memory>

#include "support.h"
#include "kernite/Kernite.h"

using TestSupport::MessageOf;

namespace {

template <class T>
class ExceptionClassTest : public ::testing::Test {};

using ExceptionClasses = ::testing::Types<Kernite::Throwable, Kernite::Exception, Kernite::TypeMismatchException,
                                          Kernite::NotInitializedException, Kernite::InvalidArgumentException>;
TYPED_TEST_SUITE(ExceptionClassTest, ExceptionClasses);

TYPED_TEST(ExceptionClassTest, CloneAndThrowKeepTheMostDerivedClass) {
    const TypeParam original(std::string("boom"));
    const Kernite::Throwable& base = original;

    std::unique_ptr<Kernite::Throwable> copy(base.Clone());
    EXPECT_EQ(typeid(*copy), typeid(TypeParam));
    EXPECT_STREQ(copy->what(), original.what());
    int originalDepth = 0;
    int copyDepth = 0;
    const void* const* originalFrames = original.GetBacktrace(originalDepth);
    const void* const* copyFrames = copy->GetBacktrace(copyDepth);
    ASSERT_EQ(copyDepth, originalDepth);
    for (int i = 0; i < copyDepth; ++i) EXPECT_EQ(copyFrames[i], originalFrames[i]);

    EXPECT_EQ(MessageOf<TypeParam>([&] { base.Throw(); }), original.what());
    EXPECT_EQ(MessageOf<TypeParam>([&] { copy->Throw(); }), original.what());
}

TEST(ExceptionTest, MessagesOfTheCoreClasses) {
    EXPECT_EQ(MessageOf<Kernite::InvalidArgumentException>(
                  [] { throw Kernite::InvalidArgumentException(std::string("X")); }),
              "Invalid argument : X");
    EXPECT_EQ(MessageOf<Kernite::InvalidArgumentException>([] { throw Kernite::InvalidArgumentException(-1); }),
              "Invalid argument : -1");
    EXPECT_EQ(MessageOf<Kernite::InvalidArgumentException>([] { throw Kernite::InvalidArgumentException("%2"); }),
              "Invalid argument : %2");
    EXPECT_EQ(MessageOf<Kernite::TypeMismatchException>([] { Kernite::ThrowTypeMismatch("PKi", "PKd"); }),
              "Type Mismatch: expected: PKi, found: PKd");
    EXPECT_EQ(MessageOf<Kernite::NotInitializedException>([] { Kernite::ThrowNotInitialized("Not initialized"); }),
              "Not initialized");

    // Every core exception is caught by the families above it.
    EXPECT_THROW(Kernite::ThrowTypeMismatch("a", "b"), Kernite::Exception);
    EXPECT_THROW(Kernite::ThrowNotInitialized("x"), Kernite::Throwable);
    EXPECT_THROW(throw Kernite::InvalidArgumentException(1), std::exception);
}

TEST(ExceptionTest, RemembersWhereItWasRaised) {
    const Kernite::Exception e("where");
    int depth = 0;
    const void* const* frames = e.GetBacktrace(depth);
    ASSERT_GT(depth, 0);
    EXPECT_NE(frames[0], nullptr);
    // The innermost frame is the raiser, not the exception machinery.
    EXPECT_EQ(e.Where().find("Throwable"), std::string::npos) << e.Where();
    const std::string dump = e.Dump();
    EXPECT_NE(dump.find("Kernite::Exception: where"), std::string::npos) << dump;
    EXPECT_NE(dump.find(e.Where()), std::string::npos) << dump;
}

TEST(MessageFormatterTest, SubstitutesNumberedArguments) {
    using Kernite::MessageFormatter;
    EXPECT_EQ(MessageFormatter::ASPrint("%2 then %1", "a", 7), "7 then a");
    EXPECT_EQ(MessageFormatter::ASPrint("%1%1", std::string("x")), "xx");
    EXPECT_EQ(MessageFormatter::ASPrint("%3 stays", "a"), "%3 stays");
    EXPECT_EQ(MessageFormatter::ASPrint("100%% of %1", 5), "100% of 5");
    EXPECT_EQ(MessageFormatter::ASPrint("ends with %", 1), "ends with %");
    EXPECT_EQ(MessageFormatter::ASPrint("%1", "%1 is not read again"), "%1 is not read again");
    EXPECT_EQ(MessageFormatter::ASPrint("%1", static_cast<const char*>(nullptr)), "");
}

struct Base : Kernite::ObjectImpl {};
struct Derived : Base {};
struct Other : Base {};

TEST(NarrowTest, NarrowsOrNamesBothStaticTypes) {
    Kernite::Ref<Base> derived(new Derived());
    Kernite::Ref<Base> other(new Other());

    EXPECT_EQ((Kernite::NarrowToType<Derived, Base>(static_cast<Base*>(nullptr))), nullptr);
    EXPECT_EQ((Kernite::NarrowToType<Derived, Base>(derived.Get())), derived.Get());
    const Base* constDerived = derived.Get();
    EXPECT_EQ((Kernite::NarrowToType<Derived, Base>(constDerived)), derived.Get());

    const std::string expected = std::string("Type Mismatch: expected: ") + typeid(const Derived*).name() +
                                 ", found: " + typeid(const Base*).name();
    EXPECT_EQ(MessageOf<Kernite::TypeMismatchException>(
                  [&] { Kernite::NarrowToType<Derived, Base>(other.Get()); }),
              expected);
}

TEST(PanicAssertDeathTest, ReportsExpressionPathAndLine) {
    EXPECT_DEATH(Kernite::PanicAssert("index < size", "kernite/test", 42), "\"index < size\".*kernite/test:42");
}

}  // namespace
