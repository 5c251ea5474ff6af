// What the sixteen loaders left in the runtime's maps when libtarn-types loaded.
#include <gtest/gtest.h>

#include <algorithm>
#include <map>
#include <set>
#include <string>
#include <utility>
#include <vector>

#include "catalogue_files.h"
#include "tarn/types.h"

namespace {

struct Counters {
    long addVersion;
    long addIncludedVersion;
    long addType;
};

Counters ReadCounters() {
    return {Orbit::GetVersionMap()->AddVersionCalls(), Orbit::GetVersionMap()->AddIncludedVersionCalls(),
            Orbit::GetTypeMap()->AddTypeCalls()};
}

// Taken while this program starts: the library's loaders have run, no test has
// added calls of its own yet.
const Counters kAtLoad = ReadCounters();

std::vector<Orbit::Type*> TypesWithPrefix(std::initializer_list<const char*> prefixes) {
    std::vector<Orbit::Type*> out;
    for (Orbit::Type* t : Orbit::GetTypeMap()->GetTypes())
        for (const char* p : prefixes)
            if (t->GetName().starts_with(p)) out.push_back(t);
    return out;
}

std::vector<Orbit::Type*> TarnTypes() { return TypesWithPrefix({"tarn."}); }

std::vector<std::string> Names(const std::vector<Orbit::Type*>& types) {
    std::vector<std::string> out;
    for (Orbit::Type* t : types) out.push_back(t->GetName());
    return out;
}

Orbit::Version* V(const std::string& name) {
    Orbit::Version* v = Orbit::GetVersionMap()->GetVersion(name);
    EXPECT_NE(v, nullptr) << name;
    return v;
}

std::vector<std::string> Included(Orbit::Version* v) {
    std::vector<std::string> out;
    for (Orbit::Version* other : Orbit::GetVersionMap()->GetVersions())
        if (v->Includes(other)) out.push_back(other->GetName());
    return out;
}

Orbit::ManagedObjectType* Managed(Orbit::Type* type) {
    auto* managed = dynamic_cast<Orbit::ManagedObjectType*>(type);
    EXPECT_NE(managed, nullptr);
    return managed;
}

// ---- Counts ----

TEST(Registration, HoldsTheTarnTypesByKind) {
    std::map<std::uint32_t, int> byKind;
    for (Orbit::Type* t : TarnTypes()) ++byKind[t->GetKind()];
    EXPECT_EQ(TarnTypes().size(), 124u);
    EXPECT_EQ(byKind[Orbit::Kind::Managed], 50);
    EXPECT_EQ(byKind[Orbit::Kind::Data], 70);
    EXPECT_EQ(byKind[Orbit::Kind::Fault], 1);
    EXPECT_EQ(byKind[Orbit::Kind::Enum], 3);
    EXPECT_EQ(byKind.size(), 4u) << "a tarn type of another kind";
}

TEST(Registration, EveryLoaderDeclaredTheVersionsAndEachTypeWasAddedOnce) {
    const long loaders = static_cast<long>(CatalogTest::LoaderOrder().size());
    ASSERT_EQ(loaders, 16);
    EXPECT_EQ(kAtLoad.addVersion, loaders * 32);
    EXPECT_EQ(kAtLoad.addIncludedVersion, loaders * 301);
    // One call per tarn type and per stand-in type; a repeated or null addition would
    // count a call that left no entry.
    const auto standins = TypesWithPrefix({"cairn.", "ferry."});
    EXPECT_FALSE(standins.empty());
    EXPECT_EQ(kAtLoad.addType, static_cast<long>(TarnTypes().size() + standins.size()));
}

// ---- Versions ----

TEST(Versions, ThirtyTwoVersionsWithAReflexiveTransitiveInclusionOf301Pairs) {
    const auto versions = Orbit::GetVersionMap()->GetVersions();
    ASSERT_EQ(versions.size(), 32u);
    int pairs = 0;
    for (Orbit::Version* a : versions) {
        EXPECT_TRUE(a->Includes(a)) << a->GetName();
        EXPECT_EQ(a->GetTaskType(), "cairn.Task");
        for (Orbit::Version* b : versions) {
            if (!a->Includes(b)) continue;
            ++pairs;
            for (Orbit::Version* c : versions)
                EXPECT_TRUE(!b->Includes(c) || a->Includes(c))
                    << a->GetName() << " > " << b->GetName() << " > " << c->GetName();
        }
    }
    EXPECT_EQ(pairs, 301);
}

TEST(Versions, InclusionExamples) {
    Orbit::Version* root = V("strata.version.version0");
    EXPECT_EQ(Included(root), std::vector<std::string>{"strata.version.version0"});
    for (Orbit::Version* v : Orbit::GetVersionMap()->GetVersions())
        EXPECT_TRUE(v->Includes(root)) << v->GetName();

    EXPECT_FALSE(V("cairn.version.dev")->Includes(V("cairn.version.juniper")));
    EXPECT_FALSE(V("tarn.version.version8")->Includes(V("ferry.version.dev")));
    EXPECT_FALSE(V("tarn.version.dev")->Includes(V("cairn.version.juniper")));
    EXPECT_EQ(Included(V("tarn.version.dev")).size(), 31u);

    const std::vector<std::string> version1 = {
        "cairn.version.version1",        "cairn.version.version2",        "cairn.version.version3",
        "cairn.version.version4",        "cairn.version.version5",        "strata.query.version.version1",
        "strata.query.version.version2", "strata.version.version0",       "strata.version.version1",
        "tarn.version.version1"};
    EXPECT_EQ(Included(V("tarn.version.version1")), version1);

    // The flag word is 1 for two versions only.
    for (Orbit::Version* v : Orbit::GetVersionMap()->GetVersions()) {
        bool flagged = v->GetName() == "cairn.version.version1" || v->GetName() == "cairn.version.version3";
        EXPECT_EQ(v->GetFlags(), flagged ? 1u : 0u) << v->GetName();
    }
}

TEST(Versions, ASecondLoaderRepeatsTheVersionCallsAndChangesNothing) {
    const auto versions = Orbit::GetVersionMap()->GetVersions();
    std::vector<std::vector<Orbit::Version*>> included;
    for (Orbit::Version* v : versions) included.push_back(v->GetIncluded());
    const auto types = Orbit::GetTypeMap()->GetTypes();
    const std::size_t cnxmgrTypes = std::count_if(types.begin(), types.end(), [](Orbit::Type* t) {
        return t->GetName().starts_with("tarn.cnxmgr.");
    });
    const Counters before = ReadCounters();

    Orbit::TarnCnxmgrTypeinfoTypeInfoLoader again;

    const Counters after = ReadCounters();
    EXPECT_EQ(after.addVersion - before.addVersion, 32);
    EXPECT_EQ(after.addIncludedVersion - before.addIncludedVersion, 301);
    EXPECT_EQ(after.addType - before.addType, static_cast<long>(cnxmgrTypes));
    EXPECT_EQ(Orbit::GetVersionMap()->GetVersions(), versions);
    for (std::size_t i = 0; i < versions.size(); ++i)
        EXPECT_EQ(versions[i]->GetIncluded(), included[i]) << versions[i]->GetName();
    EXPECT_EQ(Orbit::GetTypeMap()->GetTypes(), types);
}

// ---- Order ----

TEST(Order, LoadersRanInLibraryOrderEachRegisteringAllItsTypesAtOnce) {
    const auto loaders = CatalogTest::LoaderOrder();
    std::vector<std::string> runs;  // namespaces of consecutive types, collapsed
    for (Orbit::Type* t : TarnTypes()) {
        std::string ns = CatalogTest::NamespaceOf(t->GetName(), loaders);
        EXPECT_FALSE(ns.empty()) << t->GetName();
        if (runs.empty() || runs.back() != ns) runs.push_back(ns);
    }
    EXPECT_EQ(runs, loaders);
}

TEST(Order, EachNamespaceRegistersManagedThenDataAndFaultsThenEnumsInFileOrder) {
    const auto loaders = CatalogTest::LoaderOrder();
    const auto types = TarnTypes();
    for (const std::string& ns : loaders) {
        std::vector<std::string> registered;
        for (Orbit::Type* t : types)
            if (CatalogTest::NamespaceOf(t->GetName(), loaders) == ns) registered.push_back(t->GetName());
        EXPECT_EQ(registered, CatalogTest::DeclaredRegistrationOrder(ns)) << ns;
    }
}

// The largest namespace, its registration order written out once: managed types,
// then data objects, each in the order the loader must keep.
TEST(Order, VmprovRegistersInTheTableOrder) {
    const std::vector<std::string> expected = {
        "Action", "ActionFactory", "CheckCompatibility", "CheckDestinationFiles", "CleanupSourceVm",
        "ComputeSpecs", "CustomizeVm", "InvokePrechecks", "MarkAsTemplate", "PowerOnVm", "RelayoutSnapshot",
        "RemoveSnapshot", "SelectDestination", "UndoableAction", "UnregisterSourceVm", "UpgradeDestination",
        "CompleteGlide", "CopyVmFiles", "CreateDestinationVm", "CreateDummyGlideDisks", "CreateInventoryVm",
        "CreateSnapshot", "FinallyAction", "GenerateNvram", "InitiateGlide", "InvokeCallbacks", "PrepareGlide",
        "ReconfigureVm", "RegisterDestinationVm", "ReserveDirectory", "SwitchHostAndPool", "TrackTasks",
        "Action.Output", "Action.Input", "Action.NextAction", "Action.CancelableOption",
        "ComputeSpecs.CopySpecOutput", "ComputeSpecs.GlideSpecOutput", "ComputeSpecs.ReparentSpecOutput",
        "ComputeSpecs.CopySpecAndReparentSpecOutput", "ComputeSpecs.ConfigSpecOutput",
        "ComputeSpecs.SnapshotLayoutSpecOutput", "Context", "CreateContext", "DatastoreState", "HostState",
        "RegisterContext", "SelectDestination.Output", "SelectDestination.SnapshotNameOutput", "SnapshotState",
        "TaskTrackingInfo", "UndoableAction.UndoInput", "VmContext", "VmLocation", "VmState", "MobilityContext",
        "ReserveDirectory.ReservationInfo", "ReserveDirectory.Output", "TrackTasks.TasksToTrack", "CloneContext",
        "MigrateContext", "FtSyncContext"};
    std::vector<std::string> registered;
    for (const std::string& name : Names(TarnTypes()))
        if (name.starts_with("tarn.vmprov.")) registered.push_back(name.substr(std::string("tarn.vmprov.").size()));
    EXPECT_EQ(registered, expected);
}

// ---- Members ----

// Own members by member number ("=name" marks a property getter), and the
// method-object array that the runtime filled with them, closed by null.
void ExpectMembers(Orbit::Type* type, Orbit::ManagedMethod* const* objects, const std::vector<std::string>& expected) {
    Orbit::ManagedObjectType* managed = Managed(type);
    ASSERT_NE(managed, nullptr);
    const auto& members = managed->GetMembers();
    ASSERT_EQ(members.size(), expected.size()) << type->GetName();
    for (std::size_t i = 0; i < members.size(); ++i) {
        bool getter = expected[i].starts_with("=");
        EXPECT_EQ(members[i]->GetName(), getter ? expected[i].substr(1) : expected[i]) << type->GetName() << " #" << i;
        EXPECT_EQ(members[i]->IsPropertyGetter(), getter) << members[i]->GetName();
        EXPECT_EQ(members[i]->GetMemberNumber(), static_cast<int>(i));
        EXPECT_EQ(members[i]->GetDeclaringType(), managed);
        EXPECT_EQ(objects[i], members[i].Get()) << type->GetName() << " #" << i;
    }
    EXPECT_EQ(objects[members.size()], nullptr);
}

TEST(Members, RootManagersNumberMethodsFirstThenProperties) {
    ExpectMembers(Orbit::GetType<Tarn::DebugManager>(), gTarnDebugManagerMethodObjects,
                  {"UpdateConfig", "shutdown", "rearrangeLayoutEx", "markLogs", "traceOperation", "=faultManager",
                   "=compatManager", "=alertManager", "=rudderDebugManager", "=dvsTestManager", "=alarmTestManager"});
    ExpectMembers(Orbit::GetType<Tarn::ServiceInstance>(), gTarnServiceInstanceMethodObjects,
                  {"=debugManager", "=lockStresser", "=profiler", "=dbSerializer", "=hostPicker", "=security",
                   "=inMemLogBufferManager"});
}

TEST(Members, ActionsNumberOnlyTheirOwnMembers) {
    ExpectMembers(Orbit::GetType<Tarn::Vmprov::Action>(), gTarnVmprovActionMethodObjects,
                  {"setContribution", "execute", "taskDone", "=name", "=input", "=nextAction", "=context",
                   "=contribution", "=committed", "=cancelableOption", "=tasksToTrack"});
    ExpectMembers(Orbit::GetType<Tarn::Vmprov::UndoableAction>(), gTarnVmprovUndoableActionMethodObjects,
                  {"undo", "=undoInput", "=undoHost", "=earlyJournalize", "=idempotent"});

    // Inherited members stay with the base, under the base's numbers.
    Orbit::ManagedObjectType* undoable = Managed(Orbit::GetType<Tarn::Vmprov::UndoableAction>());
    ASSERT_NE(undoable, nullptr);
    EXPECT_EQ(undoable->GetBaseType(), Orbit::GetType<Tarn::Vmprov::Action>());
    Orbit::ManagedMethod* execute = undoable->FindMember("execute");
    ASSERT_NE(execute, nullptr);
    EXPECT_EQ(execute, gTarnVmprovActionMethodObjects[1]);
}

TEST(Members, WsdlNamesThatDifferFromMethodNames) {
    struct Case {
        const char* type;
        const char* method;
        const char* wsdl;
        bool task;
    };
    const Case cases[] = {
        {"tarn.SecurityManager", "reloadSslCertificate", "UpdateSSLCertificate", false},
        {"tarn.DebugManager", "shutdown", "DebugShutdown", false},
        {"tarn.DebugManager", "traceOperation", "DebugTraceOperation_Task", true},
        {"tarn.vmprov.Action", "execute", "ExecuteAction", false},
        {"tarn.vmprov.Action", "taskDone", "ActionTaskDone", false},
    };
    for (const Case& c : cases) {
        Orbit::ManagedObjectType* type = Managed(Orbit::GetTypeMap()->GetType(c.type));
        ASSERT_NE(type, nullptr) << c.type;
        Orbit::ManagedMethod* m = type->FindMember(c.method);
        ASSERT_NE(m, nullptr) << c.method;
        EXPECT_EQ(m->GetWsdlName(), c.wsdl);
        EXPECT_EQ(m->IsTask(), c.task) << c.method;
    }
    Orbit::ManagedMethod* reload = Managed(Orbit::GetType<Tarn::SecurityManager>())->FindMember("reloadSslCertificate");
    ASSERT_NE(reload, nullptr);
    EXPECT_EQ(reload->GetFaults(), std::vector<const Orbit::TypeInfo*>{&gTarnFaultSecurityConfigFaultTypeInfo});
    EXPECT_EQ(reload->GetResult().typeRecord, nullptr);
    EXPECT_EQ(reload->GetResult().version, "strata.version.version0");
}

// ---- Type objects ----

template <class T>
void ExpectCachedAndRegistered(const char* wireName) {
    const long calls = Orbit::GetTypeMap()->AddTypeCalls();
    Orbit::Type* first = Orbit::GetType<T>();
    ASSERT_NE(first, nullptr) << wireName;
    EXPECT_EQ(Orbit::GetType<T>(), first) << wireName;
    EXPECT_EQ(Orbit::GetTypeMap()->GetType(wireName), first) << wireName;
    EXPECT_EQ(Orbit::GetTypeMap()->AddTypeCalls(), calls);
}

TEST(TypeObjects, ASecondGetTypeReturnsTheRegisteredType) {
    ExpectCachedAndRegistered<Tarn::DebugManager>("tarn.DebugManager");
    ExpectCachedAndRegistered<Tarn::DebugManager::TraceResult>("tarn.DebugManager.TraceResult");
    ExpectCachedAndRegistered<Tarn::LockStresser::LockMode>("tarn.LockStresser.LockMode");
    ExpectCachedAndRegistered<Tarn::Fault::SecurityConfigFault>("tarn.fault.SecurityConfigFault");
    ExpectCachedAndRegistered<Tarn::Vmprov::FtSyncContext>("tarn.vmprov.FtSyncContext");
}

TEST(TypeObjects, VisibilityFollowsInclusion) {
    Orbit::Version* v1 = V("tarn.version.version1");
    Orbit::Version* v6 = V("tarn.version.version6");
    Orbit::Version* v8 = V("tarn.version.version8");
    Orbit::Version* dev = V("tarn.version.dev");

    Orbit::Type* alerts = Orbit::GetType<Tarn::AlertManager>();  // introduced in version6
    EXPECT_FALSE(alerts->IsVisible(v1));
    EXPECT_TRUE(alerts->IsVisible(v6));
    EXPECT_TRUE(alerts->IsVisible(v8));
    EXPECT_TRUE(alerts->IsVisible(dev));
    EXPECT_FALSE(alerts->IsVisible(nullptr));
    EXPECT_FALSE(Orbit::GetType<Tarn::DebugManager::TraceResult>()->IsVisible(v8));

    Orbit::ManagedObjectType* instance = Managed(Orbit::GetType<Tarn::ServiceInstance>());
    ASSERT_NE(instance, nullptr);
    EXPECT_TRUE(instance->IsVisible(v1));
    const auto& properties = instance->GetProperties();
    auto hostPicker = std::find_if(properties.begin(), properties.end(),
                                   [](const Orbit::Member& m) { return m.name == "hostPicker"; });
    ASSERT_NE(hostPicker, properties.end());
    ASSERT_EQ(hostPicker->GetVersion(), v6);
    EXPECT_FALSE(v1->Includes(hostPicker->GetVersion()));
    EXPECT_TRUE(v6->Includes(hostPicker->GetVersion()));
}

}  // namespace
