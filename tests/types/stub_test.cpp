// Client stubs against an adapter that records what they send and answers what
// the test tells it to.
#include <gtest/gtest.h>

#include <string>
#include <vector>

#include "support.h"
#include "tarn/faultInjector.h"
#include "tarn/inMemLogBufferManager.h"
#include "tarn/rudder.h"
#include "tarn/tarn.h"
#include "tarn/vmprov.h"

using Kernite::Ref;
using Kernite::TypeMismatchException;
using Kernite::System::ScheduledItem;
using Orbit::Any;
using Orbit::DataArray;
using Orbit::ManagedMethod;
using Orbit::MoRef;
using Orbit::Primitive;
using namespace TypesTest;

namespace {

struct Call {
    std::string id;
    ManagedMethod* method = nullptr;
    std::vector<Ref<Any>> args;
    bool started = false;  // through StartInvoke
    Orbit::RequestContext* context = nullptr;
};

class RecordingAdapter : public Orbit::StubAdapter {
public:
    std::vector<Call> calls;
    Ref<Any> answer;  // what every synchronous call returns
    Ref<ScheduledItem> item{new ScheduledItem()};

    void Invoke(const std::string& id, ManagedMethod* method, Kernite::RefVector<Any>& args, Ref<Any>& result,
                Orbit::RequestContext* context) override {
        calls.push_back({id, method, std::vector<Ref<Any>>(args.begin(), args.end()), false, context});
        result = answer;
    }
    void StartInvoke(const std::string& id, ManagedMethod* method, Kernite::RefVector<Any>& args,
                     const Orbit::CompletionCallback& callback, Ref<ScheduledItem>& started,
                     Orbit::RequestContext* context) override {
        calls.push_back({id, method, std::vector<Ref<Any>>(args.begin(), args.end()), true, context});
        EXPECT_TRUE(static_cast<bool>(callback));
        started = item;
    }
};

// A stub that notes which of the runtime's entry points its calls take.
template <class Stub>
class Probe : public Stub {
public:
    using Stub::Stub;
    std::vector<std::string> entries;

    void _Invoke(ManagedMethod* m, Kernite::RefVector<Any>& a, Ref<Any>& r) override {
        entries.push_back("_Invoke");
        Stub::_Invoke(m, a, r);
    }
    void _Invoke_Task(ManagedMethod* m, Kernite::RefVector<Any>& a, Ref<Any>& r) override {
        entries.push_back("_Invoke_Task");
        Stub::_Invoke_Task(m, a, r);
    }
    void _StartInvoke(ManagedMethod* m, Kernite::RefVector<Any>& a, const Orbit::CompletionCallback& c,
                      Ref<ScheduledItem>& i) override {
        entries.push_back("_StartInvoke");
        Stub::_StartInvoke(m, a, c, i);
    }
    void _StartInvoke_Task(ManagedMethod* m, Kernite::RefVector<Any>& a, const Orbit::CompletionCallback& c,
                           Ref<ScheduledItem>& i) override {
        entries.push_back("_StartInvoke_Task");
        Stub::_StartInvoke_Task(m, a, c, i);
    }
};

class StubTest : public NoLeakTest {
protected:
    void SetUp() override {
        NoLeakTest::SetUp();
        adapter = new RecordingAdapter();
        context = new Orbit::RequestContext();
    }
    void TearDown() override {
        adapter = nullptr;
        context = nullptr;
        NoLeakTest::TearDown();
    }

    template <class Stub>
    Ref<Stub> MakeStub(const std::string& id) {
        return Ref<Stub>(new Stub(id, adapter.Get(), context.Get()));
    }
    const Call& Last() const { return adapter->calls.back(); }

    template <class T>
    static const T& Boxed(const Ref<Any>& arg) {
        auto* box = dynamic_cast<Primitive<T>*>(arg.Get());
        EXPECT_NE(box, nullptr) << (arg ? typeid(*arg).name() : "empty entry");
        static const T none{};
        return box ? box->GetValue() : none;
    }

