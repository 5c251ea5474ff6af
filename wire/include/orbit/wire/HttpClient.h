// The client side of the HTTP transport: a stub adapter that carries its stubs' calls
// to an HttpServer (or any server that speaks the same SOAP, Http.h) for one API
// version, over keep-alive connections, plain or TLS.
//
//   Orbit::Wire::ClientSettings settings;
//   settings.url = "https://127.0.0.1:40123/orbit";
//   settings.apiVersion = "tarn.version.version8";
//   settings.caFile = "ca.pem";
//   settings.bearerToken = token;
//   Kernite::Ref<Orbit::Wire::HttpAdapter> adapter(new Orbit::Wire::HttpAdapter(settings));
//   auto instance = adapter->StubFor<Tarn::ServiceInstanceStub>(rootReference);
//
// Calls. Invoke encodes on the calling thread, sends the request on a pooled
// connection and decodes the answer on the calling thread. StartInvoke encodes on the
// calling thread too; the rest, the decoding and the completion callback run on the
// adapter's I/O thread(s), never on a thread per call. As with the loopback adapter,
// the callback runs once with the item, the failure or null and the result or null,
// and the item is completed after it; every failure of the call (encoding included)
// reaches the callback, and StartInvoke itself throws only after Shutdown(). A
// synchronous call from an I/O thread (inside a completion callback) would wait for
// itself, so it throws Kernite::Exception; start calls asynchronously there.
//
// Failures: faults are thrown as their own classes (the wire's own faults too,
// Faults.h); a member the version does not see is refused before anything is sent
// (strata.wire.UnknownMethod); a call that outlives callTimeout fails with
// CallTimeout; a lost or refused connection, a failed TLS verification or an answer
// that is not SOAP fails with TransportError (Http.h). A connection that failed is
// closed; the next call opens a new one. Nothing is retried, since a call that was
// sent may have run.
//
// Connections: at most maxConnections, shared by every thread; a call waits for a free
// one. Idle connections that the server has closed are noticed before reuse.
//
// The stubs' request contexts are not sent; the server makes its own.
#pragma once

#include <chrono>
#include <cstddef>
#include <memory>
#include <string>

#include "orbit/Managed.h"
#include "orbit/wire/Codec.h"
#include "orbit/wire/Http.h"

namespace Orbit::Wire {

struct ClientSettings {
    // "http://host:port/path" or "https://host:port/path"; the port defaults to 80
    // or 443.
    std::string url;
    // The API version's name, "tarn.version.version8".
    std::string apiVersion;

    // Credentials: a bearer token, or a Basic user and password (not both).
    std::string bearerToken;
    std::string basicUser;
    std::string basicPassword;
    // Basic credentials are refused over plain HTTP, where anyone on the way can read
    // them, unless this says otherwise.
    bool allowBasicOverPlainHttp = false;

    // TLS: the server's certificate must chain to a CA of this PEM file (the system's
    // CAs when empty) and name the URL's host.
    std::string caFile;
    // Turns the verification off: the connection is encrypted, but to whoever answers.
    bool insecureSkipVerification = false;

    std::size_t maxConnections = 4;
    int ioThreads = 1;
    std::chrono::milliseconds callTimeout{30000};  // from the call's start to its answer
    std::chrono::milliseconds idleTimeout{30000};  // an unused connection is then closed
    Limits limits;                                 // of the answers
};

class HttpAdapter : public StubAdapter {
public:
    // Throws Kernite::InvalidArgumentException for a bad URL, an unknown version,
    // Basic credentials over plain HTTP or an unreadable CA file. Connects lazily.
    explicit HttpAdapter(const ClientSettings& settings);
    ~HttpAdapter() override;

    void Invoke(const std::string& id, ManagedMethod* method, Kernite::RefVector<Any>& args,
                Kernite::Ref<Any>& result, RequestContext* context) override;
    void StartInvoke(const std::string& id, ManagedMethod* method, Kernite::RefVector<Any>& args,
                     const CompletionCallback& callback, Kernite::Ref<Kernite::System::ScheduledItem>& item,
                     RequestContext* context) override;

    // A stub for the object `reference` names, of the type it names (null for null).
    // Throws Kernite::InvalidArgumentException when no managed type has that name.
    Kernite::Ref<ManagedObject> CreateStub(const MoRef* reference, RequestContext* context = nullptr);
    // The same, narrowed to the stub class S (Kernite::TypeMismatchException if it
    // is not one).
    template <class S>
    Kernite::Ref<S> StubFor(const MoRef* reference, RequestContext* context = nullptr) {
        Kernite::Ref<ManagedObject> stub = CreateStub(reference, context);
        return Kernite::Ref<S>(Kernite::NarrowToType<S, ManagedObject>(stub.Get()));
    }

    const Version& GetVersion() const noexcept;

    // Waits for the calls in flight, closes the connections and joins the I/O
    // threads; later calls throw Kernite::Exception. Idempotent. Called on an I/O
    // thread, it lets the calls end on their own instead of waiting.
    void Shutdown();

    // Connections open now, for watching.
    std::size_t OpenConnections() const;

    struct Core;

private:
    std::shared_ptr<Core> _core;
};

}  // namespace Orbit::Wire
