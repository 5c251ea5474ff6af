// Our half: the workloads on the generated records of libtarn-types.
#include <stdexcept>
#include <string_view>
#include <string>
#include <vector>

#include "bench.h"
#include "orbit/Enum.h"
#include "orbit/Loopback.h"
#include "tarn/faultInjector.h"
#include "tarn/tarn.h"
#include "tarn/vmprov.h"

namespace TarnBench {
namespace {

using Kernite::Ref;
using Orbit::DataArray;
using Orbit::MoRef;
using Tarn::Vmprov::DatastoreState;
using Tarn::Vmprov::HostState;
using Tarn::Vmprov::SnapshotState;
using Tarn::Vmprov::VmLocation;
using Tarn::Vmprov::VmState;

unsigned int Identity(unsigned int n) { return n; }

// ---- the snapshot tree ----

SnapshotState* MakeSnapshot(int i, int n, const TreeTexts& texts) {
    auto* node = new SnapshotState(new MoRef(kSnapshotType, texts.ids[i]), texts.names[i], i,
                                   new Cairn::Vm::ConfigInfo(), nullptr);
    const int first = FirstChild(i);
    if (first < n) {
        DataArray<SnapshotState>* children = node->GetChildSnapshot();
        children->Reserve(std::min(kFanOut, n - first));
        for (int c = first; c < first + kFanOut && c < n; ++c) children->Append(MakeSnapshot(c, n, texts));
    }
    return node;
}

}  // namespace

// Shared with the wire's workloads (twins.h).
Ref<VmState> MakeVmState(int n) {
    const TreeTexts& texts = TextsFor(n);
    Ref<VmState> vm(new VmState(new MoRef(kVmType, kVmId), kVmPathName, Cairn::VirtualMachine::PowerState::poweredOn,
                                new Cairn::Vm::ConfigInfo(), new Cairn::Vm::FileLayoutEx(),
                                new Cairn::Vm::Capability(), nullptr));
    vm->GetRootSnapshot()->Append(MakeSnapshot(0, n, texts));
    return vm;
}

namespace {

int CountNodes(const DataArray<SnapshotState>* array) {
    int count = 0;
    for (int i = 0, length = array->GetLength(); i < length; ++i) {
        const SnapshotState* node = array->GetAt(i);
        ++count;
        if (node->GetSnapshot() == nullptr || node->GetSnapshot()->GetType() != kSnapshotType ||
            node->GetName().size() != 16 || node->GetConfig() == nullptr)
            return -1;
        if (const DataArray<SnapshotState>* children = node->GetChildSnapshot(); !children->IsEmpty()) {
            const int below = CountNodes(children);
            if (below < 0) return -1;
            count += below;
        }
    }
    return count;
}

bool CheckTree(benchmark::State& state, const VmState* vm, int n) {
    const int nodes = CountNodes(vm->GetRootSnapshot());
    if (nodes == n) return true;
    Fail(state, "tree has " + std::to_string(nodes) + " nodes, expected " + std::to_string(n));
    return false;
}

void BM_build_tree(benchmark::State& state) {
    const int n = static_cast<int>(state.range(0));
    TextsFor(n);
    if (!CheckTree(state, MakeVmState(n).Get(), n)) return;
    AllocationCount allocations(state);
    for (auto _ : state) {
        Ref<VmState> vm = MakeVmState(n);
        benchmark::DoNotOptimize(vm.Get());
    }
    allocations.Report(1.0, n);
}

// The copy follows a read-only walk of the source, as a user's copy usually follows
// a read: the walk reads every node's children, leaves included.
void BM_deep_copy(benchmark::State& state) {
    const int n = static_cast<int>(state.range(0));
    const Ref<VmState> source = MakeVmState(n);
    if (!CheckTree(state, source.Get(), n)) return;
    {
        Ref<VmState> copy(new VmState(*source));
        if (!CheckTree(state, copy.Get(), n)) return;
        if (copy->GetRootSnapshot()->GetAt(0) == source->GetRootSnapshot()->GetAt(0))
            return Fail(state, "the copy shares its nodes");
    }
    AllocationCount allocations(state);
    for (auto _ : state) {
        Ref<VmState> copy(new VmState(*source));
        benchmark::DoNotOptimize(copy.Get());
    }
    allocations.Report(1.0, n);
}

void BM_size(benchmark::State& state) {
    const int n = static_cast<int>(state.range(0));
    const Ref<VmState> source = MakeVmState(n);
    if (source->_GetSize(Identity) < static_cast<unsigned>(n) * sizeof(SnapshotState))
        return Fail(state, "size below the nodes' own size");
    AllocationCount allocations(state);
    for (auto _ : state) benchmark::DoNotOptimize(source->_GetSize(Identity));
    allocations.Report();
}

// ---- a full host and location ----

Ref<DatastoreState> MakeDatastore(int i) {
    const OutsideTexts& texts = Outside();
    return Ref<DatastoreState>(new DatastoreState(
        new MoRef("Datastore", "datastore-" + std::to_string(i)),
        new Cairn::Datastore::Summary(texts.storeNames[i], texts.storeUrls[i], 4LL << 40, (1LL << 40) + i, true),
        new Cairn::Datastore::Capability()));
}

Ref<HostState> MakeHost() {
    const OutsideTexts& texts = Outside();
    Ref<DataArray<Cairn::Host::MountInfo>> mounts(new DataArray<Cairn::Host::MountInfo>());
    for (int i = 0; i < kMounts; ++i)
        mounts->Append(new Cairn::Host::MountInfo(texts.mountPaths[i], kAccessMode, Kernite::Optional<bool>(true)));
    Ref<DataArray<Cairn::Option::OptionDef>> options(new DataArray<Cairn::Option::OptionDef>());
    for (int i = 0; i < kOptions; ++i)
        options->Append(new Cairn::Option::OptionDef(texts.optionKeys[i], texts.optionLabels[i], kOptionSummary,
                                                     Kernite::Optional<std::string>()));
    return Ref<HostState>(new HostState(
        new MoRef("HostSystem", "host-12"),
        new Cairn::AboutInfo(kProductName, kProductFullName, kProductVersion, kProductBuild), kHostUuid, kHostIp,
        new Ferry::CopySpec::CnxSpec(), kHostThumbprint, new Cairn::Host::Capability(),
        new Cairn::Host::InternalCapability(), kHostSwap, MakeDatastore(99).Get(), Kernite::Optional<bool>(true),
        new Cairn::Vm::ConfigOption(), mounts.Get(), new Cairn::Host::VirtualNicManagerInfo(),
        new Cairn::Host::NetworkInfo(), options.Get(), new Cairn::Vm::ProvisioningPolicy()));
}

}  // namespace

// Shared with the wire's workloads (twins.h).
Ref<VmLocation> MakeLocation() {
    Ref<DataArray<DatastoreState>> datastores(new DataArray<DatastoreState>());
    for (int i = 0; i < kDatastores; ++i) datastores->Append(MakeDatastore(i).Get());
    return Ref<VmLocation>(new VmLocation(new MoRef("Datacenter", "datacenter-2"), new MoRef("Folder", "group-v4"),
                                          new MoRef("ClusterComputeResource", "domain-c7"),
                                          new MoRef("ResourcePool", "resgroup-8"), MakeHost().Get(),
                                          MakeDatastore(0).Get(), datastores.Get()));
}

namespace {

int PropertyIndex(const Orbit::DataObjectType* type, const std::string& name) {
    const auto& properties = type->GetProperties();
    for (std::size_t i = 0; i < properties.size(); ++i)
        if (properties[i].name == name) return static_cast<int>(i);
    throw std::runtime_error("no property " + name);
}

// What generic code does per call (a decoder, a copier between versions): it makes
// each value it writes, and asks whether an optional is set before it reads it.
void BM_record_get_set(benchmark::State& state) {
    const Ref<HostState> host = MakeHost();
    const Orbit::DataObjectType* type = Orbit::GetDoType<HostState>();
    const Orbit::DataTypeInfo* info = type->GetDataTypeInfo();
    const int strings[] = {PropertyIndex(type, "uuid"), PropertyIndex(type, "managementIp"),
                           PropertyIndex(type, "sslThumbprint"), PropertyIndex(type, "vmSwapPlacement")};
    const std::string_view values[] = {kHostUuid, kHostIp, kHostThumbprint, kHostSwap};
    const int writable = PropertyIndex(type, "localSwapDatastoreWritable");
    const int product = PropertyIndex(type, "product");

    std::string text;
    bool flag = false;
    Ref<Orbit::Any> object;
    info->getProperty(host.Get(), strings[2], &text);
    info->getProperty(host.Get(), writable, &flag);
    info->getProperty(host.Get(), product, &object);
    if (text != kHostThumbprint || !flag || object.Get() != host->GetProduct())
        return Fail(state, "record functions read something else");

    AllocationCount allocations(state);
    for (auto _ : state) {
        for (int k = 0; k < 4; ++k) {
            info->getProperty(host.Get(), strings[k], &text);
            benchmark::DoNotOptimize(text.data());
            const std::string value(values[k]);
            info->setProperty(host.Get(), strings[k], &value);
        }
        if (info->isPropertySet(host.Get(), writable)) {
            info->getProperty(host.Get(), writable, &flag);
            benchmark::DoNotOptimize(flag);
            const bool value = flag;
            info->setProperty(host.Get(), writable, &value);
        }
        Ref<Orbit::Any> held;
        info->getProperty(host.Get(), product, &held);
        benchmark::DoNotOptimize(held.Get());
    }
    allocations.Report();
}

void BM_location_copy(benchmark::State& state) {
    const Ref<VmLocation> source = MakeLocation();
    {
        Ref<VmLocation> copy(new VmLocation(*source));
        const HostState* host = copy->GetHost();
        if (copy->GetDatastore()->GetLength() != kDatastores || host == source->GetHost() ||
            host->GetSslThumbprint() != kHostThumbprint || host->GetMountInfo()->GetLength() != kMounts ||
            host->GetMountInfo()->GetAt(kMounts - 1)->GetPath() != Outside().mountPaths[kMounts - 1] ||
            host->GetOptionDef()->GetLength() != kOptions || host->GetProduct()->GetFullName() != kProductFullName ||
            copy->GetDatastore()->GetAt(3)->GetSummary()->GetUrl() != Outside().storeUrls[3])
            return Fail(state, "location copy is not a full deep copy");
    }
    AllocationCount allocations(state);
    for (auto _ : state) {
        Ref<VmLocation> copy(new VmLocation(*source));
        benchmark::DoNotOptimize(copy.Get());
    }
    allocations.Report();
}

// ---- enumerations ----

const Orbit::EnumType* LockModeType() {
    return dynamic_cast<const Orbit::EnumType*>(Orbit::GetType<Tarn::LockStresser::LockMode>());
}

// Mixed look-ups, one unknown in five, through the forms that answer an unknown
// tag or value without throwing (as protobuf's FindValueByName and
// FindValueByNumber answer null).
void BM_enum_by_tag(benchmark::State& state) {
    const Orbit::EnumType* type = LockModeType();
    AllocationCount allocations(state);
    for (auto _ : state) {
        int sum = 0;
        for (const std::string& tag : kLockTags) sum += type->FindValue(tag);
        benchmark::DoNotOptimize(sum);
        if (sum != kLockValueSum) return Fail(state, "wrong enumeration values");
    }
    allocations.Report();
}

void BM_enum_by_value(benchmark::State& state) {
    const Orbit::EnumType* type = LockModeType();
    AllocationCount allocations(state);
    for (auto _ : state) {
        std::size_t length = 0;
        for (int value : kLockValues)
            if (const std::string* tag = type->FindTag(value)) length += tag->size();
        benchmark::DoNotOptimize(length);
        if (length != kLockTagLength) return Fail(state, "wrong enumeration tags");
    }
    allocations.Report();
}

// ---- stub calls through the loopback adapter ----

class LockStresserImpl : public Orbit::ManagedObjectImpl, public virtual Tarn::LockStresser {
public:
    using ManagedObjectImpl::ManagedObjectImpl;
    // Not inlined, so that the direct call stays a call.
    [[gnu::noinline]] void AcquireLock(DataArray<MoRef>* objects, const std::string& mode, long long holdDurationMillis, int iters,
                     long long durationBetweenItersMillis) override {
        calls += 1;
        checksum += objects->GetLength() + static_cast<long long>(mode.size()) + holdDurationMillis + iters +
                    durationBetweenItersMillis;
    }
    long long calls = 0;
    long long checksum = 0;
};

class FaultManagerImpl : public Orbit::ManagedObjectImpl, public virtual Tarn::FaultInjector::FaultInjectionManager {
public:
    using ManagedObjectImpl::ManagedObjectImpl;
    void GetFaults(Ref<DataArray<Tarn::FaultInjector::Fault>>& result) override { result = nullptr; }
    [[gnu::noinline]] int AddFault(Tarn::FaultInjector::Fault* fault) override { return fault->GetKey(); }
    bool RemoveFault(int) override { return true; }
};

struct Served {
    Ref<Orbit::LoopbackAdapter> adapter{new Orbit::LoopbackAdapter()};
    Ref<LockStresserImpl> lock{new LockStresserImpl("lock-stresser")};
    Ref<FaultManagerImpl> faults{new FaultManagerImpl("fault-manager")};
    Ref<Orbit::ManagedObject> lockStub;
    Ref<Orbit::ManagedObject> faultStub;
    Ref<DataArray<MoRef>> objects{new DataArray<MoRef>({new MoRef("VirtualMachine", "vm-1"),
                                                        new MoRef("VirtualMachine", "vm-2")})};
    Ref<Tarn::FaultInjector::Fault> fault{new Tarn::FaultInjector::Fault(
        17, Kernite::Optional<std::string>("planted by the benchmark"), new Tarn::FaultInjector::NameTarget("svc-a"),
        new Tarn::FaultInjector::ProgressTrigger(50), new Tarn::FaultInjector::CrashAction())};

