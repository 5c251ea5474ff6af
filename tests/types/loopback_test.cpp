// Calls that leave through a generated stub and arrive through the generated
// dispatch (invokeMember) at a hand-written implementation, in one process.
#include <gtest/gtest.h>

#include <memory>
#include <string>

#include "orbit/Loopback.h"
#include "support.h"
#include "tarn/fault.h"
#include "tarn/faultInjector.h"
#include "tarn/tarn.h"

using Kernite::Ref;
using Kernite::System::ScheduledItem;
using Orbit::Any;
using Orbit::DataArray;
using Orbit::MoRef;
using Orbit::Primitive;
using Tarn::Fault::SecurityConfigFault;
using Tarn::FaultInjector::Fault;
using namespace TypesTest;

namespace {

class DebugManagerImpl : public Orbit::ManagedObjectImpl, public virtual Tarn::DebugManager {
public:
    using ManagedObjectImpl::ManagedObjectImpl;

    std::string marked;
    std::string configKey;
    Ref<Any> configValue;
    Ref<MoRef> tracedObject;
    std::string tracedMethod;
    int shutdowns = 0;

    void GetFaultManager(Ref<MoRef>& result) override { result = Mo("tarn.faultInjector.FaultInjectionManager", "fim"); }
    void GetCompatManager(Ref<MoRef>& result) override { result = nullptr; }
    void GetAlertManager(Ref<MoRef>& result) override { result = Mo("tarn.AlertManager", "alerts"); }
    void GetRudderDebugManager(Ref<MoRef>& result) override { result = nullptr; }
    void GetDvsTestManager(Ref<MoRef>& result) override { result = nullptr; }
    void GetAlarmTestManager(Ref<MoRef>& result) override { result = nullptr; }
    void UpdateConfig(const std::string& key, Any* value) override {
        configKey = key;
        configValue = value;
    }
    void Shutdown() override { ++shutdowns; }
    void RearrangeLayoutEx(DataArray<Orbit::KeyAnyValue>*, Cairn::Vm::FileLayoutEx* newLayout,
                           Ref<Cairn::Vm::FileLayoutEx>& result) override {
        result = newLayout;
    }
    void MarkLogs(const std::string& message) override { marked = message; }
    void TraceOperation(MoRef* mo, const Orbit::MethodName& method, DataArray<Any>*, Ref<MoRef>& result) override {
        tracedObject = mo;
        tracedMethod = method.GetName();
        result = Mo("Task", "task-trace");
    }
};

class FaultInjectionManagerImpl : public Orbit::ManagedObjectImpl,
                                  public virtual Tarn::FaultInjector::FaultInjectionManager {
public:
    using ManagedObjectImpl::ManagedObjectImpl;
    Ref<DataArray<Fault>> faults{new DataArray<Fault>()};

    void GetFaults(Ref<DataArray<Fault>>& result) override { result = faults; }
    int AddFault(Fault* fault) override {
        faults->Append(fault);
        return fault->GetKey();
    }
    bool RemoveFault(int key) override {
        for (int i = 0; i < faults->GetLength(); ++i) {
            if (faults->GetAt(i)->GetKey() == key) {
                faults->RemoveAt(i);
                return true;
            }
        }
        return false;
    }
};

class SecurityManagerImpl : public Orbit::ManagedObjectImpl, public virtual Tarn::SecurityManager {
public:
    using ManagedObjectImpl::ManagedObjectImpl;
    void ReloadSslCertificate() override {
        auto fault = Make<SecurityConfigFault>();
        fault->SetMsg("certificate expired");
        fault->Throw();
    }
};

template <class T>
Orbit::ManagedObjectType* ManagedType() {
    return Orbit::GetTypeHelper<T, Orbit::ManagedObjectType>();
}

// What a completion callback saw, kept past the call.
struct Completion {
    int calls = 0;
    std::unique_ptr<Kernite::Exception> failure;
    Ref<Any> result;

    Orbit::CompletionCallback Callback() {
        return [this](ScheduledItem*, Kernite::Exception* e, Any* value) {
            ++calls;
            if (e) failure.reset(e->Clone());
            result = value;
        };
    }
};

class LoopbackTest : public NoLeakTest {
protected:
    void SetUp() override {
        NoLeakTest::SetUp();
        adapter = new Orbit::LoopbackAdapter();
    }
    void TearDown() override {
        // Stubs hold the adapter; the adapter joins its worker when released.
        adapter->Shutdown();
        adapter = nullptr;
        NoLeakTest::TearDown();
    }

