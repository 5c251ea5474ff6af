// A server's answer to one SOAP request, apart from HTTP: the version, the
// credentials, the privilege, the target, the call and its encoding, in the order
// HttpServer.h gives, every refusal as a fault of the request's version.
#pragma once

#include <string>
#include <string_view>

#include "orbit/Host.h"
#include "orbit/wire/Codec.h"
#include "orbit/wire/HttpServer.h"

namespace Orbit::Wire {

inline constexpr std::string_view kSoapActionField = "SOAPAction";
inline constexpr std::string_view kXmlContentType = "text/xml; charset=utf-8";

struct Answer {
    unsigned status = 200;
    std::string_view contentType = kXmlContentType;
    std::string body;
};

// Plain text, for what is not a SOAP request at all (an unknown path, a method).
Answer TextAnswer(unsigned status, std::string text);

class SoapCalls {
public:
    // Both are the server's and outlive this.
    SoapCalls(const ObjectHost& host, const ServerSettings& settings);

    // 200 with the response, or 500 with a fault. `authorization` is the header's value.
    Answer Call(std::string_view soapAction, std::string_view authorization, std::string_view body,
                const std::string& peer, bool overTls) const;
    // A message refused before it could be read: `status` with a LimitExceeded (when
    // `tooLarge`) or a MalformedMessage fault saying `what`, in the version the
    // SOAPAction names if it names one.
    Answer Refusal(unsigned status, bool tooLarge, std::string_view soapAction, const std::string& what) const;

private:
    Identity Authenticate(std::string_view authorization, bool overTls) const;
    const Version& FaultVersion(std::string_view soapAction) const;
    Answer FaultAnswer(const Version& version, MethodFault& fault) const;

    const ObjectHost& _host;
    const ServerSettings& _settings;
    const Version* _faultVersion;
};

}  // namespace Orbit::Wire
