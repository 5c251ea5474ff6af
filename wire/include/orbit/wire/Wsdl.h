// The WSDL 1.1 description of what one API version sees, written from the same
// tables that the codec uses, so that the two cannot disagree. One port type holds
// every operation of every managed type the version sees (methods by wsdl name,
// property reads as "<flat name>.<property>"); each operation declares its faults
// and the wire's faults (strata.wire.InvalidRequest, NotAuthenticated, ServerFault,
// and NotAuthorized where the member needs a privilege), and carries the version's
// SOAPAction.
#pragma once

#include <ostream>
#include <string_view>

#include "orbit/Registry.h"

namespace Orbit::Wire {

// `address` is the service's URL in the document (a placeholder when empty).
void WriteWsdl(const Version& version, std::ostream& out, std::string_view address = {});

}  // namespace Orbit::Wire
