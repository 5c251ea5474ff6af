#include "values.h"

#include <stdexcept>

namespace Reliability {

using Kernite::Ref;
using Orbit::Any;

Storage StorageOf(const Orbit::Member& property) {
    if (property.IsArray()) return Storage::Reference;
    const Orbit::TypeInfo* t = property.typeRecord;
    if (t == &Orbit::gStringTypeInfo) return Storage::String;
    if (t == &Orbit::gBoolTypeInfo) return Storage::Bool;
    if (t == &Orbit::gIntTypeInfo) return Storage::Int;
    if (t == &Orbit::gLongTypeInfo) return Storage::Long;
    if (t == &Orbit::gDoubleTypeInfo) return Storage::Double;
    if (t == &Orbit::gDateTimeTypeInfo) return Storage::DateTime;
    if (t == &Orbit::gMethodNameTypeInfo) return Storage::MethodName;
    if (t != nullptr && t->kind == Orbit::Kind::Enum) return Storage::Enum;
    return Storage::Reference;
}

std::uint32_t Chooser::Below(std::uint32_t bound) {
    if (bound == 0) return 0;
    std::uint32_t n;
    if (_data != nullptr) {
        n = Byte();
        if (bound > 256) n = n << 8 | Byte();
    } else {
        _seed ^= _seed << 13;
        _seed ^= _seed >> 17;
        _seed ^= _seed << 5;
        n = _seed;
    }
    return n % bound;
}

std::uint8_t Chooser::Byte() {
    if (_data == nullptr) return static_cast<std::uint8_t>(Below(256));
    return _next < _size ? _data[_next++] : 0;
}

std::string Chooser::Text() {
    // Lengths both inside and beyond the small-string buffer.
    static const char kLetters[] = "abcdefghijklmnopqrstuvwxyz0123456789 ._-/";
    std::size_t length = Below(4) == 0 ? 24 + Below(40) : Below(12);
    std::string text;
    for (std::size_t i = 0; i < length; ++i) text += kLetters[Below(sizeof kLetters - 1)];
    return text;
}

std::vector<const Orbit::DataObjectType*> Chain(const Orbit::DataObjectType* type) {
    std::vector<const Orbit::DataObjectType*> chain;
    for (const Orbit::DataObjectType* t = type; t != nullptr; t = t->GetBaseDataType()) chain.insert(chain.begin(), t);
    return chain;
}

std::vector<Orbit::DataObjectType*> RegisteredDataTypes() {
    std::vector<Orbit::DataObjectType*> out;
    for (Orbit::Type* type : Orbit::GetTypeMap()->GetTypes())
        if (auto* data = dynamic_cast<Orbit::DataObjectType*>(type)) out.push_back(data);
    return out;
}

namespace {

Orbit::Type* TypeOf(const Orbit::Member& property) {
    Orbit::Type* type = property.GetType();
    if (type == nullptr) throw std::logic_error("unresolved type of property " + property.name);
    return type;
}

int TagCount(const Orbit::Member& property) {
    auto* type = dynamic_cast<Orbit::EnumType*>(TypeOf(property));
    if (type == nullptr) throw std::logic_error("not an enumeration: " + property.name);
    std::vector<std::string> tags;
    type->GetEnumTags(tags);
    return static_cast<int>(tags.size());
}

Ref<Any> MakeObject(const Orbit::Member& item, Chooser& choose, int depth, int items) {
    const Orbit::TypeInfo* record = item.typeRecord;
    if (record == &Orbit::gAnyTypeInfo) {
        switch (choose.Below(3)) {
        case 0: return Ref<Any>(new Orbit::Primitive<int>(static_cast<int>(choose.Below(1000))));
        case 1: return Ref<Any>(new Orbit::Primitive<std::string>(choose.Text()));
        default: return Ref<Any>(new Orbit::MoRef("cairn.HostSystem", "host-" + choose.Text()));
        }
    }
    if (record->kind == Orbit::Kind::Managed) return Ref<Any>(new Orbit::MoRef(record->name, "mo-" + choose.Text()));
    auto* type = dynamic_cast<Orbit::DataObjectType*>(TypeOf(item));
    if (type == nullptr) throw std::logic_error("no data type for property " + item.name);
    Ref<Orbit::DataObject> object = type->CreateInstance();
    if (depth > 0) Populate(object.Get(), choose, depth - 1, items);
    return Ref<Any>(object.Get());
}

template <class T, class Make>
Ref<Any> ValueArray(int n, Make make) {
    Ref<Orbit::Array<T>> array(new Orbit::Array<T>());
    for (int i = 0; i < n; ++i) array->Append(make());
    return Ref<Any>(array.Get());
}

Ref<Any> MakeArray(const Orbit::Member& property, Chooser& choose, int depth, int items) {
    const Orbit::TypeInfo* record = property.typeRecord;
    const int n = items;
    if (record == &Orbit::gStringTypeInfo) return ValueArray<std::string>(n, [&] { return choose.Text(); });
    if (record == &Orbit::gIntTypeInfo) return ValueArray<int>(n, [&] { return static_cast<int>(choose.Below(100000)); });
    if (record == &Orbit::gLongTypeInfo) return ValueArray<long long>(n, [&] { return 7LL * choose.Below(1u << 30); });
    if (record == &Orbit::gDoubleTypeInfo) return ValueArray<double>(n, [&] { return choose.Below(1000) / 8.0; });
    if (record == &Orbit::gBoolTypeInfo) return ValueArray<bool>(n, [&] { return choose.Below(2) == 1; });
    if (record->kind == Orbit::Kind::Enum) {
        auto* type = dynamic_cast<Orbit::EnumType*>(TypeOf(property));
        std::vector<std::string> tags;
        type->GetEnumTags(tags);
        Ref<Orbit::Array<std::string>> names(new Orbit::Array<std::string>());
        for (int i = 0; i < n; ++i) names->Append(tags[choose.Below(static_cast<std::uint32_t>(tags.size()))]);
        Ref<Any> values;
        type->StringArrayToEnumArray(names.Get(), values);
        return values;
    }
    if (record == &Orbit::gAnyTypeInfo || record->kind == Orbit::Kind::Managed) {
        Ref<Orbit::DataObjectArrayBase> array(record == &Orbit::gAnyTypeInfo
                                                  ? static_cast<Orbit::DataObjectArrayBase*>(new Orbit::DataArray<Any>())
                                                  : new Orbit::DataArray<Orbit::MoRef>());
        for (int i = 0; i < n; ++i) array->CheckedAppend(MakeObject(property, choose, depth, items).Get());
        return Ref<Any>(array.Get());
    }
    auto* type = dynamic_cast<Orbit::DataObjectType*>(TypeOf(property));
    if (type == nullptr) throw std::logic_error("no array class for property " + property.name);
    Ref<Any> created = type->CreateArray();
    auto* array = Kernite::NarrowToType<Orbit::DataObjectArrayBase, Any>(created.Get());
    for (int i = 0; i < n; ++i) {
        // Now and then a null item, which arrays of objects may hold.
        if (choose.Below(8) == 0) array->CheckedAppend(nullptr);
        else array->CheckedAppend(MakeObject(property, choose, depth, items).Get());
    }
    return created;
}

}  // namespace

Ref<Any> MakeReference(const Orbit::Member& property, Chooser& choose, int depth, int items) {
    if (property.IsArray()) return MakeArray(property, choose, depth, items);
    return MakeObject(property, choose, depth, items);
}

void SetChosen(Orbit::DataObject* object, const Orbit::DataObjectType* level, int index, Chooser& choose, int depth,
               int items) {
    const Orbit::DataTypeInfo* info = level->GetDataTypeInfo();
    const Orbit::Member& property = level->GetProperties().at(static_cast<std::size_t>(index));
    switch (StorageOf(property)) {
    case Storage::String: {
        std::string v = choose.Text();
        info->setProperty(object, index, &v);
        break;
    }
    case Storage::Bool: {
        bool v = choose.Below(2) == 1;
        info->setProperty(object, index, &v);
        break;
    }
    case Storage::Int: {
        int v = static_cast<int>(choose.Below(1u << 31)) - (1 << 30);
        info->setProperty(object, index, &v);
        break;
    }
    case Storage::Long: {
        long long v = static_cast<long long>(choose.Below(1u << 31)) * 4099 - (1LL << 40);
        info->setProperty(object, index, &v);
        break;
    }
    case Storage::Double: {
        double v = choose.Below(100000) / 16.0;
        info->setProperty(object, index, &v);
        break;
    }
    case Storage::DateTime: {
        auto v = Kernite::System::DateTime::FromMicroseconds(static_cast<std::int64_t>(choose.Below(1u << 31)) * 1000003);
        info->setProperty(object, index, &v);
        break;
    }
    case Storage::MethodName: {
        Orbit::MethodName v("tarn.DebugManager." + choose.Text());
        info->setProperty(object, index, &v);
        break;
    }
    case Storage::Enum: {
        int v = static_cast<int>(choose.Below(static_cast<std::uint32_t>(TagCount(property))));
        info->setProperty(object, index, &v);
        break;
    }
    case Storage::Reference: {
        Ref<Any> v = MakeReference(property, choose, depth, items);
        info->setProperty(object, index, v.Get());
        break;
    }
    }
}

void Populate(Orbit::DataObject* object, Chooser& choose, int depth, int items) {
    for (const Orbit::DataObjectType* level : Chain(object->_GetDataType()))
        for (int i = 0; i < static_cast<int>(level->GetProperties().size()); ++i)
            SetChosen(object, level, i, choose, depth, items);
}

Ref<Orbit::DataObject> MakePopulated(const Orbit::DataObjectType* type, std::uint32_t seed, int depth, int items) {
    Chooser choose(seed);
    Ref<Orbit::DataObject> object = type->CreateInstance();
    Populate(object.Get(), choose, depth, items);
    return object;
}

}  // namespace Reliability
