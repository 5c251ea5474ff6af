// Makes a tarn data object, saves and loads it through a stub served by the
// loopback adapter, and posts an entry of its own catalogue the same way.
#include <iostream>
#include <map>

#include "quill/ledger.h"
#include "tarn/dbSerializer.h"
#include "tarn/vmprov.h"

namespace {

using Kernite::Ref;

// Keeps saved objects in memory.
class Store : public Orbit::ManagedObjectImpl, public virtual Tarn::DbSerializer::DbSerializerManager {
public:
    using Orbit::ManagedObjectImpl::ManagedObjectImpl;
    void SaveDataObject(int id, Orbit::Any* object) override { _objects[id] = object; }
    void RemoveDataObject(int id, Orbit::Any*) override { _objects.erase(id); }
    void LoadDataObject(int id, const std::string&, Ref<Orbit::Any>& result) override { result = _objects[id]; }

private:
    std::map<int, Ref<Orbit::Any>> _objects;
};

class Book : public Orbit::ManagedObjectImpl, public virtual Quill::Ledger::Book {
public:
    using Orbit::ManagedObjectImpl::ManagedObjectImpl;
    int Post(Quill::Ledger::Entry* entry) override {
        _entries.push_back(entry->GetMemo());
        return static_cast<int>(_entries.size());
    }

private:
    std::vector<std::string> _entries;
};

template <class S>
Ref<S> StubOf(Orbit::LoopbackAdapter* adapter, const std::string& id) {
    auto* type = Kernite::NarrowToType<Orbit::ManagedObjectType, Orbit::Type>(Orbit::GetType<S>());
    Ref<Orbit::ManagedObject> stub = adapter->CreateStub(id, type);
    return Ref<S>(Kernite::NarrowToType<S, Orbit::ManagedObject>(stub.Get()));
}

}  // namespace

int main() {
    Ref<Orbit::LoopbackAdapter> adapter(new Orbit::LoopbackAdapter());
    adapter->Register("store-1", Ref<Store>(new Store("store-1")).Get());
    adapter->Register("book-1", Ref<Book>(new Book("book-1")).Get());

    Ref<Tarn::Vmprov::VmState> state(new Tarn::Vmprov::VmState());
    state->SetVmPathName("[vault] guest-7/guest-7.cfg");
    auto store = StubOf<Tarn::DbSerializer::DbSerializerManager>(adapter.Get(), "store-1");
    store->SaveDataObject(7, state.Get());
    Ref<Orbit::Any> loaded;
    store->LoadDataObject(7, "tarn.vmprov.VmState", loaded);
    auto* back = Kernite::NarrowToType<Tarn::Vmprov::VmState, Orbit::Any>(loaded.Get());
    std::cout << "loaded: " << back->GetVmPathName() << "\n";

    Ref<Quill::Ledger::Entry> entry(new Quill::Ledger::Entry("seed money", 1200));
    int held = StubOf<Quill::Ledger::Book>(adapter.Get(), "book-1")->Post(entry.Get());
    std::cout << "book holds: " << held << "\n";

    int registered = 0;
    for (Orbit::Type* type : Orbit::GetTypeMap()->GetTypes()) registered += type->GetName().starts_with("tarn.");
    std::cout << "registered tarn types: " << registered << "\n";
    adapter->Shutdown();
    return 0;
}
