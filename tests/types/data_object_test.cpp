// Generated data object classes: construction, deep copies, lazy arrays, setters
// and size accounting.
#include <gtest/gtest.h>

#include <functional>
#include <string>
#include <vector>

#include "support.h"
#include "tarn/faultInjector.h"
#include "tarn/fault.h"
#include "tarn/ft.h"
#include "tarn/profiler.h"
#include "tarn/tarn.h"
#include "tarn/vmprov.h"

using Kernite::Optional;
using Kernite::Ref;
using Kernite::System::DateTime;
using Orbit::Array;
using Orbit::DataArray;
using Orbit::KeyAnyValue;
using Orbit::MoRef;
using MovePriority = Cairn::VirtualMachine::MovePriority;
using namespace Tarn::Vmprov;
using namespace TypesTest;

namespace {

class DataObjectTest : public NoLeakTest {};

Ref<KeyAnyValue> Entry(const std::string& key, int value) {
    Ref<KeyAnyValue> entry(new KeyAnyValue());
    entry->SetKey(key);
    entry->SetValue(Ref<Orbit::Any>(new Orbit::Primitive<int>(value)).Get());
    return entry;
}

Ref<SnapshotState> Snap(const std::string& name, int id, std::initializer_list<SnapshotState*> children) {
    Ref<DataArray<SnapshotState>> kids;
    if (children.size() != 0) kids = new DataArray<SnapshotState>(children);
    return Make<SnapshotState>(Mo("VmSnapshot", "s-" + name).Get(), name, id,
                               Make<Cairn::Vm::ConfigInfo>().Get(), kids.Get());
}

// The tree below `s` as text, read without creating any array.
std::string Describe(const SnapshotState* s) {
    std::string text = s->GetName() + "#" + std::to_string(s->GetId());
    text += s->GetSnapshot() ? "@" + s->GetSnapshot()->GetId() : "@-";
    if (!RecordOf<SnapshotState>()->isPropertySet(const_cast<SnapshotState*>(s), 4)) return text;
    text += "(";
    auto* kids = s->GetChildSnapshot();
    for (int i = 0; i < kids->GetLength(); ++i) text += (i ? "," : "") + Describe(kids->GetAt(i));
    return text + ")";
}

std::string Describe(const VmState* vm) {
    std::string text = vm->GetVm()->GetId() + ":" + vm->GetVmPathName() + "[";
    auto* roots = vm->GetRootSnapshot();
    for (int i = 0; i < roots->GetLength(); ++i) text += (i ? "," : "") + Describe(roots->GetAt(i));
    return text + "]";
}

// Every object of the copy is its own; the values are the source's.
void ExpectSeparateTrees(SnapshotState* a, SnapshotState* b, int& visited) {
    ++visited;
    ASSERT_NE(a, b);
    EXPECT_EQ(a->GetName(), b->GetName());
    EXPECT_EQ(a->GetId(), b->GetId());
    ASSERT_NE(b->GetSnapshot(), nullptr);
    EXPECT_NE(a->GetSnapshot(), b->GetSnapshot());
    EXPECT_EQ(*a->GetSnapshot(), *b->GetSnapshot());
    ASSERT_NE(b->GetConfig(), nullptr);
    EXPECT_NE(a->GetConfig(), b->GetConfig());
    const bool hasKids = RecordOf<SnapshotState>()->isPropertySet(a, 4);
    ASSERT_EQ(hasKids, RecordOf<SnapshotState>()->isPropertySet(b, 4));
    if (!hasKids) return;
    auto* ka = a->GetChildSnapshot();
    auto* kb = b->GetChildSnapshot();
    EXPECT_NE(ka, kb);
    ASSERT_EQ(ka->GetLength(), kb->GetLength());
    for (int i = 0; i < ka->GetLength(); ++i) ExpectSeparateTrees(ka->GetAt(i), kb->GetAt(i), visited);
}

TEST_F(DataObjectTest, DefaultObjectHoldsNothing) {
    Ref<HostState> host(new HostState());
    EXPECT_EQ(host->GetHost(), nullptr);
    EXPECT_EQ(host->GetLocalSwapDatastore(), nullptr);
    EXPECT_TRUE(host->GetUuid().empty());
    EXPECT_FALSE(host->GetLocalSwapDatastoreWritable().IsSet());
    // No array was created: the object measures as its bare size plus its four empty strings.
    const unsigned int bare = host->Orbit::DynamicData::_GetSize(Rounded) - Rounded(sizeof(Orbit::DynamicData)) +
                              Rounded(sizeof(HostState)) + 4 * Rounded(0);
    EXPECT_EQ(host->_GetSize(Rounded), bare);

    Ref<FtSyncContext> ft(new FtSyncContext());
    EXPECT_FALSE(ft->GetDstVmPathName().IsSet());
    EXPECT_FALSE(ft->GetStartTime().IsSet());
    EXPECT_FALSE(ft->GetNumGlideDisks().IsSet());
    EXPECT_EQ(ft->GetSrcVmState(), nullptr);
    EXPECT_TRUE(ft->GetDstCfgFile().empty());
}

TEST_F(DataObjectTest, FtSyncContextTakesTheChainsFourteenParametersThenItsOwn) {
    Ref<DataArray<KeyAnyValue>> cbData(new DataArray<KeyAnyValue>{Entry("k", 1).Get()});
    auto srcVm = Make<VmState>();
    auto srcLocation = Make<VmLocation>();
    auto dstLocation = Make<VmLocation>();
    auto spec = Make<Cairn::Vm::RelocateSpec>();
    auto dstResult = Make<Cairn::Host::GlideManager::GlideResult>();
    auto srcResult = Make<Cairn::Host::GlideManager::SrcGlideResult>();
    const DateTime start = DateTime::FromMicroseconds(1'700'000'000'123'456);
    const long long migrationId = (1LL << 40) + 7;

    auto ctx = Make<FtSyncContext>(cbData.Get(), srcVm.Get(), srcLocation.Get(), Optional<std::string>("/d/vm-2/cfg"),
                                   dstLocation.Get(), spec.Get(), MovePriority::highPriority, true, migrationId,
                                   Optional<bool>(false), Optional<DateTime>(start), dstResult.Get(),
                                   srcResult.Get(), Optional<int>(3), std::string("/dst/ft.cfg"));

    EXPECT_EQ(ctx->GetCbData(), cbData.Get());
    EXPECT_EQ(cbData->GetRefCount(), 2);  // shared, not copied
    EXPECT_EQ(ctx->GetSrcVmState(), srcVm.Get());
    EXPECT_EQ(ctx->GetSrcLocation(), srcLocation.Get());
    EXPECT_EQ(ctx->GetDstVmPathName().GetValue(), "/d/vm-2/cfg");
    EXPECT_EQ(ctx->GetDstLocation(), dstLocation.Get());
    EXPECT_EQ(ctx->GetSpec(), spec.Get());
    EXPECT_EQ(ctx->GetPriority(), MovePriority::highPriority);
    EXPECT_TRUE(ctx->GetKeelRecommended());
    EXPECT_EQ(ctx->GetMigrationId(), migrationId);
    ASSERT_TRUE(ctx->GetChangeDiskDatastore().IsSet());  // set to false is still set
    EXPECT_FALSE(ctx->GetChangeDiskDatastore().GetValue());
    EXPECT_EQ(ctx->GetStartTime().GetValue(), start);
    EXPECT_EQ(ctx->GetDstResult(), dstResult.Get());
    EXPECT_EQ(ctx->GetSrcResult(), srcResult.Get());
    EXPECT_EQ(ctx->GetNumGlideDisks().GetValue(), 3);
    EXPECT_EQ(ctx->GetDstCfgFile(), "/dst/ft.cfg");
    EXPECT_EQ(srcVm->GetRefCount(), 2);
    EXPECT_EQ(spec->GetRefCount(), 2);
}

TEST_F(DataObjectTest, CloneContextFullConstructorLeavesANullArrayUncreated) {
    auto srcVm = Make<VmState>();
    auto folder = Mo("Folder", "group-v3");
    auto ctx = Make<CloneContext>(nullptr, srcVm.Get(), nullptr, Optional<std::string>(), nullptr,
                                  Make<Cairn::Vm::CloneSpec>().Get(), std::string("clone-1"), Optional<std::string>(),
                                  folder.Get(), nullptr, nullptr, Optional<std::string>("tmp-snap"),
                                  Optional<std::string>(), Optional<bool>(true), nullptr);
    EXPECT_EQ(ctx->GetSrcVmState(), srcVm.Get());
    EXPECT_FALSE(ctx->GetDstVmPathName().IsSet());
    EXPECT_NE(ctx->GetSpec(), nullptr);
    EXPECT_EQ(ctx->GetName(), "clone-1");
    EXPECT_FALSE(ctx->GetSanitizedName().IsSet());
    EXPECT_EQ(ctx->GetFolder(), folder.Get());
    EXPECT_EQ(ctx->GetTempSnapshotName().GetValue(), "tmp-snap");
    EXPECT_FALSE(ctx->GetCheckpointFileName().IsSet());
    EXPECT_TRUE(ctx->GetQuiverClone().GetValue());

    const Orbit::DataTypeInfo* own = RecordOf<CloneContext>();
    const Orbit::DataTypeInfo* root = RecordOf<Context>();
    EXPECT_FALSE(own->isPropertySet(ctx.Get(), 9));   // macAssignmentData
    EXPECT_FALSE(root->isPropertySet(ctx.Get(), 0));  // cbData, through the root's record
    EXPECT_EQ(ctx->GetMacAssignmentData()->GetLength(), 0);
    EXPECT_FALSE(own->isPropertySet(ctx.Get(), 9));  // created, but empty
    ctx->SetMacAssignmentData(Make<Array<std::string>>(std::vector<std::string>{"00:50:56:aa:bb:cc"}).Get());
    EXPECT_TRUE(own->isPropertySet(ctx.Get(), 9));
}

TEST_F(DataObjectTest, CopyOfAVmStateSharesNothingDownToTheLastSnapshot) {
    auto g0 = Snap("g0", 4, {});
    auto c0 = Snap("c0", 2, {g0.Get()});
    auto c1 = Snap("c1", 3, {});
    auto r0 = Snap("r0", 1, {c0.Get(), c1.Get()});
    auto r1 = Snap("r1", 5, {});
    Ref<DataArray<SnapshotState>> roots(new DataArray<SnapshotState>{r0.Get(), r1.Get()});
    auto source = Make<VmState>(Mo("VirtualMachine", "vm-1").Get(), std::string("/d/vm-1/conf"),
                                Cairn::VirtualMachine::PowerState::poweredOn, Make<Cairn::Vm::ConfigInfo>().Get(),
                                Make<Cairn::Vm::FileLayoutEx>().Get(), Make<Cairn::Vm::Capability>().Get(),
                                roots.Get());
    g0 = c0 = c1 = r0 = r1 = nullptr;
    roots = nullptr;
    const std::string before = Describe(source.Get());
    const unsigned int sourceSize = source->_GetSize(Exact);

    Ref<VmState> copy(new VmState(*source));
    EXPECT_EQ(copy->_GetSize(Exact), sourceSize);  // nothing created that the source lacks
    EXPECT_NE(copy->GetVm(), source->GetVm());
    EXPECT_NE(copy->GetConfig(), source->GetConfig());
    EXPECT_NE(copy->GetLayoutEx(), source->GetLayoutEx());
    EXPECT_NE(copy->GetCapability(), source->GetCapability());
    EXPECT_EQ(copy->GetPowerState(), Cairn::VirtualMachine::PowerState::poweredOn);
    ASSERT_NE(copy->GetRootSnapshot(), source->GetRootSnapshot());
    int visited = 0;
    for (int i = 0; i < 2; ++i)
        ExpectSeparateTrees(source->GetRootSnapshot()->GetAt(i), copy->GetRootSnapshot()->GetAt(i), visited);
    EXPECT_EQ(visited, 5);
    EXPECT_TRUE(source->_IsEqual(copy.Get()));

    // Change the copy at every level; the source keeps its tree.
    copy->SetVm(Mo("VirtualMachine", "vm-2").Get());
    SnapshotState* copyC0 = copy->GetRootSnapshot()->GetAt(0)->GetChildSnapshot()->GetAt(0);
    copyC0->GetChildSnapshot()->GetAt(0)->SetName("changed");
    copy->GetRootSnapshot()->GetAt(1)->GetChildSnapshot()->Append(Snap("new", 9, {}).Get());
    EXPECT_EQ(Describe(source.Get()), before);
    EXPECT_FALSE(source->_IsEqual(copy.Get()));

    Orbit::PropertyDiffSet diffs;
    source->_DiffProperties(copy.Get(), "", diffs);
    EXPECT_EQ(diffs.GetPaths(), (std::vector<std::string>{"vm", "rootSnapshot[0].childSnapshot[0].childSnapshot[0].name",
                                                          "rootSnapshot[1].childSnapshot"}));

    Ref<Orbit::Any> clone = Ref<Orbit::Any>(copy->_Clone());
    EXPECT_TRUE(clone->_IsEqual(copy.Get()));
}

TEST_F(DataObjectTest, CopyKeepsDynamicTypesAndOptionalState) {
    auto fault = Make<Tarn::FaultInjector::Fault>(
        7, Optional<std::string>("a description long enough to live on the heap"),
        Make<Tarn::FaultInjector::TaskTarget>(Mo("Task", "task-12").Get()).Get(),
        Make<Tarn::FaultInjector::ProgressTrigger>(40).Get(),
        Make<Tarn::FaultInjector::ExceptionAction>(Make<Tarn::Fault::SecurityConfigFault>().Get()).Get());

    Ref<Tarn::FaultInjector::Fault> copy(new Tarn::FaultInjector::Fault(*fault));
    EXPECT_EQ(copy->GetKey(), 7);
    ASSERT_TRUE(copy->GetDescription().IsSet());
    EXPECT_EQ(copy->GetDescription().GetValue(), fault->GetDescription().GetValue());
    EXPECT_NE(&copy->GetDescription().GetValue(), &fault->GetDescription().GetValue());

    auto* target = dynamic_cast<Tarn::FaultInjector::TaskTarget*>(copy->GetTarget());
    ASSERT_NE(target, nullptr) << typeid(*copy->GetTarget()).name();
    EXPECT_NE(target, fault->GetTarget());
    EXPECT_NE(target->GetTarget(), static_cast<Tarn::FaultInjector::TaskTarget*>(fault->GetTarget())->GetTarget());
    EXPECT_EQ(target->GetTarget()->GetId(), "task-12");
    auto* trigger = dynamic_cast<Tarn::FaultInjector::ProgressTrigger*>(copy->GetTrigger());
    ASSERT_NE(trigger, nullptr);
    EXPECT_EQ(trigger->GetPercent(), 40);
    auto* action = dynamic_cast<Tarn::FaultInjector::ExceptionAction*>(copy->GetAction());
    ASSERT_NE(action, nullptr);
    EXPECT_EQ(typeid(*action->GetFault()), typeid(Tarn::Fault::SecurityConfigFault));
    EXPECT_NE(action->GetFault(), static_cast<Tarn::FaultInjector::ExceptionAction*>(fault->GetAction())->GetFault());

    // Unset stays unset, null stays null.
    Ref<Tarn::FaultInjector::Fault> bare(new Tarn::FaultInjector::Fault());
    Ref<Tarn::FaultInjector::Fault> bareCopy(new Tarn::FaultInjector::Fault(*bare));
    EXPECT_FALSE(bareCopy->GetDescription().IsSet());
    EXPECT_EQ(bareCopy->GetTarget(), nullptr);
    auto host = Make<HostState>();
    host->SetLocalSwapDatastoreWritable(false);
    Ref<HostState> hostCopy(new HostState(*host));
    ASSERT_TRUE(hostCopy->GetLocalSwapDatastoreWritable().IsSet());
    EXPECT_FALSE(hostCopy->GetLocalSwapDatastoreWritable().GetValue());
    EXPECT_FALSE(Ref<HostState>(new HostState(*Make<HostState>()))->GetLocalSwapDatastoreWritable().IsSet());
}

TEST_F(DataObjectTest, CloneKeepsTheMostDerivedClass) {
    auto ft = Make<FtSyncContext>();
    ft->SetDstCfgFile("/ft/secondary.cfg");
    ft->SetMigrationId(99);
    ft->SetCbData(Make<DataArray<KeyAnyValue>>().Get());
    ft->GetCbData()->Append(Entry("a", 1).Get());
    Context* asBase = ft.Get();
    Ref<Orbit::Any> clone(asBase->_Clone());
    auto* same = dynamic_cast<FtSyncContext*>(clone.Get());
    ASSERT_NE(same, nullptr) << typeid(*clone).name();
    EXPECT_EQ(typeid(*clone), typeid(FtSyncContext));
    EXPECT_EQ(same->GetDstCfgFile(), "/ft/secondary.cfg");
    EXPECT_EQ(same->GetMigrationId(), 99);
    EXPECT_NE(same->GetCbData(), ft->GetCbData());
    EXPECT_EQ(same->GetCbData()->GetLength(), 1);
    EXPECT_EQ(clone->_GetType(), Orbit::GetType<FtSyncContext>());
    EXPECT_EQ(same->_GetDataType(), Orbit::GetDoType<FtSyncContext>());
    EXPECT_EQ(std::string(clone->_GetType()->GetName()), "tarn.vmprov.FtSyncContext");
}

TEST_F(DataObjectTest, ArrayGettersCreateOnceAndNullSettersEmptyInPlace) {
    auto snapshot = Make<SnapshotState>();
    auto* first = snapshot->GetChildSnapshot();
    ASSERT_NE(first, nullptr);
    EXPECT_EQ(first->GetLength(), 0);
    EXPECT_EQ(snapshot->GetChildSnapshot(), first);
    EXPECT_EQ(first->GetRefCount(), 1);  // the field's reference only

    first->Append(Snap("a", 1, {}).Get());
    first->Append(Snap("b", 2, {}).Get());
    first->Append(nullptr);
    const long withItems = Kernite::ObjectImpl::LiveObjects();
    snapshot->SetChildSnapshot(nullptr);
    EXPECT_EQ(snapshot->GetChildSnapshot(), first);  // the same array, emptied
    EXPECT_EQ(first->GetLength(), 0);
    EXPECT_LT(Kernite::ObjectImpl::LiveObjects(), withItems);  // its items were released

    // On a field that was never read, null changes nothing: no array appears.
    auto names = Make<Tarn::Profiler::Query::NamesInfo>();
    const unsigned int bare = names->_GetSize(Exact);
    names->SetNames(nullptr);
    EXPECT_EQ(names->_GetSize(Exact), bare);
    EXPECT_FALSE(RecordOf<Tarn::Profiler::Query::NamesInfo>()->isPropertySet(names.Get(), 0));
    auto* created = names->GetNames();
    EXPECT_EQ(names->GetNames(), created);
    EXPECT_GT(names->_GetSize(Exact), bare);

    // A new array replaces the installed one, which is released.
    auto replacement = Make<Array<std::string>>(std::vector<std::string>{"counter.a"});
    Ref<Array<std::string>> old(created);
    names->SetNames(replacement.Get());
    EXPECT_EQ(names->GetNames(), replacement.Get());
    EXPECT_EQ(old->GetRefCount(), 1);
    EXPECT_EQ(replacement->GetRefCount(), 2);
}

TEST_F(DataObjectTest, SettingTheHeldObjectAgainKeepsIt) {
    auto host = Make<HostState>();
    host->SetLocalSwapDatastore(Make<DatastoreState>(Mo("Datastore", "ds-1").Get(), nullptr, nullptr).Get());
    host->SetHost(Mo("HostSystem", "host-9").Get());
    host->SetMountInfo(Make<DataArray<Cairn::Host::MountInfo>>().Get());
    host->GetMountInfo()->Append(Make<Cairn::Host::MountInfo>().Get());

    // Each member holds the only reference; a setter that released before taking
    // would destroy the object it is about to store.
    DatastoreState* ds = host->GetLocalSwapDatastore();
    MoRef* mo = host->GetHost();
    auto* mounts = host->GetMountInfo();
    ASSERT_EQ(ds->GetRefCount(), 1);
    ASSERT_EQ(mo->GetRefCount(), 1);
    ASSERT_EQ(mounts->GetRefCount(), 1);
    const long live = Kernite::ObjectImpl::LiveObjects();
    host->SetLocalSwapDatastore(ds);
    host->SetHost(mo);
    host->SetMountInfo(mounts);
    EXPECT_EQ(Kernite::ObjectImpl::LiveObjects(), live);
    EXPECT_EQ(host->GetLocalSwapDatastore(), ds);
    EXPECT_EQ(ds->GetRefCount(), 1);
    EXPECT_EQ(ds->GetDatastore()->GetId(), "ds-1");
    EXPECT_EQ(host->GetHost(), mo);
    EXPECT_EQ(mo->GetId(), "host-9");
    EXPECT_EQ(host->GetMountInfo(), mounts);
    EXPECT_EQ(mounts->GetLength(), 1);
    EXPECT_EQ(mounts->GetRefCount(), 1);

    // Null clears a reference member.
    host->SetLocalSwapDatastore(nullptr);
    EXPECT_EQ(host->GetLocalSwapDatastore(), nullptr);
}

// Hand-made sums: each class measures as its own object size once, plus what its
// members hold on the heap. A std::string holds heap memory only when its text does
// not fit inside the object.
unsigned int StringHeap(const std::string& s) {
    const auto* object = reinterpret_cast<const char*>(&s);
    const bool inside = s.data() >= object && s.data() < object + sizeof(std::string);
    return inside ? 0 : static_cast<unsigned int>(s.capacity() + 1);
}

unsigned int StandInSize(Orbit::SizeFunction f, unsigned int objectSize) { return f(objectSize); }

unsigned int DatastoreStateSize(const DatastoreState& ds, Orbit::SizeFunction f) {
    unsigned int size = f(sizeof(DatastoreState));
    if (ds.GetDatastore()) size += ds.GetDatastore()->_GetSize(f);
    if (ds.GetSummary()) size += StandInSize(f, sizeof(Cairn::Datastore::Summary));
    return size;
}

unsigned int HostStateSize(const HostState& h, Orbit::SizeFunction f) {
    unsigned int size = f(sizeof(HostState));
    size += h.GetHost()->_GetSize(f);
    size += StandInSize(f, sizeof(Cairn::AboutInfo));
    for (const std::string* s : {&h.GetUuid(), &h.GetManagementIp(), &h.GetSslThumbprint(), &h.GetVmSwapPlacement()})
        size += f(StringHeap(*s));
    size += DatastoreStateSize(*h.GetLocalSwapDatastore(), f);
    // One MountInfo in an array that has room for two.
    size += sizeof(Orbit::DataObjectArrayBase) + f(2 * sizeof(Ref<Orbit::Any>)) +
            StandInSize(f, sizeof(Cairn::Host::MountInfo));
    return size;
}

TEST_F(DataObjectTest, SizeIsTheSumOfObjectAndHeldMemory) {
    for (Orbit::SizeFunction f : {&Exact, &Rounded}) {
        SCOPED_TRACE(f == &Exact ? "f(n) = n" : "rounding f");
        auto host = Make<HostState>();
        host->SetHost(Mo("HostSystem", "host-1").Get());
        host->SetProduct(Make<Cairn::AboutInfo>().Get());
        host->SetUuid("4c4c4544-0038-5910-8044-b3c04f4e3232-long-enough");
        host->SetManagementIp("10.0.0.1");
        host->SetLocalSwapDatastore(
            Make<DatastoreState>(Mo("Datastore", "ds-1").Get(), Make<Cairn::Datastore::Summary>().Get(), nullptr)
                .Get());
        host->SetLocalSwapDatastoreWritable(true);  // an optional flag adds nothing
        Ref<DataArray<Cairn::Host::MountInfo>> mounts(new DataArray<Cairn::Host::MountInfo>());
        mounts->Reserve(2);
        mounts->Append(Make<Cairn::Host::MountInfo>().Get());
        host->SetMountInfo(mounts.Get());
        ASSERT_GT(StringHeap(host->GetUuid()), 0u);
        EXPECT_EQ(host->_GetSize(f), HostStateSize(*host, f));

        // Down a chain of five classes, the most derived size counts once; a set
        // optional string adds its separate string object and its text.
        auto ft = Make<FtSyncContext>();
        const unsigned int bare = f(sizeof(FtSyncContext)) + f(0);
        EXPECT_EQ(ft->_GetSize(f), bare);
        ft->SetDstVmPathName(std::string("/data/store-1/some/long/path/vm-1/config"));
        const std::string& path = ft->GetDstVmPathName().GetValue();
        EXPECT_EQ(ft->_GetSize(f), bare + f(sizeof(std::string)) + f(StringHeap(path)));
        ft->SetSrcVmState(Make<VmState>().Get());
        EXPECT_EQ(ft->_GetSize(f), bare + f(sizeof(std::string)) + f(StringHeap(path)) + f(sizeof(VmState)) + f(0));

        // The worked example: an unset TraceResult is its bare object.
        auto trace = Make<Tarn::DebugManager::TraceResult>();
        EXPECT_EQ(trace->_GetSize(f), trace->Orbit::DynamicData::_GetSize(f) - f(sizeof(Orbit::DynamicData)) +
                                          f(sizeof(Tarn::DebugManager::TraceResult)));
    }
}

}  // namespace
