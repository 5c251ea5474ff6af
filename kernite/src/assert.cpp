#include "kernite/Assert.h"

#include <cstdio>
#include <cstdlib>

namespace Kernite {

std::atomic<int> AtomicUseFence{0};

void PanicAssert(const char* expression, const char* path, int line) {
    std::fprintf(stderr, "PANIC: assertion \"%s\" failed at %s:%d\n", expression ? expression : "?",
                 path ? path : "?", line);
    std::fflush(stderr);
    std::abort();
}

} // namespace Kernite
