#include "orbit/wire/Codec.h"

#include "decoder.h"
#include "encoder.h"
#include "kernite/Exception.h"
#include "orbit/wire/Faults.h"

namespace Orbit::Wire {
namespace {

constexpr std::string_view kActionScheme = "urn:";

const MethodTable& Require(const Schema& schema, const ManagedMethod& method) {
    const MethodTable* table = schema.Method(&method);
    if (table == nullptr) {
        const ManagedObjectType* owner = method.GetDeclaringType();
        ThrowFault<UnknownMethod>("", (owner ? owner->GetName() + "." : std::string()) + method.GetName() +
                                          " is not seen by " + schema.GetVersion().GetName());
    }
    return *table;
}

}  // namespace

Version* FindVersion(std::string_view serviceNamespace, std::string_view versionId) {
    for (Version* version : GetVersionMap()->GetVersions())
        if (version->GetServiceNamespace() == serviceNamespace && version->GetVersionId() == versionId &&
            !serviceNamespace.empty())
            return version;
    return nullptr;
}

std::string SoapAction(const Version& version) {
    return std::string(kActionScheme) + version.GetServiceNamespace() + "/" + version.GetVersionId();
}

Version* VersionOfSoapAction(std::string_view action) {
    if (action.size() >= 2 && action.front() == '"' && action.back() == '"') action = action.substr(1, action.size() - 2);
    if (!action.starts_with(kActionScheme)) return nullptr;
    action.remove_prefix(kActionScheme.size());
    const std::size_t slash = action.rfind('/');
    if (slash == std::string_view::npos) return nullptr;
    return FindVersion(action.substr(0, slash), action.substr(slash + 1));
}

Version& RequireVersion(std::string_view action) {
    Version* version = VersionOfSoapAction(action);
    if (version == nullptr)
        ThrowFault<UnknownVersion>("", "no API version is named by the SOAPAction '" + std::string(action) + "'");
    return *version;
}

std::string Namespace(const Version& version) { return Schema::For(version).Namespace(); }

Codec::Codec(const Version& version, Limits limits) : _schema(&Schema::For(version)), _limits(limits) {}

const Version& Codec::GetVersion() const noexcept { return _schema->GetVersion(); }

std::string Codec::EncodeRequest(const MoRef& target, const ManagedMethod& method,
                                 const Kernite::RefVector<Any>& args) const {
    const MethodTable& table = Require(*_schema, method);
    if (args.size() != table.params.size())
        throw Kernite::InvalidArgumentException(Kernite::MessageFormatter::ASPrint(
            "%1 arguments where %2 were expected", args.size(), table.params.size()));
    std::string out;
    out.reserve(512);
    Encoder encoder(*_schema, out);
    encoder.OpenEnvelope(table.element);
    encoder.Target(target);
    for (std::size_t i = 0; i < args.size(); ++i)
        if (table.params[i].visible) encoder.Member(table.params[i], args[i].Get());
    encoder.CloseEnvelope(table.element);
    return out;
}

Request Codec::DecodeRequest(std::string_view body) const { return Decoder(*_schema, _limits).DecodeRequest(body); }

PendingRequest Codec::BeginRequest(std::string_view body) const {
    return PendingRequest(std::make_unique<Decoder>(*_schema, _limits), body);
}

PendingRequest::PendingRequest(std::unique_ptr<Decoder> decoder, std::string_view body)
    : _decoder(std::move(decoder)) {
    _target = _decoder->BeginRequest(body, _method);
}

PendingRequest::PendingRequest(PendingRequest&&) noexcept = default;
PendingRequest& PendingRequest::operator=(PendingRequest&&) noexcept = default;
PendingRequest::~PendingRequest() = default;

Kernite::RefVector<Any> PendingRequest::DecodeArguments() { return _decoder->DecodeArguments(); }

const std::string& PendingRequest::GetOperation() const noexcept { return _decoder->Operation(); }

std::string Codec::EncodeResponse(const ManagedMethod& method, Any* result) const {
    const MethodTable& table = Require(*_schema, method);
    if (!table.hasResult && result != nullptr)
        throw Kernite::InvalidArgumentException(table.element + " has no result, but one was given");
    const std::string element = table.element + "Response";
    std::string out;
    out.reserve(512);
    Encoder encoder(*_schema, out);
    encoder.OpenEnvelope(element);
    if (table.hasResult) encoder.Member(table.result, result);
    encoder.CloseEnvelope(element);
    return out;
}

Kernite::Ref<Any> Codec::DecodeResponse(std::string_view body, const ManagedMethod& method) const {
    const MethodTable& table = Require(*_schema, method);
    return Decoder(*_schema, _limits).DecodeResponse(body, table);
}

std::string Codec::EncodeFault(MethodFault& fault) const {
    std::string out;
    out.reserve(512);
    Encoder encoder(*_schema, out);
    encoder.OpenEnvelope({});
    encoder.Fault(fault, IsClientFault(fault));
    encoder.CloseEnvelope({});
    return out;
}

Kernite::Ref<MethodFault> Codec::DecodeFault(std::string_view body) const {
    return Decoder(*_schema, _limits).DecodeFault(body);
}

std::string Codec::EncodeValue(Any* value, std::string_view element) const {
    std::string out;
    Encoder encoder(*_schema, out);
    encoder.Document(element, value);
    return out;
}

Kernite::Ref<Any> Codec::DecodeValue(std::string_view document) const {
    return Decoder(*_schema, _limits).DecodeValue(document);
}

}  // namespace Orbit::Wire
