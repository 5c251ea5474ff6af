// The six record functions of the generated data types, reached as the runtime
// reaches them: through the type object's DataTypeInfo, by own-property index.
#include <gtest/gtest.h>

#include <string>
#include <vector>

#include "support.h"
#include "tarn/alarmTester.h"
#include "tarn/backup.h"
#include "tarn/cnxmgr.h"
#include "tarn/fault.h"
#include "tarn/faultInjector.h"
#include "tarn/ft.h"
#include "tarn/profiler.h"
#include "tarn/tarn.h"
#include "tarn/vmprov.h"

using Kernite::NotInitializedException;
using Kernite::Optional;
using Kernite::Ref;
using Kernite::System::DateTime;
using Orbit::Any;
using Orbit::Array;
using Orbit::DataArray;
using Orbit::DataObject;
using Orbit::DataTypeInfo;
using Orbit::KeyAnyValue;
using Orbit::MoRef;
using Orbit::Primitive;
using namespace Tarn::Vmprov;
using namespace TypesTest;

namespace {

class RecordTest : public NoLeakTest {};

template <class V>
V Read(const DataTypeInfo* record, DataObject* object, int index) {
    V value{};
    record->getProperty(object, index, &value);
    return value;
}

Ref<Any> ReadRef(const DataTypeInfo* record, DataObject* object, int index) {
    Ref<Any> value;
    record->getProperty(object, index, &value);
    return value;
}

template <class V>
void Write(const DataTypeInfo* record, DataObject* object, int index, const V& value) {
    record->setProperty(object, index, &value);
}

void WriteObject(const DataTypeInfo* record, DataObject* object, int index, Any* value) {
    record->setProperty(object, index, value);
}

TEST_F(RecordTest, OptionalScalarsAndStringsAreSetReadAndUnset) {
    const DataTypeInfo* record = RecordOf<Tarn::Profiler::Metadata>();
    auto meta = Make<Tarn::Profiler::Metadata>();
    EXPECT_TRUE(record->isPropertySet(meta.Get(), 0));  // a required string is always set
    EXPECT_FALSE(record->isPropertySet(meta.Get(), 2));
    EXPECT_EQ(MessageOf<NotInitializedException>([&] { Read<long long>(record, meta.Get(), 2); }),
              "optional value not set");

    Write<long long>(record, meta.Get(), 2, -(1LL << 50));
    EXPECT_TRUE(record->isPropertySet(meta.Get(), 2));
    EXPECT_EQ(meta->GetMinValue().GetValue(), -(1LL << 50));
    EXPECT_EQ(Read<long long>(record, meta.Get(), 2), -(1LL << 50));
    EXPECT_FALSE(meta->GetMaxValue().IsSet());  // its neighbour is untouched
    record->unsetProperty(meta.Get(), 2);
    EXPECT_FALSE(meta->GetMinValue().IsSet());

    meta->SetName("cpu.ready");
    record->unsetProperty(meta.Get(), 0);  // nothing to unset on a required string
    EXPECT_EQ(Read<std::string>(record, meta.Get(), 0), "cpu.ready");

    const DataTypeInfo* uplink = RecordOf<Tarn::Backup::Entity::UplinkPortConfig>();
    auto port = Make<Tarn::Backup::Entity::UplinkPortConfig>();
    EXPECT_FALSE(uplink->isPropertySet(port.Get(), 2));
    EXPECT_EQ(MessageOf<NotInitializedException>([&] { Read<std::string>(uplink, port.Get(), 2); }),
              "Not initialized");
    Write<std::string>(uplink, port.Get(), 2, "vmnic1");
    EXPECT_EQ(port->GetPnicDevice().GetValue(), "vmnic1");
    EXPECT_TRUE(uplink->isPropertySet(port.Get(), 2));
    EXPECT_FALSE(uplink->isPropertySet(port.Get(), 3));
    uplink->unsetProperty(port.Get(), 2);
    EXPECT_FALSE(port->GetPnicDevice().IsSet());
}

TEST_F(RecordTest, ReferencesAreSharedAndOptionalOnesUnset) {
    const DataTypeInfo* record = RecordOf<Tarn::Cnxmgr::ConnectionState>();
    auto state = Make<Tarn::Cnxmgr::ConnectionState>(nullptr);
    EXPECT_FALSE(record->isPropertySet(state.Get(), 0));
    Ref<Any> held(new Primitive<int>(1));  // overwritten with null, not left alone
    record->getProperty(state.Get(), 0, &held);
    EXPECT_EQ(held, nullptr);

    auto sic = Make<Cairn::ServiceInstanceContent>();
    WriteObject(record, state.Get(), 0, sic.Get());
    EXPECT_EQ(state->GetSic(), sic.Get());
    EXPECT_EQ(sic->GetRefCount(), 2);
    {
        Ref<Any> read = ReadRef(record, state.Get(), 0);
        EXPECT_EQ(read.Get(), sic.Get());
        EXPECT_EQ(sic->GetRefCount(), 3);
    }
    // A value of another class is refused and changes nothing.
    auto stranger = Make<Cairn::TaskInfo>();
    EXPECT_EQ(MessageOf<Kernite::TypeMismatchException>([&] { WriteObject(record, state.Get(), 0, stranger.Get()); }),
              (MismatchText<Cairn::ServiceInstanceContent, Any>()));
    EXPECT_EQ(state->GetSic(), sic.Get());
    record->unsetProperty(state.Get(), 0);
    EXPECT_EQ(state->GetSic(), nullptr);
    EXPECT_EQ(sic->GetRefCount(), 1);

    // A required reference reports whether it is there; unset leaves it.
    const DataTypeInfo* faultRecord = RecordOf<Tarn::FaultInjector::Fault>();
    auto fault = Make<Tarn::FaultInjector::Fault>();
    EXPECT_FALSE(faultRecord->isPropertySet(fault.Get(), 2));
    WriteObject(faultRecord, fault.Get(), 2, Make<Tarn::FaultInjector::NameTarget>(std::string("svc-a")).Get());
    EXPECT_TRUE(faultRecord->isPropertySet(fault.Get(), 2));
    faultRecord->unsetProperty(fault.Get(), 2);
    ASSERT_NE(fault->GetTarget(), nullptr);
    EXPECT_EQ(static_cast<Tarn::FaultInjector::NameTarget*>(fault->GetTarget())->GetName(), "svc-a");
    WriteObject(faultRecord, fault.Get(), 2, nullptr);  // null clears it
    EXPECT_EQ(fault->GetTarget(), nullptr);
}

TEST_F(RecordTest, ArraysCountAsSetOnlyWhenTheyHoldItems) {
    const DataTypeInfo* record = RecordOf<Tarn::Ft::FtVmInfo>();
    auto info = Make<Tarn::Ft::FtVmInfo>();
    EXPECT_FALSE(record->isPropertySet(info.Get(), 1));
    Ref<Any> read = ReadRef(record, info.Get(), 1);  // created on first read
    ASSERT_NE(read, nullptr);
    EXPECT_EQ(read.Get(), info->GetSecondaryVmList());
    EXPECT_FALSE(record->isPropertySet(info.Get(), 1));
    info->GetSecondaryVmList()->Append(Make<Tarn::Ft::FtVmInfo::SecondaryVmData>().Get());
    EXPECT_TRUE(record->isPropertySet(info.Get(), 1));
    record->unsetProperty(info.Get(), 1);  // required: stays as it is
    EXPECT_EQ(info->GetSecondaryVmList(), read.Get());
    EXPECT_EQ(info->GetSecondaryVmList()->GetLength(), 1);

    // Copying a list that was never created creates none.
    auto fresh = Make<Tarn::Ft::FtVmInfo>();
    Ref<Tarn::Ft::FtVmInfo> freshCopy(new Tarn::Ft::FtVmInfo(*fresh));
    EXPECT_EQ(freshCopy->_GetSize(Exact), fresh->_GetSize(Exact));

    // An optional array is replaced by a new, empty one.
    const DataTypeInfo* traceRecord = RecordOf<Tarn::DebugManager::TraceResult>();
    auto trace = Make<Tarn::DebugManager::TraceResult>();
    Ref<DataArray<KeyAnyValue>> entries(new DataArray<KeyAnyValue>{Make<KeyAnyValue>().Get()});
    WriteObject(traceRecord, trace.Get(), 3, entries.Get());
    EXPECT_EQ(trace->GetTraceInfo(), entries.Get());
    EXPECT_TRUE(traceRecord->isPropertySet(trace.Get(), 3));
    traceRecord->unsetProperty(trace.Get(), 3);
    EXPECT_FALSE(traceRecord->isPropertySet(trace.Get(), 3));
    EXPECT_NE(trace->GetTraceInfo(), entries.Get());
    EXPECT_EQ(trace->GetTraceInfo()->GetLength(), 0);
    EXPECT_EQ(entries->GetLength(), 1);  // the old array was released, not emptied
    EXPECT_EQ(entries->GetRefCount(), 1);

    // Unset on an optional array that was never read leaves an empty array too.
    auto names = Make<Tarn::Profiler::Query::NamesInfo>();
    RecordOf<Tarn::Profiler::Query::NamesInfo>()->unsetProperty(names.Get(), 0);
    EXPECT_FALSE(RecordOf<Tarn::Profiler::Query::NamesInfo>()->isPropertySet(names.Get(), 0));
    EXPECT_EQ(names->GetNames()->GetLength(), 0);
}

TEST_F(RecordTest, EnumerationsTravelAsIntegersWithinTheirTags) {
    const DataTypeInfo* record = RecordOf<Tarn::Profiler::Metadata>();
    auto meta = Make<Tarn::Profiler::Metadata>(std::string("mem.active"), Tarn::Profiler::CounterType::gauge64,
                                               Optional<long long>(), Optional<long long>());
    EXPECT_EQ(Read<int>(record, meta.Get(), 1), 1);
    Write<int>(record, meta.Get(), 1, 0);
    EXPECT_EQ(meta->GetType(), Tarn::Profiler::CounterType::counter64);
    EXPECT_EQ(MessageOf<Kernite::InvalidArgumentException>([&] { Write<int>(record, meta.Get(), 1, 2); }),
              "Invalid argument : 2");
    EXPECT_EQ(MessageOf<Kernite::InvalidArgumentException>([&] { Write<int>(record, meta.Get(), 1, -1); }),
              "Invalid argument : -1");
    EXPECT_EQ(meta->GetType(), Tarn::Profiler::CounterType::counter64);

    // An enumeration of another library is bounded by its own tag count.
    const DataTypeInfo* migrate = RecordOf<MigrateContext>();
    auto ctx = Make<MigrateContext>();
    Write<int>(migrate, ctx.Get(), 1, 2);
    EXPECT_EQ(ctx->GetPriority(), Cairn::VirtualMachine::MovePriority::defaultPriority);
    EXPECT_EQ(MessageOf<Kernite::InvalidArgumentException>([&] { Write<int>(migrate, ctx.Get(), 1, 3); }),
              "Invalid argument : 3");
    EXPECT_EQ(ctx->GetPriority(), Cairn::VirtualMachine::MovePriority::defaultPriority);
}

TEST_F(RecordTest, IndicesPastTheOwnPropertiesDoNothing) {
    const DataTypeInfo* record = RecordOf<Tarn::Profiler::Metadata>();
    auto meta = Make<Tarn::Profiler::Metadata>(std::string("x"), Tarn::Profiler::CounterType::counter64,
                                               Optional<long long>(1), Optional<long long>());
    Ref<Tarn::Profiler::Metadata> before(new Tarn::Profiler::Metadata(*meta));
    for (int index : {4, 5, 1000, -1}) {
        SCOPED_TRACE(index);
        EXPECT_TRUE(record->isPropertySet(meta.Get(), index));
        long long storage = 12345;
        record->getProperty(meta.Get(), index, &storage);
        EXPECT_EQ(storage, 12345);
        record->setProperty(meta.Get(), index, &storage);
        record->unsetProperty(meta.Get(), index);
        EXPECT_TRUE(meta->_IsEqual(before.Get()));
    }
    // The first own index of a derived type is not its base's property.
    auto ft = Make<FtSyncContext>();
    ft->SetDstCfgFile("own");
    EXPECT_EQ(Read<std::string>(RecordOf<FtSyncContext>(), ft.Get(), 0), "own");
    EXPECT_TRUE(RecordOf<FtSyncContext>()->isPropertySet(ft.Get(), 1));
}

TEST_F(RecordTest, AnObjectOfAnotherClassIsRefused) {
    const DataTypeInfo* record = RecordOf<Tarn::Profiler::Metadata>();
    auto other = Make<Tarn::Profiler::QueryResult>();
    const std::string expected = MismatchText<Tarn::Profiler::Metadata, DataObject>();
    long long storage = 0;
    EXPECT_EQ(MessageOf<Kernite::TypeMismatchException>([&] { record->getProperty(other.Get(), 2, &storage); }),
              expected);
    EXPECT_EQ(MessageOf<Kernite::TypeMismatchException>([&] { record->setProperty(other.Get(), 2, &storage); }),
              expected);
    EXPECT_EQ(MessageOf<Kernite::TypeMismatchException>([&] { record->isPropertySet(other.Get(), 2); }), expected);
    EXPECT_EQ(MessageOf<Kernite::TypeMismatchException>([&] { record->unsetProperty(other.Get(), 2); }), expected);
    EXPECT_FALSE(other->GetValue().IsSet());
    // A base record takes a derived object; a derived record refuses a base one.
    auto base = Make<MigrateContext>();
    EXPECT_TRUE(RecordOf<Context>()->isPropertySet(Make<FtSyncContext>().Get(), 1));
    EXPECT_EQ(MessageOf<Kernite::TypeMismatchException>(
                  [&] { RecordOf<FtSyncContext>()->isPropertySet(base.Get(), 0); }),
              (MismatchText<FtSyncContext, DataObject>()));
    // Types that share a scope but not a base do not narrow to each other.
    auto dvs = Make<Tarn::Backup::Entity::DistributedVirtualSwitch>();
    EXPECT_EQ(MessageOf<Kernite::TypeMismatchException>(
                  [&] { Kernite::NarrowToType<Tarn::Backup::Entity, DataObject>(dvs.Get()); }),
              (MismatchText<Tarn::Backup::Entity, DataObject>()));
}

TEST_F(RecordTest, ATypeWithoutPropertiesStillHasAllSixFunctions) {
    const DataTypeInfo* record = RecordOf<Tarn::Profiler::Query::Info>();
    auto info = Make<Tarn::Profiler::Query::Info>();
    for (int index : {0, 1, 7}) {
        EXPECT_TRUE(record->isPropertySet(info.Get(), index));
        int storage = 77;
        record->getProperty(info.Get(), index, &storage);
        EXPECT_EQ(storage, 77);
        record->setProperty(info.Get(), index, &storage);
        record->unsetProperty(info.Get(), index);
    }
    Ref<DataObject> made(record->createInstance());
    EXPECT_EQ(typeid(*made), typeid(Tarn::Profiler::Query::Info));
    Ref<Any> array(record->createArray());
    auto* typed = dynamic_cast<DataArray<Tarn::Profiler::Query::Info>*>(array.Get());
    ASSERT_NE(typed, nullptr);
    EXPECT_EQ(typed->GetLength(), 0);
    // Its subclasses are created as themselves.
    Ref<DataObject> names(RecordOf<Tarn::Profiler::Query::NamesInfo>()->createInstance());
    EXPECT_EQ(typeid(*names), typeid(Tarn::Profiler::Query::NamesInfo));
    EXPECT_NE((Kernite::NarrowToType<Tarn::Profiler::Query::Info, DataObject>(names.Get())), nullptr);
}

// Every storage kind once: written through the typed accessors and read back
// through the records, then written through the records and read back typed.
struct Everything {
    Ref<FtSyncContext> ft = Make<FtSyncContext>();
    Ref<CloneContext> clone = Make<CloneContext>();
    Ref<Tarn::Profiler::Metadata> meta = Make<Tarn::Profiler::Metadata>();
    Ref<TaskTrackingInfo> task = Make<TaskTrackingInfo>();
    Ref<Tarn::AlarmTester::AlarmChangeInfo> alarm = Make<Tarn::AlarmTester::AlarmChangeInfo>();

