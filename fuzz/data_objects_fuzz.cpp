// A byte-driven sequence of operations on any registered data type: the record
// functions with any index, copies and clones, sizes, equality and narrowing, and
// the conversions of any registered enumeration.
// Invariants: nothing crashes; the only exceptions are those the operation
// names (an unset optional read, a value of the wrong class); a copy is equal to
// its source and independent of it; a refused write changes nothing; and when the
// input is done every object it made is gone.
#include <cstdint>
#include <cstdio>
#include <cstdlib>
#include <string>
#include <typeinfo>
#include <vector>

#include "tarn/types.h"
#include "values.h"

namespace {

using Kernite::Ref;
using Orbit::Any;
using Orbit::DataObject;
using Orbit::DataObjectType;
using Reliability::Chooser;
using Reliability::Storage;
using Reliability::Stranger;

[[noreturn]] void Finding(const std::string& what) {
    std::fprintf(stderr, "data object fuzzer: %s\n", what.c_str());
    std::abort();
}

unsigned int Exact(unsigned int n) { return n; }
unsigned int RoundUp(unsigned int n) { return (n + 15) & ~15u; }

std::vector<DataObjectType*>& Types() {
    static std::vector<DataObjectType*> types = Reliability::RegisteredDataTypes();
    return types;
}

std::vector<Orbit::EnumType*>& Enums() {
    static std::vector<Orbit::EnumType*> enums = [] {
        std::vector<Orbit::EnumType*> out;
        for (Orbit::Type* type : Orbit::GetTypeMap()->GetTypes())
            if (auto* e = dynamic_cast<Orbit::EnumType*>(type)) out.push_back(e);
        return out;
    }();
    return enums;
}

long gBaseline = 0;

bool Equal(Any* a, Any* b) { return a->_IsEqual(b, true) && b->_IsEqual(a, true); }

// A copy equals its source both ways, has its class, and shows no differences.
void CheckCopy(DataObject* source, Any* copy) {
    if (copy == source) Finding("a data object's clone is the object itself");
    if (typeid(*copy) != typeid(*source)) Finding("a clone of another class");
    if (!Equal(source, copy)) Finding("a clone differs from its source: " + source->_GetType()->GetName());
    Orbit::PropertyDiffSet diffs;
    source->_DiffProperties(copy, "", diffs);
    if (!diffs.IsEmpty()) Finding("a clone shows differences at " + diffs.GetPaths()[0]);
}

// One property, chosen across the whole chain: its level and its index there.
struct Slot {
    const DataObjectType* level = nullptr;
    int index = 0;
};

Slot ChooseSlot(DataObject* object, Chooser& choose) {
    std::vector<Slot> slots;
    for (const DataObjectType* level : Reliability::Chain(object->_GetDataType()))
        for (int i = 0; i < static_cast<int>(level->GetProperties().size()); ++i) slots.push_back({level, i});
    if (slots.empty()) return {object->_GetDataType(), 0};
    return slots[choose.Below(static_cast<std::uint32_t>(slots.size()))];
}

// Reads a property into storage of its kind; an unset optional may refuse.
void Read(DataObject* object, const Slot& slot) {
    const auto& properties = slot.level->GetProperties();
    const Orbit::DataTypeInfo* info = slot.level->GetDataTypeInfo();
    if (slot.index >= static_cast<int>(properties.size())) {
        Ref<Any> untouched(new Orbit::Primitive<int>(1));
        Any* before = untouched.Get();
        info->getProperty(object, slot.index, &untouched);
        if (untouched.Get() != before) Finding("getProperty past the properties wrote its storage");
        if (!info->isPropertySet(object, slot.index)) Finding("isPropertySet past the properties answered false");
        return;
    }
    const bool set = info->isPropertySet(object, slot.index);
    try {
        switch (Reliability::StorageOf(properties[slot.index])) {
        case Storage::String: { std::string v; info->getProperty(object, slot.index, &v); break; }
        case Storage::Bool: { bool v; info->getProperty(object, slot.index, &v); break; }
        case Storage::Int:
        case Storage::Enum: { int v; info->getProperty(object, slot.index, &v); break; }
        case Storage::Long: { long long v; info->getProperty(object, slot.index, &v); break; }
        case Storage::Double: { double v; info->getProperty(object, slot.index, &v); break; }
        case Storage::DateTime: { Kernite::System::DateTime v; info->getProperty(object, slot.index, &v); break; }
        case Storage::MethodName: { Orbit::MethodName v; info->getProperty(object, slot.index, &v); break; }
        case Storage::Reference: {
            Ref<Any> v;
            info->getProperty(object, slot.index, &v);
            if (properties[slot.index].IsArray() && !v) Finding("an array property read as null");
            if (set && !v) Finding("a set reference property read as null");
            if (v) v->_GetSize(Exact);
            break;
        }
        }
    } catch (const Kernite::NotInitializedException&) {
        if (set) Finding("a set property refused to be read: " + properties[slot.index].name);
    }
}

// Operations on a stack of objects; the top is the current one.
class Session {
public:
    explicit Session(Chooser& choose) : _choose(choose) {}

