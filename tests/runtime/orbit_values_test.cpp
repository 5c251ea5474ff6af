#include <gtest/gtest.h>

#include <thread>
#include <vector>

#include "expect.h"
#include "fixtures.h"

using Kernite::ObjectImpl;
using Kernite::Ref;
using Orbit::Any;
using Orbit::Array;
using Orbit::DataArray;
using Orbit::Primitive;
using Sample::Color;
using Sample::Shape;
using TestSupport::MessageOf;

namespace {

unsigned int Identity(unsigned int n) { return n; }

Ref<Shape> MakeShape(const std::string& label) {
    Ref<Shape> shape(new Shape());
    shape->SetLabel(label);
    return shape;
}

using ValuesTest = Sample::NoLeakTest;

TEST_F(ValuesTest, BoxesAreSharedImmutableValues) {
    Ref<Any> red(new Primitive<Color>(Color::Red));
    Ref<Any> clone(red->_Clone());
    EXPECT_EQ(clone.Get(), red.Get());
    EXPECT_EQ(red->GetRefCount(), 2);

    EXPECT_TRUE(red->_IsEqual(Ref<Any>(new Primitive<Color>(Color::Red)).Get()));
    EXPECT_FALSE(red->_IsEqual(Ref<Any>(new Primitive<Color>(Color::Blue)).Get()));
    Ref<Any> number(new Primitive<int>(0));
    EXPECT_THROW(red->_IsEqual(number.Get()), Kernite::TypeMismatchException);

    Orbit::PropertyDiffSet diffs;
    red->_DiffProperties(Ref<Any>(new Primitive<Color>(Color::Red)).Get(), "p", diffs);
    EXPECT_TRUE(diffs.IsEmpty());
    red->_DiffProperties(Ref<Any>(new Primitive<Color>(Color::Green)).Get(), "p", diffs);
    EXPECT_EQ(diffs.GetPaths(), std::vector<std::string>{"p"});

    EXPECT_EQ(red->_GetType(), Orbit::GetType<Color>());
    EXPECT_EQ(Primitive<std::string>("abc")._GetSize(Identity), sizeof(Primitive<std::string>));
    EXPECT_GT(Primitive<std::string>(std::string(100, 'x'))._GetSize(Identity),
              sizeof(Primitive<std::string>) + 100);
}

TEST_F(ValuesTest, ValueArraysCompareCopyAndMeasure) {
    Ref<Array<Color>> colors(new Array<Color>{Color::Blue, Color::Red});
    Ref<Array<Color>> same(new Array<Color>{Color::Blue, Color::Red});
    Ref<Array<std::string>> tags(new Array<std::string>{"blue", "red"});
    EXPECT_TRUE(colors->_IsEqual(same.Get()));
    EXPECT_FALSE(colors->_IsEqual(tags.Get()));  // another array class: unequal, not an error

    Orbit::PropertyDiffSet diffs;
    colors->_DiffProperties(tags.Get(), "a", diffs);
    same->Append(Color::Green);
    colors->_DiffProperties(same.Get(), "b", diffs);
    EXPECT_EQ(diffs.GetPaths(), (std::vector<std::string>{"a", "b"}));

    Ref<Array<Color>> copy(static_cast<Array<Color>*>(colors->_Clone()));
    copy->GetItems()[0] = Color::Green;
    EXPECT_EQ(colors->GetAt(0), Color::Blue);

    colors->Clear();
    EXPECT_TRUE(colors->IsEmpty());
    EXPECT_EQ(colors->GetLength(), 0);

    Array<Color> four;
    four.GetItems().reserve(4);
    EXPECT_EQ(four._GetSize(Identity), sizeof(Array<Color>) + 16);
    EXPECT_EQ(tags->_GetType()->GetName(), "string[]");
    EXPECT_EQ(tags->_GetType(), Orbit::GetType<std::string>()->GetArrayType());
}

TEST_F(ValuesTest, ObjectArraysInsertSetAndCopyDeeply) {
    Ref<DataArray<Shape>> shapes(new DataArray<Shape>());
    Ref<Shape> a = MakeShape("a");
    Ref<Shape> b = MakeShape("b");
    shapes->CheckedAppend(a.Get());
    shapes->CheckedInsertAt(shapes->GetLength(), b.Get());  // inserting at the end appends
    shapes->CheckedInsertAt(0, nullptr);
    ASSERT_EQ(shapes->GetLength(), 3);
    EXPECT_EQ(shapes->GetAt(0), nullptr);
    EXPECT_EQ(shapes->GetAt(2), b.Get());
    EXPECT_EQ(a->GetRefCount(), 2);

    Ref<DataArray<Shape>> copy(static_cast<DataArray<Shape>*>(shapes->_Clone()));
    EXPECT_EQ(copy->GetAt(0), nullptr);
    EXPECT_NE(copy->GetAt(1), a.Get());
    EXPECT_TRUE(copy->_IsEqual(shapes.Get()));
    copy->GetAt(1)->SetLabel("changed");
    EXPECT_EQ(a->GetLabel(), "a");
    EXPECT_FALSE(copy->_IsEqual(shapes.Get()));

    Orbit::PropertyDiffSet diffs;
    shapes->_DiffProperties(copy.Get(), "list", diffs);
    EXPECT_EQ(diffs.GetPaths(), std::vector<std::string>{"list[1].label"});

    shapes->CheckedSetAt(1, b.Get());
    EXPECT_EQ(a->GetRefCount(), 1);
    shapes->RemoveAt(1);
    EXPECT_EQ(shapes->GetLength(), 2);
    EXPECT_EQ(b->GetRefCount(), 2);
    shapes->Clear();
    EXPECT_EQ(b->GetRefCount(), 1);

    Ref<DataArray<Sample::Circle>> circles(new DataArray<Sample::Circle>());
    EXPECT_FALSE(circles->_IsEqual(shapes.Get()));  // same items, another array class
    EXPECT_EQ(shapes->_GetType()->GetName(), "test.Shape[]");
    EXPECT_EQ(shapes->_GetDataItemType(), Orbit::GetDoType<Shape>());
}

using ValuesDeathTest = ValuesTest;

TEST_F(ValuesDeathTest, CheckedOperationsGuardIndexAndClass) {
    Ref<DataArray<Shape>> shapes(new DataArray<Shape>{MakeShape("only").Get()});
    Ref<Orbit::KeyAnyValue> stranger(new Orbit::KeyAnyValue("k", nullptr));
    EXPECT_DEATH(shapes->CheckedSetAt(shapes->GetLength(), MakeShape("x").Get()),
                 "0 <= index && index < \\(int\\)_vec.size\\(\\).*orbit/array");
    EXPECT_DEATH(shapes->CheckedInsertAt(-1, nullptr), "0 <= index && index <= \\(int\\)_vec.size\\(\\)");
    EXPECT_DEATH(shapes->GetAt(1), "0 <= index && index < \\(int\\)_vec.size\\(\\)");
    EXPECT_DEATH(shapes->CheckedAppend(stranger.Get()), "__null != p");
    EXPECT_DEATH(shapes->_IsEqual(nullptr), "\"obj\"");
    Array<int> numbers{1};
    EXPECT_DEATH(numbers.GetAt(-1), "0 <= index && index < \\(int\\)_vec.size\\(\\)");
    Orbit::PropertyDiffSet diffs;
    EXPECT_DEATH(Primitive<int>(1)._DiffProperties(nullptr, "p", diffs), "\"obj\"");
    Ref<Any> unexpected(new Primitive<int>(1));
    EXPECT_DEATH(Orbit::CheckNoResult(unexpected, "test/stub", 7), "_resultObj == __null.*test/stub:7");
    EXPECT_EQ(shapes->GetLength(), 1);
}

TEST_F(ValuesTest, ArrayFieldsInstallOnceAndClearInPlace) {
    Orbit::ArrayField<Array<std::string>> field;
    EXPECT_EQ(field.Peek(), nullptr);
    field.Set(nullptr);  // never read: stays empty
    EXPECT_EQ(field.Peek(), nullptr);

    Array<std::string>* installed = field.Get();
    ASSERT_NE(installed, nullptr);
    EXPECT_EQ(field.Get(), installed);
    installed->Append("a");
    installed->Append("b");
    installed->Append("c");
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
    EXPECT_NE(field.Peek(), nullptr);
    EXPECT_TRUE(field.Peek()->IsEmpty());
}

TEST_F(ValuesTest, RacingFirstReadersShareOneArray) {
    Kernite::AtomicUseFence = 1;
    for (int round = 0; round < 20; ++round) {
        Orbit::ArrayField<DataArray<Shape>> field;
        std::vector<DataArray<Shape>*> seen(4);
        std::vector<std::thread> readers;
        for (int t = 0; t < 4; ++t) readers.emplace_back([&field, &seen, t] { seen[t] = field.Get(); });
        for (auto& reader : readers) reader.join();
        for (auto* array : seen) EXPECT_EQ(array, field.Peek());
        EXPECT_EQ(field.Peek()->GetRefCount(), 1);
    }
    Kernite::AtomicUseFence = 0;
}

TEST_F(ValuesTest, ManagedObjectReferencesCompareByTypeAndId) {
    Ref<Orbit::MoRef> ref(new Orbit::MoRef("test.Calculator", "calc-1"));
    Ref<Any> clone(ref->_Clone());
    EXPECT_NE(clone.Get(), ref.Get());
    EXPECT_TRUE(ref->_IsEqual(clone.Get()));
    EXPECT_FALSE(ref->_IsEqual(Ref<Any>(new Orbit::MoRef("test.Calculator", "calc-2")).Get()));
    EXPECT_FALSE(ref->_IsEqual(Ref<Any>(new Orbit::MoRef("test.Counter", "calc-1")).Get()));
    EXPECT_FALSE(ref->_IsEqual(Ref<Any>(new Primitive<std::string>("calc-1")).Get()));
    EXPECT_EQ(ref->_GetType()->GetName(), "ManagedObjectReference");
    EXPECT_EQ(ref->ToString(), "test.Calculator:calc-1");
}

TEST_F(ValuesTest, DispatchHelpersRefuseMalformedCalls) {
    Kernite::RefVector<Any> args(2);
    args[0] = new Primitive<int>(4);
    EXPECT_EQ(Orbit::UnboxArgument<int>(args, 0), 4);
    EXPECT_THROW(Orbit::CheckArgumentCount(args, 3), Kernite::InvalidArgumentException);
    EXPECT_THROW(Orbit::UnboxArgument<int>(args, 1), Kernite::InvalidArgumentException);
    EXPECT_THROW(Orbit::UnboxArgument<long long>(args, 0), Kernite::TypeMismatchException);

    Ref<Any> none;
    EXPECT_EQ(MessageOf<Kernite::TypeMismatchException>([&] { Orbit::UnboxResult<int>(none); }),
              std::string("Type Mismatch: expected: ") + typeid(const Primitive<int>*).name() + ", found: null");

    Ref<Orbit::MoRef> out(new Orbit::MoRef("t", "kept"));
    Ref<Any> wrong(new Primitive<int>(1));
    EXPECT_THROW(Orbit::NarrowResult(wrong, out), Kernite::TypeMismatchException);
    EXPECT_EQ(out->GetId(), "kept");
}

}  // namespace
