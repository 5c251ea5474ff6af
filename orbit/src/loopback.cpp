#include "orbit/Loopback.h"

#include <memory>
#include <vector>

#include "kernite/Assert.h"
#include "orbit/DataObject.h"

namespace Orbit {
namespace {

thread_local RequestContext* tCurrentContext = nullptr;

// Sets the served call's context for the current thread, restoring the outer one
// (a call served inside another) afterwards.
class ContextScope {
public:
    explicit ContextScope(RequestContext* context) : _outer(tCurrentContext) { tCurrentContext = context; }
    ~ContextScope() { tCurrentContext = _outer; }
    ContextScope(const ContextScope&) = delete;
    ContextScope& operator=(const ContextScope&) = delete;

private:
    RequestContext* _outer;
};

[[noreturn]] void Fail(const std::string& message) {
    Kernite::Ref<MethodFault> fault(new MethodFault());
    fault->SetMsg(message);
    throw MethodFault::Exception(fault->_GetType()->GetName(), fault.Get());
}

std::string Describe(const ManagedMethod* method) {
    const ManagedObjectType* owner = method->GetDeclaringType();
    return (owner ? owner->GetName() + "." : std::string()) + method->GetName();
}

// The exception a failed asynchronous call reports, of its own class where it is one of ours.
std::unique_ptr<Kernite::Exception> CaptureFailure() {
    try {
        throw;
    } catch (const Kernite::Exception& e) {
        return std::unique_ptr<Kernite::Exception>(e.Clone());
    } catch (const std::exception& e) {
        return std::make_unique<Kernite::Exception>(e.what());
    } catch (...) {
        return std::make_unique<Kernite::Exception>("unknown exception");
    }
}

}  // namespace

LoopbackAdapter::LoopbackAdapter() = default;

LoopbackAdapter::~LoopbackAdapter() {
    Shutdown();
    std::unordered_map<std::string, Kernite::Ref<ManagedObject>> objects;
    {
        std::lock_guard<std::mutex> lock(_objectsMutex);
        objects.swap(_objects);
    }
    for (auto& entry : objects) entry.second->_Unregistered();
}

void LoopbackAdapter::Register(const std::string& id, ManagedObject* object) {
    if (object == nullptr) {
        Unregister(id);
        return;
    }
    Kernite::Ref<ManagedObject> previous;
    {
        std::lock_guard<std::mutex> lock(_objectsMutex);
        Kernite::Ref<ManagedObject>& slot = _objects[id];
        previous = std::move(slot);
        slot = object;
    }
    if (previous && previous.Get() != object) previous->_Unregistered();
}

void LoopbackAdapter::Unregister(const std::string& id) {
    Kernite::Ref<ManagedObject> previous;
    {
        std::lock_guard<std::mutex> lock(_objectsMutex);
        auto it = _objects.find(id);
        if (it == _objects.end()) return;
        previous = std::move(it->second);
        _objects.erase(it);
    }
    previous->_Unregistered();
}

Kernite::Ref<ManagedObject> LoopbackAdapter::CreateStub(const std::string& id, ManagedObjectType* type,
                                                        RequestContext* context) {
    return type ? type->CreateStub(id, this, context) : Kernite::Ref<ManagedObject>();
}

Kernite::Ref<ManagedObject> LoopbackAdapter::Find(const std::string& id) const {
    std::lock_guard<std::mutex> lock(_objectsMutex);
    auto it = _objects.find(id);
    return it == _objects.end() ? Kernite::Ref<ManagedObject>() : it->second;
}

void LoopbackAdapter::Invoke(const std::string& id, ManagedMethod* method, Kernite::RefVector<Any>& args,
                             Kernite::Ref<Any>& result, RequestContext* context) {
    result = nullptr;
    if (method == nullptr) Fail("no method given for managed object '" + id + "'");
    Kernite::Ref<ManagedObject> target = Find(id);
    if (!target) Fail("unknown managed object id '" + id + "' in call of " + Describe(method));

    // The member must be one of its declaring type's, and the target must be of that type.
    ManagedObjectType* declaring = method->GetDeclaringType();
    Type* targetType = target->_GetType();
    const int number = method->GetMemberNumber();
    const ManagedTypeInfo* info = declaring ? declaring->GetManagedTypeInfo() : nullptr;
    const bool known = declaring != nullptr && number >= 0 &&
                       number < static_cast<int>(declaring->GetMembers().size()) &&
                       declaring->GetMembers()[number].Get() == method;
    if (!known || info->invokeMember == nullptr || targetType == nullptr || !targetType->IsA(declaring)) {
        Fail("managed object '" + id + "' of type '" + (targetType ? targetType->GetName() : std::string("?")) +
             "' has no member " + Describe(method));
    }

    ContextScope scope(context);
    info->invokeMember(target.Get(), number, args, result);
}

void LoopbackAdapter::StartInvoke(const std::string& id, ManagedMethod* method, Kernite::RefVector<Any>& args,
                                  const CompletionCallback& callback,
                                  Kernite::Ref<Kernite::System::ScheduledItem>& item, RequestContext* context) {
    Kernite::Ref<Kernite::System::ScheduledItem> started(new Kernite::System::ScheduledItem());
    auto call = [this, id, method, args, callback, started, context = Kernite::Ref<RequestContext>(context)]() mutable {
        Kernite::Ref<Any> result;
        std::unique_ptr<Kernite::Exception> failure;
        try {
            Invoke(id, method, args, result, context.Get());
        } catch (...) {
            failure = CaptureFailure();
            result = nullptr;
        }
        if (callback) {
            // A callback's own failure has nowhere to go; the call's outcome stands.
            try {
                callback(started.Get(), failure.get(), result.Get());
            } catch (...) {
            }
        }
        started->Complete(failure.get());
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

RequestContext* LoopbackAdapter::CurrentContext() { return tCurrentContext; }

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
