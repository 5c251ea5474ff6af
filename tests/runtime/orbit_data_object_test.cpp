#include <gtest/gtest.h>

#include <functional>
#include <memory>

#include "expect.h"
#include "fixtures.h"

using Kernite::ObjectImpl;
using Kernite::Ref;
using Kernite::System::DateTime;
using Orbit::Any;
using Orbit::DataArray;
using Orbit::KeyAnyValue;
using Orbit::MethodFault;
using Orbit::PropertyDiffSet;
using Sample::Circle;
using Sample::Color;
using Sample::Shape;
using TestSupport::MessageOf;

namespace {

unsigned int Identity(unsigned int n) { return n; }
unsigned int Rounded(unsigned int n) { return (n + 15) / 16 * 16; }

Ref<Shape> Named(const std::string& label) {
    Ref<Shape> shape(new Shape());
    shape->SetLabel(label);
    return shape;
}

// A shape with every property set.
Ref<Shape> Full() {
    Ref<Shape> shape = Named("full");
    shape->SetNote(std::string("note"));
    shape->SetCount(3);
    shape->SetWeight(40);
    shape->SetSeen(DateTime::Parse("2026-12-06T09:49:01Z"));
    shape->SetColor(Color::Blue);
    shape->SetNext(Named("inner").Get());
    shape->SetExtra(Ref<Any>(new Orbit::Primitive<std::string>("extra")).Get());
    shape->SetOwner(Ref<Orbit::MoRef>(new Orbit::MoRef("test.Calculator", "calc-1")).Get());
    shape->SetTags(Ref<Orbit::Array<std::string>>(new Orbit::Array<std::string>{"a", "b"}).Get());
    shape->SetChildren(Ref<DataArray<Shape>>(new DataArray<Shape>{Named("c0").Get(), Named("c1").Get()}).Get());
    return shape;
}

std::vector<std::string> Diff(Any* a, Any* b, const std::string& path) {
    PropertyDiffSet diffs;
    a->_DiffProperties(b, path, diffs);
    return diffs.GetPaths();
}

using DataObjectTest = Sample::NoLeakTest;

TEST_F(DataObjectTest, EqualityAndDifferencesCoverEveryPropertyKind) {
    Ref<Shape> full = Full();
    EXPECT_TRUE(full->_IsEqual(Full().Get()));
    EXPECT_TRUE(Diff(full.Get(), Full().Get(), "shape").empty());

    struct Change {
        std::string path;
        std::function<void(Shape*)> apply;
    };
    const Change changes[] = {
        {"label", [](Shape* s) { s->SetLabel("other"); }},
        {"note", [](Shape* s) { s->SetNote(Kernite::Optional<std::string>()); }},
        {"count", [](Shape* s) { s->SetCount(4); }},
        {"weight", [](Shape* s) { s->SetWeight(41); }},
        {"seen", [](Shape* s) { s->SetSeen(DateTime::Parse("2026-12-06T09:49:02Z")); }},
        {"color", [](Shape* s) { s->SetColor(Color::Red); }},
        {"next.label", [](Shape* s) { s->GetNext()->SetLabel("moved"); }},
        {"next", [](Shape* s) { s->SetNext(nullptr); }},
        {"extra", [](Shape* s) { s->SetExtra(Ref<Any>(new Orbit::Primitive<int>(1)).Get()); }},
        {"owner", [](Shape* s) { s->SetOwner(Ref<Orbit::MoRef>(new Orbit::MoRef("test.Calculator", "x")).Get()); }},
        {"tags", [](Shape* s) { s->GetTags()->Append("c"); }},
        {"children[1].count", [](Shape* s) { s->GetChildren()->GetAt(1)->SetCount(9); }},
        {"children", [](Shape* s) { s->SetChildren(nullptr); }},
    };
    for (const Change& change : changes) {
        Ref<Shape> changed(static_cast<Shape*>(full->_Clone()));
        ASSERT_TRUE(changed->_IsEqual(full.Get())) << change.path;
        change.apply(changed.Get());
        EXPECT_FALSE(full->_IsEqual(changed.Get())) << change.path;
        EXPECT_FALSE(changed->_IsEqual(full.Get())) << change.path;
        EXPECT_EQ(Diff(full.Get(), changed.Get(), "shape"), std::vector<std::string>{"shape." + change.path});
    }
}

TEST_F(DataObjectTest, ComparisonFollowsTheBaseChainAndTheType) {
    Ref<Circle> circle(new Circle());
    circle->SetLabel("round");
    circle->SetRadius(2.5);
    Ref<Circle> other(static_cast<Circle*>(circle->_Clone()));
    EXPECT_TRUE(circle->_IsEqual(other.Get()));

    other->SetLabel("square");  // a property of the base
    other->SetRadius(3);
    EXPECT_FALSE(circle->_IsEqual(other.Get()));
    EXPECT_EQ(Diff(circle.Get(), other.Get(), "c"), (std::vector<std::string>{"c.label", "c.radius"}));

    Ref<Shape> plain = Named("round");
    EXPECT_FALSE(circle->_IsEqual(plain.Get()));
    EXPECT_FALSE(plain->_IsEqual(circle.Get()));
    EXPECT_TRUE(circle->_IsEqual(plain.Get(), false));  // not exact: the shared properties decide
    EXPECT_TRUE(plain->_IsEqual(circle.Get(), false));
    EXPECT_EQ(Diff(circle.Get(), plain.Get(), "c"), std::vector<std::string>{"c"});
    EXPECT_EQ(Diff(circle.Get(), other.Get(), ""), (std::vector<std::string>{"label", "radius"}));

    Ref<Orbit::MoRef> notData(new Orbit::MoRef("test.Calculator", "c"));
    EXPECT_FALSE(plain->_IsEqual(notData.Get()));

    // An array never read and one read but empty are both unset.
    Ref<Shape> read = Named("round");
    read->GetChildren();
    EXPECT_TRUE(read->_IsEqual(plain.Get()));
}

TEST_F(DataObjectTest, CopiesShareNothing) {
    Ref<Shape> full = Full();
    Ref<Shape> copy(new Shape(*full));
    EXPECT_TRUE(copy->_IsEqual(full.Get()));
    EXPECT_NE(copy->GetNext(), full->GetNext());
    EXPECT_NE(copy->GetOwner(), full->GetOwner());
    EXPECT_NE(copy->GetTags(), full->GetTags());
    EXPECT_NE(copy->GetChildren()->GetAt(0), full->GetChildren()->GetAt(0));
    EXPECT_NE(&copy->GetNote().GetValue(), &full->GetNote().GetValue());
    EXPECT_EQ(copy->GetExtra(), full->GetExtra());  // boxes are immutable and shared

    copy->GetNext()->SetLabel("changed");
    EXPECT_EQ(full->GetNext()->GetLabel(), "inner");

    Ref<Shape> bare(new Shape(*Named("bare")));
    EXPECT_FALSE(bare->GetNote().IsSet());
    EXPECT_FALSE(bare->GetWeight().IsSet());
}

TEST_F(DataObjectTest, FaultRecordFunctionsFollowTheStorageRules) {
    Orbit::DataObjectType* type = Orbit::GetDoType<MethodFault>();
    const Orbit::DataTypeInfo* info = type->GetDataTypeInfo();
    ASSERT_EQ(type->GetProperties().size(), 3u);
    EXPECT_EQ(type->GetProperties()[0].name, "msg");
    EXPECT_EQ(type->GetProperties()[1].name, "faultCause");
    EXPECT_EQ(type->GetProperties()[2].name, "faultData");

    Ref<MethodFault> fault(new MethodFault());
    EXPECT_TRUE(info->isPropertySet(fault.Get(), 0));
    EXPECT_FALSE(info->isPropertySet(fault.Get(), 1));
    EXPECT_FALSE(info->isPropertySet(fault.Get(), 2));
    EXPECT_TRUE(info->isPropertySet(fault.Get(), 3));

    const std::string msg = "broken";
    info->setProperty(fault.Get(), 0, &msg);
    std::string read;
    info->getProperty(fault.Get(), 0, &read);
    EXPECT_EQ(read, "broken");

    Ref<Sample::BadRequest> cause(new Sample::BadRequest());
    info->setProperty(fault.Get(), 1, static_cast<Any*>(cause.Get()));
    Ref<Any> held;
    info->getProperty(fault.Get(), 1, &held);
    EXPECT_EQ(held.Get(), cause.Get());
    EXPECT_EQ(cause->GetRefCount(), 3);
    Ref<KeyAnyValue> wrong(new KeyAnyValue("k", nullptr));
    EXPECT_THROW(info->setProperty(fault.Get(), 1, static_cast<Any*>(wrong.Get())), Kernite::TypeMismatchException);
    EXPECT_EQ(fault->GetFaultCause(), cause.Get());
    info->unsetProperty(fault.Get(), 1);
    EXPECT_EQ(fault->GetFaultCause(), nullptr);

    Ref<DataArray<KeyAnyValue>> data(new DataArray<KeyAnyValue>{wrong.Get()});
    info->setProperty(fault.Get(), 2, static_cast<Any*>(data.Get()));
    EXPECT_TRUE(info->isPropertySet(fault.Get(), 2));
    info->unsetProperty(fault.Get(), 2);  // an optional array: replaced by a new, empty one
    EXPECT_NE(fault->GetFaultData(), data.Get());
    EXPECT_FALSE(info->isPropertySet(fault.Get(), 2));
    EXPECT_EQ(data->GetLength(), 1);

    std::string untouched = "same";
    info->getProperty(fault.Get(), 5, &untouched);
    EXPECT_EQ(untouched, "same");

    Orbit::DataObjectType* pairType = Orbit::GetDoType<KeyAnyValue>();
    const Orbit::DataTypeInfo* pairs = pairType->GetDataTypeInfo();
    EXPECT_EQ(pairType->GetBaseType(), Orbit::GetType<Orbit::DynamicData>());
    Ref<KeyAnyValue> pair(new KeyAnyValue());
    EXPECT_FALSE(pairs->isPropertySet(pair.Get(), 1));
    pairs->setProperty(pair.Get(), 1, static_cast<Any*>(cause.Get()));
    EXPECT_TRUE(pairs->isPropertySet(pair.Get(), 1));
    pairs->unsetProperty(pair.Get(), 1);  // required: stays
    EXPECT_EQ(pair->GetValue(), cause.Get());
    EXPECT_THROW(pairs->getProperty(fault.Get(), 0, &read), Kernite::TypeMismatchException);

    Ref<Any> created(Orbit::GetDoType<Sample::BadRequest>()->CreateArray());
    EXPECT_EQ(created->_GetType()->GetName(), "test.BadRequest[]");
}

TEST_F(DataObjectTest, ThrownFaultsTravelInsideTheirOwnExceptionClass) {
    Ref<MethodFault> fault(new MethodFault());
    try {
        fault->Throw();
    } catch (const MethodFault::Exception& e) {
        EXPECT_EQ(typeid(e), typeid(MethodFault::Exception));
        EXPECT_EQ(e.GetFault(), fault.Get());
        EXPECT_EQ(fault->GetRefCount(), 2);
        EXPECT_STREQ(e.what(), "strata.MethodFault");
    }
    EXPECT_EQ(fault->GetRefCount(), 1);

    Ref<Sample::BadRequest> bad(new Sample::BadRequest());
    bad->SetMsg("no");
    EXPECT_EQ(MessageOf<Sample::BadRequest::Exception>([&] { bad->Throw(); }), "test.BadRequest");
    EXPECT_THROW(bad->Throw(), MethodFault::Exception);
    EXPECT_THROW(bad->Throw(), Kernite::Exception);

    std::unique_ptr<MethodFault::Exception> created(static_cast<MethodFault*>(bad.Get())->CreateException());
    EXPECT_EQ(typeid(*created), typeid(Sample::BadRequest::Exception));
    std::unique_ptr<Kernite::Exception> clone(static_cast<const Kernite::Exception&>(*created).Clone());
    EXPECT_EQ(typeid(*clone), typeid(Sample::BadRequest::Exception));
    EXPECT_EQ(static_cast<MethodFault::Exception&>(*clone).GetFault(), bad.Get());
    EXPECT_EQ(bad->GetRefCount(), 3);
    EXPECT_EQ(MessageOf<Sample::BadRequest::Exception>([&] { clone->Throw(); }), "test.BadRequest");
}

TEST_F(DataObjectTest, FaultCopiesAndSizes) {
    Ref<MethodFault> fault(new MethodFault("outer", Ref<Sample::BadRequest>(new Sample::BadRequest()).Get(), nullptr));
    Ref<KeyAnyValue> pair(new KeyAnyValue("key", Named("value").Get()));
    fault->GetFaultData()->Append(pair.Get());

    Ref<MethodFault> copy(static_cast<MethodFault*>(fault->_Clone()));
    EXPECT_TRUE(copy->_IsEqual(fault.Get()));
    EXPECT_NE(copy->GetFaultCause(), fault->GetFaultCause());
    EXPECT_EQ(typeid(*copy->GetFaultCause()), typeid(Sample::BadRequest));
    EXPECT_NE(copy->GetFaultData(), fault->GetFaultData());
    EXPECT_NE(copy->GetFaultData()->GetAt(0)->GetValue(), pair->GetValue());
    copy->GetFaultData()->GetAt(0)->SetKey("changed");
    EXPECT_EQ(Diff(fault.Get(), copy.Get(), "f"), std::vector<std::string>{"f.faultData[0].key"});

    Ref<Sample::BadRequest> bad(new Sample::BadRequest());
    for (auto f : {Identity, Rounded})
        EXPECT_EQ(bad->_GetSize(f), static_cast<MethodFault*>(bad.Get())->MethodFault::_GetSize(f));
    const unsigned int bare = bad->_GetSize(Rounded);
    bad->SetFaultData(Ref<DataArray<KeyAnyValue>>(new DataArray<KeyAnyValue>{pair.Get()}).Get());
    EXPECT_EQ(bad->_GetSize(Rounded), bare + bad->GetFaultData()->_GetSize(Rounded));
}

}  // namespace
