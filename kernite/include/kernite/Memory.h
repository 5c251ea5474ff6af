// Where reference-counted objects and the runtime's array storage get their memory.
//
// Every Kernite object is allocated through ObjectImpl's class-level operator new,
// which comes here, and so is the item storage of object arrays. The memory comes
// from an allocator with deep per-thread size-class caches (mimalloc by default,
// chosen with TARN_OBJECT_ALLOCATOR; see AllocatorName()), opened privately and
// used only for these objects: the process's malloc and global operator new stay
// the C and C++ libraries'. Sanitizer builds take the global operator new instead,
// so that the sanitizers see every object.
#pragma once

#include <cstddef>

namespace Kernite::Memory {

// `size` bytes aligned for any object; throws std::bad_alloc when none are left.
void* Allocate(std::size_t size);
// Returns memory from Allocate; null is ignored.
void Free(void* p) noexcept;

// "mimalloc", "jemalloc" or "operator new": where Allocate takes its memory.
const char* AllocatorName() noexcept;

// For tests and benchmarks that watch allocations: when a probe is set, Allocate
// asks it first and throws std::bad_alloc if it answers false (a counting probe
// answers true). It is consulted only where Allocate does not go through the
// global operator new (which such programs replace themselves), so that their
// operator new and this probe together see every allocation of an object exactly once.
using AllocationProbe = bool (*)() noexcept;
void SetAllocationProbe(AllocationProbe probe) noexcept;

}  // namespace Kernite::Memory
