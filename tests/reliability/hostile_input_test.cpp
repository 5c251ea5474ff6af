// Hostile values at the boundaries the runtime calls: record functions and
// invokeMember of every registered type handed objects of the wrong class, missing
// and extra arguments, indexes out of range and null where a value is required.
// Each gets a clear exception (or, for an index past the members, nothing at all),
// and a call that fails changes nothing.
#include <gtest/gtest.h>

#include <climits>
#include <cstring>
#include <string>
#include <vector>

#include "tarn/testing.h"
#include "tarn/types.h"
#include "values.h"

namespace {

using Kernite::Ref;
using Reliability::Storage;
using Reliability::StorageOf;

// A value of a class that no property or parameter has.
class Stranger : public Orbit::Any {
public:
    Orbit::Type* _GetType() const override { return nullptr; }
    unsigned int _GetSize(Orbit::SizeFunction f) const override { return f(sizeof(Stranger)); }
    Orbit::Any* _Clone() const override { return const_cast<Stranger*>(this); }
    bool _IsEqual(Orbit::Any* other, bool) const override { return other == this; }
    void _DiffProperties(Orbit::Any*, const std::string&, Orbit::PropertyDiffSet&) const override {}
};

// Which exception a call threw: "" for none.
template <class Call>
std::string Outcome(Call call) {
    try {
        call();
    } catch (const Kernite::TypeMismatchException&) {
        return "TypeMismatch";
    } catch (const Kernite::InvalidArgumentException& e) {
        return std::string("InvalidArgument: ") + e.what();
    } catch (const std::exception& e) {
        return std::string("other: ") + e.what();
    }
    return "";
}

bool IsTarn(const Orbit::Type* type) { return type->GetName().rfind("tarn.", 0) == 0; }

std::vector<Orbit::DataObjectType*> TarnDataTypes() {
    std::vector<Orbit::DataObjectType*> out;
    for (Orbit::DataObjectType* type : Reliability::RegisteredDataTypes())
        if (IsTarn(type)) out.push_back(type);
    return out;
}

// An object of another class than the property's: data objects for managed
// references and values, a reference for data objects, an array of another class
// for arrays.
Ref<Orbit::Any> WrongValueFor(const Orbit::Member& property) {
    const Orbit::TypeInfo* record = property.typeRecord;
    if (property.IsArray()) {
        if (record == &Orbit::gStringTypeInfo) return Ref<Orbit::Any>(new Orbit::Array<int>({1, 2}));
        if (record->kind == Orbit::Kind::Data || record->kind == Orbit::Kind::Fault)
            return Ref<Orbit::Any>(new Orbit::DataArray<Orbit::MoRef>());
        return Ref<Orbit::Any>(new Orbit::Array<double>({0.5}));
    }
    if (record->kind == Orbit::Kind::Data || record->kind == Orbit::Kind::Fault)
        return Ref<Orbit::Any>(new Orbit::MoRef("cairn.HostSystem", "host-9"));
    return Ref<Orbit::Any>(new Stranger());
}

class HostileRecordFunctions : public ::testing::Test {
protected:
    // A populated object of `type` and a copy to compare it with afterwards.
    void Prepare(const Orbit::DataObjectType* type, std::uint32_t seed) {
        object = Reliability::MakePopulated(type, seed, 1, 1);
        before = Ref<Orbit::Any>(object->_Clone());
    }
    bool Unchanged() const { return object->_IsEqual(before.Get(), true); }

