// The server half of the worked example: a service instance, its debug manager, a
// fault-injection manager that keeps planted faults in memory, a lock stresser that
// takes in-memory locks, a store of data objects in memory, and a security manager
// without a certificate. Each implementation derives from its generated interface;
// the runtime dispatches calls to it through the interface's invokeMember. The same
// objects are hosted in-process (loopback adapter) or by the HTTP server.
#pragma once

#include <map>
#include <memory>
#include <mutex>
#include <ostream>
#include <shared_mutex>
#include <string>

#include "orbit/Host.h"
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
    struct Managers {
        Kernite::Ref<Orbit::MoRef> debugManager, lockStresser, dbSerializer, security;
    };
    ServiceInstanceImpl(const std::string& id, Managers managers)
        : Orbit::ManagedObjectImpl(id), _managers(std::move(managers)) {}

    void GetDebugManager(Kernite::Ref<Orbit::MoRef>& result) override { result = _managers.debugManager; }
    void GetLockStresser(Kernite::Ref<Orbit::MoRef>& result) override { result = _managers.lockStresser; }
    void GetDbSerializer(Kernite::Ref<Orbit::MoRef>& result) override { result = _managers.dbSerializer; }
    void GetSecurity(Kernite::Ref<Orbit::MoRef>& result) override { result = _managers.security; }
    // The managers this server does not run.
    void GetProfiler(Kernite::Ref<Orbit::MoRef>& result) override { result = nullptr; }
    void GetHostPicker(Kernite::Ref<Orbit::MoRef>& result) override { result = nullptr; }
    void GetInMemLogBufferManager(Kernite::Ref<Orbit::MoRef>& result) override { result = nullptr; }

private:
    const Managers _managers;
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

// Locks named objects in memory: exclusively for "x" and "xall", shared for "s" and
// "sall", all of a call's objects at once, `iters` times.
class LockStresserImpl : public Orbit::ManagedObjectImpl, public virtual Tarn::LockStresser {
public:
    explicit LockStresserImpl(const std::string& id) : Orbit::ManagedObjectImpl(id) {}
    void AcquireLock(Orbit::DataArray<Orbit::MoRef>* objects, const std::string& mode, long long holdDurationMillis,
                     int iters, long long durationBetweenItersMillis) override;

private:
    std::shared_mutex& LockOf(const std::string& object);

    std::mutex _mutex;
    std::map<std::string, std::unique_ptr<std::shared_mutex>> _locks;
};

// Keeps copies of data objects under integer ids, in memory.
class DbSerializerManagerImpl : public Orbit::ManagedObjectImpl, public virtual Tarn::DbSerializer::DbSerializerManager {
public:
    DbSerializerManagerImpl(const std::string& id, Transcript& log) : Orbit::ManagedObjectImpl(id), _log(log) {}
    void SaveDataObject(int id, Orbit::Any* dataObject) override;
    void RemoveDataObject(int id, Orbit::Any* dataObject) override;
    // `strataType`, when given, must be the stored object's type or one of its bases.
    void LoadDataObject(int id, const std::string& strataType, Kernite::Ref<Orbit::Any>& result) override;

private:
    Transcript& _log;
    std::mutex _mutex;
    std::map<int, Kernite::Ref<Orbit::Any>> _objects;
};

class SecurityManagerImpl : public Orbit::ManagedObjectImpl, public virtual Tarn::SecurityManager {
public:
    SecurityManagerImpl(const std::string& id, Transcript& log) : Orbit::ManagedObjectImpl(id), _log(log) {}
    // This server has no certificate to reload.
    void ReloadSslCertificate() override;

private:
    Transcript& _log;
};

// The service instance's reference, the one thing a client needs to know to start.
Kernite::Ref<Orbit::MoRef> ServiceInstanceReference();

// Hosts the objects on `host` and returns the service instance's reference.
Kernite::Ref<Orbit::MoRef> StartServer(Orbit::ObjectHost* host, Transcript& log);

// How a fault reads in the transcript: "fault 1 'copy' on name 'x' at 50%: throws strata.MethodFault".
std::string Describe(const Tarn::FaultInjector::Fault* fault);

}  // namespace Example