    // A stub made by the createStub function of the type's own record.
    template <class Stub, class Interface>
    Ref<Stub> StubFromRecord(const std::string& id) {
        const Orbit::ManagedTypeInfo* info = ManagedType<Interface>()->GetManagedTypeInfo();
        Ref<Orbit::ManagedObject> made(info->createStub(id, adapter.Get(), nullptr));
        return Ref<Stub>(Kernite::NarrowToType<Stub, Orbit::ManagedObject>(made.Get()));
    }

    Ref<Orbit::LoopbackAdapter> adapter;
};

TEST_F(LoopbackTest, DebugManagerCallsReachTheImplementation) {
    Ref<DebugManagerImpl> impl(new DebugManagerImpl("debug"));
    adapter->Register("debug", impl.Get());
    auto stub = StubFromRecord<Tarn::DebugManagerStub, Tarn::DebugManager>("debug");
    ASSERT_NE(stub, nullptr);
    Ref<MoRef> self = stub->_GetRef();
    EXPECT_EQ(self->GetType(), "tarn.DebugManager");
    EXPECT_EQ(self->GetId(), "debug");

    stub->MarkLogs("before upgrade");
    EXPECT_EQ(impl->marked, "before upgrade");
    Ref<Any> level(new Primitive<int>(3));
    stub->UpdateConfig("log.level", level.Get());
    EXPECT_EQ(impl->configKey, "log.level");
    EXPECT_EQ(impl->configValue.Get(), level.Get());
    stub->Shutdown();
    EXPECT_EQ(impl->shutdowns, 1);

    Ref<MoRef> task;
    auto vm = Mo("VirtualMachine", "vm-3");
    stub->TraceOperation(vm.Get(), Orbit::MethodName("cairn.VirtualMachine.reset"), nullptr, task);
    ASSERT_NE(task, nullptr);
    EXPECT_EQ(task->GetId(), "task-trace");
    EXPECT_EQ(impl->tracedObject.Get(), vm.Get());
    EXPECT_EQ(impl->tracedMethod, "cairn.VirtualMachine.reset");

    Ref<MoRef> manager;
    stub->GetFaultManager(manager);
    EXPECT_EQ(manager->GetId(), "fim");
    stub->GetCompatManager(manager);
    EXPECT_EQ(manager, nullptr);
    stub->GetAlertManager(manager);
    EXPECT_EQ(manager->GetId(), "alerts");

    auto layout = Make<Cairn::Vm::FileLayoutEx>();
    Ref<Cairn::Vm::FileLayoutEx> arranged;
    stub->RearrangeLayoutEx(nullptr, layout.Get(), arranged);
    EXPECT_EQ(arranged.Get(), layout.Get());
    impl->tracedObject = nullptr;
    impl->configValue = nullptr;
}

TEST_F(LoopbackTest, FaultInjectionResultsComeBackUnboxedSyncAndAsync) {
    Ref<FaultInjectionManagerImpl> impl(new FaultInjectionManagerImpl("fim"));
    adapter->Register("fim", impl.Get());
    Ref<Orbit::ManagedObject> made =
        adapter->CreateStub("fim", ManagedType<Tarn::FaultInjector::FaultInjectionManager>());
    auto* stub = Kernite::NarrowToType<Tarn::FaultInjector::FaultInjectionManagerStub, Orbit::ManagedObject>(made.Get());
    ASSERT_NE(stub, nullptr);

    auto fault = Make<Fault>(7, Kernite::Optional<std::string>("crash on 40%"),
                             Make<Tarn::FaultInjector::NameTarget>(std::string("svc-a")).Get(),
                             Make<Tarn::FaultInjector::ProgressTrigger>(40).Get(),
                             Make<Tarn::FaultInjector::CrashAction>().Get());
    EXPECT_EQ(stub->AddFault(fault.Get()), 7);
    ASSERT_EQ(impl->faults->GetLength(), 1);
    EXPECT_EQ(impl->faults->GetAt(0), fault.Get());
    Ref<DataArray<Fault>> planted;
    stub->GetFaults(planted);
    EXPECT_EQ(planted.Get(), impl->faults.Get());
    EXPECT_TRUE(stub->RemoveFault(7));
    EXPECT_FALSE(stub->RemoveFault(7));

    Completion done;
    Ref<ScheduledItem> item;
    auto second = Make<Fault>(8, Kernite::Optional<std::string>(), nullptr, nullptr, nullptr);
    stub->AddFault(second.Get(), done.Callback(), item);
    ASSERT_NE(item, nullptr);
    ASSERT_TRUE(item->WaitFor(std::chrono::seconds(10)));
    EXPECT_FALSE(item->IsFailed());
    EXPECT_EQ(done.calls, 1);
    EXPECT_EQ(done.failure, nullptr);
    auto* key = dynamic_cast<Primitive<int>*>(done.result.Get());
    ASSERT_NE(key, nullptr);
    EXPECT_EQ(key->GetValue(), 8);
    impl->faults->Clear();
}

TEST_F(LoopbackTest, ADeclaredFaultReachesTheCallerAsItsOwnClass) {
    Ref<SecurityManagerImpl> impl(new SecurityManagerImpl("security"));
    adapter->Register("security", impl.Get());
    auto stub = StubFromRecord<Tarn::SecurityManagerStub, Tarn::SecurityManager>("security");

    try {
        stub->ReloadSslCertificate();
        ADD_FAILURE() << "no fault";
    } catch (const SecurityConfigFault::Exception& e) {
        EXPECT_EQ(typeid(e), typeid(SecurityConfigFault::Exception));
        ASSERT_NE(e.GetFault(), nullptr);
        EXPECT_EQ(typeid(*e.GetFault()), typeid(SecurityConfigFault));
        EXPECT_EQ(e.GetFault()->GetMsg(), "certificate expired");
        EXPECT_STREQ(e.what(), "tarn.fault.SecurityConfigFault");
    }

    Completion done;
    Ref<ScheduledItem> item;
    stub->ReloadSslCertificate(done.Callback(), item);
    ASSERT_TRUE(item->WaitFor(std::chrono::seconds(10)));
    EXPECT_TRUE(item->IsFailed());
    EXPECT_EQ(done.calls, 1);
    EXPECT_EQ(done.result, nullptr);
    ASSERT_NE(done.failure, nullptr);
    EXPECT_EQ(typeid(*done.failure), typeid(SecurityConfigFault::Exception));
    auto& reported = static_cast<SecurityConfigFault::Exception&>(*done.failure);
    EXPECT_EQ(reported.GetFault()->GetMsg(), "certificate expired");
    ASSERT_NE(item->GetException(), nullptr);
    EXPECT_EQ(typeid(*item->GetException()), typeid(SecurityConfigFault::Exception));
    done.failure.reset();
}

TEST_F(LoopbackTest, DispatchChecksItsTargetArgumentsAndMemberNumber) {
    Ref<DebugManagerImpl> impl(new DebugManagerImpl("debug"));
    Ref<SecurityManagerImpl> security(new SecurityManagerImpl("security"));
    const Orbit::ManagedTypeInfo* info = ManagedType<Tarn::DebugManager>()->GetManagedTypeInfo();

    Kernite::RefVector<Any> none(0);
    Ref<Any> result(new Primitive<int>(1));
    info->invokeMember(impl.Get(), 5, none, result);  // a property getter by member number
    auto* manager = dynamic_cast<MoRef*>(result.Get());
    ASSERT_NE(manager, nullptr);
    EXPECT_EQ(manager->GetId(), "fim");

    info->invokeMember(impl.Get(), 11, none, result);  // past the members: nothing, result cleared
    EXPECT_EQ(result, nullptr);
    EXPECT_EQ(impl->marked, "");

    Kernite::RefVector<Any> message(1);
    message[0] = new Primitive<std::string>("dispatched");
    info->invokeMember(impl.Get(), 3, message, result);
    EXPECT_EQ(impl->marked, "dispatched");
    EXPECT_EQ(result, nullptr);

    EXPECT_EQ(MessageOf<Kernite::TypeMismatchException>([&] { info->invokeMember(security.Get(), 3, message, result); }),
              (MismatchText<Tarn::DebugManager, Orbit::ManagedObject>()));
    Kernite::RefVector<Any> wrongBox(1);
    wrongBox[0] = new Primitive<int>(4);
    EXPECT_EQ(MessageOf<Kernite::TypeMismatchException>([&] { info->invokeMember(impl.Get(), 3, wrongBox, result); }),
              (MismatchText<Primitive<std::string>, Any>()));
    EXPECT_THROW(info->invokeMember(impl.Get(), 3, none, result), Kernite::InvalidArgumentException);
    EXPECT_EQ(impl->marked, "dispatched");
}

}  // namespace
