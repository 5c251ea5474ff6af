// Type objects made from records, and the version and type registries.
#include <gtest/gtest.h>

#include <thread>

#include "fixtures.h"

using namespace Fixture;
using Orbit::DataObjectType;
using Orbit::ManagedMethod;
using Orbit::ManagedObjectType;
using Orbit::Type;
using Orbit::Version;
using Orbit::VersionMap;
namespace Kind = Orbit::Kind;

namespace {

// Every row of the runtime's own table names a type the runtime makes, by name and by record.
TEST(RuntimeTypesTest, OwnRecordsNameTheirTypes) {
#define ORBIT_CHECK_RECORD(symbol, wire, kind, root)                                        \
    {                                                                                         \
        Type* type = Orbit::FindType(&Orbit::g##symbol##TypeInfo);                            \
        ASSERT_NE(type, nullptr) << wire;                                                     \
        EXPECT_EQ(type, Orbit::GetTypeMap()->GetType(wire));                                  \
        EXPECT_EQ(type->GetName(), wire);                                                     \
        EXPECT_EQ(type->GetWsdlName(), #symbol);                                              \
        EXPECT_EQ(type->GetKind(), Kind::kind) << wire;                                       \
        EXPECT_STREQ(Orbit::g##symbol##TypeInfo.version, Orbit::kNoneVersion);                \
    }
    ORBIT_RUNTIME_RECORDS(ORBIT_CHECK_RECORD)
#undef ORBIT_CHECK_RECORD
    EXPECT_EQ(Orbit::GetType<Orbit::MoRef>(), Orbit::FindType(&Orbit::gMoRefTypeInfo));
    EXPECT_EQ(Orbit::GetType<long long>(), Orbit::FindType(&Orbit::gLongTypeInfo));
    EXPECT_EQ(Orbit::GetType<Orbit::MethodFault>()->GetBaseType(), Orbit::GetType<Orbit::DynamicData>());
    EXPECT_EQ(Orbit::GetType<Orbit::DynamicData>()->GetBaseType(), nullptr);
    Type* strings = Orbit::GetType<std::string>()->GetArrayType();
    EXPECT_EQ(strings->GetName(), "string[]");
    EXPECT_EQ(strings->GetWsdlName(), "ArrayOfString");
    EXPECT_EQ(strings->GetKind(), Kind::Array);
}

TEST(DataObjectTypeTest, BasesInstancesAndVisibility) {
    DataObjectType* shape = Orbit::GetDoType<Fix::Shape>();
    DataObjectType* circle = Orbit::GetDoType<Fix::Circle>();
    EXPECT_EQ(Orbit::CreateDataObjectType(shape->GetDataTypeInfo()), shape);  // made once per record
    EXPECT_EQ(circle->GetBaseDataType(), shape);
    EXPECT_EQ(shape->GetBaseType(), Orbit::GetType<Orbit::DynamicData>());
    EXPECT_TRUE(circle->IsA(Orbit::GetType<Orbit::DynamicData>()));
    EXPECT_FALSE(shape->IsA(circle));
    EXPECT_TRUE(Orbit::GetType<Fix::BadRequest>()->IsA(Orbit::GetType<Orbit::MethodFault>()));
    EXPECT_EQ(shape->GetProperties()[9].GetType(), Orbit::GetType<std::string>());  // an array's item type
    Kernite::Ref<Orbit::DataObject> made = circle->CreateInstance();
    EXPECT_EQ(typeid(*made), typeid(Fix::Circle));
    EXPECT_EQ(circle->CreateArray()->_GetType(), circle->GetArrayType());

    Version* v1 = Orbit::GetVersionMap()->GetVersion("fix.version.v1");
    Version* v2 = Orbit::GetVersionMap()->GetVersion("fix.version.v2");
    ASSERT_TRUE(v1 && v2);
    EXPECT_EQ(shape->GetVersion(), v1);
    EXPECT_TRUE(shape->IsVisible(v1) && shape->IsVisible(v2));
    EXPECT_FALSE(circle->IsVisible(v1));
    EXPECT_TRUE(circle->IsVisible(v2));
    EXPECT_FALSE(shape->IsVisible(nullptr));
    EXPECT_FALSE(circle->GetArrayType()->IsVisible(v1));
    EXPECT_TRUE(circle->GetArrayType()->IsVisible(v2));
    const Orbit::Member& seen = shape->GetProperties()[4];
    EXPECT_FALSE(seen.IsVisible(v1));
    EXPECT_TRUE(seen.IsVisible(v2));
}

// Two records used only here, so that the derived type is surely made first.
const Orbit::TypeInfo kEarlyHeader{Kind::Data, "fix.Early", "FixEarly", "fix.version.v1"};
const Orbit::TypeInfo kLateHeader{Kind::Data, "fix.Late", "FixLate", "fix.version.v1"};
const Orbit::PropertyInfo kNone[] = {{nullptr, nullptr, 0, nullptr, Orbit::Flag::End, nullptr}};
const Orbit::DataTypeInfo kEarly{&kEarlyHeader, &Orbit::gStrataDynamicDataTypeInfo, kNone, nullptr, nullptr, nullptr,
                                 nullptr, nullptr, nullptr};
const Orbit::DataTypeInfo kLate{&kLateHeader, &kEarlyHeader, kNone, nullptr, nullptr, nullptr, nullptr, nullptr, nullptr};

TEST(DataObjectTypeTest, ATypeMayBeMadeBeforeItsBase) {
    if (Orbit::FindType(&kLateHeader) != nullptr) GTEST_SKIP() << "made by an earlier repetition";
    DataObjectType* late = Orbit::CreateDataObjectType(&kLate);
    EXPECT_EQ(late->GetBaseType(), nullptr);
    DataObjectType* early = Orbit::CreateDataObjectType(&kEarly);
    EXPECT_EQ(late->GetBaseType(), early);
    EXPECT_TRUE(late->IsA(Orbit::GetType<Orbit::DynamicData>()));
    EXPECT_FALSE(late->CreateInstance());
}

TEST(ManagedObjectTypeTest, MethodObjectsHoldMethodsThenPropertiesOfTheirDeclaringType) {
    auto* awkward = Kernite::NarrowToType<ManagedObjectType, Type>(Orbit::GetType<Fix::Awkward>());
    auto* calculator = Kernite::NarrowToType<ManagedObjectType, Type>(Orbit::GetType<Fix::Calculator>());
    EXPECT_EQ(awkward->GetBaseType(), calculator);
    EXPECT_EQ(Orbit::CreateManagedObjectType(calculator->GetManagedTypeInfo()), calculator);
    for (auto [type, objects] : {std::pair{calculator, gFixCalculatorMethodObjects}, {awkward, gFixAwkwardMethodObjects}}) {
        const auto& members = type->GetMembers();
        for (std::size_t i = 0; i < members.size(); ++i) {
            EXPECT_EQ(objects[i], members[i].Get());
            EXPECT_EQ(members[i]->GetMemberNumber(), static_cast<int>(i));
            EXPECT_EQ(members[i]->GetDeclaringType(), type);
        }
        EXPECT_EQ(objects[members.size()], nullptr);
    }
    EXPECT_EQ(calculator->GetMembers().size(), 5u);
    const ManagedMethod* name = calculator->GetMembers()[4].Get();
    EXPECT_TRUE(name->IsPropertyGetter());
    EXPECT_EQ(calculator->FindMember("name"), name);
    EXPECT_EQ(calculator->FindMember("missing"), nullptr);
    EXPECT_EQ(awkward->FindMember("switch")->GetParameters()[0].name, "result");
}

// ---- Registries ----

// A small chain declared the way the loaders declare theirs: every version with its
// full included set, itself first.
void DeclareChain(VersionMap& map) {
    map.AddVersion("x.version.version0", "", "", 0, "cairn.Task", 0, "");
    map.AddVersion("x.version.version1", "x", "1.0", 1, "cairn.Task", 0, "");
    map.AddVersion("x.version.version2", "x", "2.0", 0, "cairn.Task", 0, "");
    for (const char* pair : {"00", "11", "10", "22", "21", "20"})
        map.AddIncludedVersion(std::string("x.version.version") + pair[0], std::string("x.version.version") + pair[1]);
}

std::vector<std::string> Names(const std::vector<Version*>& versions) {
    std::vector<std::string> names;
    for (const Version* v : versions) names.push_back(v->GetName());
    return names;
}

TEST(VersionMapTest, KeepsTheFirstDeclarationAndTheInclusionsAsDeclared) {
    VersionMap map;
    DeclareChain(map);
    const std::vector<Version*> first = map.GetVersions();
    EXPECT_EQ(Names(first), (std::vector<std::string>{"x.version.version0", "x.version.version1", "x.version.version2"}));
    const Version* v1 = map.GetVersion("x.version.version1");
    EXPECT_EQ(v1->GetServiceNamespace(), "x");
    EXPECT_EQ(v1->GetVersionId(), "1.0");
    EXPECT_EQ(v1->GetFlags(), 1u);
    EXPECT_EQ(v1->GetTaskType(), "cairn.Task");
    EXPECT_EQ(Names(v1->GetIncluded()), (std::vector<std::string>{"x.version.version1", "x.version.version0"}));
    EXPECT_TRUE(map.Includes("x.version.version2", "x.version.version0"));
    EXPECT_TRUE(map.Includes("x.version.version0", "x.version.version0"));
    EXPECT_FALSE(map.Includes("x.version.version1", "x.version.version2"));
    EXPECT_FALSE(map.Includes("x.version.version1", "unknown"));
    EXPECT_TRUE(v1->Sees(map.GetVersion("x.version.version0")));
    EXPECT_FALSE(v1->Sees(map.GetVersion("x.version.version2")));
    EXPECT_FALSE(v1->Sees(nullptr));

    const std::vector<Version*> included = first[2]->GetIncluded();
    DeclareChain(map);
    map.AddVersion("x.version.version1", "other", "9.9", 0, "other.Task", 0, "");
    EXPECT_EQ(map.GetVersions(), first);
    EXPECT_EQ(first[2]->GetIncluded(), included);
    EXPECT_EQ(map.GetVersion("x.version.version1"), v1);
    EXPECT_EQ(v1->GetVersionId(), "1.0");
    EXPECT_EQ(map.AddVersionCalls(), 7);
    EXPECT_EQ(map.AddIncludedVersionCalls(), 12);

    for (auto [from, to] : {std::pair{"x.version.version1", "y.version.version1"}, {"y.version.version1", "x.version.version1"}})
        EXPECT_EQ(MessageOf<Kernite::InvalidArgumentException>([&] { map.AddIncludedVersion(from, to); }),
                  "Invalid argument : y.version.version1");
}

TEST(VersionMapTest, ReadersRunWhileVersionsAreDeclared) {
    VersionMap map;
    DeclareChain(map);
    std::thread writer([&map] {
        for (int i = 0; i < 200; ++i) {
            const std::string name = "w.version." + std::to_string(i);
            map.AddVersion(name, "w", "1", 0, "cairn.Task", 0, "");
            map.AddIncludedVersion(name, "x.version.version0");
        }
    });
    const Version* root = map.GetVersion("x.version.version0");
    int includingRoot = 0;
    for (int i = 0; i < 200; ++i)
        for (Version* v : map.GetVersions()) includingRoot += v->Includes(root) ? 1 : 0;
    writer.join();
    EXPECT_GE(includingRoot, 3 * 200);
    EXPECT_EQ(map.GetVersions().size(), 203u);
}

TEST(TypeMapTest, FirstRegistrationStandsAndRuntimeTypesNeedNone) {
    Orbit::TypeMap map;
    EXPECT_EQ(map.GetType("strata.ManagedObject"), Orbit::GetType<Orbit::ManagedObject>());
    EXPECT_EQ(map.GetType("ManagedObjectReference[]"), Orbit::GetType<Orbit::MoRef>()->GetArrayType());
    EXPECT_EQ(map.GetType("[]"), nullptr);
    Type* shape = Orbit::GetType<Fix::Shape>();
    Type* circle = Orbit::GetType<Fix::Circle>();
    for (Type* type : {circle, shape, circle, static_cast<Type*>(nullptr)}) map.AddType(type);
    EXPECT_EQ(map.AddTypeCalls(), 4);
    EXPECT_EQ(map.GetTypes(), (std::vector<Type*>{circle, shape}));
    EXPECT_EQ(map.GetType("fix.Shape"), shape);
    EXPECT_EQ(map.GetType("fix.Shape[]"), shape->GetArrayType());
    EXPECT_EQ(map.GetType("fix.Missing"), nullptr);
}

}  // namespace
