#include <gtest/gtest.h>

#include <thread>

#include "fixtures.h"

using Orbit::DataObjectType;
namespace Flag = Orbit::Flag;
namespace Kind = Orbit::Kind;
using Orbit::ManagedMethod;
using Orbit::ManagedObjectType;
using Orbit::Type;

namespace {

struct Expected {
    Type* type;
    const Orbit::TypeInfo* record;
    const char* name;
    const char* flatName;
    std::uint32_t kind;
};

TEST(RuntimeTypesTest, OwnRecordsNameTheirTypes) {
    const Expected expected[] = {
        {Orbit::GetType<std::string>(), &Orbit::gStringTypeInfo, "string", "String", Kind::Primitive},
        {Orbit::GetType<bool>(), &Orbit::gBoolTypeInfo, "boolean", "Bool", Kind::Primitive},
        {Orbit::GetType<int>(), &Orbit::gIntTypeInfo, "int", "Int", Kind::Primitive},
        {Orbit::GetType<long long>(), &Orbit::gLongTypeInfo, "long", "Long", Kind::Primitive},
        {Orbit::GetType<double>(), &Orbit::gDoubleTypeInfo, "double", "Double", Kind::Primitive},
        {Orbit::GetType<Kernite::System::DateTime>(), &Orbit::gDateTimeTypeInfo, "dateTime", "DateTime",
         Kind::Primitive},
        {Orbit::GetType<Orbit::Any>(), &Orbit::gAnyTypeInfo, "anyType", "Any", Kind::Primitive},
        {Orbit::GetType<Orbit::MethodName>(), &Orbit::gMethodNameTypeInfo, "methodName", "MethodName",
         Kind::Primitive},
        {Orbit::GetType<Orbit::MoRef>(), &Orbit::gMoRefTypeInfo, "ManagedObjectReference", "MoRef", Kind::Primitive},
        {Orbit::GetType<Orbit::DynamicData>(), &gStrataDynamicDataTypeInfo, "strata.DynamicData",
         "StrataDynamicData", Kind::Data},
        {Orbit::GetType<Orbit::MethodFault>(), &Orbit::gStrataMethodFaultTypeInfo, "strata.MethodFault",
         "StrataMethodFault", Kind::Fault},
        {Orbit::GetType<Orbit::KeyAnyValue>(), &gStrataKeyAnyValueTypeInfo, "strata.KeyAnyValue",
         "StrataKeyAnyValue", Kind::Data},
        {Orbit::GetType<Orbit::ManagedObject>(), &Orbit::gStrataManagedObjectTypeInfo, "strata.ManagedObject",
         "StrataManagedObject", Kind::Managed},
    };
    for (const Expected& e : expected) {
        ASSERT_NE(e.type, nullptr) << e.name;
        EXPECT_EQ(e.type->GetName(), e.name);
        EXPECT_EQ(e.type->GetWsdlName(), e.flatName);
        EXPECT_EQ(e.type->GetKind(), e.kind) << e.name;
        EXPECT_STREQ(e.record->version, "strata.version.version0");
        EXPECT_EQ(Orbit::FindType(e.record), e.type) << e.name;
    }
    EXPECT_EQ(Orbit::GetType<Orbit::MethodFault>()->GetBaseType(), Orbit::GetType<Orbit::DynamicData>());
    EXPECT_EQ(Orbit::GetType<Orbit::DynamicData>()->GetBaseType(), nullptr);
    Type* strings = Orbit::GetType<std::string>()->GetArrayType();
    EXPECT_EQ(strings->GetName(), "string[]");
    EXPECT_EQ(strings->GetWsdlName(), "ArrayOfString");
    EXPECT_EQ(strings->GetKind(), Kind::Array);
}

TEST(DataObjectTypeTest, PropertiesComeFromTheRecordInOrder) {
    DataObjectType* shape = Orbit::GetDoType<Sample::Shape>();
    EXPECT_EQ(Orbit::GetDoType<Sample::Shape>(), shape);
    EXPECT_EQ(shape->GetName(), "test.Shape");
    EXPECT_EQ(shape->GetWsdlName(), "TestShape");
    EXPECT_EQ(shape->GetKind(), Kind::Data);
    EXPECT_EQ(shape->GetDataTypeInfo(), &gTestShapeDataTypeInfo);

    const auto& properties = shape->GetProperties();
    ASSERT_EQ(properties.size(), 11u);
    EXPECT_EQ(properties[Sample::Shape::kWeight].name, "weight");
    EXPECT_EQ(properties[Sample::Shape::kWeight].flags, Flag::Optional | Flag::Carried);
    EXPECT_TRUE(properties[Sample::Shape::kWeight].IsOptional());
    EXPECT_EQ(properties[Sample::Shape::kWeight].GetType(), Orbit::GetType<long long>());
    EXPECT_EQ(properties[Sample::Shape::kSeen].version, "test.version.v2");
    EXPECT_TRUE(properties[Sample::Shape::kChildren].IsArray());
    EXPECT_EQ(properties[Sample::Shape::kChildren].GetType(), shape);  // the item type
    EXPECT_EQ(properties[Sample::Shape::kColor].GetType(), Orbit::GetType<Sample::Color>());

    DataObjectType* circle = Orbit::GetDoType<Sample::Circle>();
    EXPECT_EQ(circle->GetBaseType(), shape);
    EXPECT_EQ(circle->GetBaseDataType(), shape);
    EXPECT_EQ(shape->GetBaseType(), Orbit::GetType<Orbit::DynamicData>());
    EXPECT_TRUE(circle->IsA(shape));
    EXPECT_TRUE(circle->IsA(Orbit::GetType<Orbit::DynamicData>()));
    EXPECT_FALSE(shape->IsA(circle));
    EXPECT_TRUE(Orbit::GetType<Sample::BadRequest>()->IsA(Orbit::GetType<Orbit::MethodFault>()));

    Kernite::Ref<Orbit::DataObject> made = circle->CreateInstance();
    EXPECT_EQ(typeid(*made), typeid(Sample::Circle));
    Kernite::Ref<Orbit::Any> array = circle->CreateArray();
    EXPECT_EQ(array->_GetType(), circle->GetArrayType());
    EXPECT_EQ(Orbit::CreateDataObjectType(&gTestShapeDataTypeInfo), shape);  // made once per record
}

// Two records used only here, so that the derived type is surely made first.
const Orbit::TypeInfo kEarlyHeader{Kind::Data, "test.Early", "TestEarly", "test.version.v1"};
const Orbit::TypeInfo kLateHeader{Kind::Data, "test.Late", "TestLate", "test.version.v1"};
const Orbit::PropertyInfo kNone[] = {{nullptr, nullptr, 0, nullptr, Flag::End, nullptr}};
const Orbit::DataTypeInfo kEarly{&kEarlyHeader, &gStrataDynamicDataTypeInfo, kNone, nullptr, nullptr,
                                 nullptr,       nullptr,                      nullptr, nullptr};
const Orbit::DataTypeInfo kLate{&kLateHeader, &kEarlyHeader, kNone, nullptr, nullptr, nullptr, nullptr, nullptr,
                                nullptr};

TEST(DataObjectTypeTest, ATypeMayBeMadeBeforeItsBase) {
    if (Orbit::FindType(&kLateHeader) != nullptr) GTEST_SKIP() << "made by an earlier repetition";
    DataObjectType* late = Orbit::CreateDataObjectType(&kLate);
    EXPECT_EQ(late->GetBaseType(), nullptr);
    EXPECT_EQ(Orbit::FindType(&kEarlyHeader), nullptr);
    DataObjectType* early = Orbit::CreateDataObjectType(&kEarly);
    EXPECT_EQ(late->GetBaseType(), early);
    EXPECT_TRUE(late->IsA(Orbit::GetType<Orbit::DynamicData>()));
    EXPECT_FALSE(late->CreateInstance());
}

TEST(DataObjectTypeTest, VisibilityFollowsVersionInclusion) {
    Sample::DeclareTestVersions();
    Orbit::VersionMap* versions = Orbit::GetVersionMap();
    Orbit::Version* v1 = versions->GetVersion("test.version.v1");
    Orbit::Version* v2 = versions->GetVersion("test.version.v2");
    Type* shape = Orbit::GetType<Sample::Shape>();
    Type* circle = Orbit::GetType<Sample::Circle>();
    EXPECT_EQ(shape->GetVersion(), v1);
    EXPECT_TRUE(shape->IsVisible(v1));
    EXPECT_TRUE(shape->IsVisible(v2));
    EXPECT_FALSE(circle->IsVisible(v1));
    EXPECT_TRUE(circle->IsVisible(v2));
    EXPECT_FALSE(shape->IsVisible(nullptr));
    EXPECT_TRUE(circle->GetArrayType()->IsVisible(v2));
    EXPECT_FALSE(circle->GetArrayType()->IsVisible(v1));
}

TEST(ManagedObjectTypeTest, MethodObjectsHoldMethodsThenProperties) {
    ManagedObjectType* calculator =
        Kernite::NarrowToType<ManagedObjectType, Type>(Orbit::GetType<Sample::Calculator>());
    EXPECT_EQ(calculator->GetKind(), Kind::Managed);
    EXPECT_EQ(calculator->GetBaseType(), Orbit::GetType<Orbit::ManagedObject>());

    const auto& members = calculator->GetMembers();
    ASSERT_EQ(members.size(), 5u);
    for (std::size_t i = 0; i < members.size(); ++i) {
        EXPECT_EQ(gTestCalculatorMethodObjects[i], members[i].Get());
        EXPECT_EQ(members[i]->GetMemberNumber(), static_cast<int>(i));
        EXPECT_EQ(members[i]->GetDeclaringType(), calculator);
    }
    EXPECT_EQ(gTestCalculatorMethodObjects[5], nullptr);

    const ManagedMethod* add = members[0].Get();
    EXPECT_EQ(add->GetName(), "add");
    EXPECT_EQ(add->GetWsdlName(), "Add");
    ASSERT_EQ(add->GetParameters().size(), 2u);
    EXPECT_EQ(add->GetParameters()[1].name, "b");
    EXPECT_EQ(add->GetResult().GetType(), Orbit::GetType<int>());
    EXPECT_FALSE(add->IsTask());

    const ManagedMethod* fail = members[1].Get();
    EXPECT_EQ(fail->GetResult().typeRecord, nullptr);
    EXPECT_EQ(fail->GetFaults(), std::vector<const Orbit::TypeInfo*>{&gTestBadRequestTypeInfo});

    const ManagedMethod* echo = members[2].Get();
    EXPECT_STREQ(echo->GetPrivilege(), "Global.HubServer");
    EXPECT_TRUE(echo->GetResult().IsOptional());

    const ManagedMethod* startJob = members[3].Get();
    EXPECT_TRUE(startJob->IsTask());
    EXPECT_EQ(startJob->GetWsdlName(), "StartJob_Task");
    EXPECT_TRUE(startJob->GetParameters().empty());
    EXPECT_EQ(startJob->GetVersionName(), "test.version.v2");

    const ManagedMethod* name = members[4].Get();
    EXPECT_TRUE(name->IsPropertyGetter());
    EXPECT_EQ(name->GetName(), "name");
    EXPECT_EQ(name->GetResult().flags, Flag::Carried);
    ASSERT_EQ(calculator->GetProperties().size(), 1u);

    EXPECT_EQ(calculator->FindMember("name"), name);
    EXPECT_EQ(calculator->FindMember("missing"), nullptr);
    EXPECT_EQ(Orbit::CreateManagedObjectType(&gTestCalculatorManagedTypeInfo), calculator);
    EXPECT_EQ(gTestCalculatorMethodObjects[0], add);
}

TEST(ManagedObjectTypeTest, ConcurrentFirstUseMakesOneType) {
    std::vector<Type*> seen(4);
    std::vector<std::thread> threads;
    for (int t = 0; t < 4; ++t)
        threads.emplace_back([&seen, t] { seen[t] = Orbit::GetType<Sample::Counter>()->GetArrayType(); });
    for (auto& thread : threads) thread.join();
    for (Type* type : seen) EXPECT_EQ(type, Orbit::GetType<Sample::Counter>()->GetArrayType());
    EXPECT_NE(gTestCounterMethodObjects[0], nullptr);
    EXPECT_EQ(gTestCounterMethodObjects[1], nullptr);
}

}  // namespace