    Ref<DataArray<KeyAnyValue>> cbData{new DataArray<KeyAnyValue>{Make<KeyAnyValue>().Get()}};
    Ref<VmState> vmState = Make<VmState>();
    Ref<VmLocation> location = Make<VmLocation>();
    Ref<Cairn::Vm::RelocateSpec> spec = Make<Cairn::Vm::RelocateSpec>();
    Ref<Array<std::string>> macs = Make<Array<std::string>>(std::vector<std::string>{"00:50:56:01:02:03"});
    Ref<MoRef> folder = Mo("Folder", "group-v4");
    Ref<Any> result{new Primitive<std::string>("done")};
    Ref<Orbit::MethodFault> error = Make<Tarn::Fault::SecurityConfigFault>();
    Ref<DataArray<Tarn::AlarmTester::AlarmMetricRuntime>> values{
        new DataArray<Tarn::AlarmTester::AlarmMetricRuntime>{Make<Tarn::AlarmTester::AlarmMetricRuntime>().Get()}};
    const DateTime start = DateTime::FromMicroseconds(86'400'000'000LL * 366);
    const long long migrationId = -(1LL << 41);
};

TEST_F(RecordTest, EveryKindRoundTripsFromAccessorsToRecords) {
    Everything e;
    e.ft->SetCbData(e.cbData.Get());
    e.ft->SetSrcVmState(e.vmState.Get());
    e.ft->SetDstVmPathName(std::string("/d/vm-2/cfg"));
    e.ft->SetDstLocation(e.location.Get());
    e.ft->SetSpec(e.spec.Get());
    e.ft->SetPriority(Cairn::VirtualMachine::MovePriority::defaultPriority);
    e.ft->SetKeelRecommended(true);
    e.ft->SetMigrationId(e.migrationId);
    e.ft->SetChangeDiskDatastore(false);
    e.ft->SetStartTime(e.start);
    e.ft->SetNumGlideDisks(-3);
    e.ft->SetDstCfgFile("/dst/ft.cfg");
    e.clone->SetMacAssignmentData(e.macs.Get());
    e.clone->SetFolder(e.folder.Get());
    e.clone->SetSanitizedName(std::string("clone%20one"));
    e.clone->SetQuiverClone(true);
    e.meta->SetType(Tarn::Profiler::CounterType::gauge64);
    e.meta->SetMaxValue(1LL << 45);
    e.task->SetContribution(42);
    e.task->SetAbortOnFailure(true);
    e.task->SetResult(e.result.Get());
    e.task->SetError(e.error.Get());
    e.alarm->SetTime(e.start);
    e.alarm->SetValues(e.values.Get());

    FtSyncContext* ft = e.ft.Get();
    EXPECT_EQ(ReadRef(RecordOf<Context>(), ft, 0).Get(), e.cbData.Get());
    EXPECT_EQ(ReadRef(RecordOf<VmContext>(), ft, 0).Get(), e.vmState.Get());
    EXPECT_EQ(ReadRef(RecordOf<VmContext>(), ft, 1), nullptr);
    EXPECT_EQ(Read<std::string>(RecordOf<MobilityContext>(), ft, 0), "/d/vm-2/cfg");
    EXPECT_EQ(ReadRef(RecordOf<MobilityContext>(), ft, 1).Get(), e.location.Get());
    const DataTypeInfo* migrate = RecordOf<MigrateContext>();
    {
        Ref<Any> spec = ReadRef(migrate, ft, 0);
        EXPECT_EQ(spec.Get(), e.spec.Get());
        EXPECT_EQ(e.spec->GetRefCount(), 3);  // ours, the member's, the reader's
    }
    EXPECT_EQ(Read<int>(migrate, ft, 1), 2);
    EXPECT_TRUE(Read<bool>(migrate, ft, 2));
    EXPECT_EQ(Read<long long>(migrate, ft, 3), e.migrationId);
    EXPECT_TRUE(migrate->isPropertySet(ft, 4));
    EXPECT_FALSE(Read<bool>(migrate, ft, 4));
    EXPECT_EQ(Read<DateTime>(migrate, ft, 5), e.start);
    EXPECT_FALSE(migrate->isPropertySet(ft, 6));
    EXPECT_EQ(Read<int>(migrate, ft, 8), -3);
    EXPECT_EQ(Read<std::string>(RecordOf<FtSyncContext>(), ft, 0), "/dst/ft.cfg");

    const DataTypeInfo* clone = RecordOf<CloneContext>();
    EXPECT_EQ(Read<std::string>(clone, e.clone.Get(), 2), "clone%20one");
    EXPECT_EQ(ReadRef(clone, e.clone.Get(), 3).Get(), e.folder.Get());
    EXPECT_TRUE(Read<bool>(clone, e.clone.Get(), 8));
    EXPECT_EQ(ReadRef(clone, e.clone.Get(), 9).Get(), e.macs.Get());
    EXPECT_EQ(Read<int>(RecordOf<Tarn::Profiler::Metadata>(), e.meta.Get(), 1), 1);
    EXPECT_EQ(Read<long long>(RecordOf<Tarn::Profiler::Metadata>(), e.meta.Get(), 3), 1LL << 45);
    const DataTypeInfo* task = RecordOf<TaskTrackingInfo>();
    EXPECT_EQ(Read<int>(task, e.task.Get(), 2), 42);
    EXPECT_TRUE(Read<bool>(task, e.task.Get(), 3));
    EXPECT_EQ(ReadRef(task, e.task.Get(), 4).Get(), e.result.Get());
    EXPECT_EQ(ReadRef(task, e.task.Get(), 5).Get(), e.error.Get());
    EXPECT_FALSE(task->isPropertySet(e.task.Get(), 0));
    const DataTypeInfo* alarm = RecordOf<Tarn::AlarmTester::AlarmChangeInfo>();
    EXPECT_EQ(Read<DateTime>(alarm, e.alarm.Get(), 1), e.start);
    EXPECT_EQ(ReadRef(alarm, e.alarm.Get(), 2).Get(), e.values.Get());
}

TEST_F(RecordTest, EveryKindRoundTripsFromRecordsToAccessors) {
    Everything e;
    FtSyncContext* ft = e.ft.Get();
    WriteObject(RecordOf<Context>(), ft, 0, e.cbData.Get());
    WriteObject(RecordOf<VmContext>(), ft, 0, e.vmState.Get());
    Write<std::string>(RecordOf<MobilityContext>(), ft, 0, "/d/vm-2/cfg");
    WriteObject(RecordOf<MobilityContext>(), ft, 1, e.location.Get());
    const DataTypeInfo* migrate = RecordOf<MigrateContext>();
    WriteObject(migrate, ft, 0, e.spec.Get());
    Write<int>(migrate, ft, 1, 1);
    Write<bool>(migrate, ft, 2, true);
    Write<long long>(migrate, ft, 3, e.migrationId);
    Write<bool>(migrate, ft, 4, false);
    Write<DateTime>(migrate, ft, 5, e.start);
    Write<int>(migrate, ft, 8, 6);
    Write<std::string>(RecordOf<FtSyncContext>(), ft, 0, "/dst/ft.cfg");

    EXPECT_EQ(ft->GetCbData(), e.cbData.Get());
    EXPECT_EQ(ft->GetSrcVmState(), e.vmState.Get());
    EXPECT_EQ(ft->GetDstVmPathName().GetValue(), "/d/vm-2/cfg");
    EXPECT_EQ(ft->GetDstLocation(), e.location.Get());
    EXPECT_EQ(ft->GetSpec(), e.spec.Get());
    EXPECT_EQ(ft->GetPriority(), Cairn::VirtualMachine::MovePriority::highPriority);
    EXPECT_TRUE(ft->GetKeelRecommended());
    EXPECT_EQ(ft->GetMigrationId(), e.migrationId);
    ASSERT_TRUE(ft->GetChangeDiskDatastore().IsSet());
    EXPECT_FALSE(ft->GetChangeDiskDatastore().GetValue());
    EXPECT_EQ(ft->GetStartTime().GetValue(), e.start);
    EXPECT_EQ(ft->GetNumGlideDisks().GetValue(), 6);
    EXPECT_EQ(ft->GetDstCfgFile(), "/dst/ft.cfg");

    const DataTypeInfo* clone = RecordOf<CloneContext>();
    Write<std::string>(clone, e.clone.Get(), 2, "sanitized");
    WriteObject(clone, e.clone.Get(), 3, e.folder.Get());
    Write<bool>(clone, e.clone.Get(), 8, false);
    WriteObject(clone, e.clone.Get(), 9, e.macs.Get());
    EXPECT_EQ(e.clone->GetSanitizedName().GetValue(), "sanitized");
    EXPECT_EQ(e.clone->GetFolder(), e.folder.Get());
    EXPECT_FALSE(e.clone->GetQuiverClone().GetValue());
    EXPECT_EQ(e.clone->GetMacAssignmentData(), e.macs.Get());

    Write<int>(RecordOf<Tarn::Profiler::Metadata>(), e.meta.Get(), 1, 1);
    Write<long long>(RecordOf<Tarn::Profiler::Metadata>(), e.meta.Get(), 3, 9);
    EXPECT_EQ(e.meta->GetType(), Tarn::Profiler::CounterType::gauge64);
    EXPECT_EQ(e.meta->GetMaxValue().GetValue(), 9);

    const DataTypeInfo* task = RecordOf<TaskTrackingInfo>();
    WriteObject(task, e.task.Get(), 0, e.folder.Get());
    Write<int>(task, e.task.Get(), 2, -8);
    Write<bool>(task, e.task.Get(), 3, true);
    WriteObject(task, e.task.Get(), 4, e.result.Get());
    WriteObject(task, e.task.Get(), 5, e.error.Get());
    EXPECT_EQ(e.task->GetTask(), e.folder.Get());
    EXPECT_EQ(e.task->GetContribution(), -8);
    EXPECT_TRUE(e.task->GetAbortOnFailure());
    EXPECT_EQ(e.task->GetResult(), e.result.Get());
    EXPECT_EQ(e.task->GetError(), e.error.Get());
    // A fault property takes any fault, but nothing else.
    EXPECT_EQ(MessageOf<Kernite::TypeMismatchException>([&] { WriteObject(task, e.task.Get(), 5, e.folder.Get()); }),
              (MismatchText<Orbit::MethodFault, Any>()));

    const DataTypeInfo* alarm = RecordOf<Tarn::AlarmTester::AlarmChangeInfo>();
    Write<DateTime>(alarm, e.alarm.Get(), 1, e.start);
    WriteObject(alarm, e.alarm.Get(), 2, e.values.Get());
    EXPECT_EQ(e.alarm->GetTime().GetValue(), e.start);
    EXPECT_EQ(e.alarm->GetValues(), e.values.Get());
    // An array of another item class is refused.
    EXPECT_EQ(MessageOf<Kernite::TypeMismatchException>([&] { WriteObject(alarm, e.alarm.Get(), 2, e.cbData.Get()); }),
              (MismatchText<DataArray<Tarn::AlarmTester::AlarmMetricRuntime>, Any>()));
    EXPECT_EQ(e.alarm->GetValues(), e.values.Get());
}

TEST_F(RecordTest, EqualityAndDifferencesWalkTheWholeChain) {
    auto source = Make<FtSyncContext>();
    source->SetSrcVmState(Make<VmState>(Mo("VirtualMachine", "vm-1").Get(), std::string("/a/cfg"),
                                        Cairn::VirtualMachine::PowerState::poweredOff, nullptr, nullptr, nullptr,
                                        nullptr)
                              .Get());
    source->SetDstCfgFile("/a.cfg");
    source->SetNumGlideDisks(2);
    Ref<FtSyncContext> copy(new FtSyncContext(*source));
    EXPECT_TRUE(source->_IsEqual(copy.Get()));
    EXPECT_TRUE(copy->_IsEqual(source.Get()));

    copy->GetSrcVmState()->SetVmPathName("/b/cfg");
    copy->SetNumGlideDisks(Optional<int>());
    copy->SetDstCfgFile("/b.cfg");
    EXPECT_FALSE(source->_IsEqual(copy.Get()));
    Orbit::PropertyDiffSet diffs;
    source->_DiffProperties(copy.Get(), "ctx", diffs);
    EXPECT_EQ(diffs.GetPaths(),
              (std::vector<std::string>{"ctx.srcVmState.vmPathName", "ctx.numGlideDisks", "ctx.dstCfgFile"}));

    // Same values in a base-class object: not equal when the classes must match.
    Ref<MigrateContext> base(new MigrateContext(*source));
    EXPECT_FALSE(source->_IsEqual(base.Get()));
}

}  // namespace
