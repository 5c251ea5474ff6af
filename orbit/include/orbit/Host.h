// Serving calls: the implementations an adapter or a server hosts by id, the dispatch
// of one call to one of them, and the request context of the call served on a thread.
#pragma once

#include <cstddef>
#include <functional>
#include <memory>
#include <mutex>
#include <string>
#include <unordered_map>

#include "orbit/Managed.h"

namespace Orbit {

// Implementations by id. Holds a reference to each hosted object and tells it
// (_Unregistered) when it stops hosting it, at the latest when the host ends.
// Every operation may be called from any thread.
class ObjectHost {
public:
    ObjectHost() = default;
    ObjectHost(const ObjectHost&) = delete;
    ObjectHost& operator=(const ObjectHost&) = delete;
    virtual ~ObjectHost();

    // Hosts `object` under `id`, replacing (and unregistering) any earlier one;
    // null stops hosting `id`.
    void Register(const std::string& id, ManagedObject* object);
    // Stops hosting `id` and tells the object; unknown ids are ignored.
    void Unregister(const std::string& id);
    // Stops hosting every object.
    void UnregisterAll();
    // The object hosted under `id`, or null.
    Kernite::Ref<ManagedObject> Find(const std::string& id) const;
    std::size_t HostedCount() const;

private:
    mutable std::mutex _mutex;
    std::unordered_map<std::string, Kernite::Ref<ManagedObject>> _objects;
};

// Whether `method` is a member that `target` answers: a member of the method's
// declaring type, which the target's type is or derives from.
bool Answers(ManagedObject* target, const ManagedMethod* method);

// "<declaring type>.<method>", as messages name a member.
std::string Describe(const ManagedMethod* method);

// Calls `method` of `target` through its declaring type's invokeMember, with
// `context` as the context of the call served on this thread meanwhile. The
// caller has checked Answers(target, method).
void Dispatch(ManagedObject* target, ManagedMethod* method, Kernite::RefVector<Any>& args,
              Kernite::Ref<Any>& result, RequestContext* context);

// Inside a catch block: a copy of the exception being handled, of its own class
// where it is a Kernite::Exception, else a Kernite::Exception with its message. What
// an asynchronous call hands its callback and its item when it fails.
std::unique_ptr<Kernite::Exception> CaptureFailure();

// Ends an asynchronous call as every adapter does: `outcome` gives the result or
// throws the failure; the callback then runs once with the item, the failure or
// null and the result or null (an exception of its own has nowhere to go and is
// dropped), and the item completes after it.
void CompleteCall(Kernite::System::ScheduledItem* item, const CompletionCallback& callback,
                  const std::function<Kernite::Ref<Any>()>& outcome);

// The context of the call being served on this thread (by any adapter or server),
// or null: what an implementation reads to learn, for example, who calls it.
RequestContext* CurrentRequestContext();

}  // namespace Orbit
