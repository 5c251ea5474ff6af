// `http/acquire_lock`: LockStresserStub::AcquireLock (two object references and four
// values) through the HTTP client adapter and server on 127.0.0.1, over keep-alive
// connections, by 1 or 16 client threads each with a connection of its own, beside
// the same calls through the loopback adapter. One benchmark iteration is a batch of
// calls from every thread; each call's latency is kept, and p50/p99 are reported with
// the calls per second of wall time and the CPU time of the process per call.
#include <sys/resource.h>

#include <algorithm>
#include <atomic>
#include <barrier>
#include <chrono>
#include <memory>
#include <thread>
#include <vector>

#include "bench.h"
#include "orbit/Loopback.h"
#include "orbit/wire/HttpClient.h"
#include "orbit/wire/HttpServer.h"
#include "tarn/types.h"

namespace TarnBench {
namespace {

using Kernite::Ref;
using Orbit::DataArray;
using Orbit::MoRef;

constexpr int kBatch = 64;  // calls per thread per iteration

// CPU time of the whole process (every thread, client and server), in microseconds.
double ProcessCpuMicros() {
    rusage usage{};
    getrusage(RUSAGE_SELF, &usage);
    return 1e6 * static_cast<double>(usage.ru_utime.tv_sec + usage.ru_stime.tv_sec) +
           static_cast<double>(usage.ru_utime.tv_usec + usage.ru_stime.tv_usec);
}

class CountingLockStresser : public Orbit::ManagedObjectImpl, public virtual Tarn::LockStresser {
public:
    using ManagedObjectImpl::ManagedObjectImpl;
    void AcquireLock(DataArray<MoRef>* objects, const std::string&, long long, int, long long) override {
        calls.fetch_add(objects->GetLength() == 2 ? 1 : 1000000, std::memory_order_relaxed);
    }
    std::atomic<long long> calls{0};
};

// A server with two workers (the machine's two cores), and the same object on a
// loopback adapter.
struct Hosted {
    Ref<CountingLockStresser> lock{new CountingLockStresser("lock-stresser")};
    std::unique_ptr<Orbit::Wire::HttpServer> server;
    Ref<Orbit::LoopbackAdapter> loopback{new Orbit::LoopbackAdapter()};
    Ref<DataArray<MoRef>> objects{new DataArray<MoRef>({new MoRef("VirtualMachine", "vm-1"),
                                                        new MoRef("VirtualMachine", "vm-2")})};
    Ref<MoRef> ref{new MoRef("tarn.LockStresser", "lock-stresser")};

    Hosted() {
        Orbit::Wire::ServerSettings settings;
        settings.workerThreads = 2;
        settings.authorizer = [](const Orbit::Wire::Credentials& c) -> std::optional<Orbit::Wire::Identity> {
            if (c.token != "bench-operator") return std::nullopt;
            return Orbit::Wire::Identity{"bench", {"Global.HubServer"}};
        };
        server = std::make_unique<Orbit::Wire::HttpServer>(settings);
        server->Register("lock-stresser", lock.Get());
        loopback->Register("lock-stresser", lock.Get());
    }
    Ref<Orbit::Wire::HttpAdapter> Client(int connections) const {
        Orbit::Wire::ClientSettings settings;
        settings.url = server->Url();
        settings.apiVersion = "tarn.version.version8";
        settings.bearerToken = "bench-operator";
        settings.maxConnections = static_cast<std::size_t>(connections);
        settings.ioThreads = connections > 1 ? 2 : 1;
        return Ref<Orbit::Wire::HttpAdapter>(new Orbit::Wire::HttpAdapter(settings));
    }
};

Hosted& Host() {
    static Hosted* hosted = new Hosted();
    return *hosted;
}

// `threads` callers of `stub`, in batches, one batch per iteration.
void Load(benchmark::State& state, Tarn::LockStresser* stub, int threads) {
    Hosted& hosted = Host();
    const long long before = hosted.lock->calls;
    std::vector<std::vector<double>> latencies(static_cast<std::size_t>(threads));
    std::barrier start(threads + 1), done(threads + 1);
    std::atomic<bool> stop{false};
    std::atomic<int> failures{0};
    std::vector<std::thread> callers;
    for (int t = 0; t < threads; ++t) {
        callers.emplace_back([&, t] {
            std::vector<double>& mine = latencies[static_cast<std::size_t>(t)];
            for (;;) {
                start.arrive_and_wait();
                if (stop) return;
                for (int i = 0; i < kBatch; ++i) {
                    const auto t0 = std::chrono::steady_clock::now();
                    try {
                        stub->AcquireLock(hosted.objects.Get(), "x", 100, 3, 50);
                    } catch (const std::exception&) {
                        ++failures;
                    }
                    mine.push_back(std::chrono::duration<double, std::micro>(std::chrono::steady_clock::now() - t0).count());
                }
                done.arrive_and_wait();
            }
        });
    }
    const double cpuBefore = ProcessCpuMicros();
    for (auto _ : state) {
        start.arrive_and_wait();
        done.arrive_and_wait();
    }
    const double cpu = ProcessCpuMicros() - cpuBefore;
    stop = true;
    start.arrive_and_wait();
    for (std::thread& caller : callers) caller.join();

    std::vector<double> all;
    for (const auto& mine : latencies) all.insert(all.end(), mine.begin(), mine.end());
    const long long calls = static_cast<long long>(state.iterations()) * threads * kBatch;
    if (failures != 0 || hosted.lock->calls - before != calls)
        return Fail(state, "calls failed or did not reach the implementation");
    if (all.empty()) return;
    std::sort(all.begin(), all.end());
    state.counters["p50_us"] = all[all.size() / 2];
    state.counters["p99_us"] = all[all.size() * 99 / 100];
    // What one call costs both ends together: on a quiet machine of C cores, about
    // C / cpu_us_per_call calls per microsecond at most.
    state.counters["cpu_us_per_call"] = cpu / static_cast<double>(calls);
    state.SetItemsProcessed(calls);
}

void BM_http_acquire_lock(benchmark::State& state) {
    const int connections = static_cast<int>(state.range(0));
    Ref<Orbit::Wire::HttpAdapter> adapter = Host().Client(connections);
    Ref<Tarn::LockStresserStub> stub = adapter->StubFor<Tarn::LockStresserStub>(Host().ref.Get());
    Load(state, stub.Get(), connections);
    adapter->Shutdown();
}

void BM_loopback_acquire_lock(benchmark::State& state) {
    Ref<Orbit::ManagedObject> stub = Host().loopback->CreateStub(
        "lock-stresser", Orbit::GetTypeHelper<Tarn::LockStresser, Orbit::ManagedObjectType>());
    Load(state, dynamic_cast<Tarn::LockStresserStub*>(stub.Get()), static_cast<int>(state.range(0)));
}

}  // namespace

BENCHMARK(BM_http_acquire_lock)->Name("http/acquire_lock/connections")->Arg(1)->Arg(16)->UseRealTime();
BENCHMARK(BM_loopback_acquire_lock)->Name("http/acquire_lock_loopback/threads")->Arg(1)->Arg(16)->UseRealTime();

}  // namespace TarnBench
