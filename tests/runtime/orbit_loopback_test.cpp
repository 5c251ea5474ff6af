// The loopback adapter: calls from a generated stub to a server-side object in the
// same process, synchronous on the caller's thread and asynchronous on the worker.
#include <gtest/gtest.h>

#include <atomic>
#include <memory>
#include <mutex>

#include "fixtures.h"

using Fix::BadRequest;
using Fix::CalculatorStub;
using Fixture::CalculatorImpl;
using Kernite::Ref;
using Kernite::System::ScheduledItem;
using Orbit::Any;
using Orbit::LoopbackAdapter;
using Orbit::MethodFault;

namespace {

// What a completion callback saw, kept past the call.
struct Completion {
    std::mutex mutex;
    int calls = 0;
    ScheduledItem* item = nullptr;
    std::unique_ptr<Kernite::Exception> failure;
    Ref<Any> result;
    bool itemWasPending = false;

    Orbit::CompletionCallback Callback() {
        return [this](ScheduledItem* done, Kernite::Exception* e, Any* value) {
            std::lock_guard<std::mutex> lock(mutex);
            ++calls;
            item = done;
            itemWasPending = !done->IsDone();
            if (e) failure.reset(e->Clone());
            result = value;
        };
    }
};

class LoopbackTest : public Fixture::NoLeakTest {
protected:
    void SetUp() override {
        NoLeakTest::SetUp();
        adapter = new LoopbackAdapter();
        impl = new CalculatorImpl("calc-1");
        adapter->Register("calc-1", impl.Get());
        context = new Orbit::RequestContext();
        stub = StubOf("calc-1", context.Get());
    }
    void TearDown() override {
        stub = nullptr;
        impl = nullptr;
        context = nullptr;
        adapter = nullptr;
        NoLeakTest::TearDown();
    }

    Ref<CalculatorStub> StubOf(const std::string& id, Orbit::RequestContext* with = nullptr) {
        Ref<Orbit::ManagedObject> made =
            adapter->CreateStub(id, Orbit::GetTypeHelper<Fix::Calculator, Orbit::ManagedObjectType>(), with);
        return Kernite::NarrowToType<CalculatorStub, Orbit::ManagedObject>(made.Get());
    }

    // The fault of the Orbit::MethodFault::Exception (exactly) that `f` throws.
    template <class F>
    static Ref<MethodFault> FaultOf(F&& f) {
        try {
            f();
        } catch (const MethodFault::Exception& e) {
            EXPECT_EQ(typeid(e), typeid(MethodFault::Exception));
            return Ref<MethodFault>(e.GetFault());
        }
        ADD_FAILURE() << "no fault";
        return nullptr;
    }

