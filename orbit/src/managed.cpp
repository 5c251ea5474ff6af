#include "internal.h"
#include "kernite/Exception.h"
#include "orbit/Managed.h"

namespace Orbit {

void RequestContext::SetValue(const std::string& key, Any* value) {
    Kernite::Ref<Any> old;  // released after unlocking
    std::lock_guard<std::mutex> lock(_mutex);
    if (value == nullptr) {
        auto it = _values.find(key);
        if (it == _values.end()) return;
        old = std::move(it->second);
        _values.erase(it);
    } else {
        Kernite::Ref<Any>& slot = _values[key];
        old = std::move(slot);
        slot = value;
    }
}

Any* RequestContext::GetValue(const std::string& key) const {
    std::lock_guard<std::mutex> lock(_mutex);
    auto it = _values.find(key);
    return it == _values.end() ? nullptr : it->second.Get();
}

StubImpl::StubImpl(const std::string& id, StubAdapter* adapter, RequestContext* context)
    : _id(id), _adapter(adapter), _context(context) {}

StubImpl::~StubImpl() = default;

namespace {

StubAdapter* Through(const Kernite::Ref<StubAdapter>& adapter, const std::string& id) {
    if (!adapter) throw Kernite::Exception("stub of managed object '" + id + "' has no adapter");
    return adapter.Get();
}

}  // namespace

void StubImpl::_Invoke(ManagedMethod* method, Kernite::RefVector<Any>& args, Kernite::Ref<Any>& result) {
    Kernite::Ref<RequestContext> context = _GetRequestContext();
    Through(_adapter, _id)->Invoke(_id, method, args, result, context.Get());
}

void StubImpl::_Invoke_Task(ManagedMethod* method, Kernite::RefVector<Any>& args, Kernite::Ref<Any>& result) {
    // A task method's implementation answers with the task's reference, so a task
    // call travels like any other.
    Kernite::Ref<RequestContext> context = _GetRequestContext();
    Through(_adapter, _id)->Invoke(_id, method, args, result, context.Get());
}

void StubImpl::_StartInvoke(ManagedMethod* method, Kernite::RefVector<Any>& args,
                            const CompletionCallback& callback, Kernite::Ref<Kernite::System::ScheduledItem>& item) {
    Kernite::Ref<RequestContext> context = _GetRequestContext();
    Through(_adapter, _id)->StartInvoke(_id, method, args, callback, item, context.Get());
}

void StubImpl::_StartInvoke_Task(ManagedMethod* method, Kernite::RefVector<Any>& args,
                                 const CompletionCallback& callback,
                                 Kernite::Ref<Kernite::System::ScheduledItem>& item) {
    Kernite::Ref<RequestContext> context = _GetRequestContext();
    Through(_adapter, _id)->StartInvoke(_id, method, args, callback, item, context.Get());
}

StubAdapter* StubImpl::_GetStubAdapter() const { return _adapter.Get(); }

Kernite::Ref<RequestContext> StubImpl::_GetRequestContext() const {
    std::lock_guard<std::mutex> lock(_contextMutex);
    return _context;
}

void StubImpl::_SetRequestContext(RequestContext* context) {
    Kernite::Ref<RequestContext> old;
    std::lock_guard<std::mutex> lock(_contextMutex);
    old = std::move(_context);
    _context = context;
}

Kernite::Ref<MoRef> StubImpl::_GetRef() const {
    Type* type = _GetType();
    return Kernite::Ref<MoRef>(new MoRef(type ? type->GetName() : std::string(), _id));
}

void StubImpl::_Unregistered() {}

Kernite::Ref<MoRef> ManagedObjectImpl::_GetRef() const {
    Type* type = _GetType();
    return Kernite::Ref<MoRef>(new MoRef(type ? type->GetName() : std::string(), _id));
}

// The root managed type: no members, and stubs that can only name their object.
namespace {

class ManagedObjectStub : public StubImpl {
public:
    using StubImpl::StubImpl;
    Type* _GetType() const override { return GetType<ManagedObject>(); }
};

void InvokeNothing(ManagedObject*, int, Kernite::RefVector<Any>&, Kernite::Ref<Any>& result) { result = nullptr; }

ManagedObject* NewManagedObjectStub(const std::string& id, StubAdapter* adapter, RequestContext* context) {
    return new ManagedObjectStub(id, adapter, context);
}

constexpr PropertyInfo kNoProperties[] = {{nullptr, nullptr, 0, nullptr, Flag::End, nullptr}};
constexpr MethodInfo kNoMethods[] = {
    {nullptr, nullptr, nullptr, 0, {nullptr, 0, nullptr, 0, nullptr}, nullptr, nullptr, 0, nullptr}};
ManagedMethod* gStrataManagedObjectMethodObjects[1];

}  // namespace

namespace detail {

constinit const ManagedTypeInfo kManagedObjectInfo{&gStrataManagedObjectTypeInfo, nullptr, kNoProperties, kNoMethods,
                                                   InvokeNothing, NewManagedObjectStub,
                                                   gStrataManagedObjectMethodObjects};

}  // namespace detail
}  // namespace Orbit
