// Allocation failure at every allocation of one encode and one decode of a call
// that carries arrays, key/value records, data objects and a fault: whichever
// allocation fails, std::bad_alloc or a fault comes out and nothing leaks.
#include <gtest/gtest.h>

#include <new>

#include "failing_allocator.h"
#include "orbit/Orbit.h"
#include "orbit/wire/Codec.h"
#include "samples.h"
#include "tarn/tarn.h"

namespace {

template <class Op>
void FailEveryAllocation(const char* what, Op op) {
    op();  // first-use caches
    Reliability::ArmAllocator(0);
    op();
    const long total = Reliability::DisarmAllocator();
    EXPECT_GT(total, 0) << what;
    for (long k = 1; k <= total; ++k) {
        const long live = Kernite::ObjectImpl::LiveObjects();
        bool threw = false;
        try {
            Reliability::ArmAllocator(k);
            op();
        } catch (const std::bad_alloc&) {
            threw = true;
        } catch (const Orbit::MethodFault::Exception&) {
            threw = true;
        }
        Reliability::DisarmAllocator();
        EXPECT_TRUE(threw) << what << ": allocation " << k << " of " << total << " failed unnoticed";
        EXPECT_EQ(Kernite::ObjectImpl::LiveObjects(), live) << what << ": allocation " << k << " leaked";
        if (::testing::Test::HasFailure()) return;
    }
}

TEST(WireAllocation, EveryAllocationOfAnEncodeAndADecodeMayFail) {
    Orbit::Version* dev = Orbit::GetVersionMap()->GetVersion("tarn.version.dev");
    const Orbit::Wire::Codec codec(*dev);
    auto* manager = Kernite::NarrowToType<Orbit::ManagedObjectType, Orbit::Type>(Orbit::GetType<Tarn::DebugManager>());
    Orbit::ManagedMethod* method = manager->FindMember("rearrangeLayoutEx");
    Kernite::RefVector<Orbit::Any> args(2);
    for (int i = 0; i < 2; ++i) args[i] = Roundtrip::MakeFullSample(method->GetParameters()[i], i, true, dev);
    const Orbit::MoRef target("tarn.DebugManager", "debug-1");

    const std::string request = codec.EncodeRequest(target, *method, args);
    FailEveryAllocation("encode", [&] { codec.EncodeRequest(target, *method, args); });
    FailEveryAllocation("decode", [&] { codec.DecodeRequest(request); });

    auto* trace = Kernite::NarrowToType<Orbit::DataObjectType, Orbit::Type>(
        Orbit::GetType<Tarn::DebugManager::TraceResult>());
    const std::string value = codec.EncodeValue(Roundtrip::MakeFullObject(trace, 1, true, dev).Get());
    FailEveryAllocation("decode a value with a fault and anyType", [&] { codec.DecodeValue(value); });
}

}  // namespace
