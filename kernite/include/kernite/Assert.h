// Internal invariants and the memory-fence switch.
#pragma once

#include <atomic>

namespace Kernite {

// Reports the failed expression with its source path and line on stderr and aborts.
[[noreturn]] void PanicAssert(const char* expression, const char* path, int line);

// When nonzero, lazily installed objects are followed by a full fence after their
// compare-and-swap (for platforms whose atomics are weaker than they claim).
extern std::atomic<int> AtomicUseFence;

inline void FenceAfterInstall() noexcept {
    if (AtomicUseFence.load(std::memory_order_relaxed) != 0) {
#if defined(__SANITIZE_THREAD__)
        // ThreadSanitizer does not model fences; a sequentially consistent
        // read-modify-write is what it understands.
        static std::atomic<int> token{0};
        token.fetch_add(0, std::memory_order_seq_cst);
#else
        std::atomic_thread_fence(std::memory_order_seq_cst);
#endif
    }
}

} // namespace Kernite
