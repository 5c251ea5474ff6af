// An adapter that serves calls in the same process: implementations are hosted by
// id, and each call is dispatched through its managed type's invokeMember.
#pragma once

#include <condition_variable>
#include <deque>
#include <functional>
#include <mutex>
#include <string>
#include <thread>
#include <unordered_map>

#include "orbit/Managed.h"

namespace Orbit {

class LoopbackAdapter : public StubAdapter {
public:
    LoopbackAdapter();
    ~LoopbackAdapter() override;

    // Hosts `object` under `id`, replacing (and unregistering) any earlier one.
    void Register(const std::string& id, ManagedObject* object);
    // Stops hosting `id` and tells the object; unknown ids are ignored.
    void Unregister(const std::string& id);
    // A stub of `type` for `id`, through this adapter.
    Kernite::Ref<ManagedObject> CreateStub(const std::string& id, ManagedObjectType* type,
                                           RequestContext* context = nullptr);

    // An unknown id, or a member that the hosted object's type lacks, is thrown as
    // an Orbit::MethodFault::Exception whose fault says so; the implementation's own
    // exceptions pass through unchanged.
    void Invoke(const std::string& id, ManagedMethod* method, Kernite::RefVector<Any>& args,
                Kernite::Ref<Any>& result, RequestContext* context) override;
    // Runs the call on the adapter's worker thread, then the callback, then completes
    // the item. After Shutdown() it throws Kernite::Exception.
    void StartInvoke(const std::string& id, ManagedMethod* method, Kernite::RefVector<Any>& args,
                     const CompletionCallback& callback, Kernite::Ref<Kernite::System::ScheduledItem>& item,
                     RequestContext* context) override;

    // Finishes the queued calls and joins the worker. Idempotent.
    void Shutdown();

    // The context of the call being served on this thread, or null.
    static RequestContext* CurrentContext();

private:
    Kernite::Ref<ManagedObject> Find(const std::string& id) const;
    void WorkerLoop();

    mutable std::mutex _objectsMutex;
    std::unordered_map<std::string, Kernite::Ref<ManagedObject>> _objects;

    std::mutex _queueMutex;
    std::condition_variable _queueReady;
    std::deque<std::function<void()>> _queue;
    bool _stopping = false;
    std::thread _worker;
};

}  // namespace Orbit
