// The transport's promises: TLS verified against the right CA only, credentials and
// privileges checked before anything else, the caller's identity handed to the
// implementation, its failures turned into faults, timeouts, lost connections and a
// graceful stop.
#include <gtest/gtest.h>

#include <atomic>
#include <chrono>
#include <cstdlib>
#include <filesystem>
#include <fstream>
#include <future>
#include <stdexcept>
#include <thread>

#include "expect.h"
#include "orbit/wire/Faults.h"
#include "orbit/wire/HttpClient.h"
#include "orbit/wire/HttpServer.h"
#include "raw.h"
#include "tarn/types.h"

namespace {

using namespace Orbit::Wire;
using Kernite::Ref;
using namespace std::chrono_literals;

// A lock stresser that tells what it saw: the caller's name and privileges from the
// call's context; "sleep" holds for holdDurationMillis, "throw" fails outright.
class Probe : public Orbit::ManagedObjectImpl, public virtual Tarn::LockStresser {
public:
    Probe() : Orbit::ManagedObjectImpl("probe") {}
    void AcquireLock(Orbit::DataArray<Orbit::MoRef>*, const std::string& mode, long long hold, int, long long) override {
        Orbit::RequestContext* context = Orbit::CurrentRequestContext();
        auto* caller = context ? dynamic_cast<Orbit::Primitive<std::string>*>(context->GetValue("caller")) : nullptr;
        auto* held = context ? dynamic_cast<Orbit::Array<std::string>*>(context->GetValue("privileges")) : nullptr;
        {
            std::lock_guard<std::mutex> lock(mutex);
            seenCaller = caller ? caller->GetValue() : "";
            seenPrivileges = held ? held->GetLength() : 0;
        }
        ++calls;
        if (mode == "sleep") std::this_thread::sleep_for(std::chrono::milliseconds(hold));
        if (mode == "throw") throw std::runtime_error("disk on fire");
    }
    std::mutex mutex;
    std::string seenCaller;
    int seenPrivileges = 0;
    std::atomic<int> calls{0};
};

std::optional<Identity> Tokens(const Credentials& c) {
    if (c.scheme == Credentials::Scheme::Bearer && c.token == "operator-token")
        return Identity{"operator", {"Global.HubServer", "System.View"}};
    if (c.scheme == Credentials::Scheme::Bearer && c.token == "observer-token") return Identity{"observer", {}};
    if (c.scheme == Credentials::Scheme::Basic && c.user == "basic-user" && c.password == "basic-secret")
        return Identity{"basic-user", {"Global.HubServer"}};
    return std::nullopt;
}

class Transport : public ::testing::Test {
protected:
    static void SetUpTestSuite() {
        folder = std::filesystem::temp_directory_path() / ("orbit-http-" + std::to_string(::getpid()));
        std::filesystem::create_directories(folder);
        std::ofstream(folder / "san.cnf") << "subjectAltName=IP:127.0.0.1\n";
        const std::string key = " -newkey ec -pkeyopt ec_paramgen_curve:prime256v1 -nodes -days 2";
        const std::string in = "cd '" + folder.string() + "' && ";
        for (const std::string& command :
             {in + "openssl req -x509" + key + " -keyout ca.key -out ca.pem -subj /CN=orbit-test-ca",
              in + "openssl req -x509" + key + " -keyout other.key -out other.pem -subj /CN=orbit-other-ca",
              in + "openssl req" + key + " -keyout server.key -out server.csr -subj /CN=127.0.0.1",
              in + "openssl x509 -req -in server.csr -CA ca.pem -CAkey ca.key -CAcreateserial -days 2"
                   " -extfile san.cnf -out server.pem"})
            if (std::system((command + " >/dev/null 2>&1").c_str()) != 0)
                throw std::runtime_error("openssl failed: " + command);
    }
    static void TearDownTestSuite() { std::filesystem::remove_all(folder); }

    static ServerSettings WithTokens() {
        ServerSettings settings;
        settings.authorizer = Tokens;
        return settings;
    }
    static ClientSettings Bearing(const char* token) {
        ClientSettings settings;
        settings.bearerToken = token;
        return settings;
    }
    void Serve(ServerSettings settings) {
        server = std::make_unique<HttpServer>(std::move(settings));
        server->Register("probe", probe.Get());
    }
    Ref<HttpAdapter> Client(ClientSettings settings) {
        if (settings.url.empty()) settings.url = server->Url();
        settings.apiVersion = "tarn.version.version8";
        return Ref<HttpAdapter>(new HttpAdapter(settings));
    }
    static void Lock(HttpAdapter* adapter, const char* mode = "x", long long hold = 0, const char* id = "probe") {
        Ref<Orbit::MoRef> ref(new Orbit::MoRef("tarn.LockStresser", id));
        Ref<Orbit::DataArray<Orbit::MoRef>> none(new Orbit::DataArray<Orbit::MoRef>());
        adapter->StubFor<Tarn::LockStresserStub>(ref.Get())->AcquireLock(none.Get(), mode, hold, 1, 0);
    }
    // The message of the fault, of class F exactly, that a call fails with.
    template <class F>
    static std::string FaultOf(HttpAdapter* adapter, const char* mode = "x", const char* id = "probe") {
        try {
            Lock(adapter, mode, 0, id);
        } catch (const typename F::Exception& e) {
            EXPECT_EQ(typeid(e), typeid(typename F::Exception)) << "thrown as " << typeid(e).name();
            return e.GetFault()->GetMsg();
        } catch (const std::exception& e) {
            ADD_FAILURE() << "unexpected exception " << typeid(e).name() << ": " << e.what();
            return {};
        }
        ADD_FAILURE() << "no fault";
        return {};
    }

