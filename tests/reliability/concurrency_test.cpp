// Races that the library must survive, written for ThreadSanitizer (they run in
// every preset): first reads of the same lazy array property, reference-count
// storms on one shared object, synchronous and asynchronous calls through one stub
// on one adapter, and an adapter released on its own worker thread. They run on the
// runtime's test catalogue, whose generated code is the real catalogue's in small.
#include <gtest/gtest.h>

#include <atomic>
#include <barrier>
#include <chrono>
#include <functional>
#include <thread>
#include <vector>

#include "fix/doubles.h"
#include "fix/fix.h"
#include "orbit/Loopback.h"
#include "values.h"

namespace {

using Kernite::Ref;
using Kernite::System::ScheduledItem;

constexpr int kThreads = 8;

long LiveObjects() { return Kernite::ObjectImpl::LiveObjects(); }

// Objects released on another thread (the adapter's worker) are gone a moment later.
bool LiveObjectsSettleAt(long expected) {
    for (int i = 0; i < 2000 && LiveObjects() != expected; ++i)
        std::this_thread::sleep_for(std::chrono::milliseconds(1));
    return LiveObjects() == expected;
}

// `rounds` rounds on kThreads threads: `prepare(round)` runs alone, then every
// thread runs `race(thread, round)` released at the same instant, then
// `check(round)` runs alone.
void Race(int rounds, const std::function<void(int)>& prepare, const std::function<void(int, int)>& race,
          const std::function<void(int)>& check) {
    std::barrier<> start(kThreads + 1);
    std::barrier<> finish(kThreads + 1);
    std::vector<std::thread> threads;
    for (int t = 0; t < kThreads; ++t) {
        threads.emplace_back([&, t] {
            for (int r = 0; r < rounds; ++r) {
                start.arrive_and_wait();
                race(t, r);
                finish.arrive_and_wait();
            }
        });
    }
    for (int r = 0; r < rounds; ++r) {
        prepare(r);
        start.arrive_and_wait();
        finish.arrive_and_wait();
        check(r);
    }
    for (std::thread& thread : threads) thread.join();
}

int PropertyIndex(const Orbit::DataObjectType* type, const std::string& name) {
    const auto& properties = type->GetProperties();
    for (std::size_t i = 0; i < properties.size(); ++i)
        if (properties[i].name == name) return static_cast<int>(i);
    return -1;
}

TEST(Concurrency, FirstReadsOfALazyArrayInstallOneArray) {
    constexpr int kRounds = 300;
    auto* shapeType = Orbit::GetDoType<Fix::Shape>();
    const int children = PropertyIndex(shapeType, "children");
    ASSERT_GE(children, 0);

    const long baseline = LiveObjects();
    Ref<Fix::Shape> first, second;
    // What each thread saw: through the out-of-line getters and through getProperty.
    std::vector<Orbit::Any*> tagsSeen(kThreads), childrenSeen(kThreads);
    std::vector<Ref<Orbit::Any>> recordSeen(kThreads);
    int failures = 0;

    Race(
        kRounds,
        [&](int) {
            first = new Fix::Shape();
            second = new Fix::Shape();
        },
        [&](int t, int) {
            tagsSeen[t] = first->GetTags();
            childrenSeen[t] = first->GetChildren();
            shapeType->GetDataTypeInfo()->getProperty(second.Get(), children, &recordSeen[t]);
        },
        [&](int) {
            for (int t = 0; t < kThreads; ++t) {
                bool one = tagsSeen[t] != nullptr && tagsSeen[t] == first->GetTags() && childrenSeen[t] != nullptr &&
                           childrenSeen[t] == first->GetChildren() && recordSeen[t] &&
                           recordSeen[t].Get() == second->GetChildren();
                failures += one ? 0 : 1;
            }
            // The arrays of the losers are gone already; the winners go with their objects.
            recordSeen.assign(kThreads, nullptr);
            first = nullptr;
            second = nullptr;
            failures += LiveObjects() == baseline ? 0 : 1;
        });
    EXPECT_EQ(failures, 0);
    EXPECT_EQ(LiveObjects(), baseline);
}

TEST(Concurrency, ReferenceCountStormsOnASharedObject) {
    constexpr int kIterations = 20000;
    auto* type = Orbit::GetDoType<Fix::Shape>();
    {
        // Types the runtime makes on first use (its own roots, array types) stay.
        Ref<Orbit::DataObject> warmUp = Reliability::MakePopulated(type, 7, 2, 2);
        Ref<Orbit::Any>(warmUp->_Clone())->_IsEqual(warmUp.Get());
    }
    const long baseline = LiveObjects();
    {
        Ref<Orbit::DataObject> shared = Reliability::MakePopulated(type, 7, 2, 2);
        Ref<Orbit::Any> box(new Orbit::Primitive<std::string>("shared between threads, never copied"));
        Ref<Orbit::Any> reference(shared->_Clone());
        const long populated = LiveObjects();
        const int sharedCount = shared->GetRefCount();
        const int boxCount = box->GetRefCount();
        std::atomic<int> unequal{0};

        Race(
            1, [](int) {},
            [&](int, int) {
                Ref<Orbit::DataObject> mine;
                for (int i = 0; i < kIterations; ++i) {
                    mine = shared;                                     // IncRef
                    Ref<Orbit::DataObject> other(mine);                // IncRef
                    Ref<Orbit::Any> boxed(box->_Clone());              // a box is shared, not copied
                    Ref<Orbit::Any> moved(std::move(other));           // no count change
                    if (i % 512 == 0) {
                        Ref<Orbit::Any> copy(shared->_Clone());  // readers walk the object meanwhile
                        if (!copy->_IsEqual(reference.Get()) || shared->_GetSize([](unsigned n) { return n; }) == 0)
                            unequal.fetch_add(1);
                    }
                    mine.Reset();  // DecRef
                }
            },
            [](int) {});
        EXPECT_EQ(unequal.load(), 0);
        EXPECT_EQ(shared->GetRefCount(), sharedCount);
        EXPECT_EQ(box->GetRefCount(), boxCount);
        EXPECT_EQ(LiveObjects(), populated);
    }
    EXPECT_EQ(LiveObjects(), baseline);
}

TEST(Concurrency, SynchronousAndAsynchronousCallsThroughOneStub) {
    constexpr int kCalls = 150;
    {
        Ref<Orbit::LoopbackAdapter> adapter(new Orbit::LoopbackAdapter());
        adapter->Register("calc-1", Ref<Fix::CalculatorDouble>(new Fix::CalculatorDouble("calc-1")).Get());
        Ref<Fix::CalculatorStub> stub(new Fix::CalculatorStub("calc-1", adapter.Get(), nullptr));
        Ref<Orbit::Any> result;
        stub->Echo(nullptr, result);  // first use of the types and method objects
    }
    const long baseline = LiveObjects();
    {
        Ref<Orbit::LoopbackAdapter> adapter(new Orbit::LoopbackAdapter());
        Ref<Fix::CalculatorDouble> calc(new Fix::CalculatorDouble("calc-1"));
        Ref<Orbit::MoRef> answer(new Orbit::MoRef("fix.Counter", "counter-1"));
        calc->Program("Echo", answer.Get());
        adapter->Register("calc-1", calc.Get());
        Ref<Fix::CalculatorStub> stub(new Fix::CalculatorStub("calc-1", adapter.Get(), nullptr));

        std::atomic<int> completed{0}, wrong{0};
        Race(
            1, [](int) {},
            [&](int t, int) {
                std::vector<Ref<ScheduledItem>> items;
                for (int i = 0; i < kCalls; ++i) {
                    const std::string message = "thread " + std::to_string(t) + " call " + std::to_string(i);
                    stub->Fail(message);
                    Ref<Orbit::Any> result;
                    stub->Echo(nullptr, result);
                    if (result.Get() != answer.Get()) wrong.fetch_add(1);

                    Ref<ScheduledItem> item;
                    stub->Fail(message, [&](ScheduledItem*, Kernite::Exception* e, Orbit::Any* r) {
                        if (e != nullptr || r != nullptr) wrong.fetch_add(1);
                        completed.fetch_add(1);
                    }, item);
                    items.push_back(item);
                    stub->Echo(nullptr, [&](ScheduledItem*, Kernite::Exception* e, Orbit::Any* r) {
                        if (e != nullptr || r != answer.Get()) wrong.fetch_add(1);
                        completed.fetch_add(1);
                    }, item);
                    items.push_back(item);
                }
                for (const Ref<ScheduledItem>& item : items)
                    if (!item->WaitFor(std::chrono::seconds(60)) || item->IsFailed()) wrong.fetch_add(1);
            },
            [](int) {});
        EXPECT_EQ(wrong.load(), 0);
        EXPECT_EQ(completed.load(), kThreads * kCalls * 2);
        EXPECT_EQ(calc->GetCalls().size(), static_cast<std::size_t>(kThreads * kCalls * 4));
        calc->ClearCalls();
        adapter->Shutdown();
    }
    EXPECT_EQ(LiveObjects(), baseline);
}

// The adapter's last reference may be dropped on its worker thread, inside a
// completion callback or with the callback that held it; the worker cannot join
// itself, so the calls still queued run there and then, and the worker ends alone.
TEST(AdapterLifetime, LastReferenceDroppedInsideACompletionCallback) {
    const long baseline = LiveObjects();
    std::atomic<int> callbacks{0};
    std::atomic<bool> go{false};
    Ref<ScheduledItem> first, second;
    {
        Ref<Orbit::LoopbackAdapter> adapter(new Orbit::LoopbackAdapter());
        adapter->Register("calc-1", Ref<Fix::CalculatorDouble>(new Fix::CalculatorDouble("calc-1")).Get());
        // Only the stub holds the adapter, and only `owner` holds the stub.
        auto* owner = new Ref<Fix::CalculatorStub>(new Fix::CalculatorStub("calc-1", adapter.Get(), nullptr));
        adapter = nullptr;

        (*owner)->Fail("blocks the worker until both calls are queued", [&callbacks, &go, owner](ScheduledItem*, Kernite::Exception*, Orbit::Any*) {
            while (!go.load()) std::this_thread::yield();
            callbacks.fetch_add(1);
            delete owner;  // the last reference to the stub, and so to the adapter
        }, first);
        (*owner)->Fail("queued behind it", [&](ScheduledItem*, Kernite::Exception* e, Orbit::Any*) {
            if (e == nullptr) callbacks.fetch_add(1);
        }, second);
        go = true;
    }
    ASSERT_TRUE(first->WaitFor(std::chrono::seconds(60)));
    ASSERT_TRUE(second->WaitFor(std::chrono::seconds(60)));
    EXPECT_FALSE(first->IsFailed());
    EXPECT_FALSE(second->IsFailed());
    EXPECT_EQ(callbacks.load(), 2);
    first = nullptr;
    second = nullptr;
    EXPECT_TRUE(LiveObjectsSettleAt(baseline));
}

TEST(AdapterLifetime, LastReferenceHeldByTheCallbackItself) {
    const long baseline = LiveObjects();
    for (int round = 0; round < 50; ++round) {
        Ref<ScheduledItem> item;
        {
            Ref<Orbit::LoopbackAdapter> adapter(new Orbit::LoopbackAdapter());
            adapter->Register("calc-1", Ref<Fix::CalculatorDouble>(new Fix::CalculatorDouble("calc-1")).Get());
            Ref<Fix::CalculatorStub> stub(new Fix::CalculatorStub("calc-1", adapter.Get(), nullptr));
            // The copy of the callback inside the queued call keeps the stub, and the
            // stub the adapter; both go when the worker drops the finished call.
            stub->Fail("m", [stub](ScheduledItem*, Kernite::Exception*, Orbit::Any*) { (void)stub; }, item);
        }
        ASSERT_TRUE(item->WaitFor(std::chrono::seconds(60)));
        EXPECT_FALSE(item->IsFailed());
        item = nullptr;
        ASSERT_TRUE(LiveObjectsSettleAt(baseline)) << "round " << round;
    }
}

TEST(AdapterLifetime, ShutdownInsideACompletionCallback) {
    const long baseline = LiveObjects();
    {
        Ref<Orbit::LoopbackAdapter> adapter(new Orbit::LoopbackAdapter());
        Ref<Fix::CalculatorDouble> calc(new Fix::CalculatorDouble("calc-1"));
        adapter->Register("calc-1", calc.Get());
        Ref<Fix::CalculatorStub> stub(new Fix::CalculatorStub("calc-1", adapter.Get(), nullptr));
        std::atomic<bool> go{false}, refused{false};
        Ref<ScheduledItem> first, second;
        stub->Fail("first", [&](ScheduledItem*, Kernite::Exception*, Orbit::Any*) {
            while (!go.load()) std::this_thread::yield();
            adapter->Shutdown();  // runs "second" before returning
            Ref<ScheduledItem> late;
            try {
                stub->Fail("too late", {}, late);
            } catch (const Kernite::Exception&) {
                refused = true;
            }
        }, first);
        stub->Fail("second", {}, second);
        go = true;
        ASSERT_TRUE(first->WaitFor(std::chrono::seconds(60)));
        ASSERT_TRUE(second->WaitFor(std::chrono::seconds(60)));
        EXPECT_TRUE(refused.load());
        EXPECT_EQ(calc->GetCalls().size(), 2u);
        calc->ClearCalls();
    }
    EXPECT_TRUE(LiveObjectsSettleAt(baseline));
}

}  // namespace
