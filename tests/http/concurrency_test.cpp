// Bounded concurrency: eight client threads share one adapter whose few connections
// are fewer than its callers, and make a thousand calls each, synchronous and
// asynchronous mixed, every one with arguments of its own. Every answer must come
// back to the call that asked, none lost and none crossed.
#include <gtest/gtest.h>

#include <atomic>
#include <mutex>
#include <thread>

#include "orbit/wire/HttpClient.h"
#include "orbit/wire/HttpServer.h"
#include "tarn/types.h"

namespace {

using namespace Orbit::Wire;
using Kernite::Ref;

// Answers a path with the path itself and the calling identity's name, and a names
// query with a reference whose id is the names joined.
class Echo : public Orbit::ManagedObjectImpl, public virtual Tarn::Profiler::Registry {
public:
    Echo() : Orbit::ManagedObjectImpl("echo") {}
    void GetQuery(Ref<Orbit::DataArray<Orbit::MoRef>>& result) override { result = nullptr; }
    void EnumeratePath(const std::string& path, Ref<Orbit::Array<std::string>>& result) override {
        auto* caller = dynamic_cast<Orbit::Primitive<std::string>*>(Orbit::CurrentRequestContext()->GetValue("caller"));
        result = new Orbit::Array<std::string>{path, caller ? caller->GetValue() : "?"};
    }
    void CreateNamesQuery(Orbit::Array<std::string>* names, Ref<Orbit::MoRef>& result) override {
        std::string joined;
        for (int i = 0; names != nullptr && i < names->GetLength(); ++i) joined += names->GetAt(i) + "+";
        result = new Orbit::MoRef("tarn.profiler.Query", joined);
    }
    void CreateRegexQuery(const std::string&, bool, Ref<Orbit::MoRef>& result) override { result = nullptr; }
    void ClearAll() override {}
};

TEST(HttpConcurrency, EightThreadsOfAThousandMixedCallsEachGetTheirOwnAnswers) {
    constexpr int kThreads = 8, kCalls = 1000;
    ServerSettings settings;
    settings.workerThreads = 3;
    settings.authorizer = [](const Credentials& c) -> std::optional<Identity> {
        return Identity{c.token, {"Global.HubServer"}};
    };
    HttpServer server(settings);
    server.Register("echo", Ref<Echo>(new Echo()).Get());
    ClientSettings client;
    client.url = server.Url();
    client.apiVersion = "tarn.version.version8";
    client.bearerToken = "concurrent-caller";
    client.maxConnections = 3;
    client.ioThreads = 2;
    client.callTimeout = std::chrono::seconds(120);  // ThreadSanitizer is slow
    Ref<HttpAdapter> adapter(new HttpAdapter(client));
    Ref<Orbit::MoRef> ref(new Orbit::MoRef("tarn.profiler.Registry", "echo"));
    Ref<Tarn::Profiler::RegistryStub> echo = adapter->StubFor<Tarn::Profiler::RegistryStub>(ref.Get());

    std::atomic<int> matched{0}, mismatched{0}, failed{0}, callbacks{0};
    auto worker = [&](int thread) {
        std::vector<Ref<Kernite::System::ScheduledItem>> items;
        for (int i = 0; i < kCalls; ++i) {
            const std::string tag = std::to_string(thread) + "/" + std::to_string(i);
            try {
                if (i % 2 == 0) {
                    Ref<Orbit::Array<std::string>> answer;
                    echo->EnumeratePath("path:" + tag, answer);
                    (answer->GetLength() == 2 && answer->GetAt(0) == "path:" + tag &&
                             answer->GetAt(1) == "concurrent-caller"
                         ? matched
                         : mismatched)++;
                    continue;
                }
                Ref<Orbit::Array<std::string>> names(new Orbit::Array<std::string>{"a" + tag, "b" + tag});
                Ref<Kernite::System::ScheduledItem> item;
                echo->CreateNamesQuery(
                    names.Get(),
                    [&, expected = "a" + tag + "+b" + tag + "+"](Kernite::System::ScheduledItem*, Kernite::Exception* e,
                                                                   Orbit::Any* result) {
                        ++callbacks;
                        auto* query = dynamic_cast<Orbit::MoRef*>(result);
                        if (e != nullptr) ++failed;
                        else (query != nullptr && query->GetId() == expected ? matched : mismatched)++;
                    },
                    item);
                items.push_back(item);
            } catch (const std::exception& e) {
                ++failed;
                ADD_FAILURE() << tag << ": " << e.what();
            }
        }
        for (auto& item : items) item->Wait();
    };
    std::vector<std::thread> threads;
    for (int t = 0; t < kThreads; ++t) threads.emplace_back(worker, t);
    for (std::thread& t : threads) t.join();
    adapter->Shutdown();

    EXPECT_EQ(failed, 0);
    EXPECT_EQ(mismatched, 0);
    EXPECT_EQ(callbacks, kThreads * kCalls / 2);
    EXPECT_EQ(matched, kThreads * kCalls);
    EXPECT_LE(adapter->OpenConnections(), 0u);
}

}  // namespace
