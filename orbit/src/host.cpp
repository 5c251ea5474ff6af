#include "orbit/Host.h"

#include <vector>

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

}  // namespace

ObjectHost::~ObjectHost() { UnregisterAll(); }

void ObjectHost::Register(const std::string& id, ManagedObject* object) {
    if (object == nullptr) {
        Unregister(id);
        return;
    }
    Kernite::Ref<ManagedObject> previous;
    {
        std::lock_guard<std::mutex> lock(_mutex);
        Kernite::Ref<ManagedObject>& slot = _objects[id];
        previous = std::move(slot);
        slot = object;
    }
    if (previous && previous.Get() != object) previous->_Unregistered();
}

void ObjectHost::Unregister(const std::string& id) {
    Kernite::Ref<ManagedObject> previous;
    {
        std::lock_guard<std::mutex> lock(_mutex);
        auto it = _objects.find(id);
        if (it == _objects.end()) return;
        previous = std::move(it->second);
        _objects.erase(it);
    }
    previous->_Unregistered();
}

void ObjectHost::UnregisterAll() {
    std::unordered_map<std::string, Kernite::Ref<ManagedObject>> objects;
    {
        std::lock_guard<std::mutex> lock(_mutex);
        objects.swap(_objects);
    }
    for (auto& entry : objects) entry.second->_Unregistered();
}

Kernite::Ref<ManagedObject> ObjectHost::Find(const std::string& id) const {
    std::lock_guard<std::mutex> lock(_mutex);
    auto it = _objects.find(id);
    return it == _objects.end() ? Kernite::Ref<ManagedObject>() : it->second;
}

std::size_t ObjectHost::HostedCount() const {
    std::lock_guard<std::mutex> lock(_mutex);
    return _objects.size();
}

bool Answers(ManagedObject* target, const ManagedMethod* method) {
    if (target == nullptr || method == nullptr) return false;
    ManagedObjectType* declaring = method->GetDeclaringType();
    Type* targetType = target->_GetType();
    const int number = method->GetMemberNumber();
    return declaring != nullptr && number >= 0 && number < static_cast<int>(declaring->GetMembers().size()) &&
           declaring->GetMembers()[number].Get() == method &&
           declaring->GetManagedTypeInfo()->invokeMember != nullptr && targetType != nullptr &&
           targetType->IsA(declaring);
}

std::string Describe(const ManagedMethod* method) {
    const ManagedObjectType* owner = method->GetDeclaringType();
    return (owner ? owner->GetName() + "." : std::string()) + method->GetName();
}

void Dispatch(ManagedObject* target, ManagedMethod* method, Kernite::RefVector<Any>& args,
              Kernite::Ref<Any>& result, RequestContext* context) {
    ContextScope scope(context);
    method->GetDeclaringType()->GetManagedTypeInfo()->invokeMember(target, method->GetMemberNumber(), args, result);
}

RequestContext* CurrentRequestContext() { return tCurrentContext; }

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

}  // namespace Orbit

namespace Orbit {

void CompleteCall(Kernite::System::ScheduledItem* item, const CompletionCallback& callback,
                  const std::function<Kernite::Ref<Any>()>& outcome) {
    Kernite::Ref<Any> result;
    std::unique_ptr<Kernite::Exception> failure;
    try {
        result = outcome();
    } catch (...) {
        failure = CaptureFailure();
        result = nullptr;
    }
    if (callback) {
        try {
            callback(item, failure.get(), result.Get());
        } catch (...) {
        }
    }
    item->Complete(failure.get());
}

}  // namespace Orbit
