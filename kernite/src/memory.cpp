#include "kernite/Memory.h"

#include <atomic>
#include <new>

#if defined(TARN_OBJECTS_MIMALLOC)
#include <mimalloc.h>
#elif defined(TARN_OBJECTS_JEMALLOC)
#include <jemalloc/jemalloc.h>
#endif

namespace Kernite::Memory {
namespace {

std::atomic<FailureProbe> gProbe{nullptr};

}  // namespace

void SetFailureProbe(FailureProbe probe) noexcept { gProbe.store(probe, std::memory_order_release); }

#if defined(TARN_OBJECTS_MIMALLOC) || defined(TARN_OBJECTS_JEMALLOC)

[[noreturn]] static void OutOfMemory() { throw std::bad_alloc(); }

void* Allocate(std::size_t size) {
    if (FailureProbe probe = gProbe.load(std::memory_order_acquire); probe != nullptr && !probe()) OutOfMemory();
#if defined(TARN_OBJECTS_MIMALLOC)
    void* p = mi_malloc(size);
#else
    void* p = mallocx(size == 0 ? 1 : size, 0);
#endif
    if (p == nullptr) OutOfMemory();
    return p;
}

void Free(void* p) noexcept {
    if (p == nullptr) return;
#if defined(TARN_OBJECTS_MIMALLOC)
    mi_free(p);
#else
    dallocx(p, 0);
#endif
}

const char* AllocatorName() noexcept {
#if defined(TARN_OBJECTS_MIMALLOC)
    return "mimalloc";
#else
    return "jemalloc";
#endif
}

#else

void* Allocate(std::size_t size) { return ::operator new(size); }
void Free(void* p) noexcept { ::operator delete(p); }
const char* AllocatorName() noexcept { return "operator new"; }

#endif

}  // namespace Kernite::Memory
