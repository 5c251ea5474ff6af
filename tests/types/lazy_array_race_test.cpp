// Racing first reads of an array property: every reader gets the one installed
// array, the losers' arrays are released, and nothing else is touched.
#include <gtest/gtest.h>

#include <atomic>
#include <thread>
#include <vector>

#include "support.h"
#include "tarn/profiler.h"
#include "tarn/vmprov.h"

using Kernite::Ref;
using namespace TypesTest;

namespace {

constexpr int kThreads = 8;
constexpr int kRounds = 100;

// Starts `kThreads` readers together on one fresh object per round; each reports
// the array it was given.
template <class Object, class Read>
void RaceFirstReads(Read read) {
    for (int round = 0; round < kRounds; ++round) {
        Ref<Object> object(new Object());
        const long live = Kernite::ObjectImpl::LiveObjects();
        std::atomic<int> ready{0};
        std::atomic<bool> go{false};
        std::vector<const void*> seen(kThreads, nullptr);
        std::vector<std::thread> readers;
        for (int i = 0; i < kThreads; ++i) {
            readers.emplace_back([&, i] {
                ready.fetch_add(1);
                while (!go.load()) std::this_thread::yield();
                seen[i] = read(*object);
            });
        }
        while (ready.load() != kThreads) std::this_thread::yield();
        go.store(true);
        for (auto& reader : readers) reader.join();

        ASSERT_NE(seen[0], nullptr);
        for (int i = 1; i < kThreads; ++i) ASSERT_EQ(seen[i], seen[0]) << "round " << round << ", reader " << i;
        // Exactly one array survived, held by the field alone.
        ASSERT_EQ(Kernite::ObjectImpl::LiveObjects(), live + 1) << "round " << round;
        ASSERT_EQ(read(*object), seen[0]);
    }
}

class LazyArrayRaceTest : public NoLeakTest {};

TEST_F(LazyArrayRaceTest, ConcurrentFirstReadsOfADataArrayInstallOne) {
    RaceFirstReads<Tarn::Vmprov::SnapshotState>([](const Tarn::Vmprov::SnapshotState& s) -> const void* {
        auto* array = s.GetChildSnapshot();
        return array->GetLength() == 0 && array->GetRefCount() == 1 ? array : nullptr;
    });
}

TEST_F(LazyArrayRaceTest, ConcurrentFirstReadsOfAStringArrayInstallOne) {
    RaceFirstReads<Tarn::Profiler::Query::NamesInfo>([](const Tarn::Profiler::Query::NamesInfo& n) -> const void* {
        return n.GetNames();
    });
}

TEST_F(LazyArrayRaceTest, TheFencedInstallBehavesTheSame) {
    struct Fenced {
        Fenced() { Kernite::AtomicUseFence.store(1); }
        ~Fenced() { Kernite::AtomicUseFence.store(0); }
    } fenced;
    RaceFirstReads<Tarn::Vmprov::VmLocation>(
        [](const Tarn::Vmprov::VmLocation& l) -> const void* { return l.GetDatastore(); });
}

}  // namespace
