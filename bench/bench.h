// Shared by both halves of the benchmark binary: the allocation counter, the
// shape of the snapshot tree and the texts the records hold, so that our records
// and their protobuf twins are built from the very same data.
#pragma once

#include <benchmark/benchmark.h>

#include <cstdint>
#include <cstddef>
#include <string>
#include <vector>

namespace TarnBench {

// Every global operator new of the process and every allocation of Kernite's own
// allocator, counted (see main.cpp).
std::uint64_t Allocations() noexcept;

// Marks the run as broken: the benchmark is skipped and the binary exits non-zero,
// so that the smoke test notices a workload that no longer does what it says.
void Fail(benchmark::State& state, const std::string& why);

// Counts the allocations of the timed loop and reports them per operation (and
// per tree node when `nodes` is given).
class AllocationCount {
public:
    explicit AllocationCount(benchmark::State& state) : _state(state), _start(Allocations()) {}
    void Report(double perOperationDivisor = 1.0, double nodes = 0.0) const {
        const double iterations = static_cast<double>(_state.iterations());
        if (iterations == 0) return;
        const double perOp = static_cast<double>(Allocations() - _start) / iterations / perOperationDivisor;
        _state.counters["allocs_per_op"] = perOp;
        if (nodes > 0) _state.counters["allocs_per_node"] = perOp / nodes;
    }

private:
    benchmark::State& _state;
    std::uint64_t _start;
};

// The snapshot tree: node i has the children 4i+1 .. 4i+4 that are below n, so the
// tree is balanced with fan-out 4 and node 0 is its one root.
constexpr int kFanOut = 4;
inline int FirstChild(int i) { return kFanOut * i + 1; }

// Texts of the records, made before any timing starts.
struct TreeTexts {
    explicit TreeTexts(int n);
    std::vector<std::string> names;  // 16 characters each
    std::vector<std::string> ids;    // "snapshot-<i>"
};
const TreeTexts& TextsFor(int n);

inline const std::string kSnapshotType = "VirtualMachineSnapshot";
inline const std::string kVmType = "VirtualMachine";
inline const std::string kVmId = "vm-4711";
inline const std::string kVmPathName = "/data/store-1/vm-4711/config";

// A full host record's texts; record_get_set writes them back unchanged.
inline const std::string kHostUuid = "4c4c4544-0042-4810-8056-b4c04f4e3432";
inline const std::string kHostIp = "10.20.30.40";
inline const std::string kHostThumbprint = "3F:2A:9C:11:7B:D4:0E:55:A1:6C:92:BB:E0:4D:73:18:C5:2F:09:AE";
inline const std::string kHostSwap = "vmDirectory";

// The enumeration look-ups, one unknown in five: the four tags and one that is not a
// tag; the four values and one past them. Each operation sums what it finds, -1 for
// the unknown one, so the sum of the values is 0+1+2+3-1 = 5 and the tags' lengths
// add up to 10.
inline const std::string kLockTags[] = {"x", "s", "exclusive", "xall", "sall"};
constexpr int kLockValues[] = {0, 1, 4, 2, 3};
constexpr int kLockValueSum = 5;
constexpr std::size_t kLockTagLength = 10;

// A location: 8 datastores; its host has 8 mount infos and 4 option definitions.
constexpr int kDatastores = 8;
constexpr int kMounts = 8;
constexpr int kOptions = 4;

// The outside records' texts, made before timing.
struct OutsideTexts {
    OutsideTexts();
    std::vector<std::string> mountPaths;   // "/slate/volumes/store-<i>"
    std::vector<std::string> optionKeys;   // "config.host.option<i>"
    std::vector<std::string> optionLabels;
    std::vector<std::string> storeNames;
    std::vector<std::string> storeUrls;
};
const OutsideTexts& Outside();
inline const std::string kProductName = "Slate Host Agent";
inline const std::string kProductFullName = "Slate Host Agent 7.1.2 build-20231114";
inline const std::string kProductVersion = "7.1.2";
inline const std::string kProductBuild = "20231114";
inline const std::string kAccessMode = "readWrite";
inline const std::string kOptionSummary = "Applies to every virtual machine placed on this host";

}  // namespace TarnBench
