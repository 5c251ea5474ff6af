#include "kernite/Memory.h"

#include <dlfcn.h>

#include <atomic>
#include <new>

namespace Kernite::Memory {
namespace {

std::atomic<AllocationProbe> gProbe{nullptr};

#if defined(TARN_OBJECTS_LIBRARY)
// Debian ships the allocators only as libraries that also define malloc and the
// global operator new. Opened privately (RTLD_LOCAL) instead of linked, the library
// never joins the process's symbol scope, so those stay the C and C++ libraries'
// whatever order a program loads its libraries in. Should it not open, objects take
// the global operator new.
struct Library {
    void* (*allocate)(std::size_t) = nullptr;
    void (*release)(void*) = nullptr;
    const char* name = "operator new";

    Library() {
        void* handle = dlopen(TARN_OBJECTS_LIBRARY, RTLD_NOW | RTLD_LOCAL);
        if (handle == nullptr) return;
        auto* a = reinterpret_cast<void* (*)(std::size_t)>(dlsym(handle, TARN_OBJECTS_ALLOCATE));
        auto* r = reinterpret_cast<void (*)(void*)>(dlsym(handle, TARN_OBJECTS_FREE));
        if (a == nullptr || r == nullptr) {
            dlclose(handle);
            return;
        }
        allocate = a;
        release = r;
        name = TARN_OBJECTS_NAME;
    }
};

// Chosen on the first allocation; Free only ever sees memory from after that.
const Library& Chosen() {
    static const Library library;
    return library;
}
#endif

}  // namespace

void SetAllocationProbe(AllocationProbe probe) noexcept { gProbe.store(probe, std::memory_order_release); }

#if defined(TARN_OBJECTS_LIBRARY)

void* Allocate(std::size_t size) {
    const Library& library = Chosen();
    if (library.allocate == nullptr) return ::operator new(size);
    if (AllocationProbe probe = gProbe.load(std::memory_order_acquire); probe != nullptr && !probe())
        throw std::bad_alloc();
    if (void* p = library.allocate(size == 0 ? 1 : size)) return p;
    throw std::bad_alloc();
}

void Free(void* p) noexcept {
    if (p == nullptr) return;
    const Library& library = Chosen();
    if (library.release == nullptr) return ::operator delete(p);
    library.release(p);
}

const char* AllocatorName() noexcept { return Chosen().name; }

#else

void* Allocate(std::size_t size) { return ::operator new(size); }
void Free(void* p) noexcept { ::operator delete(p); }
const char* AllocatorName() noexcept { return "operator new"; }

#endif

}  // namespace Kernite::Memory
