// `load`: the time to load the libraries in a fresh process, measured by a helper
// program (tarn-bench-load) that this benchmark starts once per iteration; only the
// dlopen calls inside the helper are timed, not the process start. The time that
// counts is the helper's CPU time; its wall time is reported as a counter.
#include <spawn.h>
#include <sys/wait.h>
#include <unistd.h>

#include <cerrno>
#include <cstdio>
#include <cstring>
#include <string>
#include <vector>

#include "bench.h"

extern char** environ;

namespace TarnBench {
namespace {

struct LoadTime {
    long long cpu = -1;
    long long wall = -1;
};

// Runs the helper on `libraries`; the nanoseconds it reports, or -1.
LoadTime LoadOnce(const std::vector<std::string>& libraries, std::string& error) {
    int out[2];
    if (pipe(out) != 0) {
        error = std::strerror(errno);
        return {};
    }
    posix_spawn_file_actions_t actions;
    posix_spawn_file_actions_init(&actions);
    posix_spawn_file_actions_adddup2(&actions, out[1], STDOUT_FILENO);
    posix_spawn_file_actions_addclose(&actions, out[0]);
    posix_spawn_file_actions_addclose(&actions, out[1]);
    std::vector<char*> argv;
    std::string probe = TARN_BENCH_LOAD_PROBE;
    argv.push_back(probe.data());
    std::vector<std::string> copies(libraries);
    for (std::string& library : copies) argv.push_back(library.data());
    argv.push_back(nullptr);
    pid_t pid = 0;
    const int spawned = posix_spawn(&pid, probe.c_str(), &actions, nullptr, argv.data(), environ);
    posix_spawn_file_actions_destroy(&actions);
    close(out[1]);
    std::string text;
    char buffer[64];
    for (ssize_t got; (got = read(out[0], buffer, sizeof buffer)) > 0;) text.append(buffer, static_cast<std::size_t>(got));
    close(out[0]);
    if (spawned != 0) {
        error = std::string("cannot start the load helper: ") + std::strerror(spawned);
        return {};
    }
    int status = 0;
    waitpid(pid, &status, 0);
    LoadTime time;
    if (!WIFEXITED(status) || WEXITSTATUS(status) != 0 ||
        std::sscanf(text.c_str(), "%lld %lld", &time.cpu, &time.wall) != 2) {
        error = "the load helper failed";
        return {};
    }
    return time;
}

void LoadLoop(benchmark::State& state, const std::vector<std::string>& libraries) {
    double wall = 0;
    for (auto _ : state) {
        std::string error;
        const LoadTime time = LoadOnce(libraries, error);
        if (time.cpu < 0) return Fail(state, error);
        state.SetIterationTime(static_cast<double>(time.cpu) * 1e-9);
        wall += static_cast<double>(time.wall) * 1e-3;
    }
    state.counters["wall_us"] = benchmark::Counter(wall, benchmark::Counter::kAvgIterations);
}

void BM_load_runtime(benchmark::State& state) { LoadLoop(state, {TARN_BENCH_KERNITE, TARN_BENCH_ORBIT}); }

// Loading libtarn-types brings in the runtime and the stand-ins as its dependencies.
void BM_load_tarn_types(benchmark::State& state) { LoadLoop(state, {TARN_BENCH_TARN_TYPES}); }

}  // namespace

BENCHMARK(BM_load_runtime)->Name("tarn/load/runtime")->UseManualTime()->Iterations(20)->Unit(benchmark::kMicrosecond);
BENCHMARK(BM_load_tarn_types)->Name("tarn/load/tarn_types")->UseManualTime()->Iterations(20)->Unit(benchmark::kMicrosecond);

}  // namespace TarnBench