    Ref<LoopbackAdapter> adapter;
    Ref<CalculatorImpl> impl;
    Ref<Orbit::RequestContext> context;
    Ref<CalculatorStub> stub;
};

TEST_F(LoopbackTest, SynchronousCallsReachTheImplementationWithTheirContext) {
    EXPECT_EQ(stub->_GetStubAdapter(), adapter.Get());
    EXPECT_EQ(stub->_GetRef()->ToString(), "fix.Calculator:calc-1");
    EXPECT_EQ(stub->Add(2, 3), 5);
    EXPECT_EQ(impl->seenContext, context.Get());
    EXPECT_EQ(impl->seenThread, std::this_thread::get_id());
    EXPECT_EQ(LoopbackAdapter::CurrentContext(), nullptr);
    EXPECT_EQ(stub->GetName(), "calc:calc-1");

    Ref<Any> sent(new Orbit::MoRef("fix.Counter", "n"));
    Ref<Any> echoed;
    stub->Echo(sent.Get(), echoed);
    EXPECT_EQ(echoed.Get(), sent.Get());
    stub->Echo(nullptr, echoed);
    EXPECT_EQ(echoed, nullptr);
    Ref<Orbit::MoRef> task;
    stub->StartJob(task);
    ASSERT_TRUE(task);
    EXPECT_EQ(task->GetId(), "task-1");

    Ref<Orbit::RequestContext> other(new Orbit::RequestContext());
    stub->_SetRequestContext(other.Get());
    stub->Add(0, 0);
    EXPECT_EQ(impl->seenContext, other.Get());
    Ref<Any> user(new Orbit::Primitive<std::string>("admin"));
    other->SetValue("user", user.Get());
    EXPECT_EQ(other->GetValue("user"), user.Get());
    EXPECT_EQ(other->GetValue("session"), nullptr);
    other->SetValue("user", nullptr);
    EXPECT_EQ(user->GetRefCount(), 1);

    try {
        stub->Fail("bad input");
        ADD_FAILURE() << "no fault";
    } catch (const BadRequest::Exception& e) {
        EXPECT_EQ(typeid(e), typeid(BadRequest::Exception));
        EXPECT_EQ(e.GetFault()->GetMsg(), "bad input");
    }
    EXPECT_EQ(LoopbackAdapter::CurrentContext(), nullptr);  // restored on the way out
}

TEST_F(LoopbackTest, UnknownObjectsAndMembersOfAnotherTypeAreFaults) {
    Ref<MethodFault> fault = FaultOf([&] { StubOf("calc-404")->Add(1, 1); });
    ASSERT_TRUE(fault);
    EXPECT_NE(fault->GetMsg().find("calc-404"), std::string::npos) << fault->GetMsg();

    // A counter's member asked of a calculator.
    Kernite::RefVector<Any> args(0);
    Ref<Any> result(new Orbit::Primitive<int>(0));
    fault = FaultOf([&] { adapter->Invoke("calc-1", gFixCounterMethodObjects[0], args, result, nullptr); });
    ASSERT_TRUE(fault);
    EXPECT_NE(fault->GetMsg().find("fix.Counter.increment"), std::string::npos) << fault->GetMsg();
    EXPECT_NE(fault->GetMsg().find("fix.Calculator"), std::string::npos) << fault->GetMsg();
    EXPECT_EQ(result, nullptr);
    EXPECT_TRUE(FaultOf([&] { adapter->Invoke("calc-1", nullptr, args, result, nullptr); }));
    // Arguments that do not fit the method are the dispatcher's to refuse.
    EXPECT_THROW(adapter->Invoke("calc-1", gFixCalculatorMethodObjects[0], args, result, nullptr),
                 Kernite::InvalidArgumentException);
}

TEST_F(LoopbackTest, AsynchronousCallsCompleteThroughCallbackAndItem) {
    Completion done, failed;
    Ref<ScheduledItem> item, failedItem, lostItem;
    stub->Add(20, 22, done.Callback(), item);
    stub->Fail("later", failed.Callback(), failedItem);
    StubOf("calc-404")->Add(1, 2, Orbit::CompletionCallback(), lostItem);  // no callback: the item alone tells
    for (auto* i : {&item, &failedItem, &lostItem}) (*i)->Wait();

    std::lock_guard<std::mutex> lock(done.mutex);
    EXPECT_EQ(done.calls, 1);
    EXPECT_EQ(done.item, item.Get());
    EXPECT_TRUE(done.itemWasPending);  // the callback runs before completion
    EXPECT_EQ(done.failure, nullptr);
    EXPECT_EQ((Kernite::NarrowToType<Orbit::Primitive<int>, Any>(done.result.Get())->GetValue()), 42);
    EXPECT_EQ(item->GetState(), ScheduledItem::State::Done);
    EXPECT_NE(impl->seenThread, std::this_thread::get_id());
    EXPECT_EQ(impl->seenContext, context.Get());

    auto* itemFailure = dynamic_cast<const BadRequest::Exception*>(failedItem->GetException());
    ASSERT_NE(itemFailure, nullptr);
    EXPECT_EQ(itemFailure->GetFault()->GetMsg(), "later");
    std::lock_guard<std::mutex> failedLock(failed.mutex);
    EXPECT_EQ(failed.result, nullptr);
    ASSERT_TRUE(failed.failure);
    EXPECT_EQ(typeid(*failed.failure), typeid(BadRequest::Exception));
    EXPECT_EQ(static_cast<MethodFault::Exception&>(*failed.failure).GetFault(), itemFailure->GetFault());
    ASSERT_TRUE(lostItem->IsFailed());
    EXPECT_EQ(typeid(*lostItem->GetException()), typeid(MethodFault::Exception));
}

TEST_F(LoopbackTest, ShutdownDrainsQueuedCallsAndRefusesNewOnes) {
    std::atomic<int> callbacks{0};
    std::vector<Ref<ScheduledItem>> items(50);
    for (int i = 0; i < 50; ++i)
        stub->Add(i, i, [&callbacks](ScheduledItem*, Kernite::Exception*, Any*) { ++callbacks; }, items[i]);
    adapter->Shutdown();
    for (const auto& item : items) EXPECT_EQ(item->GetState(), ScheduledItem::State::Done);
    EXPECT_EQ(callbacks.load(), 50);
    Ref<ScheduledItem> refused;
    EXPECT_THROW(stub->Add(1, 1, Orbit::CompletionCallback(), refused), Kernite::Exception);
    EXPECT_FALSE(refused);
    adapter->Shutdown();
    EXPECT_EQ(stub->Add(1, 1), 2);  // synchronous calls need no worker
}

TEST_F(LoopbackTest, RegistrationTellsReplacedAndRemovedObjects) {
    Ref<CalculatorImpl> second(new CalculatorImpl("calc-1"));
    adapter->Register("calc-1", second.Get());
    EXPECT_EQ(impl->unregistered, 1);
    stub->Add(1, 1);
    EXPECT_EQ(second->seenThread, std::this_thread::get_id());
    adapter->Unregister("calc-1");
    adapter->Unregister("calc-1");
    EXPECT_EQ(second->unregistered, 1);
    EXPECT_TRUE(FaultOf([&] { stub->Add(1, 1); }));

    adapter->Register("calc-1", impl.Get());
    adapter = nullptr;  // the stub keeps the adapter alive
    EXPECT_EQ(stub->Add(2, 2), 4);
    stub = nullptr;  // last reference: the adapter goes, and tells what it hosted
    EXPECT_EQ(impl->unregistered, 2);
}

}  // namespace
