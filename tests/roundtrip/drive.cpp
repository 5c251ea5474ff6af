#include "drive.h"

#include <gtest/gtest.h>

#include <chrono>
#include <mutex>
#include <set>
#include <stdexcept>
#include <typeinfo>

#include "samples.h"

namespace Roundtrip {

using Kernite::Ref;
using Kernite::RefVector;
using Kernite::System::ScheduledItem;
using Orbit::Any;
using Orbit::ManagedMethod;
using Orbit::ManagedObjectType;

namespace {

constexpr int kResultSeed = 1000;  // even: a boolean result is true, not the default

// A sample for each parameter the version sees, in full; in the null pass the
// optional ones held by reference stay null.
RefVector<Any> ArgumentsOf(const ManagedMethod* member, bool nullPass, const Orbit::Version* version) {
    const auto& params = member->GetParameters();
    RefVector<Any> args(static_cast<unsigned>(params.size()));
    for (std::size_t i = 0; i < params.size(); ++i) {
        if (nullPass && params[i].IsOptional() && HeldByReference(params[i])) continue;
        if (version != nullptr && !params[i].IsVisible(version)) continue;
        args[i] = MakeFullSample(params[i], 10 * static_cast<int>(i), !nullPass, version, 1);
    }
    return args;
}

bool OptionalResult(const ManagedMethod* member) {
    return !member->IsTask() && !IsVoid(member) && member->GetResult().IsOptional() &&
           HeldByReference(member->GetResult());
}

bool HasNullPass(const ManagedMethod* member) {
    for (const Orbit::Member& p : member->GetParameters())
        if (p.IsOptional() && HeldByReference(p)) return true;
    return OptionalResult(member);
}

// What the double answers, which is also what the caller must receive.
Ref<Any> AnswerOf(const ManagedMethod* member, bool nullPass, const Orbit::Version* version) {
    if (member->IsTask()) return MakeTaskReference(kResultSeed);
    if (IsVoid(member) || (nullPass && OptionalResult(member))) return nullptr;
    return MakeFullSample(member->GetResult(), kResultSeed, !nullPass, version, 1);
}

// `arrived` equals `sent`, and is a copy where a wire lies between.
void ExpectSame(Any* sent, Any* arrived, bool copies, const std::string& what) {
    EXPECT_EQ(Difference(sent, arrived), "") << what;
    if (copies && sent != nullptr) {
        EXPECT_NE(sent, arrived) << what << " arrived as the very object sent";
    }
}

// The double received `sent` in one call of the member's operation, and the caller
// received `answer`. Returns the operation the double recorded.
std::string ExpectDelivered(const Tarn::Testing::Double* dbl, const ManagedMethod* member, const RefVector<Any>& sent,
                            Any* answer, const Outcome& outcome, bool copies) {
    EXPECT_EQ(outcome.failure, nullptr) << outcome.failure->what();
    const std::vector<Tarn::Testing::Call> calls = dbl->GetCalls();
    if (calls.size() != 1) {
        ADD_FAILURE() << calls.size() << " calls reached the double";
        return {};
    }
    EXPECT_EQ(calls[0].member, OperationName(member));
    if (calls[0].args.size() != sent.size()) {
        ADD_FAILURE() << calls[0].args.size() << " arguments arrived, " << sent.size() << " were sent";
        return calls[0].member;
    }
    for (std::size_t i = 0; i < sent.size(); ++i)
        ExpectSame(sent[i].Get(), calls[0].args[i].Get(), copies, "parameter " + member->GetParameters()[i].name);
    if (IsVoid(member) && !member->IsTask()) {
        EXPECT_EQ(outcome.result, nullptr) << "a member without a result returned one";
    } else {
        ExpectSame(answer, outcome.result.Get(), copies, "result");
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

// The call failed with the exception of `fault`'s own class, reporting that fault
// (or, across a wire, an equal one).
void ExpectFault(const Outcome& outcome, Orbit::MethodFault* fault, bool copies) {
    ASSERT_NE(outcome.failure, nullptr) << "the fault did not reach the caller";
    EXPECT_EQ(outcome.result, nullptr);
    const std::unique_ptr<Orbit::MethodFault::Exception> own(fault->CreateException());
    EXPECT_EQ(typeid(*outcome.failure), typeid(*own)) << "thrown as " << typeid(*outcome.failure).name();
    auto* reported = dynamic_cast<const Orbit::MethodFault::Exception*>(outcome.failure.get());
    ASSERT_NE(reported, nullptr);
    if (copies) ExpectSame(fault, reported->GetFault(), true, "fault");
    else EXPECT_EQ(reported->GetFault(), fault);
}

// Refused by the wire, by class name: the loopback suites do not link the wire.
void ExpectRefused(const Outcome& outcome) {
    ASSERT_NE(outcome.failure, nullptr) << "a member the version does not see was carried";
    auto* reported = dynamic_cast<const Orbit::MethodFault::Exception*>(outcome.failure.get());
    ASSERT_NE(reported, nullptr) << outcome.failure->what();
    EXPECT_EQ(reported->GetFault()->_GetType()->GetName(), "strata.wire.UnknownMethod") << outcome.failure->what();
}

}  // namespace

Outcome CallSync(Orbit::ManagedMethod* member, Orbit::ManagedObject* stub, Kernite::RefVector<Orbit::Any> args) {
    Outcome outcome;
    const Orbit::ManagedTypeInfo* info = member->GetDeclaringType()->GetManagedTypeInfo();
    try {
        info->invokeMember(stub, member->GetMemberNumber(), args, outcome.result);
    } catch (const Kernite::Exception& e) {
        outcome.failure.reset(e.Clone());
        outcome.result = nullptr;
    }
    return outcome;
}

Outcome CallAsync(Orbit::ManagedMethod* member, Orbit::ManagedObject* stub, Kernite::RefVector<Orbit::Any> args) {
    // Written by the adapter's worker, read here once the item is complete.
    struct Seen {
        std::mutex mutex;
        int calls = 0;
        bool pending = false;
        Ref<Orbit::Any> result;
        std::unique_ptr<Kernite::Exception> failure;
    };
    auto seen = std::make_shared<Seen>();
    Orbit::CompletionCallback callback = [seen](ScheduledItem* item, Kernite::Exception* e, Orbit::Any* value) {
        std::lock_guard<std::mutex> lock(seen->mutex);
        ++seen->calls;
        seen->pending = !item->IsDone();
        seen->result = value;
        if (e != nullptr) seen->failure.reset(e->Clone());
    };

    Outcome outcome;
    try {
        Tarn::Testing::StartMember(member->GetDeclaringType(), stub, member->GetMemberNumber(), args, callback,
                                   outcome.item);
    } catch (const Kernite::Exception& e) {
        outcome.failure.reset(e.Clone());
        return outcome;
    }
    if (!outcome.item || !outcome.item->WaitFor(std::chrono::seconds(30)))
        throw std::runtime_error("asynchronous call of " + member->GetName() + " did not complete");
    std::lock_guard<std::mutex> lock(seen->mutex);
    outcome.callbacks = seen->calls;
    outcome.pendingInCallback = seen->pending;
    outcome.result = seen->result;
    outcome.failure = std::move(seen->failure);
    return outcome;
}

Hosted Host(Orbit::ManagedObjectType* type, Orbit::ObjectHost* host, Orbit::StubAdapter* stubAdapter) {
    Hosted hosted;
    const std::string id = type->GetName();
    hosted.object = Tarn::Testing::CreateDouble(type, id);
    if (!hosted.object) throw std::logic_error("no double of " + id);
    hosted.dbl = Kernite::NarrowToType<Tarn::Testing::Double, Orbit::ManagedObject>(hosted.object.Get());
    host->Register(id, hosted.object.Get());
    hosted.stub = type->CreateStub(id, stubAdapter, nullptr);
    if (!hosted.stub) throw std::logic_error("no stub of " + id);
    return hosted;
}

TripCounts RunEveryMember(const Trip& trip) {
    TripCounts counts;
    for (ManagedObjectType* type : TarnManagedTypes()) {
        SCOPED_TRACE(type->GetName());
        ++counts.types;
        Hosted hosted = Host(type, trip.host, trip.adapter);
        EXPECT_EQ(hosted.stub->_GetType(), type);
        EXPECT_EQ(hosted.object->_GetType(), type);
        const std::vector<ManagedMethod*> all = AllMembers(type);
        counts.members += all.size();
        std::set<std::string> operations;

        for (ManagedMethod* member : all) {
            SCOPED_TRACE(member->GetDeclaringType()->GetName() + "." + member->GetName());
            const std::string operation = OperationName(member);
            if (trip.version != nullptr && !member->IsVisible(trip.version)) {
                hosted.dbl->ClearCalls();
                ExpectRefused(CallSync(member, hosted.stub.Get(), ArgumentsOf(member, false, nullptr)));
                Outcome async = CallAsync(member, hosted.stub.Get(), ArgumentsOf(member, false, nullptr));
                ExpectRefused(async);
                ExpectCompleted(async, true);
                EXPECT_TRUE(hosted.dbl->GetCalls().empty()) << "the refused member reached the server";
                counts.syncCalls++, counts.asyncCalls++, counts.refused++;
                operations.insert(operation);
                continue;
            }

            for (bool nullPass : {false, true}) {
                if (nullPass && !HasNullPass(member)) continue;
                SCOPED_TRACE(nullPass ? "optional values null" : "every value set");
                const Ref<Any> answer = AnswerOf(member, nullPass, trip.version);
                hosted.dbl->Program(operation, answer.Get());
                const RefVector<Any> args = ArgumentsOf(member, nullPass, trip.version);

                hosted.dbl->ClearCalls();
                Outcome sync = CallSync(member, hosted.stub.Get(), args);
                ++counts.syncCalls;
                operations.insert(ExpectDelivered(hosted.dbl, member, args, answer.Get(), sync, trip.copies));

                hosted.dbl->ClearCalls();
                Outcome async = CallAsync(member, hosted.stub.Get(), args);
                ++counts.asyncCalls;
                ExpectDelivered(hosted.dbl, member, args, answer.Get(), async, trip.copies);
                ExpectCompleted(async, false);
            }

            const Ref<Orbit::MethodFault> fault = MakeFault(member);
            hosted.dbl->ProgramFault(operation, fault.Get());
            ExpectFault(CallSync(member, hosted.stub.Get(), ArgumentsOf(member, false, trip.version)), fault.Get(),
                        trip.copies);
            ++counts.syncCalls;
            Outcome async = CallAsync(member, hosted.stub.Get(), ArgumentsOf(member, false, trip.version));
            ++counts.asyncCalls;
            ExpectFault(async, fault.Get(), trip.copies);
            ExpectCompleted(async, true);
            if (async.item && async.item->GetException() != nullptr && async.failure != nullptr) {
                EXPECT_EQ(typeid(*async.item->GetException()), typeid(*async.failure));
            } else {
                ADD_FAILURE() << "the item of a failed call holds no failure";
            }
            ++counts.exercised;
        }
        // Each member reached an operation of its own.
        EXPECT_EQ(operations.size(), all.size());
        trip.host->Unregister(type->GetName());
    }
    return counts;
}

}  // namespace Roundtrip
