// The benchmark binary: a counting global operator new (and a counting probe on
// Kernite's own allocator), the shared helpers, and main.
#include <atomic>
#include <cstdio>
#include <cstdlib>
#include <map>
#include <memory>
#include <new>

#include "bench.h"
#include "kernite/Memory.h"

namespace {

// Only the benchmark thread allocates while a loop is timed; a plain load and store
// keeps the counter from costing an atomic read-modify-write per allocation.
std::atomic<std::uint64_t> gAllocations{0};
bool gFailed = false;

inline void Count() noexcept {
    gAllocations.store(gAllocations.load(std::memory_order_relaxed) + 1, std::memory_order_relaxed);
}

// Objects take their memory from Kernite's allocator, which the global operator new
// does not see; its probe counts them, so that every allocation a workload makes is
// in the figures, ours included.
bool CountObject() noexcept {
    Count();
    return true;
}
const bool gObjectsCounted = [] {
    Kernite::Memory::SetAllocationProbe(&CountObject);
    return true;
}();

void* Allocate(std::size_t size) {
    Count();
    if (size == 0) size = 1;
    if (void* p = std::malloc(size)) return p;
    throw std::bad_alloc();
}

void* AllocateAligned(std::size_t size, std::align_val_t align) {
    Count();
    const std::size_t alignment = static_cast<std::size_t>(align);
    std::size_t rounded = (size + alignment - 1) / alignment * alignment;
    if (rounded == 0) rounded = alignment;
    if (void* p = std::aligned_alloc(alignment, rounded)) return p;
    throw std::bad_alloc();
}

}  // namespace

void* operator new(std::size_t size) { return Allocate(size); }
void* operator new[](std::size_t size) { return Allocate(size); }
void* operator new(std::size_t size, const std::nothrow_t&) noexcept {
    try {
        return Allocate(size);
    } catch (...) {
        return nullptr;
    }
}
void* operator new[](std::size_t size, const std::nothrow_t&) noexcept {
    try {
        return Allocate(size);
    } catch (...) {
        return nullptr;
    }
}
void* operator new(std::size_t size, std::align_val_t align) { return AllocateAligned(size, align); }
void* operator new[](std::size_t size, std::align_val_t align) { return AllocateAligned(size, align); }
void operator delete(void* p) noexcept { std::free(p); }
void operator delete[](void* p) noexcept { std::free(p); }
void operator delete(void* p, std::size_t) noexcept { std::free(p); }
void operator delete[](void* p, std::size_t) noexcept { std::free(p); }
void operator delete(void* p, std::align_val_t) noexcept { std::free(p); }
void operator delete[](void* p, std::align_val_t) noexcept { std::free(p); }
void operator delete(void* p, std::size_t, std::align_val_t) noexcept { std::free(p); }
void operator delete[](void* p, std::size_t, std::align_val_t) noexcept { std::free(p); }

namespace TarnBench {

std::uint64_t Allocations() noexcept { return gAllocations.load(std::memory_order_relaxed); }

void Fail(benchmark::State& state, const std::string& why) {
    gFailed = true;
    std::fprintf(stderr, "benchmark failed: %s\n", why.c_str());
    state.SkipWithError(why.c_str());
}

TreeTexts::TreeTexts(int n) {
    names.reserve(n);
    ids.reserve(n);
    char text[32];
    for (int i = 0; i < n; ++i) {
        std::snprintf(text, sizeof text, "snapshot-%07d", i);
        names.emplace_back(text);
        std::snprintf(text, sizeof text, "snapshot-%d", i);
        ids.emplace_back(text);
    }
}

const TreeTexts& TextsFor(int n) {
    static std::map<int, std::unique_ptr<TreeTexts>> made;
    auto& slot = made[n];
    if (!slot) slot = std::make_unique<TreeTexts>(n);
    return *slot;
}

OutsideTexts::OutsideTexts() {
    for (int i = 0; i < kMounts; ++i) mountPaths.push_back("/slate/volumes/store-" + std::to_string(i));
    for (int i = 0; i < kOptions; ++i) {
        optionKeys.push_back("config.host.option" + std::to_string(i));
        optionLabels.push_back("Host option number " + std::to_string(i));
    }
    for (int i = 0; i < 100; ++i) {
        storeNames.push_back("store-" + std::to_string(i));
        storeUrls.push_back("slatestore:///volumes/5f2a9c11-" + std::to_string(1000 + i) + "/");
    }
}

const OutsideTexts& Outside() {
    static const OutsideTexts texts;
    return texts;
}

}  // namespace TarnBench

int main(int argc, char** argv) {
    benchmark::AddCustomContext("object_allocator", Kernite::Memory::AllocatorName());
    benchmark::Initialize(&argc, argv);
    if (benchmark::ReportUnrecognizedArguments(argc, argv)) return 1;
    benchmark::RunSpecifiedBenchmarks();
    benchmark::Shutdown();
    return gFailed ? 1 : 0;
}
