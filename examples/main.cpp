// tarn-example                 server and client in one process (loopback adapter)
// tarn-example serve [PORT]    the server over HTTP on 127.0.0.1; prints "url: <URL>"
//                              and "token: <bearer token>", serves until SIGINT or SIGTERM
// tarn-example call URL        the client against that server; the token comes from
//                              the environment variable TARN_EXAMPLE_TOKEN
#include <openssl/rand.h>
#include <signal.h>

#include <cstdlib>
#include <iostream>

#include "client.h"
#include "orbit/Loopback.h"
#include "orbit/wire/HttpClient.h"
#include "orbit/wire/HttpServer.h"

namespace {

using Kernite::Ref;

int RunInProcess(Example::Transcript& out) {
    Ref<Orbit::LoopbackAdapter> adapter(new Orbit::LoopbackAdapter());
    const Ref<Orbit::MoRef> root = Example::StartServer(adapter.Get(), out);
    const int status = Example::RunClient(out, root.Get(), [&adapter](const Orbit::MoRef* ref) {
        auto* type = dynamic_cast<Orbit::ManagedObjectType*>(Orbit::GetTypeMap()->GetType(ref->GetType()));
        if (type == nullptr) throw Kernite::InvalidArgumentException(ref->GetType());
        return adapter->CreateStub(ref->GetId(), type);
    });
    adapter->Shutdown();
    return status;
}

// 32 random bytes as hex: the one credential of this server's one operator.
std::string NewToken() {
    unsigned char bytes[32];
    if (RAND_bytes(bytes, sizeof bytes) != 1) throw Kernite::Exception("no random bytes for a token");
    static const char* const kHex = "0123456789abcdef";
    std::string token;
    for (unsigned char b : bytes) token += {kHex[b >> 4], kHex[b & 15]};
    return token;
}

int Serve(Example::Transcript& out, unsigned short port) {
    // The workers must not take the stop signals; the main thread waits for them.
    sigset_t stop;
    sigemptyset(&stop);
    sigaddset(&stop, SIGINT);
    sigaddset(&stop, SIGTERM);
    pthread_sigmask(SIG_BLOCK, &stop, nullptr);

    const std::string token = NewToken();
    Orbit::Wire::ServerSettings settings;
    settings.port = port;
    settings.authorizer = [token](const Orbit::Wire::Credentials& credentials) -> std::optional<Orbit::Wire::Identity> {
        if (credentials.scheme != Orbit::Wire::Credentials::Scheme::Bearer || credentials.token != token)
            return std::nullopt;
        return Orbit::Wire::Identity{"operator", {"Global.HubServer"}};
    };
    Orbit::Wire::HttpServer server(settings);
    out.Line("url: " + server.Url());
    out.Line("token: " + token);
    Example::StartServer(&server, out);

    int signal = 0;
    sigwait(&stop, &signal);
    server.Stop();
    out.Line("server: stopped");
    return 0;
}

int Call(Example::Transcript& out, const std::string& url) {
    Orbit::Wire::ClientSettings settings;
    settings.url = url;
    settings.apiVersion = "tarn.version.dev";  // markLogs is newer than version8
    if (const char* token = std::getenv("TARN_EXAMPLE_TOKEN")) settings.bearerToken = token;
    Ref<Orbit::Wire::HttpAdapter> adapter(new Orbit::Wire::HttpAdapter(settings));
    const Ref<Orbit::MoRef> root = Example::ServiceInstanceReference();
    const int status = Example::RunClient(
        out, root.Get(), [&adapter](const Orbit::MoRef* ref) { return adapter->CreateStub(ref); });
    adapter->Shutdown();
    return status;
}

}  // namespace

int main(int argc, char** argv) {
    Example::Transcript out(std::cout);
    const std::string mode = argc > 1 ? argv[1] : "";
    try {
        if (mode.empty()) return RunInProcess(out);
        if (mode == "serve") return Serve(out, argc > 2 ? static_cast<unsigned short>(std::stoi(argv[2])) : 0);
        if (mode == "call" && argc > 2) return Call(out, argv[2]);
    } catch (const std::exception& e) {
        const auto* fault = dynamic_cast<const Orbit::MethodFault::Exception*>(&e);
        out.Line(std::string(mode == "serve" ? "server" : "client") + ": unexpected failure: " + e.what() +
                 (fault ? ": " + fault->GetFault()->GetMsg() : std::string()));
        return 1;
    }
    std::cerr << "usage: tarn-example [serve [PORT] | call URL]" << std::endl;
    return 2;
}
