// Loads the shared libraries named on the command line, in order, in this fresh
// process, and prints how long that took: CPU time of the process (user and
// system, page faults included) and wall time, in nanoseconds. The static
// initialisers of each library (for libtarn-types: its sixteen loaders) run
// inside dlopen. The machine is shared, so the CPU time is the figure to compare;
// the wall time also counts whatever else ran meanwhile.
#include <dlfcn.h>
#include <time.h>

#include <chrono>
#include <cstdio>

namespace {

long long CpuNow() {
    timespec t{};
    clock_gettime(CLOCK_PROCESS_CPUTIME_ID, &t);
    return static_cast<long long>(t.tv_sec) * 1000000000LL + t.tv_nsec;
}

// From the C++ library on purpose: every C++ program has it loaded already, so the
// libraries measured are ours alone.
long long WallNow() {
    return std::chrono::duration_cast<std::chrono::nanoseconds>(std::chrono::steady_clock::now().time_since_epoch())
        .count();
}

}  // namespace

int main(int argc, char** argv) {
    const long long cpu = CpuNow();
    const long long wall = WallNow();
    for (int i = 1; i < argc; ++i) {
        if (dlopen(argv[i], RTLD_NOW | RTLD_GLOBAL) == nullptr) {
            std::fprintf(stderr, "%s\n", dlerror());
            return 1;
        }
    }
    std::printf("%lld %lld\n", CpuNow() - cpu, WallNow() - wall);
    return 0;
}
