// Allocation failure at every allocation of copying, cloning, converting, calling
// and throwing: whichever allocation fails, std::bad_alloc comes out, nothing
// leaks (the live-object count returns to what it was) and the source is
// unchanged.
#include <gtest/gtest.h>

#include <memory>
#include <new>
#include <stdexcept>

#include "failing_allocator.h"
#include "orbit/Loopback.h"
#include "tarn/types.h"
#include "values.h"

namespace {

using Kernite::Ref;
using Reliability::ArmAllocator;
using Reliability::DisarmAllocator;

long LiveObjects() { return Kernite::ObjectImpl::LiveObjects(); }

// Disarms on the way out, whatever leaves the operation.
struct Armed {
    explicit Armed(long failAt) { ArmAllocator(failAt); }
    ~Armed() { DisarmAllocator(); }
    Armed(const Armed&) = delete;
    Armed& operator=(const Armed&) = delete;
};

// Runs `op` once to fill first-use caches, counts its allocations on a second run,
// then fails each of them in turn. After every failure (allocator disarmed) the
// live-object count must be back and `unchanged()` must hold.
template <class Op, class Unchanged>
void FailEveryAllocation(const char* what, Op op, Unchanged unchanged) {
    op();
    long total = 0;
    {
        Armed counting(0);
        op();
        total = DisarmAllocator();
    }
    EXPECT_GT(total, 0) << what;
    for (long k = 1; k <= total; ++k) {
        const long live = LiveObjects();
        bool threw = false;
        try {
            Armed failing(k);
            op();
        } catch (const std::bad_alloc&) {
            threw = true;
        }
        EXPECT_TRUE(threw) << what << ": allocation " << k << " of " << total << " failed and nothing was thrown";
        EXPECT_EQ(LiveObjects(), live) << what << ": objects leaked when allocation " << k << " failed";
        EXPECT_TRUE(unchanged()) << what << ": source changed when allocation " << k << " failed";
        if (::testing::Test::HasFailure()) return;
    }
}

Orbit::DataObjectType* DataType(Orbit::Type* type) { return Kernite::NarrowToType<Orbit::DataObjectType, Orbit::Type>(type); }

// A fully populated object of T: every property of its chain set, nested objects
// three levels deep, arrays of two items (so a VmState carries a snapshot tree).
template <class T>
Ref<T> Populated(std::uint32_t seed) {
    Ref<Orbit::DataObject> object = Reliability::MakePopulated(DataType(Orbit::GetType<T>()), seed, 3, 2);
    return Ref<T>(Kernite::NarrowToType<T, Orbit::DataObject>(object.Get()));
}

template <class T>
Ref<T> CopyOf(const Ref<T>& source) {
    return Ref<T>(new T(*source));
}

bool Same(Orbit::Any* a, Orbit::Any* b) { return a->_IsEqual(b, true); }

template <class T>
void CopyAndClone(const char* name, std::uint32_t seed) {
    Ref<T> source = Populated<T>(seed);
    Ref<T> before = CopyOf(source);
    EXPECT_TRUE(Same(before.Get(), source.Get())) << name;
    const std::string copying = std::string("copy constructor of ") + name;
    const std::string cloning = std::string("_Clone of ") + name;
    FailEveryAllocation(
        copying.c_str(), [&] { Ref<T> copy(new T(*source)); },
        [&] { return Same(source.Get(), before.Get()); });
    FailEveryAllocation(
        cloning.c_str(), [&] { Ref<Orbit::Any> clone(source->_Clone()); },
        [&] { return Same(source.Get(), before.Get()); });
}

// Every object is a failure point wherever its memory comes from (the global
// operator new, or Kernite's own allocator through its failure probe), and an
// object array keeps its first items inside itself.
TEST(AllocationFailure, EachObjectAndEachItemBlockIsOneAllocation) {
    using Item = Cairn::Vm::ConfigInfo;
    constexpr int kInline = Orbit::DataObjectArrayBase::kInlineItems;
    Ref<Item> item(new Item());
    const struct {
        const char* what;
        int items;
        long allocations;
    } cases[] = {{"an empty record", -1, 1}, {"an empty array", 0, 1}, {"an array of inline items", kInline, 1},
                 {"an array with an item block", kInline + 1, 2}};
    auto make = [&](int items) {
        if (items < 0) {
            Ref<Item> made(new Item());
            return;
        }
        Ref<Orbit::DataArray<Item>> array(new Orbit::DataArray<Item>());
        for (int i = 0; i < items; ++i) array->Append(item.Get());
    };
    for (const auto& c : cases) {
        long counted = 0;
        {
            Armed counting(0);
            make(c.items);
            counted = DisarmAllocator();
        }
        EXPECT_EQ(counted, c.allocations) << c.what;
        const long live = LiveObjects();
        bool threw = false;
        try {
            Armed failing(c.allocations);  // the last one
            make(c.items);
        } catch (const std::bad_alloc&) {
            threw = true;
        }
        EXPECT_TRUE(threw) << c.what;
        EXPECT_EQ(LiveObjects(), live) << c.what;
    }
    EXPECT_EQ(item->GetRefCount(), 1);
}

TEST(AllocationFailure, CopiesAndClonesOfPopulatedObjects) {
    CopyAndClone<Tarn::Vmprov::VmState>("VmState", 11);
    CopyAndClone<Tarn::Vmprov::HostState>("HostState", 12);
    CopyAndClone<Tarn::Vmprov::CloneContext>("CloneContext", 13);
    CopyAndClone<Tarn::Ft::FtVmInfo>("FtVmInfo", 14);

    // The snapshot tree really is a tree: the copies above walked nested arrays.
    Ref<Tarn::Vmprov::VmState> vm = Populated<Tarn::Vmprov::VmState>(11);
    ASSERT_EQ(vm->GetRootSnapshot()->GetLength(), 2);
    int nested = 0;
    for (int i = 0; i < 2; ++i)
        if (auto* snapshot = vm->GetRootSnapshot()->GetAt(i)) nested += snapshot->GetChildSnapshot()->GetLength();
    EXPECT_GT(nested, 0);
}

TEST(AllocationFailure, EnumerationConversions) {
    using Mode = Tarn::LockStresser::LockMode;
    auto* type = Kernite::NarrowToType<Orbit::EnumType, Orbit::Type>(Orbit::GetType<Mode>());
    Ref<Orbit::Array<std::string>> tags(new Orbit::Array<std::string>({"x", "sall", "s", "xall", "x", "s"}));
    Ref<Orbit::Array<Mode>> values(new Orbit::Array<Mode>({Mode::sall, Mode::x, Mode::xall, Mode::s, Mode::s}));
    Ref<Orbit::Any> tagsBefore(tags->_Clone());
    Ref<Orbit::Any> valuesBefore(values->_Clone());

    // `out` keeps what it held when the conversion fails.
    Ref<Orbit::Any> enumOut(new Orbit::Array<Mode>({Mode::x}));
    Orbit::Any* enumSentinel = enumOut.Get();
    Ref<Orbit::Array<std::string>> stringOut(new Orbit::Array<std::string>({"kept"}));
    Orbit::Array<std::string>* stringSentinel = stringOut.Get();

    FailEveryAllocation(
        "StringArrayToEnumArray",
        [&] {
            Ref<Orbit::Any> out = enumOut;
            type->StringArrayToEnumArray(tags.Get(), enumOut);
            enumOut = out;  // back to the sentinel for the next round
        },
        [&] { return enumOut.Get() == enumSentinel && Same(tags.Get(), tagsBefore.Get()); });
    FailEveryAllocation(
        "EnumArrayToStringArray",
        [&] {
            Ref<Orbit::Array<std::string>> out = stringOut;
            type->EnumArrayToStringArray(values.Get(), stringOut);
            stringOut = out;
        },
        [&] { return stringOut.Get() == stringSentinel && Same(values.Get(), valuesBefore.Get()); });

    // The last, unfailed round converted for real.
    Ref<Orbit::Any> out;
    type->StringArrayToEnumArray(tags.Get(), out);
    EXPECT_TRUE(Same(out.Get(), Ref<Orbit::Any>(new Orbit::Array<Mode>({Mode::x, Mode::sall, Mode::s, Mode::xall,
                                                                          Mode::x, Mode::s})).Get()));
}

// A small server-side implementation: it answers with new objects, so that results
// allocate too.
class Factory : public Orbit::ManagedObjectImpl, public virtual Tarn::Vmprov::ActionFactory {
public:
    Factory() : Orbit::ManagedObjectImpl("factory-1") {}

