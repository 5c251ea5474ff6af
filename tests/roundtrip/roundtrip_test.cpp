// Every member of every managed type, own and inherited, from a client stub through
// the loopback adapter and the generated dispatch to a test double and back.
#include <gtest/gtest.h>

#include <iostream>

#include "drive.h"

namespace {

TEST(RoundTrip, EveryMemberOfEveryManagedType) {
    Kernite::Ref<Orbit::LoopbackAdapter> adapter(new Orbit::LoopbackAdapter());
    const Roundtrip::TripCounts counts = Roundtrip::RunEveryMember({adapter.Get(), adapter.Get()});
    adapter->Shutdown();

    std::cout << "roundtrip: " << counts.types << " types, " << counts.members << " members, " << counts.syncCalls
              << " sync calls, " << counts.asyncCalls << " async calls" << std::endl;
    EXPECT_GT(counts.types, 0u);
    EXPECT_EQ(counts.exercised, counts.members);
    EXPECT_EQ(counts.syncCalls, counts.asyncCalls);
}

}  // namespace
