#include "failing_allocator.h"

#include <cstdlib>
#include <new>

#include "kernite/Memory.h"

namespace Reliability {
namespace {

// Per thread, so that nothing another thread allocates shifts the count.
thread_local bool tArmed = false;
thread_local long tCount = 0;
thread_local long tFailAt = 0;

bool Granted() noexcept { return !(tArmed && ++tCount == tFailAt); }

void* Allocate(std::size_t size) {
    if (!Granted()) return nullptr;
    return std::malloc(size == 0 ? 1 : size);
}

// Objects that take their memory from Kernite's own allocator rather than from the
// global operator new are counted and failed alike.
const bool gProbeSet = [] {
    Kernite::Memory::SetAllocationProbe(&Granted);
    return true;
}();

}  // namespace

void ArmAllocator(long failAt) {
    tCount = 0;
    tFailAt = failAt;
    tArmed = true;
}

long DisarmAllocator() {
    tArmed = false;
    return tCount;
}

}  // namespace Reliability

void* operator new(std::size_t size) {
    if (void* p = Reliability::Allocate(size)) return p;
    throw std::bad_alloc();
}
void* operator new[](std::size_t size) {
    if (void* p = Reliability::Allocate(size)) return p;
    throw std::bad_alloc();
}
void* operator new(std::size_t size, const std::nothrow_t&) noexcept { return Reliability::Allocate(size); }
void* operator new[](std::size_t size, const std::nothrow_t&) noexcept { return Reliability::Allocate(size); }
void operator delete(void* p) noexcept { std::free(p); }
void operator delete[](void* p) noexcept { std::free(p); }
void operator delete(void* p, std::size_t) noexcept { std::free(p); }
void operator delete[](void* p, std::size_t) noexcept { std::free(p); }
void operator delete(void* p, const std::nothrow_t&) noexcept { std::free(p); }
void operator delete[](void* p, const std::nothrow_t&) noexcept { std::free(p); }
