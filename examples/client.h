// The client half of the worked example, whichever adapter carries its calls.
#pragma once

#include <functional>

#include "server.h"

namespace Example {

// A stub for the object a reference names, of the type the reference names.
using StubMaker = std::function<Kernite::Ref<Orbit::ManagedObject>(const Orbit::MoRef*)>;

// Walks the story from the service instance `root`: navigation, faults planted, read
// back (also asynchronously) and removed, locks taken, a snapshot tree saved and
// read back, and the SecurityConfigFault of reloadSslCertificate. 0 when all went
// as it should.
int RunClient(Transcript& out, const Orbit::MoRef* root, const StubMaker& makeStub);

}  // namespace Example
