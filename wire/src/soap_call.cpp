#include "soap_call.h"

#include <openssl/evp.h>

#include <cctype>
#include <vector>

#include "orbit/Array.h"
#include "orbit/Primitive.h"
#include "orbit/wire/Faults.h"

namespace Orbit::Wire {
namespace {

template <class F>
Kernite::Ref<MethodFault> NewFault(const std::string& what) {
    Kernite::Ref<F> fault(new F());
    fault->SetMsg(what);
    return Kernite::Ref<MethodFault>(fault.Get());
}

bool StartsWithScheme(std::string_view header, std::string_view scheme) {
    if (header.size() <= scheme.size() || header[scheme.size()] != ' ') return false;
    for (std::size_t i = 0; i < scheme.size(); ++i)
        if (std::tolower(static_cast<unsigned char>(header[i])) != scheme[i]) return false;
    return true;
}

std::string_view Trim(std::string_view text) {
    while (!text.empty() && (text.front() == ' ' || text.front() == '\t')) text.remove_prefix(1);
    while (!text.empty() && (text.back() == ' ' || text.back() == '\t')) text.remove_suffix(1);
    return text;
}

// Standard base64 with padding; false for anything else.
bool DecodeBase64(std::string_view text, std::string& out) {
    if (text.empty() || text.size() % 4 != 0 || text.size() > 8192) return false;
    for (char c : text)
        if (!std::isalnum(static_cast<unsigned char>(c)) && c != '+' && c != '/' && c != '=') return false;
    std::vector<unsigned char> bytes(text.size() / 4 * 3);
    const int n = EVP_DecodeBlock(bytes.data(), reinterpret_cast<const unsigned char*>(text.data()),
                                  static_cast<int>(text.size()));
    if (n < 0) return false;
    std::size_t size = static_cast<std::size_t>(n);
    for (std::size_t i = text.size(); i > 0 && text[i - 1] == '='; --i) --size;  // EVP counts the padding
    out.assign(reinterpret_cast<const char*>(bytes.data()), size);
    return true;
}

const Version& LastServiceVersion() {
    const Version* last = nullptr;
    for (Version* version : GetVersionMap()->GetVersions())
        if (!version->GetServiceNamespace().empty()) last = version;
    if (last == nullptr) throw Kernite::Exception("no API version with a service namespace is registered");
    return *last;
}

Kernite::Ref<RequestContext> ContextOf(const Identity& identity, const Version& version, const std::string& peer) {
    Kernite::Ref<RequestContext> context(new RequestContext());
    if (!identity.name.empty()) context->SetValue("caller", new Primitive<std::string>(identity.name));
    if (!identity.privileges.empty()) {
        Kernite::Ref<Array<std::string>> privileges(new Array<std::string>());
        for (const std::string& privilege : identity.privileges) privileges->Append(privilege);
        context->SetValue("privileges", privileges.Get());
    }
    context->SetValue("apiVersion", new Primitive<std::string>(version.GetName()));
    context->SetValue("peer", new Primitive<std::string>(peer));
    return context;
}

}  // namespace

Answer TextAnswer(unsigned status, std::string text) {
    return Answer{status, "text/plain; charset=utf-8", std::move(text) + "\n"};
}

SoapCalls::SoapCalls(const ObjectHost& host, const ServerSettings& settings)
    : _host(host), _settings(settings) {
    Version* named = settings.faultVersion.empty() ? nullptr : GetVersionMap()->GetVersion(settings.faultVersion);
    if (!settings.faultVersion.empty() && named == nullptr)
        throw Kernite::InvalidArgumentException(settings.faultVersion);
    _faultVersion = named ? named : &LastServiceVersion();
    // The codec registers the wire's faults; the first request must not race for it.
    Codec{*_faultVersion};
}

const Version& SoapCalls::FaultVersion(std::string_view soapAction) const {
    const Version* named = VersionOfSoapAction(soapAction);
    return named ? *named : *_faultVersion;
}

Answer SoapCalls::FaultAnswer(const Version& version, MethodFault& fault) const {
    const Codec codec(version, _settings.limits);
    try {
        return Answer{500, kXmlContentType, codec.EncodeFault(fault)};
    } catch (const Kernite::Exception&) {
        // A message that XML cannot carry; the class still tells what happened.
        Kernite::Ref<MethodFault> replacement =
            NewFault<ServerFault>("a fault of class " + fault._GetType()->GetName() + " that cannot be written");
        return Answer{500, kXmlContentType, codec.EncodeFault(*replacement)};
    }
}

Answer SoapCalls::Refusal(unsigned status, bool tooLarge, std::string_view soapAction, const std::string& what) const {
    Kernite::Ref<MethodFault> fault = tooLarge ? NewFault<LimitExceeded>(what) : NewFault<MalformedMessage>(what);
    Answer answer = FaultAnswer(FaultVersion(soapAction), *fault);
    answer.status = status;
    return answer;
}

Identity SoapCalls::Authenticate(std::string_view authorization, bool overTls) const {
    authorization = Trim(authorization);
    if (authorization.empty()) return {};
    Credentials credentials;
    credentials.overTls = overTls;
    if (StartsWithScheme(authorization, "basic")) {
        std::string decoded;
        if (!DecodeBase64(Trim(authorization.substr(6)), decoded) || decoded.find(':') == std::string::npos)
            ThrowServiceFault<NotAuthenticated>("unreadable Basic credentials");
        if (!overTls && !_settings.acceptBasicOverPlainHttp)
            ThrowServiceFault<NotAuthenticated>("Basic credentials are not accepted over plain HTTP");
        credentials.scheme = Credentials::Scheme::Basic;
        credentials.user = decoded.substr(0, decoded.find(':'));
        credentials.password = decoded.substr(decoded.find(':') + 1);
    } else if (StartsWithScheme(authorization, "bearer")) {
        credentials.scheme = Credentials::Scheme::Bearer;
        credentials.token = std::string(Trim(authorization.substr(7)));
        if (credentials.token.empty()) ThrowServiceFault<NotAuthenticated>("an empty bearer token");
    } else {
        ThrowServiceFault<NotAuthenticated>("an authorization scheme other than Basic and Bearer");
    }
    // Nobody to ask: the caller stays anonymous.
    if (!_settings.authorizer) return {};
    std::optional<Identity> identity = _settings.authorizer(credentials);
    if (!identity) ThrowServiceFault<NotAuthenticated>("the credentials were refused");
    return std::move(*identity);
}

Answer SoapCalls::Call(std::string_view soapAction, std::string_view authorization, std::string_view body,
                       const std::string& peer, bool overTls) const {
    const Version* version = _faultVersion;
    try {
        version = &RequireVersion(soapAction);
        const Identity identity = Authenticate(authorization, overTls);
        const Codec codec(*version, _settings.limits);
        PendingRequest pending = codec.BeginRequest(body);
        ManagedMethod* method = pending.GetMethod();

        if (const char* privilege = method->GetPrivilege(); privilege != nullptr && !identity.privileges.count(privilege))
            ThrowServiceFault<NotAuthorized>(Describe(method) + " needs the privilege " + privilege);

        const std::string& id = pending.GetTarget()->GetId();
        const std::string targetPath = "/" + pending.GetOperation() + "/target";
        Kernite::Ref<ManagedObject> target = _host.Find(id);
        if (!target) ThrowFault<UnknownObject>(targetPath, "no object '" + id + "' is hosted here");
        if (!Answers(target.Get(), method))
            ThrowFault<UnknownMethod>(targetPath, "the object '" + id + "' of type " + target->_GetType()->GetName() +
                                                      " has no member " + Describe(method));

        Kernite::RefVector<Any> args = pending.DecodeArguments();
        const Kernite::Ref<RequestContext> context = ContextOf(identity, *version, peer);
        Kernite::Ref<Any> result;
        try {
            Dispatch(target.Get(), method, args, result, context.Get());
        } catch (const MethodFault::Exception&) {
            throw;
        } catch (const std::exception& e) {
            ThrowServiceFault<ServerFault>(e.what());
        } catch (...) {
            ThrowServiceFault<ServerFault>("an exception of no known class");
        }
        try {
            return Answer{200, kXmlContentType, codec.EncodeResponse(*method, result.Get())};
        } catch (const Kernite::Exception& e) {
            ThrowServiceFault<ServerFault>("the result of " + Describe(method) + " cannot be sent: " + e.what());
        }
    } catch (const MethodFault::Exception& e) {
        return FaultAnswer(*version, *e.GetFault());
    } catch (const std::exception& e) {
        // Out of memory, or an authorizer that failed.
        return FaultAnswer(*version, *NewFault<ServerFault>(e.what()));
    }
}

}  // namespace Orbit::Wire
