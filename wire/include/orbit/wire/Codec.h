// The SOAP 1.1 encoding of calls, results, faults and values (document/literal,
// wrapped), driven by the records: the same type objects and record functions serve
// every API version, each exactly as that version sees them.
//
// On the wire, for the API version V (service namespace "tarnd3", id "2.0"):
// - Every element of ours is in the namespace "urn:<service namespace>" (Namespace()).
//   Types are named by wire name ("tarn.vmprov.HostState"), arrays of a type by its
//   array type's flat name ("ArrayOfString", "ArrayOfTarnVmprovHostState").
// - A request names V by its SOAPAction, "urn:<service namespace>/<version id>"
//   ("urn:tarnd3/2.0", SoapAction()); the WSDL of V writes it on every operation, so
//   that SOAP clients send it, and the transport finds V with VersionOfSoapAction().
// - Request: <Body><M><target moType="T">id</target><p1>..</p1>..</M></Body>, M being
//   the method's wsdl name and p1.. its parameters by wire name, in parameter order.
//   A property of a managed type is read through the operation named
//   "<declaring type's flat name>.<property>" ("TarnServiceInstance.debugManager"),
//   which has no parameters.
// - Response: <MResponse><result>..</result></MResponse>; no <result> for a method
//   without one (or an optional result that is absent). A task method's result is the
//   task's reference.
// - Fault: <Fault><faultcode/><faultstring/><detail><W>..</W></detail></Fault>, W the
//   wire name of the fault's class, holding its properties. faultcode is Client for
//   the wire's own faults (Faults.h), Server for the others.
// - Values: strings, booleans, ints, longs, doubles (INF, -INF, NaN) and methodNames as
//   text; dateTime in ISO 8601, UTC ("2026-12-06T09:49:01.250Z"); a managed object
//   reference as <e moType="T">id</e>; an enumeration by tag; an array as repeated
//   elements; a data object as its properties, base first, an optional member omitted
//   when unset; anyType with xsi:type, and xsi:type on a data object whenever the
//   value's class is more derived than the declared type.
// - Version-exact: V writes no member it does not see, writes a value whose class it
//   does not see as the nearest base it sees, and refuses an element, a method or an
//   xsi:type it does not see.
//
// A SOAP Header is read past (its entries count against the limits), except that an
// entry for this end (no actor, or the "next" actor) marked mustUnderstand="1" is
// refused, as none is understood here.
//
// Decoding is strict (Faults.h lists what is refused): no DTD, no entity other than
// the five predefined ones and character references, limits on size, depth and
// element count. A failed decode throws the fault's own exception and leaves nothing
// allocated. Encoding refuses (Kernite::InvalidArgumentException) a required member
// that is null, a string that XML cannot carry and a value of the wrong class.
//
// A Codec is immutable once made and may be shared between threads.
#pragma once

#include <cstddef>
#include <memory>
#include <string>
#include <string_view>

#include "kernite/Ref.h"
#include "orbit/DataObject.h"
#include "orbit/Registry.h"

namespace Orbit::Wire {

class Schema;
class Decoder;

// What a decoder accepts at most. The defaults suit requests of a few megabytes.
struct Limits {
    std::size_t maxBodyBytes = 16u << 20;  // the whole message, in bytes
    int maxDepth = 64;                     // element nesting, the envelope being 1
    std::size_t maxElements = 500000;      // elements in the message, the envelope included
};

// The registered version with this service namespace and version id, or null.
Version* FindVersion(std::string_view serviceNamespace, std::string_view versionId);
// "urn:<service namespace>/<version id>".
std::string SoapAction(const Version& version);
// The version a SOAPAction names, quoted or not; null when it names none.
Version* VersionOfSoapAction(std::string_view soapAction);
// The same, throwing UnknownVersion instead of answering null.
Version& RequireVersion(std::string_view soapAction);
// "urn:<service namespace>" (the version's name when it has no service namespace).
std::string Namespace(const Version& version);

// A decoded request, ready for the target type's invokeMember: the arguments are
// boxed as the generated stubs box them, null where an optional one was absent.
struct Request {
    Kernite::Ref<MoRef> target;
    ManagedMethod* method = nullptr;
    Kernite::RefVector<Any> args;
};

// A request read in two steps, so that a server can refuse a call (an unknown target,
// a privilege the caller lacks) before any argument is built: Codec::BeginRequest
// reads the envelope up to the target and names the method, DecodeArguments() then
// reads the arguments. Holds its own copy of the message; one thread at a time.
class PendingRequest {
public:
    PendingRequest(PendingRequest&&) noexcept;
    PendingRequest& operator=(PendingRequest&&) noexcept;
    ~PendingRequest();

    MoRef* GetTarget() const noexcept { return _target.Get(); }
    ManagedMethod* GetMethod() const noexcept { return _method; }
    // The body's element ("DebugAcquireLock"), the first step of fault paths.
    const std::string& GetOperation() const noexcept;
    // The arguments, boxed as DecodeRequest boxes them. A second call throws
    // Kernite::Exception.
    Kernite::RefVector<Any> DecodeArguments();

private:
    friend class Codec;
    PendingRequest(std::unique_ptr<Decoder> decoder, std::string_view body);

    std::unique_ptr<Decoder> _decoder;
    Kernite::Ref<MoRef> _target;
    ManagedMethod* _method = nullptr;
};

class Codec {
public:
    explicit Codec(const Version& version, Limits limits = {});

    const Version& GetVersion() const noexcept;
    const Limits& GetLimits() const noexcept { return _limits; }

    // Client: a call of `method` on `target`; `args` as a stub passes them. A method
    // the version does not see is refused with UnknownMethod.
    std::string EncodeRequest(const MoRef& target, const ManagedMethod& method,
                              const Kernite::RefVector<Any>& args) const;
    // Server: the call in `body`.
    Request DecodeRequest(std::string_view body) const;
    // Server: the same in two steps; the target and the method are read (and refused
    // with the same faults) here, the arguments by PendingRequest::DecodeArguments.
    PendingRequest BeginRequest(std::string_view body) const;

    // Server: the answer to a call of `method`; `result` as invokeMember left it.
    std::string EncodeResponse(const ManagedMethod& method, Any* result) const;
    // Client: the result of a call of `method`, boxed as the stubs expect it (null
    // for a method without one). A fault in `body` is thrown as its own class.
    Kernite::Ref<Any> DecodeResponse(std::string_view body, const ManagedMethod& method) const;

    // Server: a fault; its class is written as the nearest one the version sees.
    std::string EncodeFault(MethodFault& fault) const;
    // Client: the fault in `body`, made through the type map as its own class; a
    // fault whose detail names no class the version sees is a plain MethodFault.
    Kernite::Ref<MethodFault> DecodeFault(std::string_view body) const;

    // One value as a document of its own: <element xsi:type="T">..</element>.
    std::string EncodeValue(Any* value, std::string_view element = "value") const;
    Kernite::Ref<Any> DecodeValue(std::string_view document) const;

private:
    const Schema* _schema;
    Limits _limits;
};

}  // namespace Orbit::Wire
