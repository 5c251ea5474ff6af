// What the HTTP server and client adapter agree on, beyond the SOAP envelope itself
// (Codec.h). All of it is ours to choose:
//
// - The service path is "/orbit". A call is "POST /orbit" with the envelope as body,
//   Content-Type "text/xml; charset=utf-8" and the header SOAPAction naming the API
//   version ("urn:tarnd3/4.0", Codec.h's SoapAction()).
// - The answer is "200 OK" with the response envelope, or "500" with a fault
//   envelope (SOAP 1.1), or for a message that cannot be taken in at all "400"
//   (malformed HTTP), "413" (body too large) or "431" (header too large), each with
//   a fault envelope too, after which the server closes the connection.
// - "GET /orbit?wsdl&version=<version name>" answers the WSDL of that version
//   ("tarn.version.version8"), its address being the server's own URL.
// - Credentials travel in the standard Authorization header, "Basic <base64 of
//   user:password>" or "Bearer <token>".
// - The server names itself "orbit-http" (Server header), the client
//   "orbit-http-client" (User-Agent).
#pragma once

#include <optional>
#include <set>
#include <string>

#include "kernite/Exception.h"

namespace Orbit::Wire {

inline constexpr const char* kServicePath = "/orbit";

// The credentials of a request, as the server read them from its Authorization header.
struct Credentials {
    enum class Scheme { None, Basic, Bearer };
    Scheme scheme = Scheme::None;
    std::string user;      // Basic
    std::string password;  // Basic
    std::string token;     // Bearer
    bool overTls = false;  // the connection they came over is TLS
};

// Who calls, once an authorizer has accepted the credentials.
struct Identity {
    std::string name;
    std::set<std::string> privileges;  // "Global.HubServer", ...
};

// A transport failure seen by the client: the server cannot be reached, the
// connection was lost or refused by TLS verification, or the answer was not SOAP.
// The call may or may not have reached the server.
class TransportError : public Kernite::Exception {
public:
    using Kernite::Exception::Exception;
    TransportError* Clone() const override { return new TransportError(*this); }
    [[noreturn]] void Throw() const override { throw *this; }
};

// A call that took longer than its timeout. Its connection is closed, since the
// answer could still arrive on it.
class CallTimeout : public TransportError {
public:
    using TransportError::TransportError;
    CallTimeout* Clone() const override { return new CallTimeout(*this); }
    [[noreturn]] void Throw() const override { throw *this; }
};

}  // namespace Orbit::Wire
