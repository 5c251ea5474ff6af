// Generated data objects and faults as the runtime sees them: every storage kind
// through the typed accessors and through the record functions, equality and
// differences along the base chain, deep copies, sizes, and thrown faults.
#include <gtest/gtest.h>

#include <cstring>
#include <functional>
#include <memory>
#include <new>

#include "fixtures.h"

using namespace Fixture;
using Fix::Circle;
using Fix::Color;
using Fix::Shape;
using Kernite::Ref;
using Kernite::System::DateTime;
using Orbit::Any;
using Orbit::DataArray;
using Orbit::DataObject;
using Orbit::DataTypeInfo;
using Orbit::KeyAnyValue;
using Orbit::MethodFault;

namespace {

using DataObjectTest = NoLeakTest;

const DateTime kSeen = DateTime::Parse("2026-12-06T09:49:01Z");

Ref<Shape> Labelled(const std::string& label) {
    Ref<Shape> shape = Make<Shape>();
    shape->SetLabel(label);
    return shape;
}

// A shape with every property set.
Ref<Shape> Full() {
    Ref<Shape> shape = Labelled("full");
    shape->SetNote(std::string("note"));
    shape->SetCount(3);
    shape->SetWeight(1LL << 40);
    shape->SetSeen(kSeen);
    shape->SetColor(Color::blue);
    shape->SetNext(Labelled("inner").Get());
    shape->SetExtra(Make<Orbit::Primitive<std::string>>("extra").Get());
    shape->SetOwner(Make<Orbit::MoRef>("fix.Calculator", "calc-1").Get());
    shape->SetTags(Make<Orbit::Array<std::string>>(std::initializer_list<std::string>{"a", "b"}).Get());
    shape->SetChildren(Make<DataArray<Shape>>(std::initializer_list<Shape*>{Labelled("c0").Get(), Labelled("c1").Get()}).Get());
    return shape;
}

std::vector<std::string> Diff(Any* a, Any* b, const std::string& path) {
    Orbit::PropertyDiffSet diffs;
    a->_DiffProperties(b, path, diffs);
    return diffs.GetPaths();
}

template <class V>
V Read(DataObject* object, int index) {
    V value{};
    Orbit::GetDoType<Shape>()->GetDataTypeInfo()->getProperty(object, index, &value);
    return value;
}

// The "all kinds" path: what the typed accessors wrote the records read, and the
// other way round, with set and unset as the flags say.
TEST_F(DataObjectTest, EveryKindAgreesBetweenAccessorsAndRecords) {
    const DataTypeInfo* record = Orbit::GetDoType<Shape>()->GetDataTypeInfo();
    Ref<Shape> full = Full();
    EXPECT_EQ(Read<std::string>(full.Get(), 0), "full");
    EXPECT_EQ(Read<std::string>(full.Get(), 1), "note");
    EXPECT_EQ(Read<int>(full.Get(), 2), 3);
    EXPECT_EQ(Read<long long>(full.Get(), 3), 1LL << 40);
    EXPECT_EQ(Read<DateTime>(full.Get(), 4), kSeen);
    EXPECT_EQ(Read<int>(full.Get(), 5), 2);
    EXPECT_EQ(Read<Ref<Any>>(full.Get(), 6).Get(), full->GetNext());
    EXPECT_EQ(Read<Ref<Any>>(full.Get(), 7).Get(), full->GetExtra());
    EXPECT_EQ(Read<Ref<Any>>(full.Get(), 8).Get(), full->GetOwner());
    EXPECT_EQ(Read<Ref<Any>>(full.Get(), 9).Get(), full->GetTags());
    EXPECT_EQ(Read<Ref<Any>>(full.Get(), 10).Get(), full->GetChildren());
    for (int i = 0; i <= 11; ++i) EXPECT_TRUE(record->isPropertySet(full.Get(), i)) << i;  // 11: past the own ones

    // Written through the record; unset where optional, kept where required.
    Ref<Shape> blank = Make<Shape>();
    for (int i : {1, 3, 4, 6, 7, 8, 9, 10}) EXPECT_FALSE(record->isPropertySet(blank.Get(), i)) << i;
    for (int i : {0, 2, 5}) EXPECT_TRUE(record->isPropertySet(blank.Get(), i)) << i;
    EXPECT_THROW(Read<long long>(blank.Get(), 3), Kernite::NotInitializedException);
    const std::string label = "set";
    const long long weight = -(1LL << 50);
    const int green = 1;
    record->setProperty(blank.Get(), 0, &label);
    record->setProperty(blank.Get(), 3, &weight);
    record->setProperty(blank.Get(), 4, &kSeen);
    record->setProperty(blank.Get(), 5, &green);
    record->setProperty(blank.Get(), 6, static_cast<Any*>(full->GetNext()));
    record->setProperty(blank.Get(), 10, static_cast<Any*>(full->GetChildren()));
    EXPECT_EQ(blank->GetLabel(), "set");
    EXPECT_EQ(blank->GetWeight().GetValue(), weight);
    EXPECT_EQ(blank->GetSeen().GetValue(), kSeen);
    EXPECT_EQ(blank->GetColor(), Color::green);
    EXPECT_EQ(blank->GetNext(), full->GetNext());
    EXPECT_EQ(blank->GetChildren(), full->GetChildren());
    const int pastTags = 3;
    EXPECT_THROW(record->setProperty(blank.Get(), 5, &pastTags), Kernite::InvalidArgumentException);
    EXPECT_EQ(blank->GetColor(), Color::green);
    EXPECT_THROW(record->setProperty(blank.Get(), 6, static_cast<Any*>(full->GetOwner())), Kernite::TypeMismatchException);
    EXPECT_THROW(record->setProperty(blank.Get(), 10, static_cast<Any*>(full->GetTags())), Kernite::TypeMismatchException);
    EXPECT_EQ(blank->GetNext(), full->GetNext());

    for (int i = 0; i <= 10; ++i) record->unsetProperty(blank.Get(), i);
    EXPECT_EQ(blank->GetLabel(), "set");
    EXPECT_FALSE(blank->GetWeight().IsSet());
    EXPECT_EQ(blank->GetNext(), nullptr);
    EXPECT_NE(blank->GetChildren(), nullptr) << "a required array is kept";
    EXPECT_TRUE(record->isPropertySet(blank.Get(), 10));
    blank->GetChildren()->Clear();
    EXPECT_FALSE(record->isPropertySet(blank.Get(), 10)) << "an empty array counts as unset";
    EXPECT_THROW(record->getProperty(Make<KeyAnyValue>().Get(), 0, nullptr), Kernite::TypeMismatchException);
}

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
        {"color", [](Shape* s) { s->SetColor(Color::red); }},
        {"next.label", [](Shape* s) { s->GetNext()->SetLabel("moved"); }},
        {"next", [](Shape* s) { s->SetNext(nullptr); }},
        {"extra", [](Shape* s) { s->SetExtra(Make<Orbit::Primitive<int>>(1).Get()); }},
        {"owner", [](Shape* s) { s->SetOwner(Make<Orbit::MoRef>("fix.Calculator", "x").Get()); }},
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
    Ref<Circle> circle = Make<Circle>();
    circle->SetLabel("round");
    circle->SetRadius(2.5);
    Ref<Circle> other(static_cast<Circle*>(circle->_Clone()));
    EXPECT_TRUE(circle->_IsEqual(other.Get()));
    other->SetLabel("square");  // a property of the base
    other->SetRadius(3);
    EXPECT_EQ(Diff(circle.Get(), other.Get(), "c"), (std::vector<std::string>{"c.label", "c.radius"}));

