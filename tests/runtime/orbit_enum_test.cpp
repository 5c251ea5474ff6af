#include <gtest/gtest.h>

#include <functional>

#include "expect.h"
#include "fixtures.h"

using Kernite::Ref;
using Orbit::Any;
using Orbit::Array;
using Orbit::EnumType;
using Orbit::Primitive;
using Sample::Color;
using TestSupport::MessageOf;

namespace {

EnumType* ColorType() { return Kernite::NarrowToType<EnumType, Orbit::Type>(Orbit::GetType<Color>()); }

std::string InvalidArgument(const std::function<void()>& f) {
    return MessageOf<Kernite::InvalidArgumentException>(f);
}

TEST(EnumTypeTest, IsATypeMadeOnceFromItsRecord) {
    Orbit::Type* type = Orbit::GetType<Color>();
    EXPECT_EQ(Orbit::GetType<Color>(), type);
    EXPECT_EQ(Orbit::FindType(&gTestColorTypeInfo), type);
    EXPECT_EQ(type->GetName(), "test.Color");
    EXPECT_EQ(type->GetWsdlName(), "TestColor");
    EXPECT_EQ(type->GetKind(), Orbit::Kind::Enum);
    EXPECT_EQ(type->GetBaseType(), nullptr);
    EXPECT_EQ(type->GetArrayType()->GetName(), "test.Color[]");

    std::vector<std::string> tags{"stale"};
    ColorType()->GetEnumTags(tags);
    EXPECT_EQ(tags, (std::vector<std::string>{Sample::COLOR_RED, Sample::COLOR_GREEN, Sample::COLOR_BLUE}));
}

TEST(EnumTypeTest, TagsAndValuesConvertBothWays) {
    EnumType* type = ColorType();
    EXPECT_EQ(type->GetValue("blue"), 2);
    EXPECT_EQ(type->GetTag(1), "green");
    EXPECT_TRUE(type->HasValue("red"));
    EXPECT_FALSE(type->HasValue("Red"));
    EXPECT_FALSE(type->HasValue(""));

    EXPECT_EQ(InvalidArgument([&] { type->GetValue("Blue"); }), "Invalid argument : Blue");
    EXPECT_EQ(InvalidArgument([&] { type->GetTag(3); }), "Invalid argument : 3");
    EXPECT_EQ(InvalidArgument([&] { type->GetTag(-1); }), "Invalid argument : -1");

    Ref<Any> boxed;
    type->StringToEnum("green", boxed);
    EXPECT_EQ((Kernite::NarrowToType<Primitive<Color>, Any>(boxed.Get())->GetValue()), Color::Green);
    EXPECT_EQ(type->EnumToString(boxed.Get()), "green");
    EXPECT_THROW(type->StringToEnum("purple", boxed), Kernite::InvalidArgumentException);
    EXPECT_EQ((Kernite::NarrowToType<Primitive<Color>, Any>(boxed.Get())->GetValue()), Color::Green);

    Ref<Any> number(new Primitive<int>(1));
    EXPECT_THROW(type->EnumToString(number.Get()), Kernite::TypeMismatchException);
    Ref<Any> outOfRange(new Primitive<Color>(static_cast<Color>(7)));
    EXPECT_EQ(InvalidArgument([&] { type->EnumToString(outOfRange.Get()); }), "Invalid argument : 7");
}

TEST(EnumTypeTest, ArraysConvertItemByItemOrNotAtAll) {
    EnumType* type = ColorType();
    Ref<Array<Color>> values(new Array<Color>{Color::Blue, Color::Red});
    Ref<Array<std::string>> tags;
    type->EnumArrayToStringArray(values.Get(), tags);
    EXPECT_EQ(tags->GetItems(), (std::vector<std::string>{"blue", "red"}));

    Ref<Any> back;
    type->StringArrayToEnumArray(tags.Get(), back);
    EXPECT_TRUE(back->_IsEqual(values.Get()));

    Ref<Array<std::string>> none(new Array<std::string>());
    type->StringArrayToEnumArray(none.Get(), back);
    EXPECT_EQ((Kernite::NarrowToType<Array<Color>, Any>(back.Get())->GetLength()), 0);

    Ref<Array<std::string>> bad(new Array<std::string>{"red", "bad"});
    Any* before = back.Get();
    EXPECT_EQ(InvalidArgument([&] { type->StringArrayToEnumArray(bad.Get(), back); }), "Invalid argument : bad");
    EXPECT_EQ(back.Get(), before);

    Ref<Array<Color>> outOfRange(new Array<Color>{Color::Red, static_cast<Color>(3)});
    Array<std::string>* kept = tags.Get();
    EXPECT_THROW(type->EnumArrayToStringArray(outOfRange.Get(), tags), Kernite::InvalidArgumentException);
    EXPECT_EQ(tags.Get(), kept);
    EXPECT_THROW(type->EnumArrayToStringArray(tags.Get(), tags), Kernite::TypeMismatchException);

    Ref<Any> created;
    type->CreateArrayInstance(created);
    EXPECT_EQ(created->_GetType(), Orbit::GetType<Color>()->GetArrayType());
}

}  // namespace
