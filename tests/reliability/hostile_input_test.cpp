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
#include "samples.h"
#include "tarn/types.h"
#include "values.h"

namespace {

using Kernite::Ref;
using Reliability::Storage;
using Reliability::Stranger;
using Reliability::StorageOf;

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

// Every record function of every data type, handed what no caller should: values of
// the wrong class, null where a value is required, enumeration values outside the
// tags, objects of another class or null, indexes past the own properties. Each is
// refused with a clear exception, or (past the properties) does nothing, and a
// refused call changes nothing.
TEST(HostileRecordFunctions, AreRefusedAndChangeNothing) {
    const std::string null = "InvalidArgument: Invalid argument : null";
    Ref<Orbit::KeyAnyValue> stranger(new Orbit::KeyAnyValue("key", nullptr));
    int wrongClass = 0, nullValues = 0, enums = 0;
    for (const Orbit::DataObjectType* type : TarnDataTypes()) {
        Ref<Orbit::DataObject> object = Reliability::MakePopulated(type, 101, 1, 1);
        Ref<Orbit::Any> before(object->_Clone());
        const Orbit::DataTypeInfo* info = type->GetDataTypeInfo();
        const auto& properties = type->GetProperties();
        const int n = static_cast<int>(properties.size());
        for (int i = 0; i < n; ++i) {
            const std::string where = type->GetName() + "." + properties[i].name;
            Ref<Orbit::Any> storage;
            EXPECT_EQ(Outcome([&] { info->getProperty(object.Get(), i, nullptr); }), null) << where;
            switch (StorageOf(properties[i])) {
            case Storage::Reference:
                // anyType takes anything; null clears, which is no failure.
                if (!properties[i].IsArray() && properties[i].typeRecord == &Orbit::gAnyTypeInfo) break;
                storage = WrongValueFor(properties[i]);
                EXPECT_EQ(Outcome([&] { info->setProperty(object.Get(), i, storage.Get()); }), "TypeMismatch") << where;
                ++wrongClass;
                break;
            case Storage::Enum: {
                std::vector<std::string> tags;
                Kernite::NarrowToType<Orbit::EnumType, Orbit::Type>(properties[i].GetType())->GetEnumTags(tags);
                for (int bad : {-1, static_cast<int>(tags.size()), INT_MAX, INT_MIN})
                    EXPECT_EQ(Outcome([&] { info->setProperty(object.Get(), i, &bad); }),
                              "InvalidArgument: Invalid argument : " + std::to_string(bad)) << where;
                ++enums;
                [[fallthrough]];
            }
            default:
                EXPECT_EQ(Outcome([&] { info->setProperty(object.Get(), i, nullptr); }), null) << where;
                ++nullValues;
            }
            EXPECT_TRUE(object->_IsEqual(before.Get(), true)) << where;
        }
        for (int i : {-1, 0, n, n + 1, INT_MAX, INT_MIN}) {
            int value = 0;
            EXPECT_EQ(Outcome([&] { info->getProperty(stranger.Get(), i, &value); }), "TypeMismatch") << type->GetName();
            EXPECT_EQ(Outcome([&] { info->setProperty(stranger.Get(), i, &value); }), "TypeMismatch") << type->GetName();
            EXPECT_EQ(Outcome([&] { info->isPropertySet(stranger.Get(), i); }), "TypeMismatch") << type->GetName();
            EXPECT_EQ(Outcome([&] { info->unsetProperty(stranger.Get(), i); }), "TypeMismatch") << type->GetName();
            EXPECT_EQ(Outcome([&] { info->getProperty(nullptr, i, &value); }), null) << type->GetName();
            EXPECT_EQ(Outcome([&] { info->setProperty(nullptr, i, &value); }), null) << type->GetName();
            EXPECT_EQ(Outcome([&] { info->isPropertySet(nullptr, i); }), null) << type->GetName();
            EXPECT_EQ(Outcome([&] { info->unsetProperty(nullptr, i); }), null) << type->GetName();
            if (i >= 0 && i < n) continue;
            unsigned char untouched[64], storage[64];
            std::memset(storage, 0xA5, sizeof storage);
            std::memcpy(untouched, storage, sizeof storage);
            EXPECT_EQ(Outcome([&] { info->getProperty(object.Get(), i, storage); }), "");
            EXPECT_EQ(std::memcmp(storage, untouched, sizeof storage), 0) << type->GetName() << " index " << i;
            EXPECT_EQ(Outcome([&] { info->setProperty(object.Get(), i, storage); }), "");
            EXPECT_TRUE(info->isPropertySet(object.Get(), i));
            EXPECT_EQ(Outcome([&] { info->unsetProperty(object.Get(), i); }), "");
            EXPECT_TRUE(object->_IsEqual(before.Get(), true)) << type->GetName() << " index " << i;
        }
        EXPECT_EQ(stranger->GetKey(), "key");
    }
    EXPECT_GT(wrongClass, 60);
    EXPECT_GT(nullValues, 60);
    EXPECT_GT(enums, 0);
}

// ---- invokeMember ----

// A value the parameter accepts: a sample of its type, or null for one held by reference.
Ref<Orbit::Any> ValidBox(const Orbit::Member& param) {
    return StorageOf(param) == Storage::Reference ? nullptr : Roundtrip::MakeSample(param, 0);
}

bool TakesAnything(const Orbit::Member& param) { return !param.IsArray() && param.typeRecord == &Orbit::gAnyTypeInfo; }

Tarn::Testing::Double* AsDouble(const Ref<Orbit::ManagedObject>& object) {
    return Kernite::NarrowToType<Tarn::Testing::Double, Orbit::ManagedObject>(object.Get());
}

using Roundtrip::TarnManagedTypes;

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
    EXPECT_GT(refusals, members);  // at least the extra argument, for every member
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

}  // namespace