    Ref<Shape> plain = Labelled("round");
    EXPECT_FALSE(circle->_IsEqual(plain.Get()));
    EXPECT_FALSE(plain->_IsEqual(circle.Get()));
    EXPECT_TRUE(circle->_IsEqual(plain.Get(), false));  // not exact: the shared properties decide
    EXPECT_TRUE(plain->_IsEqual(circle.Get(), false));
    EXPECT_EQ(Diff(circle.Get(), plain.Get(), "c"), std::vector<std::string>{"c"});
    EXPECT_FALSE(plain->_IsEqual(Make<Orbit::MoRef>("fix.Calculator", "c").Get()));

    Ref<Shape> read = Labelled("round");
    read->GetChildren();  // an array never read and one read but empty are both unset
    EXPECT_TRUE(read->_IsEqual(plain.Get()));
}

TEST_F(DataObjectTest, ConstructorsAndCopiesShareNothing) {
    // Made over dirty memory, so that a member the constructor leaves alone shows.
    alignas(Circle) unsigned char storage[sizeof(Circle)];
    std::memset(storage, 0xA5, sizeof storage);
    Circle* blank = new (storage) Circle();
    EXPECT_EQ(blank->GetCount(), 0);
    EXPECT_EQ(blank->GetColor(), Color::red);
    EXPECT_EQ(blank->GetRadius(), 0.0);
    EXPECT_FALSE(blank->GetNote().IsSet());
    blank->~Circle();

    Ref<Shape> full = Full();
    for (Ref<Shape> copy : {Make<Shape>(*full), Ref<Shape>(static_cast<Shape*>(full->_Clone()))}) {
        EXPECT_TRUE(copy->_IsEqual(full.Get()));
        EXPECT_NE(copy->GetNext(), full->GetNext());
        EXPECT_NE(copy->GetOwner(), full->GetOwner());
        EXPECT_NE(copy->GetTags(), full->GetTags());
        EXPECT_NE(copy->GetChildren()->GetAt(0), full->GetChildren()->GetAt(0));
        EXPECT_EQ(copy->GetExtra(), full->GetExtra());  // boxes are immutable and shared
        copy->GetNext()->SetLabel("changed");
        EXPECT_EQ(full->GetNext()->GetLabel(), "inner");
    }
    // The full constructor takes the base's properties first, then the own ones.
    Ref<Circle> circle = Make<Circle>("c", Kernite::Optional<std::string>(), 7, Kernite::Optional<long long>(),
                                      Kernite::Optional<DateTime>(kSeen), Color::green, nullptr, nullptr, nullptr,
                                      nullptr, full->GetChildren(), 1.5);
    EXPECT_EQ(circle->GetCount(), 7);
    EXPECT_EQ(circle->GetColor(), Color::green);
    EXPECT_EQ(circle->GetSeen().GetValue(), kSeen);
    EXPECT_EQ(circle->GetRadius(), 1.5);
    EXPECT_EQ(circle->GetChildren(), full->GetChildren());
}

