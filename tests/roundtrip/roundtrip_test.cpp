// Every member of every managed type, own and inherited, from a client stub through
// the loopback adapter and the generated dispatch to a test double and back.
#include <gtest/gtest.h>

#include <iostream>
#include <set>
#include <typeinfo>

#include "drive.h"
#include "samples.h"
#include "tarn/testing.h"
#include "tarn/types.h"

namespace {

using Kernite::Ref;
using Kernite::RefVector;
using Orbit::Any;
using Orbit::ManagedMethod;
using Orbit::ManagedObjectType;
using Roundtrip::Outcome;

constexpr int kResultSeed = 1000;  // even: a boolean result is true, not the default

// A sample for each parameter; in the null pass the optional ones held by
// reference stay null.
RefVector<Any> ArgumentsOf(const ManagedMethod* member, bool nullPass) {
    const auto& params = member->GetParameters();
    RefVector<Any> args(static_cast<unsigned>(params.size()));
    for (std::size_t i = 0; i < params.size(); ++i) {
        if (nullPass && params[i].IsOptional() && Roundtrip::HeldByReference(params[i])) continue;
        args[i] = Roundtrip::MakeSample(params[i], 10 * static_cast<int>(i));
    }
    return args;
}

bool OptionalResult(const ManagedMethod* member) {
    return !member->IsTask() && !Roundtrip::IsVoid(member) && member->GetResult().IsOptional() &&
           Roundtrip::HeldByReference(member->GetResult());
}

bool HasNullPass(const ManagedMethod* member) {
    for (const Orbit::Member& p : member->GetParameters())
        if (p.IsOptional() && Roundtrip::HeldByReference(p)) return true;
    return OptionalResult(member);
}

// What the double answers, which is also what the caller must receive.
Ref<Any> AnswerOf(const ManagedMethod* member, bool nullPass) {
    if (member->IsTask()) return Roundtrip::MakeTaskReference(kResultSeed);
    if (Roundtrip::IsVoid(member) || (nullPass && OptionalResult(member))) return nullptr;
    return Roundtrip::MakeSample(member->GetResult(), kResultSeed);
}

// The double received `sent` in one call of the member's operation, and the caller
// received `answer`. Returns the operation the double recorded.
std::string ExpectDelivered(const Tarn::Testing::Double* dbl, const ManagedMethod* member, const RefVector<Any>& sent,
                            Any* answer, const Outcome& outcome) {
    EXPECT_EQ(outcome.failure, nullptr) << outcome.failure->what();
    const std::vector<Tarn::Testing::Call> calls = dbl->GetCalls();
    if (calls.size() != 1) {
        ADD_FAILURE() << calls.size() << " calls reached the double";
        return {};
    }
    EXPECT_EQ(calls[0].member, Roundtrip::OperationName(member));
    if (calls[0].args.size() != sent.size()) {
        ADD_FAILURE() << calls[0].args.size() << " arguments arrived, " << sent.size() << " were sent";
        return calls[0].member;
    }
    for (std::size_t i = 0; i < sent.size(); ++i)
        EXPECT_EQ(Roundtrip::Difference(sent[i].Get(), calls[0].args[i].Get()), "")
            << "parameter " << member->GetParameters()[i].name;
    if (Roundtrip::IsVoid(member) && !member->IsTask()) {
        EXPECT_EQ(outcome.result, nullptr) << "a member without a result returned one";
    } else {
        EXPECT_EQ(Roundtrip::Difference(answer, outcome.result.Get()), "") << "result";
    }
    if (member->IsTask()) {
        EXPECT_NE(dynamic_cast<Orbit::MoRef*>(outcome.result.Get()), nullptr) << "not the task";
    }
    return calls[0].member;
}

void ExpectCompleted(const Outcome& outcome, bool failed) {
    EXPECT_EQ(outcome.callbacks, 1);
    EXPECT_TRUE(outcome.pendingInCallback) << "the item completed before the callback ran";
    ASSERT_TRUE(outcome.item);
    EXPECT_TRUE(outcome.item->IsDone());
    EXPECT_EQ(outcome.item->IsFailed(), failed);
}

// The call failed with the exception of `fault`'s own class, reporting that fault.
void ExpectFault(const Outcome& outcome, Orbit::MethodFault* fault) {
    ASSERT_NE(outcome.failure, nullptr) << "the fault did not reach the caller";
    EXPECT_EQ(outcome.result, nullptr);
    const std::unique_ptr<Orbit::MethodFault::Exception> own(fault->CreateException());
    EXPECT_EQ(typeid(*outcome.failure), typeid(*own)) << "thrown as " << typeid(*outcome.failure).name();
    auto* reported = dynamic_cast<const Orbit::MethodFault::Exception*>(outcome.failure.get());
    ASSERT_NE(reported, nullptr);
    EXPECT_EQ(reported->GetFault(), fault);
}

TEST(RoundTrip, EveryMemberOfEveryManagedType) {
    Ref<Orbit::LoopbackAdapter> adapter(new Orbit::LoopbackAdapter());
    std::size_t types = 0, members = 0, exercised = 0, syncCalls = 0, asyncCalls = 0;

    for (ManagedObjectType* type : Roundtrip::TarnManagedTypes()) {
        SCOPED_TRACE(type->GetName());
        ++types;
        Roundtrip::Hosted hosted = Roundtrip::Host(type, adapter.Get());
        EXPECT_EQ(hosted.stub->_GetType(), type);
        EXPECT_EQ(hosted.object->_GetType(), type);
        const std::vector<ManagedMethod*> all = Roundtrip::AllMembers(type);
        members += all.size();
        std::set<std::string> operations;

        for (ManagedMethod* member : all) {
            SCOPED_TRACE(member->GetDeclaringType()->GetName() + "." + member->GetName());
            const std::string operation = Roundtrip::OperationName(member);

            for (bool nullPass : {false, true}) {
                if (nullPass && !HasNullPass(member)) continue;
                SCOPED_TRACE(nullPass ? "optional values null" : "every value set");
                const Ref<Any> answer = AnswerOf(member, nullPass);
                hosted.dbl->Program(operation, answer.Get());
                const RefVector<Any> args = ArgumentsOf(member, nullPass);

                hosted.dbl->ClearCalls();
                Outcome sync = Roundtrip::CallSync(member, hosted.stub.Get(), args);
                ++syncCalls;
                operations.insert(ExpectDelivered(hosted.dbl, member, args, answer.Get(), sync));

                hosted.dbl->ClearCalls();
                Outcome async = Roundtrip::CallAsync(member, hosted.stub.Get(), args);
                ++asyncCalls;
                ExpectDelivered(hosted.dbl, member, args, answer.Get(), async);
                ExpectCompleted(async, false);
            }

            const Ref<Orbit::MethodFault> fault = Roundtrip::MakeFault(member);
            hosted.dbl->ProgramFault(operation, fault.Get());
            ExpectFault(Roundtrip::CallSync(member, hosted.stub.Get(), ArgumentsOf(member, false)), fault.Get());
            ++syncCalls;
            Outcome async = Roundtrip::CallAsync(member, hosted.stub.Get(), ArgumentsOf(member, false));
            ++asyncCalls;
            ExpectFault(async, fault.Get());
            ExpectCompleted(async, true);
            if (async.item) {
                ASSERT_NE(async.item->GetException(), nullptr);
                EXPECT_EQ(typeid(*async.item->GetException()), typeid(*async.failure));
            }
            ++exercised;
        }
        // Each member reached an operation of its own.
        EXPECT_EQ(operations.size(), all.size());
        adapter->Unregister(type->GetName());
    }
    adapter->Shutdown();

    std::cout << "roundtrip: " << types << " types, " << members << " members, " << syncCalls << " sync calls, "
              << asyncCalls << " async calls" << std::endl;
    EXPECT_GT(types, 0u);
    EXPECT_EQ(exercised, members);
    EXPECT_EQ(syncCalls, asyncCalls);
}

}  // namespace