    Ref<RecordingAdapter> adapter;
    Ref<Orbit::RequestContext> context;
};

TEST_F(StubTest, ArgumentsAreBoxedByKindAndPassedInOrder) {
    auto stub = MakeStub<Tarn::LockStresserStub>("lock-1");
    Ref<DataArray<MoRef>> objects(new DataArray<MoRef>{Mo("VirtualMachine", "vm-1").Get()});
    stub->AcquireLock(objects.Get(), "x", 100, 3, 50);

    ASSERT_EQ(adapter->calls.size(), 1u);
    const Call& call = Last();
    EXPECT_EQ(call.id, "lock-1");
    EXPECT_EQ(call.context, context.Get());
    EXPECT_EQ(call.method, gTarnLockStresserMethodObjects[0]);
    ASSERT_NE(call.method, nullptr);
    EXPECT_EQ(call.method->GetName(), "AcquireLock");
    ASSERT_EQ(call.args.size(), 5u);
    EXPECT_EQ(call.args[0].Get(), objects.Get());  // the array itself, not a copy
    EXPECT_EQ(typeid(*call.args[1]), typeid(Primitive<std::string>));
    EXPECT_EQ(Boxed<std::string>(call.args[1]), "x");
    EXPECT_EQ(typeid(*call.args[2]), typeid(Primitive<long long>));
    EXPECT_EQ(Boxed<long long>(call.args[2]), 100);
    EXPECT_EQ(typeid(*call.args[3]), typeid(Primitive<int>));
    EXPECT_EQ(Boxed<int>(call.args[3]), 3);
    EXPECT_EQ(Boxed<long long>(call.args[4]), 50);

    // A null object argument is an empty entry in its place.
    stub->AcquireLock(nullptr, "s", 1, 1, 1);
    ASSERT_EQ(Last().args.size(), 5u);
    EXPECT_EQ(Last().args[0], nullptr);
    EXPECT_EQ(Boxed<std::string>(Last().args[1]), "s");

    auto faults = MakeStub<Tarn::FaultInjector::FaultInjectionManagerStub>("fim");
    adapter->answer = new Primitive<int>(12);
    EXPECT_EQ(faults->AddFault(nullptr), 12);
    ASSERT_EQ(Last().args.size(), 1u);
    EXPECT_EQ(Last().args[0], nullptr);
    EXPECT_EQ(Last().method, gTarnFaultInjectorFaultInjectionManagerMethodObjects[0]);
    adapter->answer = new Primitive<bool>(true);
    EXPECT_TRUE(faults->RemoveFault(12));
    EXPECT_EQ(Boxed<int>(Last().args[0]), 12);
    EXPECT_EQ(Last().method, gTarnFaultInjectorFaultInjectionManagerMethodObjects[1]);

    // An enumeration travels in a box of its own type.
    using Correlation = Tarn::Rudder::RudderDebugManager::DatastoreCorrelationType;
    auto rudder = MakeStub<Tarn::Rudder::RudderDebugManagerStub>("rudder");
    Ref<DataArray<MoRef>> correlated(new DataArray<MoRef>());
    adapter->answer = correlated.Get();
    Ref<DataArray<MoRef>> found;
    rudder->QueryDatastoreCorrelations(Mo("Datastore", "ds-1").Get(), Correlation::plumbOnly, found);
    EXPECT_EQ(found.Get(), correlated.Get());
    ASSERT_EQ(Last().args.size(), 2u);
    EXPECT_EQ(typeid(*Last().args[1]), typeid(Primitive<Correlation>));
    EXPECT_EQ(Boxed<Correlation>(Last().args[1]), Correlation::plumbOnly);
}

TEST_F(StubTest, TraceOperationAnswersWithTheTaskNotItsResult) {
    auto stub = MakeStub<Tarn::DebugManagerStub>("debug");
    auto target = Mo("VirtualMachine", "vm-7");
    Ref<DataArray<Any>> args(new DataArray<Any>{Ref<Any>(new Primitive<int>(1)).Get()});
    auto task = Mo("Task", "task-42");
    adapter->answer = task.Get();
    Ref<MoRef> result;
    stub->TraceOperation(target.Get(), Orbit::MethodName("cairn.VirtualMachine.powerOn"), args.Get(), result);
    EXPECT_EQ(result.Get(), task.Get());
    EXPECT_EQ(Last().method, gTarnDebugManagerMethodObjects[4]);
    ASSERT_EQ(Last().args.size(), 3u);
    EXPECT_EQ(Last().args[0].Get(), target.Get());
    EXPECT_EQ(Boxed<Orbit::MethodName>(Last().args[1]).GetName(), "cairn.VirtualMachine.powerOn");
    EXPECT_EQ(Last().args[2].Get(), args.Get());

    // The declared result type is the task's business, not the stub's: a trace
    // result in place of the task reference is a type mismatch, and `result` keeps
    // what it held.
    adapter->answer = Make<Tarn::DebugManager::TraceResult>().Get();
    EXPECT_EQ(MessageOf<TypeMismatchException>(
                  [&] { stub->TraceOperation(target.Get(), Orbit::MethodName("m"), nullptr, result); }),
              (MismatchText<MoRef, Any>()));
    EXPECT_EQ(result.Get(), task.Get());
}

TEST_F(StubTest, GettersSendNothingAndUnboxWhatComesBack) {
    auto instance = MakeStub<Tarn::ServiceInstanceStub>("ServiceInstance");
    auto manager = Mo("tarn.DebugManager", "debug");
    adapter->answer = manager.Get();
    Ref<MoRef> result;
    instance->GetDebugManager(result);
    EXPECT_EQ(result.Get(), manager.Get());
    EXPECT_TRUE(Last().args.empty());
    EXPECT_EQ(Last().method, gTarnServiceInstanceMethodObjects[0]);
    adapter->answer = nullptr;  // an absent manager replaces what `result` held
    instance->GetInMemLogBufferManager(result);
    EXPECT_EQ(result, nullptr);
    EXPECT_EQ(Last().method, gTarnServiceInstanceMethodObjects[6]);

    auto action = MakeStub<Tarn::Vmprov::ActionStub>("action-1");
    adapter->answer = new Primitive<std::string>("CopyVmFiles");
    EXPECT_EQ(action->GetName(), "CopyVmFiles");
    EXPECT_TRUE(Last().args.empty());
    EXPECT_EQ(Last().method, gTarnVmprovActionMethodObjects[3]);

    adapter->answer = new Primitive<int>(5);
    EXPECT_EQ(MessageOf<TypeMismatchException>([&] { action->GetName(); }),
              (MismatchText<Primitive<std::string>, Any>()));
    EXPECT_EQ(action->GetContribution(), 5);

    // A by-value member answered with nothing has no value to return.
    adapter->answer = nullptr;
    EXPECT_EQ(MessageOf<TypeMismatchException>([&] { action->GetName(); }),
              std::string("Type Mismatch: expected: ") + typeid(const Primitive<std::string>*).name() +
                  ", found: null");
    EXPECT_EQ(MessageOf<TypeMismatchException>([&] { action->IsCommitted(); }),
              std::string("Type Mismatch: expected: ") + typeid(const Primitive<bool>*).name() + ", found: null");

    // An optional array result may be absent.
    auto logs = MakeStub<Tarn::InMemLogBufferManager::InMemLogBufferManagerStub>("logs");
    Ref<Orbit::Array<std::string>> names(new Orbit::Array<std::string>());
    logs->QueryWhiteList(names);
    EXPECT_EQ(names, nullptr);
    EXPECT_EQ(Last().method, gTarnInMemLogBufferManagerInMemLogBufferManagerMethodObjects[8]);
    logs->AddTaskNamesToWhitelist(nullptr);
    ASSERT_EQ(Last().args.size(), 1u);
    EXPECT_EQ(Last().args[0], nullptr);
}

TEST_F(StubTest, SynchronousAndAsynchronousFormsSendTheSameCall) {
    Ref<Probe<Tarn::DebugManagerStub>> stub(new Probe<Tarn::DebugManagerStub>("debug", adapter.Get(), context.Get()));
    stub->MarkLogs("mark 1");
    int callbacks = 0;
    Ref<ScheduledItem> item;
    stub->MarkLogs("mark 1", [&](ScheduledItem*, Kernite::Exception*, Any*) { ++callbacks; }, item);

    ASSERT_EQ(adapter->calls.size(), 2u);
    const Call& sync = adapter->calls[0];
    const Call& async = adapter->calls[1];
    EXPECT_FALSE(sync.started);
    EXPECT_TRUE(async.started);
    EXPECT_EQ(sync.method, gTarnDebugManagerMethodObjects[3]);
    EXPECT_EQ(async.method, sync.method);
    ASSERT_EQ(async.args.size(), 1u);
    EXPECT_EQ(typeid(*async.args[0]), typeid(Primitive<std::string>));
    EXPECT_EQ(Boxed<std::string>(async.args[0]), "mark 1");
    EXPECT_EQ(item.Get(), adapter->item.Get());
    EXPECT_EQ(callbacks, 0);  // the stub itself never completes the call
    EXPECT_EQ(stub->entries, (std::vector<std::string>{"_Invoke_Task", "_StartInvoke_Task"}));

    // A managed object reference out-parameter has no place in the asynchronous form.
    stub->GetAlarmTestManager([](ScheduledItem*, Kernite::Exception*, Any*) {}, item);
    EXPECT_TRUE(Last().started);
    EXPECT_TRUE(Last().args.empty());
    EXPECT_EQ(Last().method, gTarnDebugManagerMethodObjects[10]);
}

TEST_F(StubTest, DerivedStubsAnswerInheritedMembersWithTheirDeclaringEntries) {
    Ref<Probe<Tarn::Vmprov::InvokeCallbacksStub>> stub(
        new Probe<Tarn::Vmprov::InvokeCallbacksStub>("callbacks", adapter.Get(), nullptr));
    EXPECT_EQ(stub->_GetType(), Orbit::GetType<Tarn::Vmprov::InvokeCallbacks>());

    stub->Finalize();
    EXPECT_EQ(Last().method, gTarnVmprovFinallyActionMethodObjects[0]);
    adapter->answer = new Primitive<bool>(true);
    EXPECT_TRUE(stub->Undo());
    EXPECT_EQ(Last().method, gTarnVmprovUndoableActionMethodObjects[0]);
    EXPECT_TRUE(stub->IsIdempotent());
    EXPECT_EQ(Last().method, gTarnVmprovUndoableActionMethodObjects[4]);
    adapter->answer = new Primitive<std::string>("InvokeCallbacks");
    Tarn::Vmprov::Action& asAction = *stub;
    EXPECT_EQ(asAction.GetName(), "InvokeCallbacks");
    EXPECT_EQ(Last().method, gTarnVmprovActionMethodObjects[3]);
    adapter->answer = nullptr;
    Ref<DataArray<Tarn::Vmprov::TaskTrackingInfo>> tasks;
    stub->GetTasksToTrack(tasks);
    EXPECT_EQ(Last().method, gTarnVmprovActionMethodObjects[10]);
    EXPECT_EQ(Last().context, nullptr);
    EXPECT_EQ(stub->entries.size(), 5u);
    for (const std::string& entry : stub->entries) EXPECT_EQ(entry, "_Invoke_Task");

    // Each handle belongs to the interface that declares the member.
    EXPECT_EQ(gTarnVmprovFinallyActionMethodObjects[0]->GetDeclaringType(),
              Orbit::GetType<Tarn::Vmprov::FinallyAction>());
    EXPECT_EQ(gTarnVmprovUndoableActionMethodObjects[0]->GetDeclaringType(),
              Orbit::GetType<Tarn::Vmprov::UndoableAction>());
}

TEST_F(StubTest, AVoidMemberThatReceivesAResultBreaksItsInvariant) {
    GTEST_FLAG_SET(death_test_style, "threadsafe");
    auto stub = MakeStub<Tarn::DebugManagerStub>("debug");
    adapter->answer = new Primitive<int>(1);
    EXPECT_DEATH(stub->MarkLogs("m"), "_resultObj == __null.*tarn/stub:[0-9]+");
    auto finalizer = MakeStub<Tarn::Vmprov::FinallyActionStub>("finally");
    EXPECT_DEATH(finalizer->Finalize(), "_resultObj == __null.*tarn/vmprov/stub:[0-9]+");
    adapter->answer = nullptr;
}

}  // namespace