// Reading an array through a const object installs an empty one; copies made
// afterwards leave it out, so they make no more objects than before the read and
// measure that array less than their source, and the copy's own read yields
// another empty array.
TEST_F(DataObjectTest, ArraysMadeByReadsAreNotCopied) {
    Ref<Shape> leaf = Labelled("leaf");
    Ref<Shape> root = Labelled("root");
    root->SetChildren(Make<DataArray<Shape>>(std::initializer_list<Shape*>{leaf.Get()}).Get());
    auto objectsMadeByACopy = [&] {
        const long before = Kernite::ObjectImpl::LiveObjects();
        Ref<Shape> copy = Make<Shape>(*root);
        return Kernite::ObjectImpl::LiveObjects() - before;
    };
    const long unread = objectsMadeByACopy();
    const unsigned int unreadSize = root->_GetSize(Exact);
    const Shape* readOnly = leaf.Get();
    DataArray<Shape>* created = readOnly->GetChildren();
    ASSERT_TRUE(created->IsEmpty());
    EXPECT_EQ(objectsMadeByACopy(), unread);

    Ref<Shape> copy = Make<Shape>(*root);
    EXPECT_EQ(root->_GetSize(Exact), unreadSize + created->_GetSize(Exact));
    EXPECT_EQ(copy->_GetSize(Exact), unreadSize);
    DataArray<Shape>* copied = copy->GetChildren()->GetAt(0)->GetChildren();
    EXPECT_TRUE(copied->IsEmpty());
    EXPECT_NE(copied, created);
}

TEST_F(DataObjectTest, SizeIsTheObjectOnceAndWhatItsMembersHold) {
    for (Orbit::SizeFunction f : {&Exact, &Rounded}) {
        Ref<Shape> shape = Make<Shape>();
        const unsigned int bare = shape->_GetSize(f);
        // The label is the one member that measures when empty: a string's f(0).
        EXPECT_EQ(bare, shape->Orbit::DynamicData::_GetSize(f) - f(sizeof(Orbit::DynamicData)) + f(sizeof(Shape)) + f(0));
        shape->SetLabel(std::string(100, 'x'));
        const unsigned int labelled = shape->_GetSize(f);
        EXPECT_GT(labelled, bare + 50);
        shape->SetNote(std::string(200, 'y'));
        EXPECT_GT(shape->_GetSize(f), labelled + 150);
        Ref<Shape> next = Labelled("n");
        shape->SetNext(next.Get());
        Ref<Orbit::Array<std::string>> tags = Make<Orbit::Array<std::string>>(std::initializer_list<std::string>{"t"});
        const unsigned int before = shape->_GetSize(f);
        shape->SetTags(tags.Get());
        EXPECT_EQ(shape->_GetSize(f), before + tags->_GetSize(f));
        Ref<Circle> circle = Make<Circle>();
        EXPECT_EQ(circle->_GetSize(f), Make<Shape>()->_GetSize(f) - f(sizeof(Shape)) + f(sizeof(Circle)));
    }
}

