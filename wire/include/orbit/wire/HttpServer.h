// A server that hosts implementations by id (as the loopback adapter does) and
// serves their members as SOAP over HTTP/1.1, plain or TLS, for every API version
// at once: each request names its own (Http.h has the conventions).
//
// One call, in order:
//  1. the SOAPAction names the API version;
//  2. the Authorization header is read and handed to the authorizer;
//  3. the envelope is read up to the target and the method (no argument is built);
//  4. a member with a privilege is refused unless the caller holds it;
//  5. the target must be hosted and answer the member;
//  6. the arguments are decoded, the implementation is called through its type's
//     invokeMember, and its result (or fault) is encoded for that version.
//
// The faults a server sends (Faults.h), each with its cause:
//   strata.wire.NotAuthenticated  the authorizer refused the credentials; Basic
//                                 credentials over plain HTTP (unless allowed); an
//                                 Authorization header of another scheme, or unreadable
//   strata.wire.UnknownVersion    no SOAPAction, or one naming no registered version
//   strata.wire.MalformedMessage, UnknownElement, MissingElement, InvalidValue,
//   LimitExceeded                 the envelope cannot be read (Codec.h); also
//                                 LimitExceeded for a body or header over the limit
//                                 and MalformedMessage for malformed HTTP
//   strata.wire.UnknownMethod     a method the version does not see, or that the
//                                 hosted object does not answer
//   strata.wire.NotAuthorized     the member needs a privilege the caller does not
//                                 hold; without an authorizer every privileged member
//   strata.wire.UnknownObject     no object is hosted under the target's id
//   strata.wire.ServerFault       the implementation threw an exception that is not a
//                                 fault (its message is kept), or answered a result
//                                 that cannot be encoded
//   any fault of the API          the implementation threw it; a version that does
//                                 not see its class hears of its nearest base
//
// The implementation learns who calls from the call's request context,
// Orbit::CurrentRequestContext(), which holds:
//   "caller"      Primitive<std::string>, the identity's name (absent if anonymous)
//   "privileges"  Array<std::string>, the privileges held (absent if none)
//   "apiVersion"  Primitive<std::string>, the version's name ("tarn.version.version8")
//   "peer"        Primitive<std::string>, the client's address and port
//
// Threads: `workerThreads` threads run every connection's I/O and the calls
// themselves, each connection on its own strand, so at most that many calls run at
// once. Reads, writes and idle keep-alive connections have timeouts, so that a slow or
// stalled client holds no thread and its connection only for a while. Stop() (and the
// destructor) refuse new connections, close the idle ones, finish the requests in
// flight and then join the threads.
#pragma once

#include <chrono>
#include <cstddef>
#include <functional>
#include <memory>
#include <optional>
#include <string>

#include "orbit/Host.h"
#include "orbit/wire/Codec.h"
#include "orbit/wire/Http.h"

namespace Orbit::Wire {

// Maps a request's credentials to who calls; nullopt refuses them. Called for every
// request that carries credentials, from any worker thread at once.
using Authorizer = std::function<std::optional<Identity>(const Credentials&)>;

struct ServerSettings {
    std::string address = "127.0.0.1";
    unsigned short port = 0;  // 0 picks a free port; Port() tells which
    int workerThreads = 2;
    // PEM files; both set for TLS, both empty for plain HTTP.
    std::string certificateFile;
    std::string privateKeyFile;
    // Without one, every caller is anonymous and every privileged member is refused.
    Authorizer authorizer;
    // Basic credentials over plain HTTP travel readable by anyone on the way, so they
    // are refused unless this says otherwise.
    bool acceptBasicOverPlainHttp = false;
    Limits limits;                        // of the envelope; maxBodyBytes is also the HTTP body limit
    std::size_t maxHeaderBytes = 16 << 10;  // the request line and the headers together
    std::size_t maxConnections = 512;     // beyond it, new connections are closed at once
    // Waiting for a request's header, on a new or a keep-alive connection.
    std::chrono::milliseconds idleTimeout{60000};
    // A request's body once its header is in; the TLS handshake.
    std::chrono::milliseconds readTimeout{30000};
    std::chrono::milliseconds writeTimeout{30000};  // one answer
    std::chrono::milliseconds stopGrace{30000};     // Stop() waits this long for calls in flight
    // The version of the faults sent before a request has named its own (no or an
    // unknown SOAPAction, malformed HTTP). Empty: the last registered version that
    // has a service namespace.
    std::string faultVersion;
};

class HttpServer : public ObjectHost {
public:
    // Listens at once; throws TransportError when it cannot (address in use, bad
    // certificate or key).
    explicit HttpServer(ServerSettings settings);
    ~HttpServer() override;

    unsigned short Port() const noexcept;
    // "http://127.0.0.1:40123/orbit" (https for TLS).
    std::string Url() const;

    // Refuses new connections, closes idle ones, lets the requests in flight finish
    // (for at most stopGrace, then closes what is left) and joins the workers.
    // Idempotent. Throws Kernite::Exception when called on a worker, which cannot
    // wait for itself.
    void Stop();

    // Connections open now, for watching (tests count them before and after).
    std::size_t OpenConnections() const;

    struct Impl;

private:
    std::unique_ptr<Impl> _impl;
};

}  // namespace Orbit::Wire