    Served() {
        adapter->Register("lock-stresser", lock.Get());
        adapter->Register("fault-manager", faults.Get());
        lockStub = adapter->CreateStub("lock-stresser",
                                       Orbit::GetTypeHelper<Tarn::LockStresser, Orbit::ManagedObjectType>());
        faultStub = adapter->CreateStub(
            "fault-manager", Orbit::GetTypeHelper<Tarn::FaultInjector::FaultInjectionManager, Orbit::ManagedObjectType>());
    }
    ~Served() { adapter->Shutdown(); }
};

Served& Service() {
    static Served* served = new Served();
    return *served;
}

void AcquireLockLoop(benchmark::State& state, Tarn::LockStresser* target) {
    Served& served = Service();
    const std::string mode = "x";
    const long long before = served.lock->calls;
    benchmark::DoNotOptimize(target);  // a real virtual call, not an inlined one
    AllocationCount allocations(state);
    for (auto _ : state) target->AcquireLock(served.objects.Get(), mode, 100, 3, 50);
    allocations.Report();
    if (served.lock->calls - before != static_cast<long long>(state.iterations()))
        Fail(state, "the implementation was not reached on every call");
}

void BM_stub_acquire_lock(benchmark::State& state) {
    auto* stub = dynamic_cast<Tarn::LockStresserStub*>(Service().lockStub.Get());
    if (stub == nullptr) return Fail(state, "no LockStresserStub");
    AcquireLockLoop(state, stub);
}

void BM_direct_acquire_lock(benchmark::State& state) { AcquireLockLoop(state, Service().lock.Get()); }

void AddFaultLoop(benchmark::State& state, Tarn::FaultInjector::FaultInjectionManager* target) {
    Served& served = Service();
    benchmark::DoNotOptimize(target);  // a real virtual call, not an inlined one
    AllocationCount allocations(state);
    for (auto _ : state) {
        const int key = target->AddFault(served.fault.Get());
        benchmark::DoNotOptimize(key);
        if (key != 17) return Fail(state, "wrong result");
    }
    allocations.Report();
}

void BM_stub_add_fault(benchmark::State& state) {
    auto* stub = dynamic_cast<Tarn::FaultInjector::FaultInjectionManagerStub*>(Service().faultStub.Get());
    if (stub == nullptr) return Fail(state, "no FaultInjectionManagerStub");
    AddFaultLoop(state, stub);
}

void BM_direct_add_fault(benchmark::State& state) { AddFaultLoop(state, Service().faults.Get()); }

}  // namespace

BENCHMARK(BM_build_tree)->Name("tarn/build_tree")->Arg(1)->Arg(64)->Arg(4096);
BENCHMARK(BM_deep_copy)->Name("tarn/deep_copy")->Arg(1)->Arg(64)->Arg(4096);
BENCHMARK(BM_size)->Name("tarn/size")->Arg(1)->Arg(64)->Arg(4096);
BENCHMARK(BM_record_get_set)->Name("tarn/record_get_set");
BENCHMARK(BM_enum_by_tag)->Name("tarn/enum_lookup/by_tag");
BENCHMARK(BM_enum_by_value)->Name("tarn/enum_lookup/by_value");
BENCHMARK(BM_location_copy)->Name("tarn/location_copy");
BENCHMARK(BM_stub_acquire_lock)->Name("tarn/stub_call/acquire_lock");
BENCHMARK(BM_direct_acquire_lock)->Name("tarn/stub_call/acquire_lock_direct");
BENCHMARK(BM_stub_add_fault)->Name("tarn/stub_call/add_fault");
BENCHMARK(BM_direct_add_fault)->Name("tarn/stub_call/add_fault_direct");

}  // namespace TarnBench
