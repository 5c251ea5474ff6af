#include <gtest/gtest.h>

#include <algorithm>
#include <thread>

#include "expect.h"
#include "fixtures.h"

using Orbit::Type;
using Orbit::TypeMap;
using Orbit::Version;
using Orbit::VersionMap;
using TestSupport::MessageOf;

namespace {

// A small chain declared the way the loaders declare theirs: every version with its
// full included set, itself first.
void DeclareChain(VersionMap& map) {
    map.AddVersion("x.version.version0", "", "", 0, "cairn.Task", 0, "");
    map.AddVersion("x.version.version1", "x", "1.0", 1, "cairn.Task", 0, "");
    map.AddVersion("x.version.version2", "x", "2.0", 0, "cairn.Task", 0, "");
    map.AddIncludedVersion("x.version.version0", "x.version.version0");
    map.AddIncludedVersion("x.version.version1", "x.version.version1");
    map.AddIncludedVersion("x.version.version1", "x.version.version0");
    map.AddIncludedVersion("x.version.version2", "x.version.version2");
    map.AddIncludedVersion("x.version.version2", "x.version.version1");
    map.AddIncludedVersion("x.version.version2", "x.version.version0");
}

std::vector<std::string> Names(const std::vector<Version*>& versions) {
    std::vector<std::string> names;
    for (const Version* v : versions) names.push_back(v->GetName());
    return names;
}

TEST(VersionMapTest, KeepsVersionsAndInclusionsAsDeclared) {
    VersionMap map;
    DeclareChain(map);
    EXPECT_EQ(Names(map.GetVersions()),
              (std::vector<std::string>{"x.version.version0", "x.version.version1", "x.version.version2"}));

    const Version* v1 = map.GetVersion("x.version.version1");
    ASSERT_NE(v1, nullptr);
    EXPECT_EQ(v1->GetServiceNamespace(), "x");
    EXPECT_EQ(v1->GetVersionId(), "1.0");
    EXPECT_EQ(v1->GetFlags(), 1u);
    EXPECT_EQ(v1->GetTaskType(), "cairn.Task");
    EXPECT_EQ(Names(v1->GetIncluded()), (std::vector<std::string>{"x.version.version1", "x.version.version0"}));

    EXPECT_TRUE(map.Includes("x.version.version2", "x.version.version0"));
    EXPECT_TRUE(map.Includes("x.version.version0", "x.version.version0"));
    EXPECT_FALSE(map.Includes("x.version.version0", "x.version.version2"));
    EXPECT_FALSE(map.Includes("x.version.version1", "x.version.version2"));
    EXPECT_FALSE(map.Includes("x.version.version1", "unknown"));
    EXPECT_EQ(map.GetVersion("unknown"), nullptr);
}

TEST(VersionMapTest, RepeatedDeclarationsChangeNothing) {
    VersionMap map;
    DeclareChain(map);
    const std::vector<Version*> first = map.GetVersions();
    const std::vector<Version*> included = first[2]->GetIncluded();

    DeclareChain(map);
    map.AddVersion("x.version.version1", "other", "9.9", 0, "other.Task", 0, "");
    EXPECT_EQ(map.GetVersions(), first);
    EXPECT_EQ(first[2]->GetIncluded(), included);
    EXPECT_EQ(first[1]->GetVersionId(), "1.0");
    EXPECT_EQ(map.AddVersionCalls(), 7);
    EXPECT_EQ(map.AddIncludedVersionCalls(), 12);
}

TEST(VersionMapTest, InclusionOfAnUnknownVersionIsRefused) {
    VersionMap map;
    DeclareChain(map);
    EXPECT_EQ(MessageOf<Kernite::InvalidArgumentException>(
                  [&] { map.AddIncludedVersion("x.version.version1", "y.version.version1"); }),
              "Invalid argument : y.version.version1");
    EXPECT_EQ(MessageOf<Kernite::InvalidArgumentException>(
                  [&] { map.AddIncludedVersion("y.version.version1", "x.version.version1"); }),
              "Invalid argument : y.version.version1");
    EXPECT_EQ(map.AddIncludedVersionCalls(), 8);
    EXPECT_FALSE(map.Includes("x.version.version1", "y.version.version1"));
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
    EXPECT_TRUE(map.Includes("w.version.199", "x.version.version0"));
}

TEST(TypeMapTest, FirstRegistrationStandsAndCallsAreCounted) {
    TypeMap map;
    Type* shape = Orbit::GetType<Sample::Shape>();
    Type* circle = Orbit::GetType<Sample::Circle>();
    map.AddType(circle);
    map.AddType(shape);
    map.AddType(circle);
    map.AddType(nullptr);
    EXPECT_EQ(map.AddTypeCalls(), 4);
    EXPECT_EQ(map.GetTypes(), (std::vector<Type*>{circle, shape}));
    EXPECT_EQ(map.GetType("test.Shape"), shape);
    EXPECT_EQ(map.GetType("test.Missing"), nullptr);
}

TEST(TypeMapTest, RuntimeTypesResolveWithoutRegistration) {
    TypeMap map;
    EXPECT_EQ(map.GetType("string"), Orbit::GetType<std::string>());
    EXPECT_EQ(map.GetType("strata.MethodFault"), Orbit::GetType<Orbit::MethodFault>());
    EXPECT_EQ(map.GetType("strata.ManagedObject"), Orbit::GetType<Orbit::ManagedObject>());
    EXPECT_EQ(map.GetType("ManagedObjectReference[]"), Orbit::GetType<Orbit::MoRef>()->GetArrayType());
    EXPECT_EQ(map.GetType("[]"), nullptr);
    EXPECT_EQ(map.AddTypeCalls(), 0);
    EXPECT_TRUE(map.GetTypes().empty());

    map.AddType(Orbit::GetType<Sample::Shape>());
    EXPECT_EQ(map.GetType("test.Shape[]"), Orbit::GetType<Sample::Shape>()->GetArrayType());
}

}  // namespace