    void Run(DataObjectType* type) {
        _stack.push_back(type->CreateInstance());
        for (int step = 0; step < 48 && !_choose.Exhausted(); ++step) Step();
        for (const Ref<DataObject>& object : _stack) Snapshot(object.Get());
    }

private:
    DataObject* Top() const { return _stack.back().Get(); }

    Ref<Any> Snapshot(DataObject* object) {
        Ref<Any> copy(object->_Clone());
        CheckCopy(object, copy.Get());
        return copy;
    }

    void Step() {
        DataObject* object = Top();
        switch (_choose.Below(12)) {
        case 0:
        case 1: {  // write a chosen value
            Slot slot = ChooseSlot(object, _choose);
            if (slot.level->GetProperties().empty()) break;
            Reliability::SetChosen(object, slot.level, slot.index, _choose, static_cast<int>(_choose.Below(3)),
                                   static_cast<int>(_choose.Below(4)));
            break;
        }
        case 2: {  // read, at any index
            Slot slot = ChooseSlot(object, _choose);
            if (_choose.Below(8) == 0) slot.index = static_cast<int>(_choose.Below(40)) - 8;
            if (slot.index < 0) {
                Ref<Any> untouched;
                slot.level->GetDataTypeInfo()->getProperty(object, slot.index, &untouched);
                if (untouched) Finding("getProperty at a negative index wrote its storage");
                break;
            }
            Read(object, slot);
            break;
        }
        case 3: {  // unset; optional properties become unset, required ones stay
            Slot slot = ChooseSlot(object, _choose);
            const Orbit::DataTypeInfo* info = slot.level->GetDataTypeInfo();
            info->unsetProperty(object, slot.index);
            const auto& properties = slot.level->GetProperties();
            if (slot.index < static_cast<int>(properties.size()) && properties[slot.index].IsOptional() &&
                info->isPropertySet(object, slot.index))
                Finding("an optional property still set after unsetProperty: " + properties[slot.index].name);
            break;
        }
        case 4: {  // a copy is equal to its source, and independent of it
            Ref<Any> before = Snapshot(object);
            Ref<Any> copy(object->_Clone());
            auto* copied = Kernite::NarrowToType<DataObject, Any>(copy.Get());
            Slot slot = ChooseSlot(copied, _choose);
            if (!slot.level->GetProperties().empty())
                Reliability::SetChosen(copied, slot.level, slot.index, _choose, 1, 2);
            if (!Equal(object, before.Get())) Finding("writing a copy changed its source");
            break;
        }
        case 5: {  // sizes
            unsigned exact = object->_GetSize(Exact);
            unsigned rounded = object->_GetSize(RoundUp);
            if (exact < sizeof(Orbit::DynamicData) || rounded == 0) Finding("an impossible size");
            break;
        }
        case 6: {  // narrowing agrees with the type
            const bool fault = object->_GetDataType()->IsA(Orbit::GetType<Orbit::MethodFault>());
            bool narrowed = true;
            try {
                Kernite::NarrowToType<Orbit::MethodFault, Any>(object);
            } catch (const Kernite::TypeMismatchException&) {
                narrowed = false;
            }
            if (narrowed != fault) Finding("narrowing to a fault disagrees with the type");
            if (Kernite::NarrowToType<Orbit::DynamicData, Any>(object) == nullptr) Finding("not dynamic data");
            if (object->_GetType() != object->_GetDataType()) Finding("two types for one object");
            break;
        }
        case 7: {  // a value of the wrong class is refused and changes nothing
            Slot slot = ChooseSlot(object, _choose);
            const auto& properties = slot.level->GetProperties();
            if (slot.index >= static_cast<int>(properties.size())) break;
            const Orbit::Member& property = properties[slot.index];
            if (Reliability::StorageOf(property) != Storage::Reference) break;
            if (!property.IsArray() && property.typeRecord == &Orbit::gAnyTypeInfo) break;
            Ref<Any> before = Snapshot(object);
            Ref<Any> stranger(new Stranger());
            try {
                slot.level->GetDataTypeInfo()->setProperty(object, slot.index, stranger.Get());
                Finding("a value of the wrong class was taken: " + property.name);
            } catch (const Kernite::TypeMismatchException&) {
            }
            if (!Equal(object, before.Get())) Finding("a refused write changed the object");
            break;
        }
        case 8: {  // go into a nested data object
            Slot slot = ChooseSlot(object, _choose);
            const auto& properties = slot.level->GetProperties();
            if (slot.index >= static_cast<int>(properties.size()) || _stack.size() >= 6) break;
            if (Reliability::StorageOf(properties[slot.index]) != Storage::Reference) break;
            Ref<Any> held;
            slot.level->GetDataTypeInfo()->getProperty(object, slot.index, &held);
            if (auto* nested = dynamic_cast<DataObject*>(held.Get())) _stack.push_back(Ref<DataObject>(nested));
            else if (auto* array = dynamic_cast<Orbit::DataObjectArrayBase*>(held.Get())) {
                Ref<Any> copy(array->_Clone());
                if (!Equal(array, copy.Get())) Finding("a clone of an array differs from it");
            }
            break;
        }
        case 9: {  // back out, or start over with a new object of any type
            if (_stack.size() > 1) _stack.pop_back();
            else _stack.push_back(Types()[_choose.Below(static_cast<std::uint32_t>(Types().size()))]->CreateInstance());
            break;
        }
        case 10: {  // replace the object by its clone, through the record's own creation too
            Ref<Any> copy = Snapshot(object);
            Ref<DataObject> fresh = object->_GetDataType()->CreateInstance();
            if (typeid(*fresh) != typeid(*object)) Finding("createInstance made another class");
            _stack.back() = Ref<DataObject>(Kernite::NarrowToType<DataObject, Any>(copy.Get()));
            break;
        }
        case 11: Enumeration(*Enums()[_choose.Below(static_cast<std::uint32_t>(Enums().size()))]); break;
        }
    }

