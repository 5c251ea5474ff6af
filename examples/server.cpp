#include "server.h"

namespace Example {

using Kernite::Ref;

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
    Ref<Orbit::MethodFault> fault(new Orbit::MethodFault());
    fault->SetMsg("tracing " + method.GetName() + " is not supported by this server");
    fault->Throw();
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
        fault->GetAction() == nullptr) {
        Ref<Orbit::MethodFault> refused(new Orbit::MethodFault());
        refused->SetMsg("a fault needs a target, a trigger and an action");
        refused->Throw();
    }
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

Ref<Orbit::MoRef> StartServer(Orbit::LoopbackAdapter* adapter, Transcript& log) {
    Ref<FaultInjectionManagerImpl> faults(new FaultInjectionManagerImpl("fault-injection-manager", log));
    Ref<DebugManagerImpl> debug(new DebugManagerImpl("debug-manager", faults->_GetRef().Get(), log));
    Ref<SecurityManagerImpl> security(new SecurityManagerImpl("security-manager", log));
    Ref<ServiceInstanceImpl> instance(
        new ServiceInstanceImpl("service-instance", debug->_GetRef().Get(), security->_GetRef().Get()));

    for (Orbit::ManagedObjectImpl* object : std::initializer_list<Orbit::ManagedObjectImpl*>{
             instance.Get(), debug.Get(), faults.Get(), security.Get()}) {
        adapter->Register(object->GetId(), object);
        log.Line("server: hosting " + object->_GetRef()->ToString());
    }
    return instance->_GetRef();
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
