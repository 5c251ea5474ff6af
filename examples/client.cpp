// The client half of the worked example. It knows only the service instance's
// reference and reaches everything else through stubs, the way a remote client
// would: each getter hands back a managed object reference, and the reference's
// type names the stub to make for it.
#include <iostream>

#include "server.h"

namespace {

using Kernite::Ref;
using namespace Tarn::FaultInjector;

// A stub of class S for the object that `ref` names, made by the stub factory of
// the type the reference names.
template <class S>
Ref<S> StubOf(Orbit::LoopbackAdapter* adapter, const Orbit::MoRef* ref) {
    if (ref == nullptr) throw Kernite::InvalidArgumentException(std::string("null reference"));
    auto* type = Kernite::NarrowToType<Orbit::ManagedObjectType, Orbit::Type>(Orbit::GetTypeMap()->GetType(ref->GetType()));
    if (type == nullptr) throw Kernite::InvalidArgumentException(ref->GetType());
    Ref<Orbit::ManagedObject> stub = adapter->CreateStub(ref->GetId(), type);
    return Ref<S>(Kernite::NarrowToType<S, Orbit::ManagedObject>(stub.Get()));
}

Ref<Fault> MakeFault(const std::string& description, const std::string& name, int percent, Orbit::MethodFault* thrown) {
    Ref<NameTarget> target(new NameTarget(name));
    Ref<ProgressTrigger> trigger(new ProgressTrigger(percent));
    Ref<ExceptionAction> action(new ExceptionAction(thrown));
    return Ref<Fault>(new Fault(0, description, target.Get(), trigger.Get(), action.Get()));
}

void ListFaults(Example::Transcript& out, Orbit::DataArray<Fault>* faults) {
    out.Line("client: " + std::to_string(faults->GetLength()) + " fault(s) planted");
    for (int i = 0; i < faults->GetLength(); ++i) out.Line("client:   " + Example::Describe(faults->GetAt(i)));
}

int Run(Example::Transcript& out) {
    Ref<Orbit::LoopbackAdapter> adapter(new Orbit::LoopbackAdapter());
    const Ref<Orbit::MoRef> root = Example::StartServer(adapter.Get(), out);

    auto instance = StubOf<Tarn::ServiceInstanceStub>(adapter.Get(), root.Get());
    Ref<Orbit::MoRef> debugRef;
    instance->GetDebugManager(debugRef);
    out.Line("client: ServiceInstance.debugManager -> " + debugRef->ToString());
    auto debug = StubOf<Tarn::DebugManagerStub>(adapter.Get(), debugRef.Get());
    debug->MarkLogs("example client connected");

    Ref<Orbit::MoRef> faultsRef;
    debug->GetFaultManager(faultsRef);
    out.Line("client: DebugManager.faultManager -> " + faultsRef->ToString());
    auto faults = StubOf<FaultInjectionManagerStub>(adapter.Get(), faultsRef.Get());

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

    Ref<Orbit::MoRef> securityRef;
    instance->GetSecurity(securityRef);
    out.Line("client: ServiceInstance.security -> " + securityRef->ToString());
    auto security = StubOf<Tarn::SecurityManagerStub>(adapter.Get(), securityRef.Get());
    try {
        security->ReloadSslCertificate();
        out.Line("client: reloadSslCertificate succeeded unexpectedly");
        return 1;
    } catch (const Tarn::Fault::SecurityConfigFault::Exception& e) {
        out.Line(std::string("client: reloadSslCertificate failed with ") + e.what() + ": " + e.GetFault()->GetMsg());
    }

    adapter->Shutdown();
    out.Line("client: done");
    return 0;
}

}  // namespace

int main() {
    Example::Transcript out(std::cout);
    try {
        return Run(out);
    } catch (const std::exception& e) {
        out.Line(std::string("client: unexpected failure: ") + e.what());
        return 1;
    }
}