    Ref<Orbit::DataObject> object;
    Ref<Orbit::Any> before;
};

TEST_F(HostileRecordFunctions, ValuesOfTheWrongClassAreRefusedAndChangeNothing) {
    int checked = 0;
    for (const Orbit::DataObjectType* type : TarnDataTypes()) {
        Prepare(type, 101);
        const Orbit::DataTypeInfo* info = type->GetDataTypeInfo();
        const auto& properties = type->GetProperties();
        for (int i = 0; i < static_cast<int>(properties.size()); ++i) {
            if (StorageOf(properties[i]) != Storage::Reference) continue;
            if (!properties[i].IsArray() && properties[i].typeRecord == &Orbit::gAnyTypeInfo) continue;  // takes anything
            Ref<Orbit::Any> wrong = WrongValueFor(properties[i]);
            EXPECT_EQ(Outcome([&] { info->setProperty(object.Get(), i, wrong.Get()); }), "TypeMismatch")
                << type->GetName() << "." << properties[i].name;
            EXPECT_TRUE(Unchanged()) << type->GetName() << "." << properties[i].name;
            ++checked;
        }
    }
    EXPECT_GT(checked, 60);
}

TEST_F(HostileRecordFunctions, ObjectsOfAnotherClassAndNullObjectsAreRefused) {
    Ref<Orbit::KeyAnyValue> stranger(new Orbit::KeyAnyValue("key", nullptr));
    for (const Orbit::DataObjectType* type : TarnDataTypes()) {
        const Orbit::DataTypeInfo* info = type->GetDataTypeInfo();
        const std::string name = type->GetName();
        const int n = static_cast<int>(type->GetProperties().size());
        for (int i : {0, n}) {
            Ref<Orbit::Any> storage;
            int value = 0;
            EXPECT_EQ(Outcome([&] { info->getProperty(stranger.Get(), i, &storage); }), "TypeMismatch") << name;
            EXPECT_EQ(Outcome([&] { info->setProperty(stranger.Get(), i, &value); }), "TypeMismatch") << name;
            EXPECT_EQ(Outcome([&] { info->isPropertySet(stranger.Get(), i); }), "TypeMismatch") << name;
            EXPECT_EQ(Outcome([&] { info->unsetProperty(stranger.Get(), i); }), "TypeMismatch") << name;
            EXPECT_EQ(Outcome([&] { info->getProperty(nullptr, i, &storage); }), "InvalidArgument: Invalid argument : null") << name;
            EXPECT_EQ(Outcome([&] { info->setProperty(nullptr, i, &value); }), "InvalidArgument: Invalid argument : null") << name;
            EXPECT_EQ(Outcome([&] { info->isPropertySet(nullptr, i); }), "InvalidArgument: Invalid argument : null") << name;
            EXPECT_EQ(Outcome([&] { info->unsetProperty(nullptr, i); }), "InvalidArgument: Invalid argument : null") << name;
        }
        EXPECT_EQ(stranger->GetKey(), "key");
    }
}

TEST_F(HostileRecordFunctions, NullWhereAValueIsRequired) {
    int checked = 0;
    for (const Orbit::DataObjectType* type : TarnDataTypes()) {
        Prepare(type, 202);
        const Orbit::DataTypeInfo* info = type->GetDataTypeInfo();
        const auto& properties = type->GetProperties();
        for (int i = 0; i < static_cast<int>(properties.size()); ++i) {
            const std::string where = type->GetName() + "." + properties[i].name;
            // No storage to read into: refused, whatever the property.
            EXPECT_EQ(Outcome([&] { info->getProperty(object.Get(), i, nullptr); }),
                      "InvalidArgument: Invalid argument : null")
                << where;
            // A by-value property has no null value; a property held by reference
            // takes null as "clear", which is not a failure.
            if (StorageOf(properties[i]) != Storage::Reference) {
                EXPECT_EQ(Outcome([&] { info->setProperty(object.Get(), i, nullptr); }),
                          "InvalidArgument: Invalid argument : null")
                    << where;
                EXPECT_TRUE(Unchanged()) << where;
                ++checked;
            }
        }
    }
    EXPECT_GT(checked, 60);
}

TEST_F(HostileRecordFunctions, EnumerationValuesOutsideTheTagsAreRefused) {
    int checked = 0;
    for (const Orbit::DataObjectType* type : TarnDataTypes()) {
        Prepare(type, 303);
        const auto& properties = type->GetProperties();
        for (int i = 0; i < static_cast<int>(properties.size()); ++i) {
            if (StorageOf(properties[i]) != Storage::Enum) continue;
            std::vector<std::string> tags;
            Kernite::NarrowToType<Orbit::EnumType, Orbit::Type>(properties[i].GetType())->GetEnumTags(tags);
            for (int bad : {-1, static_cast<int>(tags.size()), INT_MAX, INT_MIN}) {
                EXPECT_EQ(Outcome([&] { type->GetDataTypeInfo()->setProperty(object.Get(), i, &bad); }),
                          "InvalidArgument: Invalid argument : " + std::to_string(bad));
                EXPECT_TRUE(Unchanged()) << type->GetName() << "." << properties[i].name;
            }
            ++checked;
        }
    }
    EXPECT_GT(checked, 0);
}

TEST_F(HostileRecordFunctions, IndexesPastTheOwnPropertiesDoNothing) {
    for (const Orbit::DataObjectType* type : TarnDataTypes()) {
        Prepare(type, 404);
        const Orbit::DataTypeInfo* info = type->GetDataTypeInfo();
        const int n = static_cast<int>(type->GetProperties().size());
        for (int i : {-1, n, n + 1, INT_MAX, INT_MIN}) {
            unsigned char storage[64];
            std::memset(storage, 0xA5, sizeof storage);
            unsigned char untouched[64];
            std::memcpy(untouched, storage, sizeof storage);
            EXPECT_EQ(Outcome([&] { info->getProperty(object.Get(), i, storage); }), "");
            EXPECT_EQ(std::memcmp(storage, untouched, sizeof storage), 0) << type->GetName() << " index " << i;
            EXPECT_EQ(Outcome([&] { info->setProperty(object.Get(), i, storage); }), "");
            EXPECT_TRUE(info->isPropertySet(object.Get(), i));
            EXPECT_EQ(Outcome([&] { info->unsetProperty(object.Get(), i); }), "");
            EXPECT_TRUE(Unchanged()) << type->GetName() << " index " << i;
        }
    }
}

// ---- invokeMember ----

Ref<Orbit::Any> ValidBox(const Orbit::Member& param) {
    const Orbit::TypeInfo* record = param.typeRecord;
    switch (StorageOf(param)) {
    case Storage::String: return Ref<Orbit::Any>(new Orbit::Primitive<std::string>("value"));
    case Storage::Bool: return Ref<Orbit::Any>(new Orbit::Primitive<bool>(true));
    case Storage::Int: return Ref<Orbit::Any>(new Orbit::Primitive<int>(3));
    case Storage::Long: return Ref<Orbit::Any>(new Orbit::Primitive<long long>(100));
    case Storage::Double: return Ref<Orbit::Any>(new Orbit::Primitive<double>(0.5));
    case Storage::DateTime: return Ref<Orbit::Any>(new Orbit::Primitive<Kernite::System::DateTime>({}));
    case Storage::MethodName: return Ref<Orbit::Any>(new Orbit::Primitive<Orbit::MethodName>(Orbit::MethodName("tarn.X.y")));
    case Storage::Enum: {
        std::vector<std::string> tags;
        auto* type = Kernite::NarrowToType<Orbit::EnumType, Orbit::Type>(Orbit::FindType(record));
        type->GetEnumTags(tags);
        Ref<Orbit::Any> box;
        type->StringToEnum(tags.back(), box);
        return box;
    }
    case Storage::Reference: break;
    }
    return nullptr;  // objects and arrays may be null
}

bool TakesAnything(const Orbit::Member& param) { return !param.IsArray() && param.typeRecord == &Orbit::gAnyTypeInfo; }

Tarn::Testing::Double* AsDouble(const Ref<Orbit::ManagedObject>& object) {
    return Kernite::NarrowToType<Tarn::Testing::Double, Orbit::ManagedObject>(object.Get());
}

std::vector<Orbit::ManagedObjectType*> TarnManagedTypes() {
    std::vector<Orbit::ManagedObjectType*> out;
    for (Orbit::Type* type : Orbit::GetTypeMap()->GetTypes())
        if (auto* managed = dynamic_cast<Orbit::ManagedObjectType*>(type); managed && IsTarn(type)) out.push_back(managed);
    return out;
}

TEST(HostileInvokeMember, ArgumentsMissingExtraNullOrOfTheWrongClass) {
    int members = 0, refusals = 0;
    for (Orbit::ManagedObjectType* type : TarnManagedTypes()) {
        Ref<Orbit::ManagedObject> target = Tarn::Testing::CreateDouble(type, "hostile");
        ASSERT_TRUE(target) << type->GetName();
        Orbit::InvokeMemberFunction invoke = type->GetManagedTypeInfo()->invokeMember;
        for (const Ref<Orbit::ManagedMethod>& member : type->GetMembers()) {
            const std::string where = type->GetName() + "." + member->GetName();
            const auto& params = member->GetParameters();
            const int number = member->GetMemberNumber();
            auto valid = [&] {
                Kernite::RefVector<Orbit::Any> args(static_cast<unsigned>(params.size()));
                for (std::size_t i = 0; i < params.size(); ++i) args[i] = ValidBox(params[i]);
                return args;
            };
            auto refused = [&](Kernite::RefVector<Orbit::Any>& args, const std::string& expected) {
                Ref<Orbit::Any> result;
                EXPECT_EQ(Outcome([&] { invoke(target.Get(), number, args, result); }), expected) << where;
                EXPECT_TRUE(AsDouble(target)->GetCalls().empty()) << where << ": the implementation was called";
                ++refusals;
            };
            const std::string count = std::to_string(params.size());

            Kernite::RefVector<Orbit::Any> extra = valid();
            extra.push_back(Ref<Orbit::Any>(new Orbit::Primitive<int>(1)));
            refused(extra, "InvalidArgument: Invalid argument : " + std::to_string(params.size() + 1) +
                               " arguments where " + count + " were expected");
            if (!params.empty()) {
                Kernite::RefVector<Orbit::Any> missing = valid();
                missing.pop_back();
                refused(missing, "InvalidArgument: Invalid argument : " + std::to_string(params.size() - 1) +
                                     " arguments where " + count + " were expected");
            }
            for (std::size_t i = 0; i < params.size(); ++i) {
                if (!TakesAnything(params[i])) {
                    Kernite::RefVector<Orbit::Any> wrong = valid();
                    wrong[i] = new Stranger();
                    refused(wrong, "TypeMismatch");
                }
                if (StorageOf(params[i]) != Storage::Reference) {
                    Kernite::RefVector<Orbit::Any> null = valid();
                    null[i] = nullptr;
                    refused(null, "InvalidArgument: Invalid argument : argument " + std::to_string(i) + " is null");
                }
            }
            // The same arguments, put right, go through.
            Kernite::RefVector<Orbit::Any> args = valid();
            Ref<Orbit::Any> result;
            EXPECT_EQ(Outcome([&] { invoke(target.Get(), number, args, result); }), "") << where;
            EXPECT_EQ(AsDouble(target)->GetCalls().size(), 1u) << where;
            AsDouble(target)->ClearCalls();
            ++members;
        }
    }
    EXPECT_GT(members, 100);
    std::printf("invokeMember: %d members, %d refused calls\n", members, refusals);
}

TEST(HostileInvokeMember, TargetsOfAnotherClassOrNullAndIndexesPastTheMembers) {
    const std::vector<Orbit::ManagedObjectType*> types = TarnManagedTypes();
    for (Orbit::ManagedObjectType* type : types) {
        // A double of a type that is not this one nor derived from it.
        Ref<Orbit::ManagedObject> stranger;
        for (Orbit::ManagedObjectType* other : types)
            if (!other->IsA(type)) {
                stranger = Tarn::Testing::CreateDouble(other, "stranger");
                break;
            }
        ASSERT_TRUE(stranger);
        Ref<Orbit::ManagedObject> target = Tarn::Testing::CreateDouble(type, "target");
        Orbit::InvokeMemberFunction invoke = type->GetManagedTypeInfo()->invokeMember;
        const int members = static_cast<int>(type->GetMembers().size());
        Kernite::RefVector<Orbit::Any> none;
        for (int index : {0, members, -1}) {
            Ref<Orbit::Any> result;
            EXPECT_EQ(Outcome([&] { invoke(stranger.Get(), index, none, result); }), "TypeMismatch") << type->GetName();
            EXPECT_EQ(Outcome([&] { invoke(nullptr, index, none, result); }), "InvalidArgument: Invalid argument : null")
                << type->GetName();
        }
        for (int index : {members, members + 1, -1, INT_MAX, INT_MIN}) {
            Ref<Orbit::Any> result(new Orbit::Primitive<int>(7));
            EXPECT_EQ(Outcome([&] { invoke(target.Get(), index, none, result); }), "") << type->GetName();
            EXPECT_EQ(result, nullptr);  // cleared first, as every call does
        }
        EXPECT_TRUE(AsDouble(stranger)->GetCalls().empty());
        EXPECT_TRUE(AsDouble(target)->GetCalls().empty());
    }
}

// ---- stubs receiving results of the wrong kind ----

// An adapter that answers every call with a programmed result.
class ScriptedAdapter : public Orbit::StubAdapter {
public:
    void Invoke(const std::string&, Orbit::ManagedMethod*, Kernite::RefVector<Orbit::Any>&, Ref<Orbit::Any>& result,
                Orbit::RequestContext*) override {
        result = answer;
    }
    void StartInvoke(const std::string&, Orbit::ManagedMethod*, Kernite::RefVector<Orbit::Any>&,
                     const Orbit::CompletionCallback&, Ref<Kernite::System::ScheduledItem>&, Orbit::RequestContext*) override {
        throw Kernite::Exception("not scripted");
    }
    Ref<Orbit::Any> answer;
};

TEST(HostileResults, StubsRefuseResultsOfTheWrongClassAndKeepTheirResultParameter) {
    Ref<ScriptedAdapter> adapter(new ScriptedAdapter());
    Ref<Tarn::Rudder::RudderDebugManagerStub> stub(new Tarn::Rudder::RudderDebugManagerStub("rudder", adapter.Get(), nullptr));

    adapter->answer = new Orbit::Primitive<int>(3);
    EXPECT_EQ(Outcome([&] { stub->ReadMirrorTree(nullptr, nullptr); }), "TypeMismatch");
    adapter->answer = nullptr;  // a by-value result that never came
    EXPECT_EQ(Outcome([&] { stub->ReadMirrorTree(nullptr, nullptr); }), "TypeMismatch");
    adapter->answer = new Orbit::Primitive<std::string>("tree");
    EXPECT_EQ(stub->ReadMirrorTree(nullptr, nullptr), "tree");

    Ref<Cairn::ResourceConfigSpec> kept(new Cairn::ResourceConfigSpec());
    Ref<Cairn::ResourceConfigSpec> result = kept;
    adapter->answer = new Orbit::MoRef("cairn.HostSystem", "host-1");
    EXPECT_EQ(Outcome([&] { stub->ReadRootResources(nullptr, result); }), "TypeMismatch");
    EXPECT_EQ(result, kept);
    adapter->answer = nullptr;
    stub->ReadRootResources(nullptr, result);  // no object is a null object
    EXPECT_EQ(result, nullptr);
}

}  // namespace
