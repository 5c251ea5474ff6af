// The enumeration conversions on any input: tags and values in and out, one by one
// and as arrays, with unknown tags, values outside the tags, values of the wrong
// class and null. Invariants: a known tag and its value convert both ways; anything
// else is an InvalidArgumentException naming the offending tag or value (a
// TypeMismatchException for a value of the wrong class), and the output is left as
// it was.
#include <cstdint>
#include <cstdio>
#include <cstdlib>
#include <string>
#include <vector>

#include "cairn/cairn.h"
#include "tarn/types.h"
#include "values.h"

namespace {

using Kernite::Ref;
using Orbit::Any;
using Reliability::Chooser;

[[noreturn]] void Finding(const std::string& what) {
    std::fprintf(stderr, "enumeration fuzzer: %s\n", what.c_str());
    std::abort();
}

template <class Call>
std::string Refusal(Call call) {
    try {
        call();
    } catch (const Kernite::InvalidArgumentException& e) {
        return e.what();
    } catch (const Kernite::TypeMismatchException&) {
        return "type mismatch";
    }
    return "";
}

// A tag: often a real one, sometimes a real one changed, sometimes anything.
std::string ChooseTag(Chooser& choose, const std::vector<std::string>& tags) {
    std::string tag = tags[choose.Below(static_cast<std::uint32_t>(tags.size()))];
    switch (choose.Below(6)) {
    case 0: tag[choose.Below(static_cast<std::uint32_t>(tag.size()))] ^= static_cast<char>(choose.Byte() | 1); break;
    case 1: tag = tag.substr(0, choose.Below(static_cast<std::uint32_t>(tag.size()))); break;
    case 2: tag += static_cast<char>(choose.Byte()); break;
    case 3: {
        std::string raw;
        for (std::uint32_t n = choose.Below(12); n > 0; --n) raw += static_cast<char>(choose.Byte());
        tag = raw;
        break;
    }
    default: break;
    }
    return tag;
}

int ChooseValue(Chooser& choose, int count) {
    switch (choose.Below(4)) {
    case 0: return static_cast<int>(choose.Below(1u << 31)) * (choose.Below(2) ? 1 : -1);
    case 1: return count + static_cast<int>(choose.Below(3)) - 1;  // around the end
    default: return static_cast<int>(choose.Below(static_cast<std::uint32_t>(count)));
    }
}

template <class E>
void Exercise(Chooser& choose) {
    auto* type = Kernite::NarrowToType<Orbit::EnumType, Orbit::Type>(Orbit::GetType<E>());
    std::vector<std::string> tags;
    type->GetEnumTags(tags);
    const int count = static_cast<int>(tags.size());
    for (int step = 0; step < 16 && !choose.Exhausted(); ++step) {
        switch (choose.Below(6)) {
        case 0: {  // tag to value and back
            const std::string tag = ChooseTag(choose, tags);
            if (type->HasValue(tag)) {
                const int value = type->GetValue(tag);
                if (value < 0 || value >= count || type->GetTag(value) != tag) Finding("a tag does not come back: " + tag);
                Ref<Any> box;
                type->StringToEnum(tag, box);
                if (type->EnumToString(box.Get()) != tag) Finding("a boxed tag does not come back: " + tag);
            } else {
                // what() is a C string: a tag with a NUL in it shows up to the NUL.
                const std::string expected = ("Invalid argument : " + tag).c_str();
                if (Refusal([&] { type->GetValue(tag); }) != expected) Finding("unknown tag: " + tag);
                Ref<Any> kept(new Orbit::Primitive<E>(E{}));
                Ref<Any> out = kept;
                if (Refusal([&] { type->StringToEnum(tag, out); }).empty() || out != kept) Finding("StringToEnum took " + tag);
            }
            break;
        }
        case 1: {  // value to tag
            const int value = ChooseValue(choose, count);
            const std::string refusal = Refusal([&] { type->GetTag(value); });
            const bool known = value >= 0 && value < count;
            if (known != refusal.empty()) Finding("GetTag of " + std::to_string(value));
            if (!known && refusal != "Invalid argument : " + std::to_string(value)) Finding("GetTag said " + refusal);
            Ref<Any> box(new Orbit::Primitive<E>(static_cast<E>(value)));
            if (Refusal([&] { type->EnumToString(box.Get()); }) != refusal) Finding("EnumToString disagrees with GetTag");
            break;
        }
        case 2: {  // tags to values, all or nothing
            Ref<Orbit::Array<std::string>> names(new Orbit::Array<std::string>());
            bool allKnown = true;
            for (std::uint32_t n = choose.Below(6); n > 0; --n) {
                names->Append(ChooseTag(choose, tags));
                allKnown = allKnown && type->HasValue(names->GetItems().back());
            }
            Ref<Any> kept(new Orbit::Array<E>());
            Ref<Any> out = kept;
            const std::string refusal = Refusal([&] { type->StringArrayToEnumArray(names.Get(), out); });
            if (allKnown != refusal.empty()) Finding("StringArrayToEnumArray: " + refusal);
            if (!allKnown) {
                if (out != kept) Finding("a failed StringArrayToEnumArray changed its output");
                break;
            }
            auto* values = Kernite::NarrowToType<Orbit::Array<E>, Any>(out.Get());
            if (values == nullptr || values->GetLength() != names->GetLength()) Finding("lost values");
            for (int i = 0; i < values->GetLength(); ++i)
                if (type->GetTag(static_cast<int>(values->GetAt(i))) != names->GetAt(i)) Finding("a value changed its tag");
            Ref<Orbit::Array<std::string>> back;
            type->EnumArrayToStringArray(values, back);
            if (!back->_IsEqual(names.Get())) Finding("tags do not come back through an array");
            break;
        }
        case 3: {  // values to tags, all or nothing
            Ref<Orbit::Array<E>> values(new Orbit::Array<E>());
            bool allKnown = true;
            for (std::uint32_t n = choose.Below(6); n > 0; --n) {
                const int value = ChooseValue(choose, count);
                allKnown = allKnown && value >= 0 && value < count;
                values->Append(static_cast<E>(value));
            }
            Ref<Orbit::Array<std::string>> kept(new Orbit::Array<std::string>({"kept"}));
            Ref<Orbit::Array<std::string>> out = kept;
            const std::string refusal = Refusal([&] { type->EnumArrayToStringArray(values.Get(), out); });
            if (allKnown != refusal.empty()) Finding("EnumArrayToStringArray: " + refusal);
            if (!allKnown && out != kept) Finding("a failed EnumArrayToStringArray changed its output");
            if (allKnown && out->GetLength() != values->GetLength()) Finding("lost tags");
            break;
        }
        case 4: {  // values of the wrong class, and null
            Ref<Any> number(new Orbit::Primitive<int>(static_cast<int>(choose.Below(4))));
            Ref<Any> numbers(new Orbit::Array<int>({0, 1}));
            Ref<Orbit::Array<std::string>> out;
            if (Refusal([&] { type->EnumToString(number.Get()); }) != "type mismatch") Finding("EnumToString took an int");
            if (Refusal([&] { type->EnumArrayToStringArray(numbers.Get(), out); }) != "type mismatch")
                Finding("EnumArrayToStringArray took ints");
            if (Refusal([&] { type->EnumToString(nullptr); }).empty()) Finding("EnumToString took null");
            if (Refusal([&] { type->EnumArrayToStringArray(nullptr, out); }).empty()) Finding("EnumArrayToStringArray took null");
            Ref<Any> any;
            if (Refusal([&] { type->StringArrayToEnumArray(nullptr, any); }).empty()) Finding("StringArrayToEnumArray took null");
            if (out || any) Finding("a refused conversion wrote its output");
            break;
        }
        case 5: {  // boxes and arrays of the enumeration behave as values
            Ref<Any> array;
            type->CreateArrayInstance(array);
            Ref<Any> copy(array->_Clone());
            if (!array->_IsEqual(copy.Get()) || array->_GetType() != type->GetArrayType()) Finding("an empty array");
            Ref<Any> box(new Orbit::Primitive<E>(static_cast<E>(ChooseValue(choose, count))));
            if (box->_Clone() != box.Get()) Finding("a box was copied");
            break;
        }
        }
    }
}

using Exerciser = void (*)(Chooser&);
// The catalogue's enumerations, and those of the outside library that properties use.
const Exerciser kEnumerations[] = {
    &Exercise<Tarn::LockStresser::LockMode>,
    &Exercise<Tarn::Profiler::CounterType>,
    &Exercise<Tarn::Rudder::RudderDebugManager::DatastoreCorrelationType>,
    &Exercise<Cairn::VirtualMachine::PowerState>,
    &Exercise<Cairn::VirtualMachine::MovePriority>,
    &Exercise<Cairn::ManagedEntity::Status>,
};

long gBaseline = 0;

}  // namespace

extern "C" int LLVMFuzzerInitialize(int*, char***) {
    for (Exerciser exercise : kEnumerations) {
        Chooser warmUp(1);
        exercise(warmUp);
    }
    gBaseline = Kernite::ObjectImpl::LiveObjects();
    return 0;
}

extern "C" int LLVMFuzzerTestOneInput(const std::uint8_t* data, std::size_t size) {
    Chooser choose(data, size);
    while (!choose.Exhausted()) kEnumerations[choose.Below(sizeof kEnumerations / sizeof kEnumerations[0])](choose);
    if (Kernite::ObjectImpl::LiveObjects() != gBaseline) Finding("objects leaked");
    return 0;
}
