// The protobuf twin: the same workloads on the same records, as protobuf messages,
// on the heap and on an arena.
#include <google/protobuf/arena.h>
#include <google/protobuf/descriptor.h>
#include <google/protobuf/message.h>

#include <string>

#include "bench.h"
#include "tarn_bench.pb.h"

namespace TarnBench {
namespace {

using google::protobuf::Arena;
namespace pb = ::tarnbench;

// ---- the snapshot tree ----

void FillSnapshot(pb::SnapshotState* node, int i, int n, const TreeTexts& texts) {
    pb::MoRef* ref = node->mutable_snapshot();
    ref->set_type(kSnapshotType);
    ref->set_id(texts.ids[i]);
    node->set_name(texts.names[i]);
    node->set_id(i);
    node->mutable_config();
    const int first = FirstChild(i);
    if (first < n) {
        node->mutable_child_snapshot()->Reserve(std::min(kFanOut, n - first));
        for (int c = first; c < first + kFanOut && c < n; ++c) FillSnapshot(node->add_child_snapshot(), c, n, texts);
    }
}

}  // namespace

// Shared with the wire's workloads (twins.h).
void FillVmState(pb::VmState* vm, int n) {
    const TreeTexts& texts = TextsFor(n);
    vm->mutable_vm()->set_type(kVmType);
    vm->mutable_vm()->set_id(kVmId);
    vm->set_vm_path_name(kVmPathName);
    vm->set_power_state(pb::poweredOn);
    vm->mutable_config();
    vm->mutable_layout_ex();
    vm->mutable_capability();
    FillSnapshot(vm->add_root_snapshot(), 0, n, texts);
}

namespace {

int CountNodes(const google::protobuf::RepeatedPtrField<pb::SnapshotState>& nodes) {
    int count = 0;
    for (const pb::SnapshotState& node : nodes) {
        ++count;
        if (node.snapshot().type() != kSnapshotType || node.name().size() != 16 || !node.has_config()) return -1;
        const int below = CountNodes(node.child_snapshot());
        if (below < 0) return -1;
        count += below;
    }
    return count;
}

bool CheckTree(benchmark::State& state, const pb::VmState& vm, int n) {
    const int nodes = CountNodes(vm.root_snapshot());
    if (nodes == n) return true;
    Fail(state, "tree has " + std::to_string(nodes) + " nodes, expected " + std::to_string(n));
    return false;
}

void BM_build_tree_heap(benchmark::State& state) {
    const int n = static_cast<int>(state.range(0));
    {
        pb::VmState vm;
        FillVmState(&vm, n);
        if (!CheckTree(state, vm, n)) return;
    }
    AllocationCount allocations(state);
    for (auto _ : state) {
        pb::VmState vm;
        FillVmState(&vm, n);
        benchmark::DoNotOptimize(&vm);
    }
    allocations.Report(1.0, n);
}

void BM_build_tree_arena(benchmark::State& state) {
    const int n = static_cast<int>(state.range(0));
    TextsFor(n);
    AllocationCount allocations(state);
    for (auto _ : state) {
        Arena arena;
        auto* vm = Arena::CreateMessage<pb::VmState>(&arena);
        FillVmState(vm, n);
        benchmark::DoNotOptimize(vm);
    }
    allocations.Report(1.0, n);
}

// Both copies follow a read-only walk of the source, as ours do.
void BM_deep_copy_heap(benchmark::State& state) {
    const int n = static_cast<int>(state.range(0));
    pb::VmState source;
    FillVmState(&source, n);
    if (!CheckTree(state, source, n)) return;
    {
        pb::VmState copy(source);
        if (!CheckTree(state, copy, n)) return;
    }
    AllocationCount allocations(state);
    for (auto _ : state) {
        pb::VmState copy(source);
        benchmark::DoNotOptimize(&copy);
    }
    allocations.Report(1.0, n);
}

// Messages on an arena have no copy constructor: a new message and CopyFrom.
void BM_deep_copy_arena(benchmark::State& state) {
    const int n = static_cast<int>(state.range(0));
    pb::VmState source;
    FillVmState(&source, n);
    if (!CheckTree(state, source, n)) return;
    {
        Arena arena;
        auto* copy = Arena::CreateMessage<pb::VmState>(&arena);
        copy->CopyFrom(source);
        if (!CheckTree(state, *copy, n)) return;
    }
    AllocationCount allocations(state);
    for (auto _ : state) {
        Arena arena;
        auto* copy = Arena::CreateMessage<pb::VmState>(&arena);
        copy->CopyFrom(source);
        benchmark::DoNotOptimize(copy);
    }
    allocations.Report(1.0, n);
}

void BM_size_heap(benchmark::State& state) {
    const int n = static_cast<int>(state.range(0));
    pb::VmState source;
    FillVmState(&source, n);
    if (source.SpaceUsedLong() < static_cast<std::size_t>(n) * sizeof(pb::SnapshotState))
        return Fail(state, "size below the nodes' own size");
    AllocationCount allocations(state);
    for (auto _ : state) benchmark::DoNotOptimize(source.SpaceUsedLong());
    allocations.Report();
}

// ---- a full host and location ----

void FillDatastore(pb::DatastoreState* datastore, int i) {
    const OutsideTexts& texts = Outside();
    datastore->mutable_datastore()->set_type("Datastore");
    datastore->mutable_datastore()->set_id("datastore-" + std::to_string(i));
    pb::DatastoreSummary* summary = datastore->mutable_summary();
    summary->set_name(texts.storeNames[i]);
    summary->set_url(texts.storeUrls[i]);
    summary->set_capacity(4LL << 40);
    summary->set_free_space((1LL << 40) + i);
    summary->set_accessible(true);
    datastore->mutable_capability();
}

void FillHost(pb::HostState* host) {
    const OutsideTexts& texts = Outside();
    host->mutable_host()->set_type("HostSystem");
    host->mutable_host()->set_id("host-12");
    pb::AboutInfo* product = host->mutable_product();
    product->set_name(kProductName);
    product->set_full_name(kProductFullName);
    product->set_version(kProductVersion);
    product->set_build(kProductBuild);
    host->set_uuid(kHostUuid);
    host->set_management_ip(kHostIp);
    host->mutable_cnx_spec();
    host->set_ssl_thumbprint(kHostThumbprint);
    host->mutable_capability();
    host->mutable_internal_capability();
    host->set_vm_swap_placement(kHostSwap);
    FillDatastore(host->mutable_local_swap_datastore(), 99);
    host->set_local_swap_datastore_writable(true);
    host->mutable_config_option();
    for (int i = 0; i < kMounts; ++i) {
        pb::MountInfo* mount = host->add_mount_info();
        mount->set_path(texts.mountPaths[i]);
        mount->set_access_mode(kAccessMode);
        mount->set_mounted(true);
    }
    host->mutable_v_nic_info();
    host->mutable_network();
    for (int i = 0; i < kOptions; ++i) {
        pb::OptionDef* option = host->add_option_def();
        option->set_key(texts.optionKeys[i]);
        option->set_label(texts.optionLabels[i]);
        option->set_summary(kOptionSummary);
    }
    host->mutable_prov_policy();
}

}  // namespace

// Shared with the wire's workloads (twins.h).
void FillLocation(pb::VmLocation* location) {
    auto setRef = [](pb::MoRef* ref, const char* type, const char* id) {
        ref->set_type(type);
        ref->set_id(id);
    };
    setRef(location->mutable_datacenter(), "Datacenter", "datacenter-2");
    setRef(location->mutable_folder(), "Folder", "group-v4");
    setRef(location->mutable_compute_resource(), "ClusterComputeResource", "domain-c7");
    setRef(location->mutable_pool(), "ResourcePool", "resgroup-8");
    FillHost(location->mutable_host());
    FillDatastore(location->mutable_primary_datastore(), 0);
    for (int i = 0; i < kDatastores; ++i) FillDatastore(location->add_datastore(), i);
}

namespace {

void BM_record_get_set(benchmark::State& state) {
    pb::HostState host;
    FillHost(&host);
    const google::protobuf::Descriptor* type = host.GetDescriptor();
    const google::protobuf::Reflection* reflection = host.GetReflection();
    const google::protobuf::FieldDescriptor* strings[] = {
        type->FindFieldByName("uuid"), type->FindFieldByName("management_ip"), type->FindFieldByName("ssl_thumbprint"),
        type->FindFieldByName("vm_swap_placement")};
    const std::string* values[] = {&kHostUuid, &kHostIp, &kHostThumbprint, &kHostSwap};
    const google::protobuf::FieldDescriptor* writable = type->FindFieldByName("local_swap_datastore_writable");
    const google::protobuf::FieldDescriptor* product = type->FindFieldByName("product");
    if (reflection->GetString(host, strings[2]) != kHostThumbprint || !reflection->GetBool(host, writable) ||
        &reflection->GetMessage(host, product) != &host.product())
        return Fail(state, "reflection reads something else");

    std::string text;
    AllocationCount allocations(state);
    for (auto _ : state) {
        for (int k = 0; k < 4; ++k) {
            text = reflection->GetString(host, strings[k]);
            benchmark::DoNotOptimize(text.data());
            std::string value(*values[k]);
            reflection->SetString(&host, strings[k], std::move(value));
        }
        if (reflection->HasField(host, writable)) {
            bool flag = reflection->GetBool(host, writable);
            benchmark::DoNotOptimize(flag);
            reflection->SetBool(&host, writable, flag);
        }
        const google::protobuf::Message& held = reflection->GetMessage(host, product);
        benchmark::DoNotOptimize(&held);
    }
    allocations.Report();
}

void BM_location_copy_heap(benchmark::State& state) {
    pb::VmLocation source;
    FillLocation(&source);
    {
        pb::VmLocation copy(source);
        if (copy.datastore_size() != kDatastores || copy.host().ssl_thumbprint() != kHostThumbprint ||
            copy.host().mount_info_size() != kMounts ||
            copy.host().mount_info(kMounts - 1).path() != Outside().mountPaths[kMounts - 1] ||
            copy.host().option_def_size() != kOptions || copy.host().product().full_name() != kProductFullName ||
            copy.datastore(3).summary().url() != Outside().storeUrls[3])
            return Fail(state, "location copy is not a full copy");
    }
    AllocationCount allocations(state);
    for (auto _ : state) {
        pb::VmLocation copy(source);
        benchmark::DoNotOptimize(&copy);
    }
    allocations.Report();
}

void BM_location_copy_arena(benchmark::State& state) {
    pb::VmLocation source;
    FillLocation(&source);
    AllocationCount allocations(state);
    for (auto _ : state) {
        Arena arena;
        auto* copy = Arena::CreateMessage<pb::VmLocation>(&arena);
        copy->CopyFrom(source);
        benchmark::DoNotOptimize(copy);
    }
    allocations.Report();
}

// ---- enumerations ----

void BM_enum_by_tag(benchmark::State& state) {
    const google::protobuf::EnumDescriptor* type = pb::LockMode_descriptor();
    AllocationCount allocations(state);
    for (auto _ : state) {
        int sum = 0;
        for (const std::string& tag : kLockTags) {
            const google::protobuf::EnumValueDescriptor* value = type->FindValueByName(tag);
            sum += value != nullptr ? value->number() : -1;
        }
        benchmark::DoNotOptimize(sum);
        if (sum != kLockValueSum) return Fail(state, "wrong enumeration values");
    }
    allocations.Report();
}

void BM_enum_by_value(benchmark::State& state) {
    const google::protobuf::EnumDescriptor* type = pb::LockMode_descriptor();
    AllocationCount allocations(state);
    for (auto _ : state) {
        std::size_t length = 0;
        for (int number : kLockValues)
            if (const google::protobuf::EnumValueDescriptor* value = type->FindValueByNumber(number))
                length += value->name().size();
        benchmark::DoNotOptimize(length);
        if (length != kLockTagLength) return Fail(state, "wrong enumeration tags");
    }
    allocations.Report();
}

}  // namespace

BENCHMARK(BM_build_tree_heap)->Name("protobuf_heap/build_tree")->Arg(1)->Arg(64)->Arg(4096);
BENCHMARK(BM_build_tree_arena)->Name("protobuf_arena/build_tree")->Arg(1)->Arg(64)->Arg(4096);
BENCHMARK(BM_deep_copy_heap)->Name("protobuf_heap/deep_copy")->Arg(1)->Arg(64)->Arg(4096);
BENCHMARK(BM_deep_copy_arena)->Name("protobuf_arena/deep_copy")->Arg(1)->Arg(64)->Arg(4096);
BENCHMARK(BM_size_heap)->Name("protobuf_heap/size")->Arg(1)->Arg(64)->Arg(4096);
BENCHMARK(BM_record_get_set)->Name("protobuf_heap/record_get_set");
BENCHMARK(BM_enum_by_tag)->Name("protobuf_heap/enum_lookup/by_tag");
BENCHMARK(BM_enum_by_value)->Name("protobuf_heap/enum_lookup/by_value");
BENCHMARK(BM_location_copy_heap)->Name("protobuf_heap/location_copy");
BENCHMARK(BM_location_copy_arena)->Name("protobuf_arena/location_copy");

}  // namespace TarnBench
