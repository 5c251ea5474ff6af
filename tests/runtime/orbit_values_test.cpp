// Boxes, arrays, array fields, managed object references, enumerations and the
// dispatch helpers.
#include <gtest/gtest.h>

#include <algorithm>
#include <functional>
#include <limits>
#include <vector>

#include "fixtures.h"

using namespace Fixture;
using Fix::Color;
using Fix::Shape;
using Kernite::Ref;
using Orbit::Any;
using Orbit::Array;
using Orbit::DataArray;
using Orbit::Primitive;

namespace {

using ValuesTest = NoLeakTest;

Ref<Shape> Labelled(const std::string& label) {
    Ref<Shape> shape = Make<Shape>();
    shape->SetLabel(label);
    return shape;
}

std::vector<std::string> Diff(Any* a, Any* b, const std::string& path) {
    Orbit::PropertyDiffSet diffs;
    a->_DiffProperties(b, path, diffs);
    return diffs.GetPaths();
}

TEST_F(ValuesTest, BoxesAreSharedImmutableValues) {
    Ref<Any> red(new Primitive<Color>(Color::red));
    Ref<Any> clone(red->_Clone());
    EXPECT_EQ(clone.Get(), red.Get());
    EXPECT_EQ(red->GetRefCount(), 2);
    EXPECT_TRUE(red->_IsEqual(Make<Primitive<Color>>(Color::red).Get()));
    EXPECT_FALSE(red->_IsEqual(Make<Primitive<Color>>(Color::blue).Get()));
    EXPECT_THROW(red->_IsEqual(Make<Primitive<int>>(0).Get()), Kernite::TypeMismatchException);
    EXPECT_TRUE(Diff(red.Get(), Make<Primitive<Color>>(Color::red).Get(), "p").empty());
    EXPECT_EQ(Diff(red.Get(), Make<Primitive<Color>>(Color::green).Get(), "p"), std::vector<std::string>{"p"});
    EXPECT_EQ(red->_GetType(), Orbit::GetType<Color>());
    EXPECT_EQ(Primitive<std::string>("abc")._GetSize(Exact), sizeof(Primitive<std::string>));
    EXPECT_GT(Primitive<std::string>(std::string(100, 'x'))._GetSize(Exact), sizeof(Primitive<std::string>) + 100);
}

TEST_F(ValuesTest, ValueArraysCompareCopyAndMeasure) {
    auto colors = Make<Array<Color>>(std::initializer_list<Color>{Color::blue, Color::red});
    auto same = Make<Array<Color>>(std::initializer_list<Color>{Color::blue, Color::red});
    auto tags = Make<Array<std::string>>(std::initializer_list<std::string>{"blue", "red"});
    EXPECT_TRUE(colors->_IsEqual(same.Get()));
    EXPECT_FALSE(colors->_IsEqual(tags.Get()));  // another array class: unequal, not an error
    EXPECT_EQ(Diff(colors.Get(), tags.Get(), "a"), std::vector<std::string>{"a"});
    same->Append(Color::green);
    EXPECT_EQ(Diff(colors.Get(), same.Get(), "b"), std::vector<std::string>{"b"});

    Ref<Array<Color>> copy(static_cast<Array<Color>*>(colors->_Clone()));
    copy->GetItems()[0] = Color::green;
    EXPECT_EQ(colors->GetAt(0), Color::blue);
    colors->Clear();
    EXPECT_TRUE(colors->IsEmpty());

    Array<Color> four;
    four.GetItems().reserve(4);
    EXPECT_EQ(four._GetSize(Exact), sizeof(Array<Color>) + 16);
    EXPECT_EQ(tags->_GetType(), Orbit::GetType<std::string>()->GetArrayType());
    EXPECT_EQ(tags->_GetType()->GetName(), "string[]");
}

TEST_F(ValuesTest, ObjectArraysInsertSetAndCopyDeeply) {
    auto shapes = Make<DataArray<Shape>>();
    Ref<Shape> a = Labelled("a"), b = Labelled("b");
    shapes->CheckedAppend(a.Get());
    shapes->CheckedInsertAt(shapes->GetLength(), b.Get());  // inserting at the end appends
    shapes->CheckedInsertAt(0, nullptr);
    ASSERT_EQ(shapes->GetLength(), 3);
    EXPECT_EQ(shapes->GetAt(2), b.Get());
    EXPECT_EQ(a->GetRefCount(), 2);

    Ref<DataArray<Shape>> copy(static_cast<DataArray<Shape>*>(shapes->_Clone()));
    EXPECT_EQ(copy->GetAt(0), nullptr);
    EXPECT_NE(copy->GetAt(1), a.Get());
    EXPECT_TRUE(copy->_IsEqual(shapes.Get()));
    copy->GetAt(1)->SetLabel("changed");
    EXPECT_EQ(a->GetLabel(), "a");
    EXPECT_FALSE(copy->_IsEqual(shapes.Get()));
    EXPECT_EQ(Diff(shapes.Get(), copy.Get(), "list"), std::vector<std::string>{"list[1].label"});
    Ref<DataArray<Shape>> shorter(static_cast<DataArray<Shape>*>(shapes->_Clone()));
    shorter->RemoveAt(2);  // equal as far as it goes
    EXPECT_FALSE(shorter->_IsEqual(shapes.Get())) << "a shorter array";
    EXPECT_FALSE(shapes->_IsEqual(shorter.Get())) << "a longer array";

    shapes->CheckedSetAt(1, b.Get());
    EXPECT_EQ(a->GetRefCount(), 1);
    shapes->RemoveAt(1);
    EXPECT_EQ(b->GetRefCount(), 2);
    shapes->Clear();
    EXPECT_EQ(b->GetRefCount(), 1);
    EXPECT_FALSE(Make<DataArray<Fix::Circle>>()->_IsEqual(shapes.Get()));  // same items, another class
    EXPECT_EQ(shapes->_GetType()->GetName(), "fix.Shape[]");
    EXPECT_EQ(shapes->_GetDataItemType(), Orbit::GetDoType<Shape>());
}

// Object arrays keep their first items inside the array object and the rest in a
// block of their own: every operation must agree with a plain vector on both sides
// of that boundary, hold exactly one reference per item, and measure the block only
// when there is one.
TEST_F(ValuesTest, ObjectArraysBehaveAlikeInsideAndBeyondTheirInlineItems) {
    constexpr int kInline = Orbit::DataObjectArrayBase::kInlineItems;
    std::vector<Ref<Shape>> shapes;
    for (int i = 0; i < 2 * kInline + 2; ++i) shapes.push_back(Labelled("s" + std::to_string(i)));
    for (int length = 0; length <= 2 * kInline + 1; ++length) {
        SCOPED_TRACE("length " + std::to_string(length));
        Ref<DataArray<Shape>> array(new DataArray<Shape>());
        std::vector<Shape*> model;
        for (int i = 0; i < length; ++i) {
            // Appends, inserts at the front and in the middle, and a null item, in turn.
            Shape* item = i % 5 == 4 ? nullptr : shapes[i].Get();  // each shape at most once
            const int at = i % 3 == 0 ? array->GetLength() : i % 3 == 1 ? 0 : array->GetLength() / 2;
            array->InsertAt(at, item);
            model.insert(model.begin() + at, item);
        }
        auto agree = [&](const DataArray<Shape>& a) {
            ASSERT_EQ(a.GetLength(), static_cast<int>(model.size()));
            for (int i = 0; i < a.GetLength(); ++i) EXPECT_EQ(a.GetAt(i), model[i]) << i;
        };
        agree(*array);
        for (int i = 0; i < length; ++i)
            EXPECT_EQ(shapes[i]->GetRefCount(), 1 + std::count(model.begin(), model.end(), shapes[i].Get()));

        // A copy has room for exactly its items.
        Ref<DataArray<Shape>> copy(static_cast<DataArray<Shape>*>(array->_Clone()));
        unsigned int held = 0;
        for (int i = 0; i < copy->GetLength(); ++i) {
            if (model[i] == nullptr) {
                EXPECT_EQ(copy->GetAt(i), nullptr);
                continue;
            }
            EXPECT_NE(copy->GetAt(i), model[i]);
            EXPECT_TRUE(copy->GetAt(i)->_IsEqual(model[i]));
            held += copy->GetAt(i)->_GetSize(Exact);
        }
        const unsigned int block = length > kInline ? length * sizeof(Any*) : 0;
        EXPECT_EQ(copy->_GetSize(Exact), sizeof(Orbit::DataObjectArrayBase) + block + held);

        while (!model.empty()) {
            const int at = static_cast<int>(model.size()) / 2;
            array->RemoveAt(at);
            model.erase(model.begin() + at);
            agree(*array);
        }
        for (const Ref<Shape>& shape : shapes) EXPECT_EQ(shape->GetRefCount(), 1);
    }
}

using ValuesDeathTest = ValuesTest;

TEST_F(ValuesDeathTest, CheckedOperationsGuardIndexAndClass) {
    auto shapes = Make<DataArray<Shape>>(std::initializer_list<Shape*>{Labelled("only").Get()});
    auto stranger = Make<Orbit::KeyAnyValue>("k", nullptr);
    EXPECT_DEATH(shapes->CheckedSetAt(shapes->GetLength(), Labelled("x").Get()),
                 "0 <= index && index < \\(int\\)_vec.size\\(\\).*orbit/array");
    EXPECT_DEATH(shapes->CheckedInsertAt(-1, nullptr), "0 <= index && index <= \\(int\\)_vec.size\\(\\)");
    EXPECT_DEATH(shapes->GetAt(1), "0 <= index && index < \\(int\\)_vec.size\\(\\)");
    EXPECT_DEATH(shapes->CheckedAppend(stranger.Get()), "__null != p");
    EXPECT_DEATH(shapes->_IsEqual(nullptr), "\"obj\"");
    Orbit::PropertyDiffSet diffs;
    EXPECT_DEATH(Primitive<int>(1)._DiffProperties(nullptr, "p", diffs), "\"obj\"");
    Ref<Any> unexpected(new Primitive<int>(1));
    EXPECT_DEATH(Orbit::CheckNoResult(unexpected, "test/stub", 7), "_resultObj == __null.*test/stub:7");
}

TEST_F(ValuesTest, ArrayFieldsInstallOnceAndClearInPlace) {
    Orbit::ArrayField<Array<std::string>> field;
    field.Set(nullptr);  // never read: stays empty
    EXPECT_EQ(field.Peek(), nullptr);
    Array<std::string>* installed = field.Get();
    ASSERT_NE(installed, nullptr);
    EXPECT_EQ(field.Get(), installed);
    installed->Append("a");
    field.Set(nullptr);  // installed: emptied in place
    EXPECT_EQ(field.Peek(), installed);
    EXPECT_EQ(installed->GetLength(), 0);
    field.Set(installed);  // the field's own array again
    EXPECT_EQ(installed->GetRefCount(), 1);
    installed->Append("kept");

    Orbit::ArrayField<Array<std::string>> copy(field);
    ASSERT_NE(copy.Peek(), installed);
    EXPECT_EQ(copy.Peek()->GetItems(), installed->GetItems());
    field.Reset();
    EXPECT_TRUE(field.Peek()->IsEmpty());

    // An installed empty array is not cloned: the copy's field stays empty.
    const long live = Kernite::ObjectImpl::LiveObjects();
    Orbit::ArrayField<Array<std::string>> emptyCopy(field);
    EXPECT_EQ(emptyCopy.Peek(), nullptr);
    EXPECT_EQ(Kernite::ObjectImpl::LiveObjects(), live);
    EXPECT_NE(emptyCopy.Get(), field.Peek());
}

TEST_F(ValuesTest, ManagedObjectReferencesCompareByTypeAndId) {
    auto ref = Make<Orbit::MoRef>("fix.Calculator", "calc-1");
    Ref<Any> clone(ref->_Clone());
    EXPECT_NE(clone.Get(), ref.Get());
    EXPECT_TRUE(ref->_IsEqual(clone.Get()));
    EXPECT_FALSE(ref->_IsEqual(Make<Orbit::MoRef>("fix.Calculator", "calc-2").Get()));
    EXPECT_FALSE(ref->_IsEqual(Make<Orbit::MoRef>("fix.Counter", "calc-1").Get()));
    EXPECT_FALSE(ref->_IsEqual(Make<Primitive<std::string>>("calc-1").Get()));
    EXPECT_EQ(ref->_GetType()->GetName(), "ManagedObjectReference");
    EXPECT_EQ(ref->ToString(), "fix.Calculator:calc-1");
}

TEST_F(ValuesTest, DispatchHelpersRefuseMalformedCalls) {
    Kernite::RefVector<Any> args(2);
    args[0] = new Primitive<int>(4);
    EXPECT_EQ(Orbit::UnboxArgument<int>(args, 0), 4);
    EXPECT_THROW(Orbit::CheckArgumentCount(args, 3), Kernite::InvalidArgumentException);
    EXPECT_THROW(Orbit::CheckArgumentCount(args, 1), Kernite::InvalidArgumentException);
    EXPECT_THROW(Orbit::UnboxArgument<int>(args, 1), Kernite::InvalidArgumentException);
    EXPECT_THROW(Orbit::UnboxArgument<long long>(args, 0), Kernite::TypeMismatchException);
    Ref<Any> none;
    EXPECT_EQ(MessageOf<Kernite::TypeMismatchException>([&] { Orbit::UnboxResult<int>(none); }),
              std::string("Type Mismatch: expected: ") + typeid(const Primitive<int>*).name() + ", found: null");
    auto out = Make<Orbit::MoRef>("t", "kept");
    Ref<Any> wrong(new Primitive<int>(1));
    EXPECT_THROW(Orbit::NarrowResult(wrong, out), Kernite::TypeMismatchException);
    EXPECT_EQ(out->GetId(), "kept");
    // Null is nothing to act on, and an enumeration's int must name a tag.
    EXPECT_THROW((Orbit::NarrowTarget<Shape, Orbit::DataObject>(nullptr)), Kernite::InvalidArgumentException);
    for (int bad : {-1, 3}) EXPECT_THROW(Orbit::ReadEnum(&bad, 3), Kernite::InvalidArgumentException) << bad;
    int last = 2;
    EXPECT_EQ(Orbit::ReadEnum(&last, 3), 2);
}

// ---- Enumerations ----

Orbit::EnumType* ColorType() { return Kernite::NarrowToType<Orbit::EnumType, Orbit::Type>(Orbit::GetType<Color>()); }

std::string InvalidArgument(const std::function<void()>& f) { return MessageOf<Kernite::InvalidArgumentException>(f); }

TEST(EnumTypeTest, TagsAndValuesConvertBothWays) {
    Orbit::EnumType* type = ColorType();
    EXPECT_EQ(Orbit::FindType(&gFixColorTypeInfo), type);
    std::vector<std::string> tags{"stale"};
    type->GetEnumTags(tags);
    EXPECT_EQ(tags, (std::vector<std::string>{Fix::COLOR_RED, Fix::COLOR_GREEN, Fix::COLOR_BLUE}));
    EXPECT_EQ(type->GetValue("blue"), 2);
    EXPECT_EQ(type->GetTag(1), "green");
    EXPECT_TRUE(type->HasValue("red"));
    EXPECT_FALSE(type->HasValue("Red"));
    EXPECT_EQ(InvalidArgument([&] { type->GetValue("Blue"); }), "Invalid argument : Blue");
    EXPECT_EQ(InvalidArgument([&] { type->GetTag(3); }), "Invalid argument : 3");
    EXPECT_EQ(InvalidArgument([&] { type->GetTag(-1); }), "Invalid argument : -1");

    Ref<Any> boxed;
    type->StringToEnum("green", boxed);
    EXPECT_EQ((Kernite::NarrowToType<Primitive<Color>, Any>(boxed.Get())->GetValue()), Color::green);
    EXPECT_EQ(type->EnumToString(boxed.Get()), "green");
    EXPECT_THROW(type->StringToEnum("purple", boxed), Kernite::InvalidArgumentException);
    EXPECT_EQ(type->EnumToString(boxed.Get()), "green");
    EXPECT_THROW(type->EnumToString(Make<Primitive<int>>(1).Get()), Kernite::TypeMismatchException);
    EXPECT_THROW(type->EnumToString(nullptr), Kernite::InvalidArgumentException);
    EXPECT_EQ(InvalidArgument([&] { type->EnumToString(Make<Primitive<Color>>(static_cast<Color>(3)).Get()); }),
              "Invalid argument : 3");
}

TEST(EnumTypeTest, ArraysConvertItemByItemOrNotAtAll) {
    Orbit::EnumType* type = ColorType();
    auto values = Make<Array<Color>>(std::initializer_list<Color>{Color::blue, Color::red});
    Ref<Array<std::string>> tags;
    type->EnumArrayToStringArray(values.Get(), tags);
    EXPECT_EQ(tags->GetItems(), (std::vector<std::string>{"blue", "red"}));
    Ref<Any> back;
    type->StringArrayToEnumArray(tags.Get(), back);
    EXPECT_TRUE(back->_IsEqual(values.Get()));

    Any* before = back.Get();
    auto bad = Make<Array<std::string>>(std::initializer_list<std::string>{"red", "bad"});
    EXPECT_EQ(InvalidArgument([&] { type->StringArrayToEnumArray(bad.Get(), back); }), "Invalid argument : bad");
    EXPECT_EQ(back.Get(), before);
    Array<std::string>* kept = tags.Get();
    auto outOfRange = Make<Array<Color>>(std::initializer_list<Color>{Color::red, static_cast<Color>(3)});
    EXPECT_THROW(type->EnumArrayToStringArray(outOfRange.Get(), tags), Kernite::InvalidArgumentException);
    EXPECT_EQ(tags.Get(), kept);
    EXPECT_THROW(type->EnumArrayToStringArray(tags.Get(), tags), Kernite::TypeMismatchException);
    Ref<Any> created;
    type->CreateArrayInstance(created);
    EXPECT_EQ(created->_GetType(), Orbit::GetType<Color>()->GetArrayType());
}

// The non-throwing look-ups agree with the throwing ones, on few tags (scanned) and
// on many (hashed), for every tag, for near misses and for values out of range.
TEST(EnumTypeTest, FindValueAndFindTagAnswerWithoutThrowing) {
    const Orbit::EnumType* shade = Kernite::NarrowToType<Orbit::EnumType, Orbit::Type>(Orbit::GetType<Fix::Shade>());
    for (const Orbit::EnumType* type : {static_cast<const Orbit::EnumType*>(ColorType()), shade}) {
        std::vector<std::string> tags;
        type->GetEnumTags(tags);
        const int count = static_cast<int>(tags.size());
        for (int value = 0; value < count; ++value) {
            EXPECT_EQ(type->FindValue(tags[value]), value) << tags[value];
            ASSERT_NE(type->FindTag(value), nullptr);
            EXPECT_EQ(type->FindTag(value), &type->GetTag(value));
            std::string longer = tags[value] + "x";
            std::string upper = tags[value];
            upper[0] = static_cast<char>(upper[0] - 'a' + 'A');
            for (const std::string& miss : {longer, upper, tags[value].substr(1)}) {
                EXPECT_EQ(type->FindValue(miss), -1) << miss;
                EXPECT_FALSE(type->HasValue(miss)) << miss;
            }
        }
        for (int value : {-1, count, count + 1, std::numeric_limits<int>::min(), std::numeric_limits<int>::max()})
            EXPECT_EQ(type->FindTag(value), nullptr) << value;
        EXPECT_EQ(type->FindValue(""), -1);
        EXPECT_EQ(type->FindValue(std::string_view("red\0", 4)), -1);
    }
}

}  // namespace
