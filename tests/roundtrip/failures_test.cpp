// What a stub does with an answer that does not fit its member: one of the wrong
// type, none where a value is due, or one where none may come. Each member is
// driven once, through a stub of the type that declares it.
#include <gtest/gtest.h>

#include <map>
#include <string>
#include <typeinfo>

#include "drive.h"
#include "samples.h"

namespace {

using Kernite::Ref;
using Kernite::RefVector;
using Orbit::Any;
using Orbit::ManagedMethod;
using Orbit::ManagedObjectType;

RefVector<Any> SampleArguments(const ManagedMethod* member) {
    const auto& params = member->GetParameters();
    RefVector<Any> args(static_cast<unsigned>(params.size()));
    for (std::size_t i = 0; i < params.size(); ++i) args[i] = Roundtrip::MakeSample(params[i], static_cast<int>(i));
    return args;
}

bool HasResult(const ManagedMethod* member) { return member->IsTask() || !Roundtrip::IsVoid(member); }

// The stub source of the namespace that declares `type`: "tarn.vmprov.Action" is
// built from "tarn/vmprov/stub".
std::string StubPath(const ManagedObjectType* type) {
    std::string ns = type->GetName().substr(0, type->GetName().rfind('.'));
    for (char& c : ns)
        if (c == '.') c = '/';
    return ns + "/stub";
}

class StubFailures : public ::testing::Test {
protected:
    void SetUp() override {
        loopback = new Orbit::LoopbackAdapter();
        forging = new Roundtrip::ForgingAdapter(loopback.Get());
    }
    void TearDown() override { loopback->Shutdown(); }

    // Calls `check` for every own member of every managed type, with a double and a
    // stub of the declaring type (the stub's calls go through the forging adapter).
    template <class F>
    void ForEachMember(F&& check) {
        for (ManagedObjectType* type : Roundtrip::TarnManagedTypes()) {
            SCOPED_TRACE(type->GetName());
            Roundtrip::Hosted hosted = Roundtrip::Host(type, loopback.Get(), forging.Get());
            for (const auto& member : type->GetMembers()) {
                SCOPED_TRACE(member->GetName());
                check(hosted, member.Get());
            }
            loopback->Unregister(type->GetName());
        }
    }

    Ref<Orbit::LoopbackAdapter> loopback;
    Ref<Roundtrip::ForgingAdapter> forging;
};

// The server's own narrowing refuses a wrong box, and the mismatch reaches the
// caller with its class, synchronously and through the callback.
TEST_F(StubFailures, WrongBoxProgrammedOnTheDoubleIsATypeMismatch) {
    int checked = 0;
    ForEachMember([&](Roundtrip::Hosted& hosted, ManagedMethod* member) {
        if (!HasResult(member) || Roundtrip::TakesAnyResult(member)) return;
        hosted.dbl->Program(Roundtrip::OperationName(member), Roundtrip::MakeWrongBox(member).Get());

        Roundtrip::Outcome sync = Roundtrip::CallSync(member, hosted.stub.Get(), SampleArguments(member));
        ASSERT_NE(sync.failure, nullptr);
        EXPECT_EQ(typeid(*sync.failure), typeid(Kernite::TypeMismatchException)) << sync.failure->what();

        Roundtrip::Outcome async = Roundtrip::CallAsync(member, hosted.stub.Get(), SampleArguments(member));
        ASSERT_NE(async.failure, nullptr);
        EXPECT_EQ(typeid(*async.failure), typeid(Kernite::TypeMismatchException)) << async.failure->what();
        EXPECT_EQ(async.result, nullptr);
        ASSERT_TRUE(async.item);
        EXPECT_TRUE(async.item->IsFailed());
        ++checked;
    });
    EXPECT_GT(checked, 0);
}

// The stub's own narrowing refuses a result of the wrong type; an answer of nothing
// is a mismatch where a value is due and a null object elsewhere.
TEST_F(StubFailures, ForgedAnswersReachingTheStub) {
    int wrong = 0, none = 0;
    ForEachMember([&](Roundtrip::Hosted& hosted, ManagedMethod* member) {
        if (!HasResult(member)) return;
        hosted.dbl->ClearCalls();
        if (!Roundtrip::TakesAnyResult(member)) {
            forging->Forge(Roundtrip::MakeWrongBox(member).Get());
            Roundtrip::Outcome sync = Roundtrip::CallSync(member, hosted.stub.Get(), SampleArguments(member));
            ASSERT_NE(sync.failure, nullptr);
            EXPECT_EQ(typeid(*sync.failure), typeid(Kernite::TypeMismatchException));
            EXPECT_EQ(std::string(sync.failure->what()).rfind("Type Mismatch: expected: ", 0), 0u) << sync.failure->what();
            EXPECT_EQ(hosted.dbl->GetCalls().size(), 1u) << "the call reached the server before the answer was refused";
            ++wrong;
        }
        forging->Forge(nullptr);
        Roundtrip::Outcome sync = Roundtrip::CallSync(member, hosted.stub.Get(), SampleArguments(member));
        if (Roundtrip::ReturnedByValue(member)) {
            ASSERT_NE(sync.failure, nullptr);
            EXPECT_EQ(typeid(*sync.failure), typeid(Kernite::TypeMismatchException));
            EXPECT_TRUE(std::string(sync.failure->what()).ends_with("found: null")) << sync.failure->what();
        } else {
            EXPECT_EQ(sync.failure, nullptr) << sync.failure->what();
            EXPECT_EQ(sync.result, nullptr);
        }
        ++none;
    });
    EXPECT_GT(wrong, 0);
    EXPECT_GT(none, 0);
}

using StubFailuresDeathTest = StubFailures;

// One void member of each namespace's stub source: the invariant names that source.
TEST_F(StubFailuresDeathTest, ResultOnAVoidMemberBreaksTheInvariant) {
    GTEST_FLAG_SET(death_test_style, "threadsafe");
    std::map<std::string, ManagedMethod*> firstVoid;  // by stub source
    for (ManagedObjectType* type : Roundtrip::TarnManagedTypes())
        for (const auto& member : type->GetMembers())
            if (!HasResult(member.Get())) firstVoid.emplace(StubPath(type), member.Get());
    ASSERT_FALSE(firstVoid.empty());

    forging->Forge(new Orbit::Primitive<std::string>("unexpected"));
    for (const auto& [path, member] : firstVoid) {
        SCOPED_TRACE(member->GetDeclaringType()->GetName() + "." + member->GetName());
        Roundtrip::Hosted hosted = Roundtrip::Host(member->GetDeclaringType(), loopback.Get(), forging.Get());
        EXPECT_DEATH(Roundtrip::CallSync(member, hosted.stub.Get(), SampleArguments(member)),
                     "_resultObj == __null\" failed at " + path + ":[0-9]+");
    }
}

}  // namespace