    void CreateAction(const std::string& actionType, Tarn::Vmprov::Action::Input* input,
                      Ref<Orbit::MoRef>& result) override {
        result = new Orbit::MoRef("tarn.vmprov.Action", actionType + (input ? "/configured" : "/bare"));
    }
    void DestroyAction(Orbit::MoRef*) override {}
    void CreateDefaultActionInput(Orbit::MoRef*, Ref<Tarn::Vmprov::Action::Input>& result) override {
        result = new Tarn::Vmprov::Action::Input();
    }
    void CreateMigrateActionInput(Orbit::MoRef* vm, Cairn::Vm::RelocateSpec*, Cairn::VirtualMachine::MovePriority,
                                  bool, Ref<Tarn::Vmprov::Action::Input>& result) override {
        Ref<Tarn::Vmprov::VmContext> context(new Tarn::Vmprov::VmContext());
        Ref<Tarn::Vmprov::VmState> state(new Tarn::Vmprov::VmState());
        state->SetVm(vm);
        state->SetVmPathName("[datastore-with-a-long-name] vm/vm.cfg");
        context->SetSrcVmState(state.Get());
        result = new Tarn::Vmprov::Action::Input(context.Get(), nullptr);
    }
};

TEST(AllocationFailure, StubCallsThroughTheLoopbackAdapter) {
    Ref<Orbit::LoopbackAdapter> adapter(new Orbit::LoopbackAdapter());
    adapter->Register("factory-1", Ref<Factory>(new Factory()).Get());
    Ref<Tarn::Vmprov::ActionFactoryStub> stub(new Tarn::Vmprov::ActionFactoryStub("factory-1", adapter.Get(), nullptr));

    Ref<Tarn::Vmprov::Action::Input> input = Populated<Tarn::Vmprov::Action::Input>(21);
    Ref<Tarn::Vmprov::Action::Input> inputBefore = CopyOf(input);
    Ref<Orbit::MoRef> vm(new Orbit::MoRef("cairn.VirtualMachine", "vm-with-a-long-identifier-42"));
    Ref<Orbit::MoRef> vmBefore(new Orbit::MoRef(*vm));
    Ref<Cairn::Vm::RelocateSpec> spec(new Cairn::Vm::RelocateSpec());
    const std::string actionType = "tarn.vmprov.CreateSnapshot-with-a-long-name";

    // A result parameter keeps what it held unless the call completed.
    Ref<Orbit::MoRef> actionSentinel(new Orbit::MoRef("tarn.vmprov.Action", "sentinel"));
    Ref<Orbit::MoRef> action = actionSentinel;
    Ref<Tarn::Vmprov::Action::Input> inputSentinel(new Tarn::Vmprov::Action::Input());
    Ref<Tarn::Vmprov::Action::Input> made = inputSentinel;

    FailEveryAllocation(
        "CreateAction",
        [&] {
            stub->CreateAction(actionType, input.Get(), action);
            action = actionSentinel;
        },
        [&] { return action == actionSentinel && Same(input.Get(), inputBefore.Get()); });
    FailEveryAllocation(
        "CreateMigrateActionInput",
        [&] {
            stub->CreateMigrateActionInput(vm.Get(), spec.Get(), Cairn::VirtualMachine::MovePriority::highPriority, true,
                                           made);
            made = inputSentinel;
        },
        [&] { return made == inputSentinel && Same(vm.Get(), vmBefore.Get()); });
    FailEveryAllocation(
        "DestroyAction", [&] { stub->DestroyAction(vm.Get()); }, [&] { return Same(vm.Get(), vmBefore.Get()); });

    // Unfailed, the calls deliver what the implementation answered.
    stub->CreateAction(actionType, input.Get(), action);
    EXPECT_EQ(action->GetId(), actionType + "/configured");
    stub->CreateMigrateActionInput(vm.Get(), spec.Get(), Cairn::VirtualMachine::MovePriority::highPriority, true, made);
    auto* context = Kernite::NarrowToType<Tarn::Vmprov::VmContext, Orbit::DataObject>(made->GetContext());
    ASSERT_NE(context, nullptr);
    EXPECT_TRUE(Same(context->GetSrcVmState()->GetVm(), vm.Get()));
    adapter->Shutdown();
}

TEST(AllocationFailure, FaultExceptions) {
    using Fault = Tarn::Fault::SecurityConfigFault;
    Ref<Fault> fault = Populated<Fault>(31);
    Ref<Fault> faultBefore = CopyOf(fault);
    const int references = fault->GetRefCount();
    std::unique_ptr<Fault::Exception> stored(fault->CreateException());
    const std::string message = stored->what();
    EXPECT_EQ(message, "tarn.fault.SecurityConfigFault");
    auto unchanged = [&] {
        return Same(fault.Get(), faultBefore.Get()) && fault->GetRefCount() == references + 1 &&
               stored->GetFault() == fault.Get() && message == stored->what();
    };

    FailEveryAllocation(
        "SecurityConfigFault::Throw",
        [&] {
            try {
                fault->Throw();
            } catch (const Fault::Exception& e) {
                if (e.GetFault() != fault.Get()) throw std::logic_error("the exception reports another fault");
            }
        },
        unchanged);
    FailEveryAllocation(
        "SecurityConfigFault::CreateException",
        [&] { std::unique_ptr<Fault::Exception> e(fault->CreateException()); }, unchanged);
    FailEveryAllocation(
        "SecurityConfigFault::Exception::Clone", [&] { std::unique_ptr<Fault::Exception> e(stored->Clone()); },
        unchanged);
    FailEveryAllocation(
        "SecurityConfigFault::Exception::Throw",
        [&] {
            try {
                stored->Throw();
            } catch (const Fault::Exception& e) {
                if (e.GetFault() != fault.Get()) throw std::logic_error("the exception reports another fault");
            }
        },
        unchanged);
}

}  // namespace
