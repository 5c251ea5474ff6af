// An adapter that serves calls in the same process: implementations are hosted by
// id, and each call is dispatched through its managed type's invokeMember.
#pragma once

#include <condition_variable>
#include <deque>
#include <functional>
#include <memory>
#include <mutex>
#include <string>
#include <thread>

#include "orbit/Host.h"

namespace Orbit {

// Hosts objects (ObjectHost's Register, Unregister) and serves its stubs' calls.
class LoopbackAdapter : public StubAdapter, public ObjectHost {
public:
    LoopbackAdapter();
    ~LoopbackAdapter() override;

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

    // Finishes the queued calls and joins the worker. Idempotent. Called on the
    // worker's own thread (from a completion callback, or by the release of the last
    // reference there), it runs what is still queued itself and lets the worker end.
    void Shutdown();

    // The context of the call being served on this thread, or null; the same as
    // Orbit::CurrentRequestContext().
    static RequestContext* CurrentContext();

private:
    // The worker's queue, shared with the worker thread, which may outlive the
    // adapter when the adapter was released on that thread.
    struct WorkQueue {
        std::mutex mutex;
        std::condition_variable ready;
        std::deque<std::function<void()>> calls;
        bool stopping = false;
        // Null once none is left; the lock is not held while the call runs.
        std::function<void()> Next(bool wait);
    };

    static void WorkerLoop(std::shared_ptr<WorkQueue> queue);

    const std::shared_ptr<WorkQueue> _queue = std::make_shared<WorkQueue>();
    std::thread _worker;  // guarded by _queue->mutex
};

}  // namespace Orbit
