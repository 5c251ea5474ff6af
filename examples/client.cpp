// The client half of the worked example. It knows only the service instance's
// reference and reaches everything else through stubs, the way a remote client
// would: each getter hands back a managed object reference, and the reference's
// type names the stub to make for it.
#include "client.h"

#include "cairn/cairn.h"

namespace Example {
namespace {

using Kernite::Ref;
using namespace Tarn::FaultInjector;

// A stub of class S for the object that `ref` names.
template <class S>
Ref<S> StubOf(const StubMaker& makeStub, const Orbit::MoRef* ref) {
    if (ref == nullptr) throw Kernite::InvalidArgumentException(std::string("null reference"));
    Ref<Orbit::ManagedObject> stub = makeStub(ref);
    return Ref<S>(Kernite::NarrowToType<S, Orbit::ManagedObject>(stub.Get()));
}

Ref<Fault> MakeFault(const std::string& description, const std::string& name, int percent, Orbit::MethodFault* thrown) {
    Ref<NameTarget> target(new NameTarget(name));
    Ref<ProgressTrigger> trigger(new ProgressTrigger(percent));
    Ref<ExceptionAction> action(new ExceptionAction(thrown));
    return Ref<Fault>(new Fault(0, description, target.Get(), trigger.Get(), action.Get()));
}

void ListFaults(Transcript& out, Orbit::DataArray<Fault>* faults) {
    out.Line("client: " + std::to_string(faults->GetLength()) + " fault(s) planted");
    for (int i = 0; i < faults->GetLength(); ++i) out.Line("client:   " + Describe(faults->GetAt(i)));
}

// A snapshot with `children` children, each with one child of its own.
Ref<Tarn::Vmprov::SnapshotState> Snapshot(const std::string& name, int id, int children) {
    Ref<Orbit::DataArray<Tarn::Vmprov::SnapshotState>> below(new Orbit::DataArray<Tarn::Vmprov::SnapshotState>());
    for (int i = 0; i < children; ++i)
        below->Append(Snapshot(name + "." + std::to_string(i + 1), id * 10 + i + 1, children > 1 ? 1 : 0).Get());
    Ref<Orbit::MoRef> ref(new Orbit::MoRef("VirtualMachineSnapshot", "snapshot-" + std::to_string(id)));
    Ref<Cairn::Vm::ConfigInfo> config(new Cairn::Vm::ConfigInfo());
    return Ref<Tarn::Vmprov::SnapshotState>(
        new Tarn::Vmprov::SnapshotState(ref.Get(), name, id, config.Get(), children ? below.Get() : nullptr));
}

int CountSnapshots(Orbit::DataArray<Tarn::Vmprov::SnapshotState>* snapshots) {
    int count = 0;
    for (int i = 0; snapshots != nullptr && i < snapshots->GetLength(); ++i)
        count += 1 + CountSnapshots(snapshots->GetAt(i)->GetChildSnapshot());
    return count;
}

}  // namespace

int RunClient(Transcript& out, const Orbit::MoRef* root, const StubMaker& makeStub) {
    auto instance = StubOf<Tarn::ServiceInstanceStub>(makeStub, root);
    Ref<Orbit::MoRef> debugRef;
    instance->GetDebugManager(debugRef);
    out.Line("client: ServiceInstance.debugManager -> " + debugRef->ToString());
    auto debug = StubOf<Tarn::DebugManagerStub>(makeStub, debugRef.Get());
    debug->MarkLogs("example client connected");

    Ref<Orbit::MoRef> faultsRef;
    debug->GetFaultManager(faultsRef);
    out.Line("client: DebugManager.faultManager -> " + faultsRef->ToString());
    auto faults = StubOf<FaultInjectionManagerStub>(makeStub, faultsRef.Get());

    Ref<Orbit::MethodFault> diskFull(new Orbit::MethodFault());
    diskFull->SetMsg("disk full");
    const int copyKey = faults->AddFault(MakeFault("fail the copy halfway", "vmprov.CopyVmFiles", 50, diskFull.Get()).Get());
    out.Line("client: addFault -> key " + std::to_string(copyKey));
    Ref<Tarn::Fault::SecurityConfigFault> noCertificate(new Tarn::Fault::SecurityConfigFault());
    noCertificate->SetMsg("certificate expired");
    const int powerKey =
        faults->AddFault(MakeFault("refuse the power-on", "vmprov.PowerOnVm", 90, noCertificate.Get()).Get());
    out.Line("client: addFault -> key " + std::to_string(powerKey));

    Ref<Orbit::DataArray<Fault>> planted;
    faults->GetFaults(planted);
    ListFaults(out, planted.Get());

    out.Line(std::string("client: removeFault(") + std::to_string(copyKey) + ") -> " +
             (faults->RemoveFault(copyKey) ? "true" : "false"));
    out.Line(std::string("client: removeFault(") + std::to_string(copyKey) + ") again -> " +
             (faults->RemoveFault(copyKey) ? "true" : "false"));

    // The same read, asynchronously: the callback runs on the adapter's thread.
    Ref<Orbit::DataArray<Fault>> remaining;
    Ref<Kernite::System::ScheduledItem> item;
    faults->GetFaults([&remaining](Kernite::System::ScheduledItem*, Kernite::Exception* failure, Orbit::Any* result) {
        if (failure == nullptr) remaining = Kernite::NarrowToType<Orbit::DataArray<Fault>, Orbit::Any>(result);
    }, item);
    item->Wait();
    if (item->IsFailed()) throw Kernite::Exception(std::string("faults unreadable: ") + item->GetException()->what());
    out.Line("client: faults read asynchronously:");
    ListFaults(out, remaining.Get());

    // Locks on the two managers, by their references.
    Ref<Orbit::MoRef> locksRef;
    instance->GetLockStresser(locksRef);
    auto locks = StubOf<Tarn::LockStresserStub>(makeStub, locksRef.Get());
    Ref<Orbit::DataArray<Orbit::MoRef>> objects(new Orbit::DataArray<Orbit::MoRef>{debugRef.Get(), faultsRef.Get()});
    locks->AcquireLock(objects.Get(), Tarn::LockStresser::LOCKMODE_X, 5, 2, 1);
    out.Line("client: acquireLock x on " + std::to_string(objects->GetLength()) + " objects, twice -> done");

    // A snapshot tree, saved and read back.
    Ref<Orbit::MoRef> storeRef;
    instance->GetDbSerializer(storeRef);
    auto store = StubOf<Tarn::DbSerializer::DbSerializerManagerStub>(makeStub, storeRef.Get());
    Ref<Orbit::DataArray<Tarn::Vmprov::SnapshotState>> roots(
        new Orbit::DataArray<Tarn::Vmprov::SnapshotState>{Snapshot("base", 1, 2).Get()});
    Ref<Orbit::MoRef> vm(new Orbit::MoRef("VirtualMachine", "vm-7"));
    Ref<Tarn::Vmprov::VmState> state(new Tarn::Vmprov::VmState(
        vm.Get(), "/store-1/vm-7/config", Cairn::VirtualMachine::PowerState::poweredOn, new Cairn::Vm::ConfigInfo(),
        new Cairn::Vm::FileLayoutEx(), new Cairn::Vm::Capability(), roots.Get()));
    store->SaveDataObject(7, state.Get());
    Ref<Orbit::Any> loaded;
    store->LoadDataObject(7, "tarn.vmprov.VmState", loaded);
    auto* back = Kernite::NarrowToType<Tarn::Vmprov::VmState, Orbit::Any>(loaded.Get());
    out.Line("client: loadDataObject(7) -> a VmState of " + std::to_string(CountSnapshots(back->GetRootSnapshot())) +
             " snapshots, equal to the one saved: " + (state->_IsEqual(back) ? "true" : "false"));

    Ref<Orbit::MoRef> securityRef;
    instance->GetSecurity(securityRef);
    out.Line("client: ServiceInstance.security -> " + securityRef->ToString());
    auto security = StubOf<Tarn::SecurityManagerStub>(makeStub, securityRef.Get());
    try {
        security->ReloadSslCertificate();
        out.Line("client: reloadSslCertificate succeeded unexpectedly");
        return 1;
    } catch (const Tarn::Fault::SecurityConfigFault::Exception& e) {
        out.Line(std::string("client: reloadSslCertificate failed with ") + e.what() + ": " + e.GetFault()->GetMsg());
    }
    out.Line("client: done");
    return 0;
}

}  // namespace Example
