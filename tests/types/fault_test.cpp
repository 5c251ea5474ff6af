// The catalogue's fault class: thrown, caught at every level of its exception's
// hierarchy, cloned, and reached through its record.
#include <gtest/gtest.h>

#include <memory>
#include <string>

#include "support.h"
#include "tarn/fault.h"

using Kernite::Ref;
using Orbit::MethodFault;
using Tarn::Fault::SecurityConfigFault;
using namespace TypesTest;

namespace {

class FaultTest : public NoLeakTest {};

TEST_F(FaultTest, ThrowIsCaughtAtEveryLevelWithTheSameFault) {
    auto fault = Make<SecurityConfigFault>();
    fault->SetMsg("certificate expired");
    const int held = fault->GetRefCount();

    try {
        fault->Throw();
    } catch (const SecurityConfigFault::Exception& e) {
        EXPECT_EQ(typeid(e), typeid(SecurityConfigFault::Exception));
        EXPECT_EQ(e.GetFault(), fault.Get());
        EXPECT_EQ(fault->GetRefCount(), held + 1);
        EXPECT_STREQ(e.what(), "tarn.fault.SecurityConfigFault");
        EXPECT_EQ(std::string(e.what()), fault->_GetType()->GetName());
    }
    EXPECT_EQ(fault->GetRefCount(), held);

    try {
        fault->Throw();
    } catch (const MethodFault::Exception& e) {
        EXPECT_EQ(typeid(e), typeid(SecurityConfigFault::Exception));
        EXPECT_EQ(e.GetFault(), fault.Get());
        EXPECT_EQ(fault->GetRefCount(), held + 1);
    }

    try {
        MethodFault* asBase = fault.Get();
        asBase->Throw();  // virtual: still the fault's own exception
    } catch (const Kernite::Exception& e) {
        auto* carrying = dynamic_cast<const SecurityConfigFault::Exception*>(&e);
        ASSERT_NE(carrying, nullptr) << typeid(e).name();
        EXPECT_EQ(carrying->GetFault(), fault.Get());
        EXPECT_EQ(carrying->GetFault()->GetMsg(), "certificate expired");
    }
    EXPECT_EQ(fault->GetRefCount(), held);
}

TEST_F(FaultTest, ClonesAndCreatedExceptionsShareTheFault) {
    auto fault = Make<SecurityConfigFault>();
    const int held = fault->GetRefCount();

    std::unique_ptr<MethodFault::Exception> created(fault->CreateException());
    ASSERT_NE(created, nullptr);
    EXPECT_EQ(typeid(*created), typeid(SecurityConfigFault::Exception));
    EXPECT_EQ(created->GetFault(), fault.Get());
    EXPECT_STREQ(created->what(), "tarn.fault.SecurityConfigFault");
    EXPECT_EQ(fault->GetRefCount(), held + 1);

    std::unique_ptr<Kernite::Throwable> clone(static_cast<const Kernite::Throwable&>(*created).Clone());
    EXPECT_EQ(typeid(*clone), typeid(SecurityConfigFault::Exception));
    EXPECT_EQ(static_cast<SecurityConfigFault::Exception&>(*clone).GetFault(), fault.Get());
    EXPECT_STREQ(clone->what(), created->what());
    EXPECT_EQ(fault->GetRefCount(), held + 2);

    // A stored exception rethrows as its own class, still reporting the same fault.
    try {
        clone->Throw();
    } catch (const SecurityConfigFault::Exception& e) {
        EXPECT_EQ(e.GetFault(), fault.Get());
        EXPECT_EQ(fault->GetRefCount(), held + 3);
    }
    clone.reset();
    created.reset();
    EXPECT_EQ(fault->GetRefCount(), held);

    // An exception keeps its fault alive after every other holder let go.
    MethodFault::Exception* orphan = fault->CreateException();
    fault = nullptr;
    ASSERT_NE(orphan->GetFault(), nullptr);
    EXPECT_EQ(orphan->GetFault()->GetRefCount(), 1);
    EXPECT_EQ(typeid(*orphan->GetFault()), typeid(SecurityConfigFault));
    delete orphan;
}

TEST_F(FaultTest, CopiesMeasuresAndRecordFunctions) {
    auto cause = Make<MethodFault>();
    cause->SetMsg("root cause");
    auto fault = Make<SecurityConfigFault>();
    fault->SetMsg("outer");
    fault->SetFaultCause(cause.Get());

    Ref<Orbit::Any> clone(fault->_Clone());
    auto* copy = dynamic_cast<SecurityConfigFault*>(clone.Get());
    ASSERT_NE(copy, nullptr);
    EXPECT_EQ(copy->GetMsg(), "outer");
    ASSERT_NE(copy->GetFaultCause(), nullptr);
    EXPECT_NE(copy->GetFaultCause(), cause.Get());
    EXPECT_EQ(copy->GetFaultCause()->GetMsg(), "root cause");
    EXPECT_TRUE(fault->_IsEqual(copy));
    EXPECT_EQ(copy->_GetDataType(), Orbit::GetDoType<SecurityConfigFault>());

    for (Orbit::SizeFunction f : {&Exact, &Rounded})
        EXPECT_EQ(fault->_GetSize(f), fault->MethodFault::_GetSize(f));

    const Orbit::DataTypeInfo* record = RecordOf<SecurityConfigFault>();
    EXPECT_EQ(record->base, &Orbit::gStrataMethodFaultTypeInfo);
    for (int index : {0, 1, 3}) {
        EXPECT_TRUE(record->isPropertySet(fault.Get(), index));
        std::string storage = "untouched";
        record->getProperty(fault.Get(), index, &storage);
        EXPECT_EQ(storage, "untouched");
        record->setProperty(fault.Get(), index, &storage);
        record->unsetProperty(fault.Get(), index);
    }
    EXPECT_EQ(fault->GetMsg(), "outer");
    EXPECT_EQ(fault->GetFaultCause(), cause.Get());
    // The runtime's base fault is not a SecurityConfigFault.
    EXPECT_EQ(MessageOf<Kernite::TypeMismatchException>([&] { record->isPropertySet(cause.Get(), 0); }),
              (MismatchText<SecurityConfigFault, Orbit::DataObject>()));

    Ref<Orbit::DataObject> made(record->createInstance());
    EXPECT_EQ(typeid(*made), typeid(SecurityConfigFault));
    Ref<Orbit::Any> array(record->createArray());
    auto* faults = dynamic_cast<Orbit::DataArray<SecurityConfigFault>*>(array.Get());
    ASSERT_NE(faults, nullptr);
    EXPECT_TRUE(faults->IsEmpty());
}

}  // namespace
