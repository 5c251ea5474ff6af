// Managed objects, client stubs and the adapter through which their calls travel.
#pragma once

#include <map>
#include <mutex>
#include <string>

#include "kernite/Exception.h"
#include "kernite/Functor.h"
#include "kernite/Object.h"
#include "kernite/Ref.h"
#include "kernite/System.h"
#include "orbit/Any.h"
#include "orbit/Type.h"

namespace Orbit {

// The interface every managed object implements: generated interfaces derive from
// it virtually, and so do stubs and server-side implementations.
class ManagedObject : public virtual Kernite::Object {
public:
    virtual Type* _GetType() const = 0;
    // A new reference naming this object.
    virtual Kernite::Ref<MoRef> _GetRef() const = 0;
    // Told when the object is no longer reachable through its adapter.
    virtual void _Unregistered() = 0;
};

// Per-call data that travels with a request (who asks, for which session...).
class RequestContext : public Kernite::ObjectImpl {
public:
    void SetValue(const std::string& key, Any* value);
    // Null when absent.
    Any* GetValue(const std::string& key) const;

private:
    mutable std::mutex _mutex;
    std::map<std::string, Kernite::Ref<Any>> _values;
};

// Called once when an asynchronous call ends: with the item, the failure or null,
// and the result or null. The exception and result are only borrowed.
using CompletionCallback =
    Kernite::Functor<void, Kernite::System::ScheduledItem*, Kernite::Exception*, Any*, Kernite::Nil,
                     Kernite::Nil, Kernite::Nil, Kernite::Nil>;

// The connection a stub's calls travel through.
class StubAdapter : public Kernite::ObjectImpl {
public:
    // Carries out one call and fills `result`; faults are thrown.
    virtual void Invoke(const std::string& id, ManagedMethod* method, Kernite::RefVector<Any>& args,
                        Kernite::Ref<Any>& result, RequestContext* context) = 0;
    // Starts one call and returns at once; `item` receives its handle. The adapter
    // keeps its own references to the arguments.
    virtual void StartInvoke(const std::string& id, ManagedMethod* method, Kernite::RefVector<Any>& args,
                             const CompletionCallback& callback,
                             Kernite::Ref<Kernite::System::ScheduledItem>& item, RequestContext* context) = 0;
};

// The client side of a managed object: every call goes to the adapter with the
// object's id. Holds a reference to its adapter and to its request context.
class StubImpl : public Kernite::ObjectImpl, public virtual ManagedObject {
public:
    StubImpl(const std::string& id, StubAdapter* adapter, RequestContext* context);
    ~StubImpl() override;

    virtual void _Invoke(ManagedMethod* method, Kernite::RefVector<Any>& args, Kernite::Ref<Any>& result);
    // For a task method the result is the task's reference.
    virtual void _Invoke_Task(ManagedMethod* method, Kernite::RefVector<Any>& args, Kernite::Ref<Any>& result);
    virtual void _StartInvoke(ManagedMethod* method, Kernite::RefVector<Any>& args,
                              const CompletionCallback& callback,
                              Kernite::Ref<Kernite::System::ScheduledItem>& item);
    virtual void _StartInvoke_Task(ManagedMethod* method, Kernite::RefVector<Any>& args,
                                   const CompletionCallback& callback,
                                   Kernite::Ref<Kernite::System::ScheduledItem>& item);
    virtual StubAdapter* _GetStubAdapter() const;
    virtual Kernite::Ref<RequestContext> _GetRequestContext() const;
    virtual void _SetRequestContext(RequestContext* context);
    Kernite::Ref<MoRef> _GetRef() const override;
    void _Unregistered() override;

    const std::string& _GetId() const noexcept { return _id; }

private:
    const std::string _id;
    const Kernite::Ref<StubAdapter> _adapter;
    mutable std::mutex _contextMutex;
    Kernite::Ref<RequestContext> _context;
};

// A convenient base for server-side implementations:
//   class Impl : public Orbit::ManagedObjectImpl, public virtual Tarn::LockStresser { ... };
class ManagedObjectImpl : public Kernite::ObjectImpl, public virtual ManagedObject {
public:
    explicit ManagedObjectImpl(std::string id) : _id(std::move(id)) {}
    const std::string& GetId() const noexcept { return _id; }
    Kernite::Ref<MoRef> _GetRef() const override;
    void _Unregistered() override {}

private:
    const std::string _id;
};

}  // namespace Orbit
