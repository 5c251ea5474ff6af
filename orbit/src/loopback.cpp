#include "orbit/Loopback.h"

#include <memory>
#include <vector>

#include "kernite/Assert.h"
#include "orbit/DataObject.h"

namespace Orbit {
namespace {

[[noreturn]] void Fail(const std::string& message) {
    Kernite::Ref<MethodFault> fault(new MethodFault());
    fault->SetMsg(message);
    throw MethodFault::Exception(fault->_GetType()->GetName(), fault.Get());
}

}  // namespace

LoopbackAdapter::LoopbackAdapter() = default;

LoopbackAdapter::~LoopbackAdapter() {
    Shutdown();
    UnregisterAll();
}

Kernite::Ref<ManagedObject> LoopbackAdapter::CreateStub(const std::string& id, ManagedObjectType* type,
                                                        RequestContext* context) {
    return type ? type->CreateStub(id, this, context) : Kernite::Ref<ManagedObject>();
}

void LoopbackAdapter::Invoke(const std::string& id, ManagedMethod* method, Kernite::RefVector<Any>& args,
                             Kernite::Ref<Any>& result, RequestContext* context) {
    result = nullptr;
    if (method == nullptr) Fail("no method given for managed object '" + id + "'");
    Kernite::Ref<ManagedObject> target = Find(id);
    if (!target) Fail("unknown managed object id '" + id + "' in call of " + Describe(method));

    if (!Answers(target.Get(), method)) {
        Type* targetType = target->_GetType();
        Fail("managed object '" + id + "' of type '" + (targetType ? targetType->GetName() : std::string("?")) +
             "' has no member " + Describe(method));
    }
    Dispatch(target.Get(), method, args, result, context);
}

void LoopbackAdapter::StartInvoke(const std::string& id, ManagedMethod* method, Kernite::RefVector<Any>& args,
                                  const CompletionCallback& callback,
                                  Kernite::Ref<Kernite::System::ScheduledItem>& item, RequestContext* context) {
    Kernite::Ref<Kernite::System::ScheduledItem> started(new Kernite::System::ScheduledItem());
    auto call = [this, id, method, args, callback, started, context = Kernite::Ref<RequestContext>(context)]() mutable {
        CompleteCall(started.Get(), callback, [&] {
            Kernite::Ref<Any> result;
            Invoke(id, method, args, result, context.Get());
            return result;
        });
    };
    {
        std::lock_guard<std::mutex> lock(_queue->mutex);
        if (_queue->stopping) throw Kernite::Exception("loopback adapter is shut down");
        if (!_worker.joinable()) _worker = std::thread(&LoopbackAdapter::WorkerLoop, _queue);
        _queue->calls.emplace_back(std::move(call));
    }
    _queue->ready.notify_one();
    item = std::move(started);
}

void LoopbackAdapter::Shutdown() {
    std::thread worker;
    {
        std::lock_guard<std::mutex> lock(_queue->mutex);
        _queue->stopping = true;
        worker = std::move(_worker);
    }
    _queue->ready.notify_all();
    if (!worker.joinable()) return;
    if (worker.get_id() != std::this_thread::get_id()) {
        worker.join();
        return;
    }
    // On the worker itself, which cannot wait for itself: the queued calls still
    // need this adapter, so they run here and now, in order, as the worker would
    // have run them. The worker then finds the queue empty and ends on its own,
    // touching only the shared queue, never this adapter.
    while (std::function<void()> call = _queue->Next(false)) call();
    worker.detach();
}

RequestContext* LoopbackAdapter::CurrentContext() { return CurrentRequestContext(); }

std::function<void()> LoopbackAdapter::WorkQueue::Next(bool wait) {
    std::unique_lock<std::mutex> lock(mutex);
    if (wait) ready.wait(lock, [this] { return stopping || !calls.empty(); });
    if (calls.empty()) return nullptr;
    std::function<void()> call = std::move(calls.front());
    calls.pop_front();
    return call;
}

void LoopbackAdapter::WorkerLoop(std::shared_ptr<WorkQueue> queue) {
    // A call may release the adapter's last reference (its callback holds it), so
    // the call is destroyed before the queue is looked at again.
    while (std::function<void()> call = queue->Next(true)) {
        call();
        call = nullptr;
    }
}

}  // namespace Orbit
