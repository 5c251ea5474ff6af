// The faults of the wire: what a peer hears when its message cannot be read, or when
// a server refuses or fails a call. Each is a runtime fault type with its own record
// (wire name "strata.wire.<Name>", version "strata.version.version0", so every API
// version sees it), registered with the type map when the first Codec is made, so
// that the other end decodes it as its own class.
//
//   strata.wire.InvalidRequest      the base of the refused messages; `path` names
//                                   the offending element
//     strata.wire.MalformedMessage  not well-formed XML, a DOCTYPE, an entity
//                                   reference, bad UTF-8, not a SOAP 1.1 envelope
//     strata.wire.UnknownElement    an element or attribute that is not expected
//                                   here, or that the API version does not see; a
//                                   header entry for us marked mustUnderstand
//     strata.wire.MissingElement    a required member is absent
//     strata.wire.InvalidValue      text that is not a value of the declared type:
//                                   wrong lexical form, number out of range,
//                                   unknown tag, bad dateTime, an xsi:type that is
//                                   unknown or not a subtype of the declared type
//     strata.wire.LimitExceeded     body size, nesting depth or element count
//     strata.wire.UnknownMethod     a method the API version does not see, or
//                                   that the target's type does not have
//     strata.wire.UnknownVersion    an API version that is not registered
//     strata.wire.UnknownObject     a target id that the server hosts no object under
//   strata.wire.NotAuthenticated    credentials that the server refuses (directly a
//                                   MethodFault, as are the three below)
//   strata.wire.NotAuthorized       a member whose privilege the caller does not hold
//   strata.wire.ServerFault         an implementation failed with an exception that is
//                                   not a fault; the message is the exception's
//
// The message reads "<path>: <what is wrong>"; paths start at the body's element,
// "/DebugAcquireLock/holdDurationMillis", and count repeated elements from 0,
// "/DebugAcquireLock/objects[1]". A fault of the message as a whole (not XML, not
// an envelope, too large) has an empty path and names the byte where it can.
#pragma once

#include <string>

#include "orbit/DataObject.h"

namespace Orbit::Wire {

class InvalidRequest : public MethodFault {
public:
    class Exception : public MethodFault::Exception {
    public:
        using MethodFault::Exception::Exception;
        Exception* Clone() const override;
        [[noreturn]] void Throw() const override;
    };

    InvalidRequest() = default;
    InvalidRequest(const InvalidRequest& other) = default;

    const std::string& GetPath() const noexcept { return _path; }
    void SetPath(const std::string& path) { _path = path; }

    Type* _GetType() const override;
    DataObjectType* _GetDataType() const override;
    unsigned int _GetSize(SizeFunction f) const override;
    Any* _Clone() const override;
    [[noreturn]] void Throw() override;
    Exception* CreateException() override;

private:
    std::string _path;
};

// One kind of fault: its own class, record and exception, nothing else.
template <class Tag, class Base>
class FaultKind : public Base {
public:
    class Exception : public Base::Exception {
    public:
        using Base::Exception::Exception;
        Exception* Clone() const override { return new Exception(*this); }
        [[noreturn]] void Throw() const override { throw *this; }
    };

    Type* _GetType() const override { return GetType<FaultKind>(); }
    DataObjectType* _GetDataType() const override { return GetDoType<FaultKind>(); }
    unsigned int _GetSize(SizeFunction f) const override {
        return Base::_GetSize(f) - f(sizeof(Base)) + f(sizeof(FaultKind));
    }
    Any* _Clone() const override { return new FaultKind(*this); }
    [[noreturn]] void Throw() override { throw Exception(_GetType()->GetName(), this); }
    Exception* CreateException() override { return new Exception(_GetType()->GetName(), this); }
};

// Every kind but InvalidRequest itself, with its base: X(Name, Base). Declarations,
// records, type objects and registration are all made from this one list.
#define ORBIT_WIRE_FAULT_KINDS(X)       \
    X(MalformedMessage, InvalidRequest) \
    X(UnknownElement, InvalidRequest)   \
    X(MissingElement, InvalidRequest)   \
    X(InvalidValue, InvalidRequest)     \
    X(LimitExceeded, InvalidRequest)    \
    X(UnknownMethod, InvalidRequest)    \
    X(UnknownVersion, InvalidRequest)   \
    X(UnknownObject, InvalidRequest)    \
    X(NotAuthenticated, MethodFault)    \
    X(NotAuthorized, MethodFault)       \
    X(ServerFault, MethodFault)

#define ORBIT_WIRE_DECLARE_KIND(Name, Base) \
    struct Name##Tag;                       \
    using Name = FaultKind<Name##Tag, Base>;
ORBIT_WIRE_FAULT_KINDS(ORBIT_WIRE_DECLARE_KIND)
#undef ORBIT_WIRE_DECLARE_KIND

// Throws a new fault of class F with `path` and the message "<path>: <what>".
template <class F>
[[noreturn]] void ThrowFault(const std::string& path, const std::string& what) {
    Kernite::Ref<F> fault(new F());
    fault->SetPath(path);
    fault->SetMsg(path.empty() ? what : path + ": " + what);
    throw typename F::Exception(fault->_GetType()->GetName(), fault.Get());
}

// Throws a new fault of class F (one without a path) with the message `what`.
template <class F>
[[noreturn]] void ThrowServiceFault(const std::string& what) {
    Kernite::Ref<F> fault(new F());
    fault->SetMsg(what);
    throw typename F::Exception(fault->_GetType()->GetName(), fault.Get());
}

// Whether the fault blames the caller (SOAP faultcode Client): a refused message,
// refused credentials or a missing privilege. Every other fault blames the server.
bool IsClientFault(const MethodFault& fault);

}  // namespace Orbit::Wire

namespace Orbit {
template <> Type* GetType<Wire::InvalidRequest>();
#define ORBIT_WIRE_DECLARE_GET_TYPE(Name, Base) template <> Type* GetType<Wire::Name>();
ORBIT_WIRE_FAULT_KINDS(ORBIT_WIRE_DECLARE_GET_TYPE)
#undef ORBIT_WIRE_DECLARE_GET_TYPE
}  // namespace Orbit
