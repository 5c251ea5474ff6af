// The test binary's global operator new/delete, which can be told to fail the k-th
// allocation of the current thread from now on; it also answers Kernite's failure
// probe, so objects fail alike wherever their memory comes from. Exceptions
// themselves are allocated by the language runtime with malloc and are not affected.
#pragma once

namespace Reliability {

// Counts the allocations of this thread from now on; with `failAt` > 0 the
// allocation of that number throws std::bad_alloc (once).
void ArmAllocator(long failAt);
// Stops counting; returns the number of allocations since ArmAllocator.
long DisarmAllocator();

}  // namespace Reliability
