// Test doubles of managed interfaces. For every managed interface X the generated
// class XDouble implements every operation (its own and its bases') by recording
// the arguments it received and answering what the test programmed:
//
//   Kernite::Ref<Tarn::DebugManagerDouble> debug(new Tarn::DebugManagerDouble("debug-1"));
//   debug->Program("GetAlertManager", new Orbit::MoRef("tarn.AlertManager", "alerts-1"));
//   debug->ProgramFault("MarkLogs", new SomeFault());
//   ... calls ...
//   debug->GetCalls()[0].args   // the arguments, boxed as they travel
//
// Doubles are thread-safe: calls may arrive on an adapter's worker thread while the
// test programs or reads them.
#pragma once

#include <map>
#include <mutex>
#include <string>
#include <vector>

#include "orbit/Orbit.h"

namespace Tarn::Testing {

// One call received: the member's operation name ("MarkLogs", "GetDebugManager")
// and its arguments, values in Orbit::Primitive boxes and objects as they came.
struct Call {
    std::string member;
    Kernite::RefVector<Orbit::Any> args;
};

class Double : public Orbit::ManagedObjectImpl {
public:
    explicit Double(std::string id) : Orbit::ManagedObjectImpl(std::move(id)) {}

    // From now on `member` answers `result`: a box (Orbit::Primitive) for members
    // that return a value, the object or array otherwise. Null answers nothing.
    void Program(const std::string& member, Orbit::Any* result);
    // From now on `member` throws `fault` (through its Throw(), so as its own class).
    void ProgramFault(const std::string& member, Orbit::MethodFault* fault);

    std::vector<Call> GetCalls() const;
    void ClearCalls();

protected:
    // Records the call, then throws the programmed fault or returns the programmed
    // result (null when none was programmed).
    Kernite::Ref<Orbit::Any> Answer(const char* member, Kernite::RefVector<Orbit::Any>& args);

private:
    mutable std::mutex _mutex;
    std::vector<Call> _calls;
    std::map<std::string, Kernite::Ref<Orbit::Any>> _results;
    std::map<std::string, Kernite::Ref<Orbit::MethodFault>> _faults;
};

// A by-value answer; an unprogrammed one is the type's default value.
template <class T>
T ValueOf(const Kernite::Ref<Orbit::Any>& result) {
    return result ? Orbit::UnboxResult<T>(result) : T();
}

using DoubleFactory = Orbit::ManagedObject* (*)(const std::string& id);
// Calls the asynchronous overload of member `index` of a stub, its arguments
// narrowed from `args` as invokeMember would.
using AsyncInvoker = void (*)(Orbit::ManagedObject* stub, int index, Kernite::RefVector<Orbit::Any>& args,
                              const Orbit::CompletionCallback& callback,
                              Kernite::Ref<Kernite::System::ScheduledItem>& item);

// Filled while the testing library loads, one entry per managed type.
void RegisterDouble(const Orbit::TypeInfo* header, DoubleFactory factory, AsyncInvoker invoker);
// A new double of `type` (the most derived: every inherited member answers too), or null.
Kernite::Ref<Orbit::ManagedObject> CreateDouble(const Orbit::ManagedObjectType* type, const std::string& id);
// The asynchronous counterpart of `declaringType`'s invokeMember, applied to a stub.
// Throws Kernite::InvalidArgumentException for a type without doubles.
void StartMember(const Orbit::ManagedObjectType* declaringType, Orbit::ManagedObject* stub, int index,
                 Kernite::RefVector<Orbit::Any>& args, const Orbit::CompletionCallback& callback,
                 Kernite::Ref<Kernite::System::ScheduledItem>& item);

}  // namespace Tarn::Testing
