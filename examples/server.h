// The server half of the worked example: a service instance, its debug manager, a
// fault-injection manager that keeps planted faults in memory, and a security
// manager without a certificate. Each implementation derives from its generated
// interface; the runtime dispatches calls to it through the interface's invokeMember.
#pragma once

#include <map>
#include <mutex>
#include <ostream>
#include <string>

#include "orbit/Loopback.h"
#include "tarn/types.h"

namespace Example {

// Lines of the example's transcript; the server's come from the adapter's
// thread when a call is asynchronous, so lines are written whole under a lock.
class Transcript {
public:
    explicit Transcript(std::ostream& out) : _out(out) {}
    void Line(const std::string& text);

private:
    std::mutex _mutex;
    std::ostream& _out;
};

class ServiceInstanceImpl : public Orbit::ManagedObjectImpl, public virtual Tarn::ServiceInstance {
public:
    ServiceInstanceImpl(const std::string& id, Orbit::MoRef* debugManager, Orbit::MoRef* security)
        : Orbit::ManagedObjectImpl(id), _debugManager(debugManager), _security(security) {}

    void GetDebugManager(Kernite::Ref<Orbit::MoRef>& result) override { result = _debugManager; }
    void GetSecurity(Kernite::Ref<Orbit::MoRef>& result) override { result = _security; }
    // The managers this server does not run.
    void GetLockStresser(Kernite::Ref<Orbit::MoRef>& result) override { result = nullptr; }
    void GetProfiler(Kernite::Ref<Orbit::MoRef>& result) override { result = nullptr; }
    void GetDbSerializer(Kernite::Ref<Orbit::MoRef>& result) override { result = nullptr; }
    void GetHostPicker(Kernite::Ref<Orbit::MoRef>& result) override { result = nullptr; }
    void GetInMemLogBufferManager(Kernite::Ref<Orbit::MoRef>& result) override { result = nullptr; }

private:
    const Kernite::Ref<Orbit::MoRef> _debugManager;
    const Kernite::Ref<Orbit::MoRef> _security;
};

class DebugManagerImpl : public Orbit::ManagedObjectImpl, public virtual Tarn::DebugManager {
public:
    DebugManagerImpl(const std::string& id, Orbit::MoRef* faultManager, Transcript& log)
        : Orbit::ManagedObjectImpl(id), _faultManager(faultManager), _log(log) {}

    void GetFaultManager(Kernite::Ref<Orbit::MoRef>& result) override { result = _faultManager; }
    void GetCompatManager(Kernite::Ref<Orbit::MoRef>& result) override { result = nullptr; }
    void GetAlertManager(Kernite::Ref<Orbit::MoRef>& result) override { result = nullptr; }
    void GetRudderDebugManager(Kernite::Ref<Orbit::MoRef>& result) override { result = nullptr; }
    void GetDvsTestManager(Kernite::Ref<Orbit::MoRef>& result) override { result = nullptr; }
    void GetAlarmTestManager(Kernite::Ref<Orbit::MoRef>& result) override { result = nullptr; }
    void UpdateConfig(const std::string& key, Orbit::Any* value) override;
    void Shutdown() override;
    void RearrangeLayoutEx(Orbit::DataArray<Orbit::KeyAnyValue>* keyMap, Cairn::Vm::FileLayoutEx* newLayout,
                           Kernite::Ref<Cairn::Vm::FileLayoutEx>& result) override;
    void MarkLogs(const std::string& message) override;
    void TraceOperation(Orbit::MoRef* mo, const Orbit::MethodName& method, Orbit::DataArray<Orbit::Any>* args,
                        Kernite::Ref<Orbit::MoRef>& result) override;

private:
    const Kernite::Ref<Orbit::MoRef> _faultManager;
    Transcript& _log;
    std::mutex _mutex;
    std::map<std::string, Kernite::Ref<Orbit::Any>> _config;
};

// Planted faults live in memory, under keys this manager hands out.
class FaultInjectionManagerImpl : public Orbit::ManagedObjectImpl,
                                  public virtual Tarn::FaultInjector::FaultInjectionManager {
public:
    FaultInjectionManagerImpl(const std::string& id, Transcript& log) : Orbit::ManagedObjectImpl(id), _log(log) {}

    void GetFaults(Kernite::Ref<Orbit::DataArray<Tarn::FaultInjector::Fault>>& result) override;
    int AddFault(Tarn::FaultInjector::Fault* fault) override;
    bool RemoveFault(int key) override;

private:
    Transcript& _log;
    std::mutex _mutex;
    int _nextKey = 1;
    std::map<int, Kernite::Ref<Tarn::FaultInjector::Fault>> _faults;
};

class SecurityManagerImpl : public Orbit::ManagedObjectImpl, public virtual Tarn::SecurityManager {
public:
    SecurityManagerImpl(const std::string& id, Transcript& log) : Orbit::ManagedObjectImpl(id), _log(log) {}
    // This server has no certificate to reload.
    void ReloadSslCertificate() override;

private:
    Transcript& _log;
};

// Hosts the four objects on `adapter` and returns the service instance's reference,
// the one thing a client needs to know to start.
Kernite::Ref<Orbit::MoRef> StartServer(Orbit::LoopbackAdapter* adapter, Transcript& log);

// How a fault reads in the transcript: "fault 1 'copy' on name 'x' at 50%: throws strata.MethodFault".
std::string Describe(const Tarn::FaultInjector::Fault* fault);

}  // namespace Example
