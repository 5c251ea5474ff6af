// The faults of the wire: what a peer hears when its message cannot be read. Each is
// a runtime fault type with its own record (wire name "strata.wire.<Name>", version
// "strata.version.version0", so every API version sees it), registered with the type
// map when the first Codec is made, so that the other end decodes it as its own class.
//
//   strata.wire.InvalidRequest      the base; `path` names the offending element
//     strata.wire.MalformedMessage  not well-formed XML, a DOCTYPE, an entity
//                                   reference, bad UTF-8, not a SOAP 1.1 envelope
//     strata.wire.UnknownElement    an element or attribute that is not expected
//                                   here, or that the API version does not see
//     strata.wire.MissingElement    a required member is absent
//     strata.wire.InvalidValue      text that is not a value of the declared type:
//                                   wrong lexical form, number out of range,
//                                   unknown tag, bad dateTime, an xsi:type that is
//                                   unknown or not a subtype of the declared type
//     strata.wire.LimitExceeded     body size, nesting depth or element count
//     strata.wire.UnknownMethod     a method the API version does not see, or
//                                   that the target's type does not have
//     strata.wire.UnknownVersion    an API version that is not registered
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

// One kind of invalid request: its own class, record and exception, nothing else.
template <class Tag>
class RequestFaultKind : public InvalidRequest {
public:
    class Exception : public InvalidRequest::Exception {
    public:
        using InvalidRequest::Exception::Exception;
        Exception* Clone() const override { return new Exception(*this); }
        [[noreturn]] void Throw() const override { throw *this; }
    };

    Type* _GetType() const override { return GetType<RequestFaultKind>(); }
    DataObjectType* _GetDataType() const override { return GetDoType<RequestFaultKind>(); }
    unsigned int _GetSize(SizeFunction f) const override {
        return InvalidRequest::_GetSize(f) - f(sizeof(InvalidRequest)) + f(sizeof(RequestFaultKind));
    }
    Any* _Clone() const override { return new RequestFaultKind(*this); }
    [[noreturn]] void Throw() override { throw Exception(_GetType()->GetName(), this); }
    Exception* CreateException() override { return new Exception(_GetType()->GetName(), this); }
};

struct MalformedMessageTag;
struct UnknownElementTag;
struct MissingElementTag;
struct InvalidValueTag;
struct LimitExceededTag;
struct UnknownMethodTag;
struct UnknownVersionTag;
using MalformedMessage = RequestFaultKind<MalformedMessageTag>;
using UnknownElement = RequestFaultKind<UnknownElementTag>;
using MissingElement = RequestFaultKind<MissingElementTag>;
using InvalidValue = RequestFaultKind<InvalidValueTag>;
using LimitExceeded = RequestFaultKind<LimitExceededTag>;
using UnknownMethod = RequestFaultKind<UnknownMethodTag>;
using UnknownVersion = RequestFaultKind<UnknownVersionTag>;

// Throws a new fault of class F with `path` and the message "<path>: <what>".
template <class F>
[[noreturn]] void ThrowFault(const std::string& path, const std::string& what) {
    Kernite::Ref<F> fault(new F());
    fault->SetPath(path);
    fault->SetMsg(path.empty() ? what : path + ": " + what);
    throw typename F::Exception(fault->_GetType()->GetName(), fault.Get());
}

}  // namespace Orbit::Wire

namespace Orbit {
template <> Type* GetType<Wire::InvalidRequest>();
template <> Type* GetType<Wire::MalformedMessage>();
template <> Type* GetType<Wire::UnknownElement>();
template <> Type* GetType<Wire::MissingElement>();
template <> Type* GetType<Wire::InvalidValue>();
template <> Type* GetType<Wire::LimitExceeded>();
template <> Type* GetType<Wire::UnknownMethod>();
template <> Type* GetType<Wire::UnknownVersion>();
}  // namespace Orbit
