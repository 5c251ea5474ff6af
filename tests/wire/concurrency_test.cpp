// Codecs shared by threads from their first use: the tables of a version are built
// once however many threads ask at the same time, and what each thread decodes is
// what it encoded. Runs on the runtime's test catalogue.
#include <gtest/gtest.h>

#include <latch>
#include <thread>

#include "fix/fix.h"
#include "orbit/Orbit.h"
#include "orbit/wire/Codec.h"
#include "orbit/wire/Faults.h"
#include "samples.h"

namespace {

TEST(WireConcurrency, ThreadsShareCodecsFromTheirFirstUse) {
    Orbit::Version* versions[] = {Orbit::GetVersionMap()->GetVersion("fix.version.v1"),
                                  Orbit::GetVersionMap()->GetVersion("fix.version.v2")};
    Orbit::DataObjectType* shape = Orbit::GetDoType<Fix::Shape>();
    const Kernite::Ref<Orbit::DataObject> source = Roundtrip::MakeFullObject(shape, 1, true);
    Kernite::Ref<Orbit::DataObject> expected[2];
    for (int v = 0; v < 2; ++v) expected[v] = Roundtrip::MakeFullObject(shape, 1, true, versions[v]);

    constexpr int kThreads = 4;
    std::latch start(kThreads);
    int failures[kThreads] = {};
    std::vector<std::thread> threads;
    for (int t = 0; t < kThreads; ++t) {
        threads.emplace_back([&, t] {
            start.arrive_and_wait();
            const Orbit::Wire::Codec codec(*versions[t % 2]);
            for (int i = 0; i < 50; ++i) {
                Kernite::Ref<Orbit::Any> back = codec.DecodeValue(codec.EncodeValue(source.Get()));
                if (!expected[t % 2]->_IsEqual(back.Get())) ++failures[t];
                try {
                    codec.DecodeValue("<value/>");
                    ++failures[t];
                } catch (const Orbit::Wire::UnknownElement::Exception&) {
                }
            }
        });
    }
    for (std::thread& thread : threads) thread.join();
    for (int t = 0; t < kThreads; ++t) EXPECT_EQ(failures[t], 0) << "thread " << t;
}

}  // namespace
