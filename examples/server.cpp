#include "server.h"

#include <algorithm>
#include <chrono>
#include <thread>
#include <vector>

namespace Example {

using Kernite::Ref;

namespace {

[[noreturn]] void Refuse(const std::string& message) {
    Ref<Orbit::MethodFault> fault(new Orbit::MethodFault());
    fault->SetMsg(message);
    throw Orbit::MethodFault::Exception(fault->_GetType()->GetName(), fault.Get());
}

}  // namespace

void Transcript::Line(const std::string& text) {
    std::lock_guard<std::mutex> lock(_mutex);
    _out << text << std::endl;
}

void DebugManagerImpl::UpdateConfig(const std::string& key, Orbit::Any* value) {
    std::lock_guard<std::mutex> lock(_mutex);
    _config[key] = value;
    _log.Line("server: config '" + key + "' updated");
}

void DebugManagerImpl::Shutdown() { _log.Line("server: shutdown requested (ignored by the example)"); }

void DebugManagerImpl::RearrangeLayoutEx(Orbit::DataArray<Orbit::KeyAnyValue>*, Cairn::Vm::FileLayoutEx* newLayout,
                                         Ref<Cairn::Vm::FileLayoutEx>& result) {
    // Nothing to move here: the layout asked for is the layout obtained.
    result = newLayout ? Orbit::CloneOf(Ref<Cairn::Vm::FileLayoutEx>(newLayout)) : nullptr;
}

void DebugManagerImpl::MarkLogs(const std::string& message) { _log.Line("server: log mark: " + message); }

void DebugManagerImpl::TraceOperation(Orbit::MoRef*, const Orbit::MethodName& method, Orbit::DataArray<Orbit::Any>*,
                                      Ref<Orbit::MoRef>&) {
    Refuse("tracing " + method.GetName() + " is not supported by this server");
}

void FaultInjectionManagerImpl::GetFaults(Ref<Orbit::DataArray<Tarn::FaultInjector::Fault>>& result) {
    Ref<Orbit::DataArray<Tarn::FaultInjector::Fault>> faults(new Orbit::DataArray<Tarn::FaultInjector::Fault>());
    std::lock_guard<std::mutex> lock(_mutex);
    // Copies: what the client holds must not change the planted faults.
    for (const auto& entry : _faults) faults->Append(Orbit::CloneOf(entry.second).Get());
    result = faults;
}

int FaultInjectionManagerImpl::AddFault(Tarn::FaultInjector::Fault* fault) {
    if (fault == nullptr || fault->GetTarget() == nullptr || fault->GetTrigger() == nullptr ||
        fault->GetAction() == nullptr)
        Refuse("a fault needs a target, a trigger and an action");
    Ref<Tarn::FaultInjector::Fault> planted = Orbit::CloneOf(Ref<Tarn::FaultInjector::Fault>(fault));
    int key;
    {
        std::lock_guard<std::mutex> lock(_mutex);
        key = _nextKey++;
        planted->SetKey(key);
        _faults[key] = planted;
    }
    _log.Line("server: planted " + Describe(planted.Get()));
    return key;
}

bool FaultInjectionManagerImpl::RemoveFault(int key) {
    bool removed;
    {
        std::lock_guard<std::mutex> lock(_mutex);
        removed = _faults.erase(key) != 0;
    }
    _log.Line("server: fault " + std::to_string(key) + (removed ? " removed" : " not planted"));
    return removed;
}

void SecurityManagerImpl::ReloadSslCertificate() {
    _log.Line("server: reloading the SSL certificate");
    Ref<Tarn::Fault::SecurityConfigFault> fault(new Tarn::Fault::SecurityConfigFault());
    fault->SetMsg("no SSL certificate is configured");
    fault->Throw();
}

std::shared_mutex& LockStresserImpl::LockOf(const std::string& object) {
    std::lock_guard<std::mutex> lock(_mutex);
    std::unique_ptr<std::shared_mutex>& slot = _locks[object];
    if (!slot) slot = std::make_unique<std::shared_mutex>();
    return *slot;
}

void LockStresserImpl::AcquireLock(Orbit::DataArray<Orbit::MoRef>* objects, const std::string& mode,
                                   long long holdDurationMillis, int iters, long long durationBetweenItersMillis) {
    Ref<Orbit::Any> parsed;
    try {
        Kernite::NarrowToType<Orbit::EnumType, Orbit::Type>(Orbit::GetType<Tarn::LockStresser::LockMode>())
            ->StringToEnum(mode, parsed);
    } catch (const Kernite::InvalidArgumentException&) {
        Refuse("no lock mode '" + mode + "'; the modes are x, s, xall and sall");
    }
    if (holdDurationMillis < 0 || holdDurationMillis > 10000 || durationBetweenItersMillis < 0 ||
        durationBetweenItersMillis > 10000 || iters < 0 || iters > 100)
        Refuse("hold and pause times of 0 to 10000 ms and 0 to 100 iterations, please");
    // Taken in name order, so that two calls cannot wait for each other.
    std::vector<std::string> names;
    for (int i = 0; objects != nullptr && i < objects->GetLength(); ++i)
        names.push_back(objects->GetAt(i)->ToString());
    std::sort(names.begin(), names.end());
    names.erase(std::unique(names.begin(), names.end()), names.end());
    const bool exclusive = mode == Tarn::LockStresser::LOCKMODE_X || mode == Tarn::LockStresser::LOCKMODE_XALL;
    for (int i = 0; i < iters; ++i) {
        if (i > 0) std::this_thread::sleep_for(std::chrono::milliseconds(durationBetweenItersMillis));
        std::vector<std::shared_mutex*> held;
        for (const std::string& name : names) {
            std::shared_mutex& lock = LockOf(name);
            exclusive ? lock.lock() : lock.lock_shared();
            held.push_back(&lock);
        }
        std::this_thread::sleep_for(std::chrono::milliseconds(holdDurationMillis));
        for (auto it = held.rbegin(); it != held.rend(); ++it) exclusive ? (*it)->unlock() : (*it)->unlock_shared();
    }
}

void DbSerializerManagerImpl::SaveDataObject(int id, Orbit::Any* dataObject) {
    if (dataObject == nullptr) Refuse("nothing to save");
    Ref<Orbit::Any> copy = Orbit::CloneOf(Ref<Orbit::Any>(dataObject));
    {
        std::lock_guard<std::mutex> lock(_mutex);
        _objects[id] = copy;
    }
    _log.Line("server: saved a " + copy->_GetType()->GetName() + " under " + std::to_string(id));
}

void DbSerializerManagerImpl::RemoveDataObject(int id, Orbit::Any*) {
    std::lock_guard<std::mutex> lock(_mutex);
    _objects.erase(id);
}

void DbSerializerManagerImpl::LoadDataObject(int id, const std::string& strataType, Ref<Orbit::Any>& result) {
    Ref<Orbit::Any> stored;
    {
        std::lock_guard<std::mutex> lock(_mutex);
        auto it = _objects.find(id);
        if (it != _objects.end()) stored = it->second;
    }
    if (!stored) {
        result = nullptr;
        return;
    }
    Orbit::Type* wanted = strataType.empty() ? nullptr : Orbit::GetTypeMap()->GetType(strataType);
    if (!strataType.empty() && (wanted == nullptr || !stored->_GetType()->IsA(wanted)))
        Refuse("the object under " + std::to_string(id) + " is a " + stored->_GetType()->GetName() + ", not a " +
               strataType);
    result = Orbit::CloneOf(stored);
}

Ref<Orbit::MoRef> ServiceInstanceReference() {
    return Ref<Orbit::MoRef>(new Orbit::MoRef("tarn.ServiceInstance", "service-instance"));
}

Ref<Orbit::MoRef> StartServer(Orbit::ObjectHost* host, Transcript& log) {
    Ref<FaultInjectionManagerImpl> faults(new FaultInjectionManagerImpl("fault-injection-manager", log));
    Ref<DebugManagerImpl> debug(new DebugManagerImpl("debug-manager", faults->_GetRef().Get(), log));
    Ref<LockStresserImpl> locks(new LockStresserImpl("lock-stresser"));
    Ref<DbSerializerManagerImpl> store(new DbSerializerManagerImpl("data-object-store", log));
    Ref<SecurityManagerImpl> security(new SecurityManagerImpl("security-manager", log));
    const Ref<Orbit::MoRef> root = ServiceInstanceReference();
    Ref<ServiceInstanceImpl> instance(new ServiceInstanceImpl(
        root->GetId(), {debug->_GetRef(), locks->_GetRef(), store->_GetRef(), security->_GetRef()}));

    for (Orbit::ManagedObjectImpl* object : std::initializer_list<Orbit::ManagedObjectImpl*>{
             instance.Get(), debug.Get(), faults.Get(), locks.Get(), store.Get(), security.Get()}) {
        host->Register(object->GetId(), object);
        log.Line("server: hosting " + object->_GetRef()->ToString());
    }
    return root;
}

std::string Describe(const Tarn::FaultInjector::Fault* fault) {
    std::string text = "fault " + std::to_string(fault->GetKey());
    if (fault->GetDescription().IsSet()) text += " '" + fault->GetDescription().GetValue() + "'";
    if (auto* name = dynamic_cast<const Tarn::FaultInjector::NameTarget*>(fault->GetTarget()))
        text += " on name '" + name->GetName() + "'";
    else if (auto* task = dynamic_cast<const Tarn::FaultInjector::TaskTarget*>(fault->GetTarget()))
        text += " on task " + (task->GetTarget() ? task->GetTarget()->ToString() : std::string("?"));
    if (auto* progress = dynamic_cast<const Tarn::FaultInjector::ProgressTrigger*>(fault->GetTrigger()))
        text += " at " + std::to_string(progress->GetPercent()) + "%";
    const Tarn::FaultInjector::Action* action = fault->GetAction();
    if (auto* exception = dynamic_cast<const Tarn::FaultInjector::ExceptionAction*>(action)) {
        text += ": throws ";
        text += exception->GetFault() ? exception->GetFault()->_GetType()->GetName() : std::string("nothing");
        if (exception->GetFault() && !exception->GetFault()->GetMsg().empty())
            text += " (\"" + exception->GetFault()->GetMsg() + "\")";
    } else if (dynamic_cast<const Tarn::FaultInjector::CrashAction*>(action)) {
        text += ": crashes";
    } else if (dynamic_cast<const Tarn::FaultInjector::CancelAction*>(action)) {
        text += ": cancels";
    }
    return text;
}

}  // namespace Example