    static inline std::filesystem::path folder;
    Ref<Probe> probe{new Probe()};
    std::unique_ptr<HttpServer> server;
};

TEST_F(Transport, TlsVerifiesTheServerAgainstTheCaGiven) {
    ServerSettings settings = WithTokens();
    settings.certificateFile = (folder / "server.pem").string();
    settings.privateKeyFile = (folder / "server.key").string();
    Serve(settings);
    ASSERT_EQ(server->Url().rfind("https://127.0.0.1:", 0), 0u) << server->Url();

    ClientSettings right = Bearing("operator-token");
    right.caFile = (folder / "ca.pem").string();
    Lock(Client(right).Get());
    EXPECT_EQ(probe->calls, 1);

    ClientSettings wrong = right;
    wrong.caFile = (folder / "other.pem").string();
    const std::string refused = TestSupport::MessageOf<TransportError>([&] { Lock(Client(wrong).Get()); });
    EXPECT_NE(refused.find("TLS handshake"), std::string::npos) << refused;
    EXPECT_EQ(probe->calls, 1) << "a call went to a server that could not be verified";

    // Only when told so explicitly does the client talk to whoever answers.
    wrong.insecureSkipVerification = true;
    Lock(Client(wrong).Get());
    EXPECT_EQ(probe->calls, 2);

    // Basic credentials are fine over TLS.
    ClientSettings basic;
    basic.caFile = right.caFile;
    basic.basicUser = "basic-user";
    basic.basicPassword = "basic-secret";
    Lock(Client(basic).Get());
    EXPECT_EQ(probe->seenCaller, "basic-user");

    // Plain HTTP to a TLS port is no answer.
    ClientSettings plain = right;
    plain.url = "http://127.0.0.1:" + std::to_string(server->Port()) + "/orbit";
    EXPECT_THROW(Lock(Client(plain).Get()), TransportError);
}

TEST_F(Transport, BasicCredentialsNeverTravelOverPlainHttpUnlessAllowed) {
    ServerSettings settings = WithTokens();
    Serve(settings);
    ClientSettings basic;
    basic.basicUser = "basic-user";
    basic.basicPassword = "basic-secret";
    EXPECT_THROW(Client(basic), Kernite::InvalidArgumentException);

    // A client told to send them anyway meets a server that was not told to accept them.
    basic.allowBasicOverPlainHttp = true;
    Ref<HttpAdapter> careless = Client(basic);
    EXPECT_NE(FaultOf<NotAuthenticated>(careless.Get()).find("not accepted over plain HTTP"), std::string::npos);
    EXPECT_EQ(probe->calls, 0);

    server.reset();
    settings.acceptBasicOverPlainHttp = true;
    Serve(settings);
    Lock(Client(basic).Get());
    EXPECT_EQ(probe->seenCaller, "basic-user");
}

TEST_F(Transport, PrivilegesAreCheckedBeforeAnyArgumentAndIdentityReachesTheImplementation) {
    ServerSettings settings;
    Serve(settings);
    ClientSettings anonymous;
    // Without an authorizer, every privileged member is refused, credentials or not.
    EXPECT_NE(FaultOf<NotAuthorized>(Client(anonymous).Get()).find("needs the privilege Global.HubServer"),
              std::string::npos);
    const ClientSettings operatorToken = Bearing("operator-token");
    FaultOf<NotAuthorized>(Client(operatorToken).Get());

    server.reset();
    settings.authorizer = Tokens;
    Serve(settings);
    FaultOf<NotAuthorized>(Client(anonymous).Get());
    FaultOf<NotAuthorized>(Client(Bearing("observer-token")).Get());
    EXPECT_EQ(FaultOf<NotAuthenticated>(Client(Bearing("forged-token")).Get()), "the credentials were refused");
    EXPECT_EQ(probe->calls, 0);

    Lock(Client(operatorToken).Get());
    EXPECT_EQ(probe->seenCaller, "operator");
    EXPECT_EQ(probe->seenPrivileges, 2);

    // Arguments that cannot be read, from a caller without the privilege: refused
    // for the privilege, since they are never read.
    RawHttp::Connection raw(server->Port());
    raw.Send(RawHttp::Post("\"urn:tarnd3/4.0\"",
                           "<e:Envelope xmlns:e=\"http://schemas.xmlsoap.org/soap/envelope/\"><e:Body>"
                           "<DebugAcquireLock xmlns=\"urn:tarnd3\"><target moType=\"tarn.LockStresser\">probe</target>"
                           "<mode>x</mode><holdDurationMillis>never</holdDurationMillis></DebugAcquireLock>"
                           "</e:Body></e:Envelope>"));
    const RawHttp::Reply reply = raw.Receive();
    EXPECT_EQ(reply.status, 500);
    EXPECT_NE(reply.body.find("<strata.wire.NotAuthorized"), std::string::npos) << reply.body;
}

TEST_F(Transport, FailuresOfTheServerReachTheCallerAsFaults) {
    Serve(WithTokens());
    Ref<HttpAdapter> adapter = Client(Bearing("operator-token"));

    // An implementation's own exception keeps its message; the server goes on.
    EXPECT_EQ(FaultOf<ServerFault>(adapter.Get(), "throw"), "disk on fire");
    Lock(adapter.Get());
    FaultOf<UnknownObject>(adapter.Get(), "x", "nobody");

    // The WSDL names the server as the service's address; an unknown version is no WSDL.
    RawHttp::Connection raw(server->Port());
    raw.Send("GET /orbit?wsdl&version=tarn.version.version1 HTTP/1.1\r\nHost: h\r\n\r\n");
    RawHttp::Reply wsdl = raw.Receive();
    EXPECT_EQ(wsdl.status, 200);
    EXPECT_NE(wsdl.body.find("location=\"" + server->Url() + "\""), std::string::npos);
    raw.Send("GET /orbit?wsdl&version=tarn.version.version99 HTTP/1.1\r\nHost: h\r\n\r\n");
    EXPECT_EQ(raw.Receive().status, 404);
}

TEST_F(Transport, TimeoutsLostConnectionsAndAGracefulStop) {
    ServerSettings settings = WithTokens();
    settings.idleTimeout = 150ms;
    Serve(settings);
    ClientSettings quick = Bearing("operator-token");
    quick.callTimeout = 200ms;
    quick.maxConnections = 1;
    Ref<HttpAdapter> adapter = Client(quick);

    // Too slow: the call times out, its connection goes, the next call opens another.
    EXPECT_THROW(Lock(adapter.Get(), "sleep", 600), CallTimeout);
    Lock(adapter.Get());
    // The server closed the idle connection meanwhile; the client notices before reuse.
    std::this_thread::sleep_for(400ms);
    Lock(adapter.Get());
    EXPECT_EQ(probe->calls, 3);

    // A stop finishes the call in flight and refuses new connections.
    ClientSettings patient = quick;
    patient.callTimeout = 5s;
    Ref<HttpAdapter> slow = Client(patient);
    std::thread inFlight([&] { EXPECT_NO_THROW(Lock(slow.Get(), "sleep", 300)); });
    while (probe->calls < 4) std::this_thread::sleep_for(1ms);
    server->Stop();
    inFlight.join();
    EXPECT_EQ(server->OpenConnections(), 0u);
    EXPECT_THROW(Lock(adapter.Get()), TransportError);
    server.reset();

    // A connection lost mid-call fails that call, clearly; the next one reconnects.
    std::optional<RawHttp::Hangup> hangup(std::in_place);
    patient.url = "http://127.0.0.1:" + std::to_string(hangup->Port()) + "/orbit";
    Ref<HttpAdapter> dropped = Client(patient);
    const std::string message = TestSupport::MessageOf<TransportError>([&] { Lock(dropped.Get()); });
    EXPECT_NE(message.find("reading the answer failed"), std::string::npos) << message;
    settings.port = hangup->Port();
    hangup.reset();
    Serve(settings);
    Lock(dropped.Get());
    EXPECT_EQ(probe->calls, 5);
}

// As with the loopback adapter, the last reference to the adapter may go, and the
// adapter may be shut down, inside one of its own completion callbacks.
TEST_F(Transport, TheAdapterMayEndInsideItsOwnCallback) {
    Serve(WithTokens());
    Ref<Orbit::MoRef> ref(new Orbit::MoRef("tarn.LockStresser", "probe"));
    Ref<Orbit::DataArray<Orbit::MoRef>> none(new Orbit::DataArray<Orbit::MoRef>());
    for (bool shutdownFirst : {false, true}) {
        Ref<HttpAdapter> adapter = Client(Bearing("operator-token"));
        Ref<Tarn::LockStresserStub> stub = adapter->StubFor<Tarn::LockStresserStub>(ref.Get());
        std::promise<bool> outcome;
        Ref<Kernite::System::ScheduledItem> item;
        stub->AcquireLock(
            none.Get(), "x", 0, 1, 0,
            [&, shutdownFirst, held = std::move(adapter)](Kernite::System::ScheduledItem*, Kernite::Exception* e,
                                                            Orbit::Any*) mutable {
                if (shutdownFirst) held->Shutdown();
                EXPECT_THROW(Lock(held.Get()), Kernite::Exception);  // no synchronous call from here
                held = nullptr;
                stub = nullptr;
                outcome.set_value(e == nullptr);
            },
            item);
        EXPECT_TRUE(outcome.get_future().get());
        item->Wait();
        EXPECT_FALSE(item->IsFailed());
    }
    EXPECT_EQ(probe->calls, 2);
}

}  // namespace
