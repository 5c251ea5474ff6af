// Calls one member of a managed type end to end: through the declaring type's
// invokeMember applied to a client stub (synchronous), or through the testing
// library's StartMember (asynchronous), and keeps what came back.
#pragma once

#include <memory>
#include <string>

#include "orbit/Loopback.h"
#include "orbit/Orbit.h"
#include "tarn/testing/Double.h"

namespace Roundtrip {

struct Outcome {
    Kernite::Ref<Orbit::Any> result;
    std::unique_ptr<Kernite::Exception> failure;  // a clone of what was thrown
    // Asynchronous calls only.
    Kernite::Ref<Kernite::System::ScheduledItem> item;
    int callbacks = 0;
    bool pendingInCallback = false;  // the item was not completed before the callback ran
};

Outcome CallSync(Orbit::ManagedMethod* member, Orbit::ManagedObject* stub, Kernite::RefVector<Orbit::Any> args);
Outcome CallAsync(Orbit::ManagedMethod* member, Orbit::ManagedObject* stub, Kernite::RefVector<Orbit::Any> args);

// A double of the most derived type, hosted on `host` under the type's wire name,
// and a stub of the same type that reaches it through `stubAdapter`.
struct Hosted {
    Kernite::Ref<Orbit::ManagedObject> object;
    Tarn::Testing::Double* dbl = nullptr;
    Kernite::Ref<Orbit::ManagedObject> stub;
};
Hosted Host(Orbit::ManagedObjectType* type, Orbit::ObjectHost* host, Orbit::StubAdapter* stubAdapter);

// Every member of every managed type, own and inherited, from a client stub through
// `adapter` to a test double hosted on `host` and back: arguments and results (all
// set, then optional ones null), sync and async, and a fault of each member. Each
// value must arrive equal to what was sent, and a fault as its own class.
struct Trip {
    Orbit::ObjectHost* host = nullptr;
    Orbit::StubAdapter* adapter = nullptr;
    // The version the adapter speaks: values hold only what it sees, and the members
    // it does not see must be refused with strata.wire.UnknownMethod. Null: all.
    const Orbit::Version* version = nullptr;
    // A wire lies between: what arrives is a copy, never the object sent.
    bool copies = false;
};
struct TripCounts {
    std::size_t types = 0, members = 0, exercised = 0, refused = 0, syncCalls = 0, asyncCalls = 0;
};
TripCounts RunEveryMember(const Trip& trip);

// Forwards to a loopback adapter and, when told to, hands the stub another answer
// than the server gave: what no generated server would produce.
class ForgingAdapter : public Orbit::StubAdapter {
public:
    explicit ForgingAdapter(Orbit::LoopbackAdapter* inner) : _inner(inner) {}

    // From now on every synchronous call answers `answer` (null: no result at all).
    void Forge(Orbit::Any* answer) {
        _forging = true;
        _answer = answer;
    }

    void Invoke(const std::string& id, Orbit::ManagedMethod* method, Kernite::RefVector<Orbit::Any>& args,
                Kernite::Ref<Orbit::Any>& result, Orbit::RequestContext* context) override {
        _inner->Invoke(id, method, args, result, context);
        if (_forging) result = _answer;
    }
    void StartInvoke(const std::string& id, Orbit::ManagedMethod* method, Kernite::RefVector<Orbit::Any>& args,
                     const Orbit::CompletionCallback& callback, Kernite::Ref<Kernite::System::ScheduledItem>& item,
                     Orbit::RequestContext* context) override {
        _inner->StartInvoke(id, method, args, callback, item, context);
    }

private:
    Kernite::Ref<Orbit::LoopbackAdapter> _inner;
    bool _forging = false;
    Kernite::Ref<Orbit::Any> _answer;
};

}  // namespace Roundtrip
