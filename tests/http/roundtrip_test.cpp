// Every member of every managed type through the HTTP client adapter and server on
// 127.0.0.1 and back, in the newest version and in an older one, which must refuse
// what it does not see.
#include <gtest/gtest.h>

#include <iostream>

#include "drive.h"
#include "orbit/wire/HttpClient.h"
#include "orbit/wire/HttpServer.h"

namespace {

using namespace Orbit::Wire;

std::optional<Identity> Operator(const Credentials& credentials) {
    if (credentials.token != "roundtrip-operator") return std::nullopt;
    return Identity{"operator", {"Global.HubServer"}};
}

class HttpRoundTrip : public ::testing::TestWithParam<const char*> {};

TEST_P(HttpRoundTrip, EveryMemberOfEveryManagedType) {
    ServerSettings settings;
    settings.authorizer = Operator;
    HttpServer server(settings);
    ClientSettings client;
    client.url = server.Url();
    client.apiVersion = GetParam();
    client.bearerToken = "roundtrip-operator";
    Kernite::Ref<HttpAdapter> adapter(new HttpAdapter(client));

    Roundtrip::Trip trip{&server, adapter.Get(), &adapter->GetVersion(), true};
    const Roundtrip::TripCounts counts = Roundtrip::RunEveryMember(trip);
    std::cout << GetParam() << ": " << counts.types << " types, " << counts.members << " members ("
              << counts.refused << " refused), " << counts.syncCalls << " sync and " << counts.asyncCalls
              << " async calls" << std::endl;
    EXPECT_EQ(counts.types, 50u);
    EXPECT_EQ(counts.exercised + counts.refused, counts.members);
    if (std::string(GetParam()) == "tarn.version.dev") EXPECT_EQ(counts.refused, 0u);
    else EXPECT_GT(counts.refused, 0u);
    adapter->Shutdown();
    EXPECT_EQ(server.HostedCount(), 0u);
}

INSTANTIATE_TEST_SUITE_P(Versions, HttpRoundTrip, ::testing::Values("tarn.version.dev", "tarn.version.version6"));

}  // namespace
