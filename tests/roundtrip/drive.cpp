#include "drive.h"

#include <chrono>
#include <mutex>
#include <stdexcept>

namespace Roundtrip {

using Kernite::Ref;
using Kernite::System::ScheduledItem;

Outcome CallSync(Orbit::ManagedMethod* member, Orbit::ManagedObject* stub, Kernite::RefVector<Orbit::Any> args) {
    Outcome outcome;
    const Orbit::ManagedTypeInfo* info = member->GetDeclaringType()->GetManagedTypeInfo();
    try {
        info->invokeMember(stub, member->GetMemberNumber(), args, outcome.result);
    } catch (const Kernite::Exception& e) {
        outcome.failure.reset(e.Clone());
        outcome.result = nullptr;
    }
    return outcome;
}

Outcome CallAsync(Orbit::ManagedMethod* member, Orbit::ManagedObject* stub, Kernite::RefVector<Orbit::Any> args) {
    // Written by the adapter's worker, read here once the item is complete.
    struct Seen {
        std::mutex mutex;
        int calls = 0;
        bool pending = false;
        Ref<Orbit::Any> result;
        std::unique_ptr<Kernite::Exception> failure;
    };
    auto seen = std::make_shared<Seen>();
    Orbit::CompletionCallback callback = [seen](ScheduledItem* item, Kernite::Exception* e, Orbit::Any* value) {
        std::lock_guard<std::mutex> lock(seen->mutex);
        ++seen->calls;
        seen->pending = !item->IsDone();
        seen->result = value;
        if (e != nullptr) seen->failure.reset(e->Clone());
    };

    Outcome outcome;
    try {
        Tarn::Testing::StartMember(member->GetDeclaringType(), stub, member->GetMemberNumber(), args, callback,
                                   outcome.item);
    } catch (const Kernite::Exception& e) {
        outcome.failure.reset(e.Clone());
        return outcome;
    }
    if (!outcome.item || !outcome.item->WaitFor(std::chrono::seconds(30)))
        throw std::runtime_error("asynchronous call of " + member->GetName() + " did not complete");
    std::lock_guard<std::mutex> lock(seen->mutex);
    outcome.callbacks = seen->calls;
    outcome.pendingInCallback = seen->pending;
    outcome.result = seen->result;
    outcome.failure = std::move(seen->failure);
    return outcome;
}

Hosted Host(Orbit::ManagedObjectType* type, Orbit::LoopbackAdapter* adapter, Orbit::StubAdapter* stubAdapter) {
    Hosted hosted;
    const std::string id = type->GetName();
    hosted.object = Tarn::Testing::CreateDouble(type, id);
    if (!hosted.object) throw std::logic_error("no double of " + id);
    hosted.dbl = Kernite::NarrowToType<Tarn::Testing::Double, Orbit::ManagedObject>(hosted.object.Get());
    adapter->Register(id, hosted.object.Get());
    hosted.stub = type->CreateStub(id, stubAdapter ? stubAdapter : adapter, nullptr);
    if (!hosted.stub) throw std::logic_error("no stub of " + id);
    return hosted;
}

}  // namespace Roundtrip
