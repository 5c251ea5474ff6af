#include "tarn/testing/Double.h"

#include <unordered_map>

namespace Tarn::Testing {
namespace {

struct Entry {
    DoubleFactory factory;
    AsyncInvoker invoker;
};

// Written only while the library loads; read afterwards.
std::unordered_map<const Orbit::TypeInfo*, Entry>& Registry() {
    static std::unordered_map<const Orbit::TypeInfo*, Entry> registry;
    return registry;
}

const Entry* Find(const Orbit::ManagedObjectType* type) {
    if (type == nullptr) return nullptr;
    auto it = Registry().find(type->GetRecord());
    return it == Registry().end() ? nullptr : &it->second;
}

}  // namespace

void Double::Program(const std::string& member, Orbit::Any* result) {
    std::lock_guard<std::mutex> lock(_mutex);
    _faults.erase(member);
    _results[member] = result;
}

void Double::ProgramFault(const std::string& member, Orbit::MethodFault* fault) {
    std::lock_guard<std::mutex> lock(_mutex);
    _results.erase(member);
    _faults[member] = fault;
}

std::vector<Call> Double::GetCalls() const {
    std::lock_guard<std::mutex> lock(_mutex);
    return _calls;
}

void Double::ClearCalls() {
    std::lock_guard<std::mutex> lock(_mutex);
    _calls.clear();
}

Kernite::Ref<Orbit::Any> Double::Answer(const char* member, Kernite::RefVector<Orbit::Any>& args) {
    Kernite::Ref<Orbit::MethodFault> fault;
    Kernite::Ref<Orbit::Any> result;
    {
        std::lock_guard<std::mutex> lock(_mutex);
        _calls.push_back(Call{member, args});
        if (auto it = _faults.find(member); it != _faults.end()) fault = it->second;
        else if (auto found = _results.find(member); found != _results.end()) result = found->second;
    }
    if (fault) fault->Throw();
    return result;
}

void RegisterDouble(const Orbit::TypeInfo* header, DoubleFactory factory, AsyncInvoker invoker) {
    Registry()[header] = Entry{factory, invoker};
}

Kernite::Ref<Orbit::ManagedObject> CreateDouble(const Orbit::ManagedObjectType* type, const std::string& id) {
    const Entry* entry = Find(type);
    return entry ? Kernite::Ref<Orbit::ManagedObject>(entry->factory(id)) : nullptr;
}

void StartMember(const Orbit::ManagedObjectType* declaringType, Orbit::ManagedObject* stub, int index,
                 Kernite::RefVector<Orbit::Any>& args, const Orbit::CompletionCallback& callback,
                 Kernite::Ref<Kernite::System::ScheduledItem>& item) {
    const Entry* entry = Find(declaringType);
    if (entry == nullptr) throw Kernite::InvalidArgumentException(declaringType ? declaringType->GetName() : std::string("null"));
    entry->invoker(stub, index, args, callback, item);
}

}  // namespace Tarn::Testing
