// First use of every type of the runtime's test catalogue in a fresh process, by
// eight threads at once. The loaders create each type object while the library loads, so what is
// really used for the first time here is what nothing touches at load: the
// per-class narrowed type caches (GetTypeHelper<T, DataObjectType> behind
// _GetDataType, GetTypeHelper<T, ManagedObjectType> behind an interface's
// _GetType) and each type's array type (GetArrayType, behind an array's _GetType).
// This binary does nothing else, so every one of them starts empty.
#include <gtest/gtest.h>

#include <barrier>
#include <thread>
#include <vector>

#include "fix/fix.h"

namespace {

using Kernite::Ref;

constexpr int kThreads = 8;

long LiveObjects() { return Kernite::ObjectImpl::LiveObjects(); }

// One catalogue type with an object of it to ask, made before the race.
struct Subject {
    Orbit::Type* type = nullptr;
    Ref<Orbit::DataObject> instance;        // data objects and faults
    Ref<Orbit::ManagedObject> stub;         // managed types
    Ref<Orbit::Any> array;                  // every type: an array of it
};

// What one thread saw of one subject.
struct Seen {
    Orbit::Type* type = nullptr;
    Orbit::Type* narrowed = nullptr;
    Orbit::Type* arrayType = nullptr;
};

TEST(FirstUse, EveryTypeByEightThreadsAtOnce) {
    // Naming a record links the library in (and asks nothing of its caches).
    ASSERT_NE(Orbit::FindType(&gFixColorTypeInfo), nullptr);
    std::vector<Subject> subjects;
    int managed = 0, data = 0, faults = 0, enums = 0;
    for (Orbit::Type* type : Orbit::GetTypeMap()->GetTypes()) {
        if (type->GetName().rfind("fix.", 0) != 0) continue;
        Subject s;
        s.type = type;
        if (auto* dataType = dynamic_cast<Orbit::DataObjectType*>(type)) {
            (type->GetKind() == Orbit::Kind::Fault ? faults : data) += 1;
            s.instance = dataType->CreateInstance();
            s.array = dataType->CreateArray();
        } else if (auto* managedType = dynamic_cast<Orbit::ManagedObjectType*>(type)) {
            ++managed;
            s.stub = managedType->CreateStub("first-use", nullptr, nullptr);
            s.array = new Orbit::DataArray<Orbit::MoRef>();
        } else if (auto* enumType = dynamic_cast<Orbit::EnumType*>(type)) {
            ++enums;
            enumType->CreateArrayInstance(s.array);
        }
        ASSERT_TRUE(s.array) << type->GetName();
        subjects.push_back(std::move(s));
    }
    ASSERT_TRUE(managed > 0 && data > 0 && faults > 0 && enums > 0) << "every kind races";

    std::vector<std::vector<Seen>> seen(kThreads, std::vector<Seen>(subjects.size()));
    Orbit::GetType<Orbit::MoRef>();  // the runtime's own type, made on demand; not one of ours
    const long before = LiveObjects();
    std::barrier<> start(kThreads);
    std::vector<std::thread> threads;
    for (int t = 0; t < kThreads; ++t) {
        threads.emplace_back([&, t] {
            start.arrive_and_wait();
            // Each thread walks the types from a different place, so that every type
            // meets racing first users.
            for (std::size_t n = 0; n < subjects.size(); ++n) {
                const std::size_t i = (n + t * subjects.size() / kThreads) % subjects.size();
                const Subject& s = subjects[i];
                Seen& mine = seen[t][i];
                if (s.instance) {
                    mine.type = s.instance->_GetType();
                    mine.narrowed = s.instance->_GetDataType();
                } else if (s.stub) {
                    mine.type = s.stub->_GetType();
                    mine.narrowed = mine.type;
                } else {
                    mine.type = mine.narrowed = s.type;
                }
                mine.arrayType = s.array->_GetType();
            }
        });
    }
    for (std::thread& thread : threads) thread.join();

    int disagreements = 0;
    for (std::size_t i = 0; i < subjects.size(); ++i) {
        const Subject& s = subjects[i];
        Orbit::Type* arrayType = s.stub ? Orbit::GetType<Orbit::MoRef>()->GetArrayType() : s.type->GetArrayType();
        for (int t = 0; t < kThreads; ++t) {
            const Seen& mine = seen[t][i];
            if (mine.type != s.type || mine.narrowed != s.type || mine.arrayType != arrayType) {
                ++disagreements;
                ADD_FAILURE() << s.type->GetName() << " seen differently by thread " << t;
            }
        }
    }
    EXPECT_EQ(disagreements, 0);
    // One array type was kept per data, fault and enumeration type (arrays of managed
    // references share the reference's array type); the racers' spares are gone.
    EXPECT_EQ(LiveObjects() - before, data + faults + enums + 1);
}

}  // namespace