TEST_F(DataObjectTest, RuntimeFaultRecordsNarrowTheirValues) {
    const DataTypeInfo* info = Orbit::GetDoType<MethodFault>()->GetDataTypeInfo();
    Ref<MethodFault> fault = Make<MethodFault>();
    Ref<Fix::BadRequest> cause = Make<Fix::BadRequest>();
    info->setProperty(fault.Get(), 1, static_cast<Any*>(cause.Get()));
    EXPECT_EQ(fault->GetFaultCause(), cause.Get());
    Ref<KeyAnyValue> wrong = Make<KeyAnyValue>("k", nullptr);
    EXPECT_THROW(info->setProperty(fault.Get(), 1, static_cast<Any*>(wrong.Get())), Kernite::TypeMismatchException);
    EXPECT_EQ(fault->GetFaultCause(), cause.Get());
    auto data = Make<DataArray<KeyAnyValue>>(std::initializer_list<KeyAnyValue*>{wrong.Get()});
    info->setProperty(fault.Get(), 2, static_cast<Any*>(data.Get()));
    info->unsetProperty(fault.Get(), 2);  // an optional array: replaced by a new, empty one
    EXPECT_EQ(data->GetLength(), 1);
}

TEST_F(DataObjectTest, FaultsAreThrownClonedAndCopiedAsTheirOwnClass) {
    Ref<Fix::BadRequest> bad = Make<Fix::BadRequest>();
    bad->SetMsg("no");
    EXPECT_EQ(MessageOf<Fix::BadRequest::Exception>([&] { bad->Throw(); }), "fix.BadRequest");
    EXPECT_THROW(bad->Throw(), MethodFault::Exception);
    std::unique_ptr<MethodFault::Exception> created(static_cast<MethodFault*>(bad.Get())->CreateException());
    EXPECT_EQ(typeid(*created), typeid(Fix::BadRequest::Exception));
    std::unique_ptr<Kernite::Exception> clone(static_cast<const Kernite::Exception&>(*created).Clone());
    EXPECT_EQ(typeid(*clone), typeid(Fix::BadRequest::Exception));
    EXPECT_EQ(static_cast<MethodFault::Exception&>(*clone).GetFault(), bad.Get());
    EXPECT_EQ(bad->GetRefCount(), 3);
    EXPECT_EQ(MessageOf<Fix::BadRequest::Exception>([&] { clone->Throw(); }), "fix.BadRequest");

    Ref<MethodFault> outer = Make<MethodFault>("outer", bad.Get(), nullptr);
    Ref<KeyAnyValue> pair = Make<KeyAnyValue>("key", Labelled("value").Get());
    outer->GetFaultData()->Append(pair.Get());
    Ref<MethodFault> copy(static_cast<MethodFault*>(outer->_Clone()));
    EXPECT_TRUE(copy->_IsEqual(outer.Get()));
    EXPECT_NE(copy->GetFaultCause(), bad.Get());
    EXPECT_EQ(typeid(*copy->GetFaultCause()), typeid(Fix::BadRequest));
    EXPECT_NE(copy->GetFaultData()->GetAt(0)->GetValue(), pair->GetValue());
    copy->GetFaultData()->GetAt(0)->SetKey("changed");
    EXPECT_EQ(Diff(outer.Get(), copy.Get(), "f"), std::vector<std::string>{"f.faultData[0].key"});
    for (Orbit::SizeFunction f : {&Exact, &Rounded}) {
        Ref<Fix::BadRequest> fresh = Make<Fix::BadRequest>();
        const unsigned int bare = fresh->_GetSize(f);
        EXPECT_EQ(bare, fresh->MethodFault::_GetSize(f));
        fresh->SetFaultData(Make<DataArray<KeyAnyValue>>(std::initializer_list<KeyAnyValue*>{pair.Get()}).Get());
        EXPECT_EQ(fresh->_GetSize(f), bare + fresh->GetFaultData()->_GetSize(f));
    }
}

}  // namespace