    // A tag: a real one, one changed, or any text.
    std::string ChooseTag(const std::vector<std::string>& tags) {
        std::string tag = _choose.Below(3) ? tags[_choose.Below(static_cast<std::uint32_t>(tags.size()))] : _choose.Text();
        if (_choose.Below(4) == 0) tag += static_cast<char>(_choose.Byte());
        return tag;
    }

    // A known tag and its value convert both ways, one by one and as arrays; anything
    // else is refused and leaves the output as it was.
    void Enumeration(Orbit::EnumType& type) {
        std::vector<std::string> tags;
        type.GetEnumTags(tags);
        const int count = static_cast<int>(tags.size());
        const int value = static_cast<int>(_choose.Below(static_cast<std::uint32_t>(count) + 2)) - 1;
        const bool inRange = value >= 0 && value < count;
        if (Refused([&] { type.GetTag(value); }) == inRange) Finding("GetTag of " + std::to_string(value));
        Ref<Orbit::Array<std::string>> names(new Orbit::Array<std::string>());
        bool known = true;
        for (std::uint32_t n = _choose.Below(5) + 1; n > 0; --n) {
            names->Append(ChooseTag(tags));
            known = known && type.HasValue(names->GetItems().back());
            if (known && type.GetTag(type.GetValue(names->GetItems().back())) != names->GetItems().back())
                Finding("a tag does not come back: " + names->GetItems().back());
        }
        Ref<Any> kept(new Orbit::Primitive<int>(0));
        Ref<Any> box = kept, values = kept;
        if (Refused([&] { type.StringToEnum(names->GetAt(0), box); }) == type.HasValue(names->GetAt(0)) ||
            Refused([&] { type.StringArrayToEnumArray(names.Get(), values); }) == known)
            Finding("a conversion refused a known tag or took an unknown one");
        if (!known) {
            if (values != kept) Finding("a refused conversion wrote its output");
            return;
        }
        Ref<Orbit::Array<std::string>> back;
        type.EnumArrayToStringArray(values.Get(), back);
        if (!back->_IsEqual(names.Get()) || type.EnumToString(box.Get()) != names->GetAt(0))
            Finding("tags do not come back through a box or an array");
    }

    template <class Call>
    static bool Refused(Call call) {
        try {
            call();
        } catch (const Kernite::InvalidArgumentException&) {
            return true;
        }
        return false;
    }

    Chooser& _choose;
    std::vector<Ref<DataObject>> _stack;
};

}  // namespace

extern "C" int LLVMFuzzerInitialize(int*, char***) {
    // Whatever exists once per process (type objects, array types) is made now, so
    // that every input starts from the same count of live objects.
    for (DataObjectType* type : Types()) {
        Ref<DataObject> object = Reliability::MakePopulated(type, 5, 2, 2);
        Ref<Any> copy(object->_Clone());
        object->_IsEqual(copy.Get(), true);
        type->CreateArray()->_GetType();
        type->GetArrayType();
    }
    gBaseline = Kernite::ObjectImpl::LiveObjects();
    return 0;
}

extern "C" int LLVMFuzzerTestOneInput(const std::uint8_t* data, std::size_t size) {
    Chooser choose(data, size);
    {
        Session session(choose);
        session.Run(Types()[choose.Below(static_cast<std::uint32_t>(Types().size()))]);
    }
    const long live = Kernite::ObjectImpl::LiveObjects();
    if (live != gBaseline) Finding("objects leaked: " + std::to_string(live - gBaseline));
    return 0;
}
