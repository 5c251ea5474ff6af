// The catalogue's enumerations: their type objects, tag constants and the value
// templates instantiated for them.
#include <gtest/gtest.h>

#include <cctype>
#include <string>
#include <vector>

#include "support.h"
#include "tarn/profiler.h"
#include "tarn/rudder.h"
#include "tarn/tarn.h"

using Kernite::InvalidArgumentException;
using Kernite::Ref;
using Kernite::TypeMismatchException;
using Orbit::Any;
using Orbit::Array;
using Orbit::EnumType;
using Orbit::Primitive;
using LockMode = Tarn::LockStresser::LockMode;
using CounterType = Tarn::Profiler::CounterType;
using Correlation = Tarn::Rudder::RudderDebugManager::DatastoreCorrelationType;
using namespace TypesTest;

namespace {

template <class E>
EnumType* TypeOf() {
    return Kernite::NarrowToType<EnumType, Orbit::Type>(Orbit::GetType<E>());
}

// What each enumeration's generated code must agree on: the wire name, the tag
// constants in declaration order, and the C++ enumerators at the same positions.
template <class E>
struct Enumeration;

template <>
struct Enumeration<LockMode> {
    static constexpr const char* wire = "tarn.LockStresser.LockMode";
    static std::vector<std::string> Tags() {
        using L = Tarn::LockStresser;
        return {L::LOCKMODE_X, L::LOCKMODE_S, L::LOCKMODE_XALL, L::LOCKMODE_SALL};
    }
    static std::vector<LockMode> Values() { return {LockMode::x, LockMode::s, LockMode::xall, LockMode::sall}; }
};

template <>
struct Enumeration<CounterType> {
    static constexpr const char* wire = "tarn.profiler.CounterType";
    static std::vector<std::string> Tags() {
        return {Tarn::Profiler::COUNTERTYPE_COUNTER64, Tarn::Profiler::COUNTERTYPE_GAUGE64};
    }
    static std::vector<CounterType> Values() { return {CounterType::counter64, CounterType::gauge64}; }
};

template <>
struct Enumeration<Correlation> {
    static constexpr const char* wire = "tarn.rudder.RudderDebugManager.DatastoreCorrelationType";
    static std::vector<std::string> Tags() {
        using R = Tarn::Rudder::RudderDebugManager;
        return {R::DATASTORECORRELATIONTYPE_STORAGERMONLY, R::DATASTORECORRELATIONTYPE_PLUMBONLY,
                R::DATASTORECORRELATIONTYPE_ALL};
    }
    static std::vector<Correlation> Values() {
        return {Correlation::storageRMOnly, Correlation::plumbOnly, Correlation::all};
    }
};

template <class E>
class EnumerationTest : public ::testing::Test {};
using Enumerations = ::testing::Types<LockMode, CounterType, Correlation>;
TYPED_TEST_SUITE(EnumerationTest, Enumerations);

TYPED_TEST(EnumerationTest, TypeTagsConstantsAndEnumeratorsAgree) {
    using E = TypeParam;
    EnumType* type = TypeOf<E>();
    ASSERT_NE(type, nullptr);
    EXPECT_EQ(Orbit::GetType<E>(), Orbit::GetType<E>());
    EXPECT_EQ(type->GetKind(), Orbit::Kind::Enum);
    EXPECT_EQ(type->GetName(), Enumeration<E>::wire);
    EXPECT_EQ(Orbit::GetTypeMap()->GetType(Enumeration<E>::wire), Orbit::GetType<E>());
    EXPECT_EQ(type->GetBaseType(), nullptr);

    const std::vector<std::string> tags = Enumeration<E>::Tags();
    std::vector<std::string> registered{"stale"};
    type->GetEnumTags(registered);
    EXPECT_EQ(registered, tags);
    const std::vector<E> values = Enumeration<E>::Values();
    for (std::size_t i = 0; i < tags.size(); ++i) {
        SCOPED_TRACE(tags[i]);
        EXPECT_EQ(type->GetValue(tags[i]), static_cast<int>(values[i]));
        EXPECT_EQ(type->GetTag(static_cast<int>(i)), tags[i]);
        EXPECT_TRUE(type->HasValue(tags[i]));
        Ref<Any> boxed;
        type->StringToEnum(tags[i], boxed);
        auto* box = dynamic_cast<Primitive<E>*>(boxed.Get());
        ASSERT_NE(box, nullptr);
        EXPECT_EQ(box->GetValue(), values[i]);
        EXPECT_EQ(type->EnumToString(box), tags[i]);
    }
    const std::string count = std::to_string(tags.size());
    EXPECT_EQ(MessageOf<InvalidArgumentException>([&] { type->GetTag(static_cast<int>(tags.size())); }),
              "Invalid argument : " + count);
    std::string shouted = tags.back();
    for (char& c : shouted) c = static_cast<char>(std::toupper(static_cast<unsigned char>(c)));
    EXPECT_FALSE(type->HasValue(shouted));
    EXPECT_EQ(MessageOf<InvalidArgumentException>([&] { type->GetValue(shouted); }), "Invalid argument : " + shouted);
}

TEST(LockModeTest, ConversionsAndTheirErrors) {
    EnumType* type = TypeOf<LockMode>();
    EXPECT_EQ(type->GetValue("sall"), 3);
    EXPECT_EQ(type->GetTag(1), "s");
    EXPECT_EQ(MessageOf<InvalidArgumentException>([&] { type->GetValue("X"); }), "Invalid argument : X");
    EXPECT_EQ(MessageOf<InvalidArgumentException>([&] { type->GetTag(4); }), "Invalid argument : 4");
    EXPECT_EQ(MessageOf<InvalidArgumentException>([&] { type->GetTag(-1); }), "Invalid argument : -1");
    EXPECT_FALSE(type->HasValue(""));

    // Arrays of tags to arrays of values and back.
    Ref<Any> values;
    type->StringArrayToEnumArray(Make<Array<std::string>>().Get(), values);
    auto* empty = dynamic_cast<Array<LockMode>*>(values.Get());
    ASSERT_NE(empty, nullptr);
    EXPECT_EQ(empty->GetLength(), 0);

    Ref<Any> kept(new Primitive<int>(0));
    Any* before = kept.Get();
    auto mixed = Make<Array<std::string>>(std::vector<std::string>{"x", "bad"});
    EXPECT_EQ(MessageOf<InvalidArgumentException>([&] { type->StringArrayToEnumArray(mixed.Get(), kept); }),
              "Invalid argument : bad");
    EXPECT_EQ(kept.Get(), before);

    Ref<Array<std::string>> strings;
    type->EnumArrayToStringArray(Make<Array<LockMode>>(std::vector<LockMode>{LockMode::sall, LockMode::x}).Get(),
                                 strings);
    ASSERT_NE(strings, nullptr);
    EXPECT_EQ(strings->GetItems(), (std::vector<std::string>{"sall", "x"}));
    Ref<Array<std::string>> untouched = strings;
    auto outOfRange = Make<Array<LockMode>>(std::vector<LockMode>{LockMode::s, static_cast<LockMode>(7)});
    EXPECT_EQ(MessageOf<InvalidArgumentException>([&] { type->EnumArrayToStringArray(outOfRange.Get(), strings); }),
              "Invalid argument : 7");
    EXPECT_EQ(strings, untouched);
    auto counters = Make<Array<CounterType>>(std::vector<CounterType>{CounterType::gauge64});
    EXPECT_EQ(MessageOf<TypeMismatchException>([&] { type->EnumArrayToStringArray(counters.Get(), strings); }),
              (MismatchText<Array<LockMode>, Any>()));

    // Boxes of another type are not this enumeration's values.
    Primitive<int> number(2);
    EXPECT_EQ(MessageOf<TypeMismatchException>([&] { type->EnumToString(&number); }),
              (MismatchText<Primitive<LockMode>, Any>()));
    Primitive<LockMode> outside(static_cast<LockMode>(4));
    EXPECT_EQ(MessageOf<InvalidArgumentException>([&] { type->EnumToString(&outside); }), "Invalid argument : 4");
    Ref<Any> out(new Primitive<int>(9));
    Any* previous = out.Get();
    EXPECT_EQ(MessageOf<InvalidArgumentException>([&] { type->StringToEnum("XALL", out); }),
              "Invalid argument : XALL");
    EXPECT_EQ(out.Get(), previous);

    Ref<Any> fresh;
    type->CreateArrayInstance(fresh);
    auto* made = dynamic_cast<Array<LockMode>*>(fresh.Get());
    ASSERT_NE(made, nullptr);
    EXPECT_TRUE(made->IsEmpty());
}

TEST(LockModeTest, BoxesAreSharedAndCompareOnlyWithTheirOwnKind) {
    Ref<Primitive<LockMode>> box(new Primitive<LockMode>(LockMode::xall));
    Ref<Any> clone(box->_Clone());
    EXPECT_EQ(clone.Get(), box.Get());
    EXPECT_EQ(box->GetRefCount(), 2);
    EXPECT_EQ(box->_GetType(), Orbit::GetType<LockMode>());
    EXPECT_EQ(box->_GetSize(Rounded), Rounded(sizeof(Primitive<LockMode>)) + Rounded(0));

    Primitive<LockMode> same(LockMode::xall);
    Primitive<LockMode> other(LockMode::s);
    EXPECT_TRUE(box->_IsEqual(&same));
    EXPECT_FALSE(box->_IsEqual(&other));
    Primitive<int> two(2);
    EXPECT_EQ(MessageOf<TypeMismatchException>([&] { box->_IsEqual(&two); }),
              (MismatchText<Primitive<LockMode>, Any>()));
    Orbit::PropertyDiffSet diffs;
    box->_DiffProperties(&same, "mode", diffs);
    box->_DiffProperties(&other, "mode", diffs);
    EXPECT_EQ(diffs.GetPaths(), std::vector<std::string>{"mode"});
}

TEST(LockModeTest, ValueArraysCopyCompareAndMeasure) {
    Ref<Array<LockMode>> modes(new Array<LockMode>());
    modes->GetItems().reserve(4);
    modes->Append(LockMode::x);
    modes->Append(LockMode::sall);
    ASSERT_EQ(modes->GetItems().capacity(), 4u);
    EXPECT_EQ(modes->_GetSize(Exact), sizeof(Array<LockMode>) + 16);
    EXPECT_EQ(modes->_GetType(), Orbit::GetType<LockMode>()->GetArrayType());

    Ref<Any> copy(modes->_Clone());
    auto* copied = dynamic_cast<Array<LockMode>*>(copy.Get());
    ASSERT_NE(copied, nullptr);
    EXPECT_NE(copied, modes.Get());
    EXPECT_TRUE(modes->_IsEqual(copied));
    copied->Append(LockMode::s);
    EXPECT_FALSE(modes->_IsEqual(copied));
    EXPECT_EQ(modes->GetLength(), 2);

    auto tags = Make<Array<std::string>>(std::vector<std::string>{"x", "sall"});
    EXPECT_FALSE(modes->_IsEqual(tags.Get()));
    Orbit::PropertyDiffSet diffs;
    modes->_DiffProperties(tags.Get(), "modes", diffs);
    EXPECT_EQ(diffs.GetPaths(), std::vector<std::string>{"modes"});
    modes->Clear();
    EXPECT_TRUE(modes->IsEmpty());
}

}  // namespace
