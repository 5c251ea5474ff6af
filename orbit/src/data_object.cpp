#include <typeinfo>
#include <vector>

#include "internal.h"
#include "kernite/Assert.h"
#include "kernite/Narrow.h"
#include "kernite/System.h"
#include "orbit/DataObject.h"
#include "orbit/Dispatch.h"

namespace Orbit {
namespace {

// What a record function reads and writes for a property, from its type record and flags.
enum class Storage { String, Bool, Int, Long, Double, DateTime, MethodName, EnumValue, Reference };

Storage StorageOf(const Member& property) {
    if (property.IsArray()) return Storage::Reference;
    const TypeInfo* t = property.typeRecord;
    if (t == &gStringTypeInfo) return Storage::String;
    if (t == &gBoolTypeInfo) return Storage::Bool;
    if (t == &gIntTypeInfo) return Storage::Int;
    if (t == &gLongTypeInfo) return Storage::Long;
    if (t == &gDoubleTypeInfo) return Storage::Double;
    if (t == &gDateTimeTypeInfo) return Storage::DateTime;
    if (t == &gMethodNameTypeInfo) return Storage::MethodName;
    if (t != nullptr && t->kind == Kind::Enum) return Storage::EnumValue;
    return Storage::Reference;  // data objects, faults, anyType, managed object references
}

// The data types whose properties an object of `type` has, root first.
std::vector<const DataObjectType*> Chain(const DataObjectType* type) {
    std::vector<const DataObjectType*> chain;
    for (const DataObjectType* t = type; t != nullptr; t = t->GetBaseDataType()) chain.push_back(t);
    return {chain.rbegin(), chain.rend()};
}

template <class T>
bool ScalarEqual(const DataTypeInfo* info, DataObject* a, DataObject* b, int index) {
    T x{};
    T y{};
    info->getProperty(a, index, &x);
    info->getProperty(b, index, &y);
    return x == y;
}

bool ScalarEqual(Storage storage, const DataTypeInfo* info, DataObject* a, DataObject* b, int index) {
    switch (storage) {
        case Storage::String: return ScalarEqual<std::string>(info, a, b, index);
        case Storage::Bool: return ScalarEqual<bool>(info, a, b, index);
        case Storage::Int:
        case Storage::EnumValue: return ScalarEqual<int>(info, a, b, index);
        case Storage::Long: return ScalarEqual<long long>(info, a, b, index);
        case Storage::Double: return ScalarEqual<double>(info, a, b, index);
        case Storage::DateTime: return ScalarEqual<Kernite::System::DateTime>(info, a, b, index);
        case Storage::MethodName: return ScalarEqual<MethodName>(info, a, b, index);
        case Storage::Reference: break;
    }
    return false;
}

struct HeldPair {
    Kernite::Ref<Any> a;
    Kernite::Ref<Any> b;
};

HeldPair ReadReferences(const DataTypeInfo* info, DataObject* a, DataObject* b, int index) {
    HeldPair held;
    info->getProperty(a, index, &held.a);
    info->getProperty(b, index, &held.b);
    return held;
}

bool ValuesEqual(Any* a, Any* b, bool exact) {
    if (a == nullptr || b == nullptr) return a == b;
    if (typeid(*a) == typeid(*b)) return a->_IsEqual(b, exact);
    // Data objects of related classes may still compare when not exact.
    return !exact && dynamic_cast<DataObject*>(a) != nullptr && a->_IsEqual(b, exact);
}

// With `exact` the types must be the same; otherwise the less derived of two
// related types decides which properties count.
const DataObjectType* CommonType(const DataObjectType* a, const DataObjectType* b, bool exact) {
    if (a == nullptr || b == nullptr) return nullptr;
    if (a == b) return a;
    if (exact) return nullptr;
    if (a->IsA(b)) return b;
    if (b->IsA(a)) return a;
    return nullptr;
}

std::string Join(const std::string& path, const std::string& name) {
    return path.empty() ? name : path + "." + name;
}

}  // namespace

bool DataObject::_IsEqual(Any* other, bool exact) const {
    if (other == nullptr) Kernite::PanicAssert("obj", "orbit/DataObject", __LINE__);
    auto* that = dynamic_cast<DataObject*>(other);
    if (that == nullptr) return false;
    if (that == this) return true;
    const DataObjectType* common = CommonType(_GetDataType(), that->_GetDataType(), exact);
    if (common == nullptr) return false;
    auto* self = const_cast<DataObject*>(this);
    for (const DataObjectType* level : Chain(common)) {
        const DataTypeInfo* info = level->GetDataTypeInfo();
        const auto& properties = level->GetProperties();
        for (int i = 0; i < static_cast<int>(properties.size()); ++i) {
            const bool setHere = info->isPropertySet(self, i);
            if (setHere != info->isPropertySet(that, i)) return false;
            if (!setHere) continue;
            const Storage storage = StorageOf(properties[i]);
            if (storage != Storage::Reference) {
                if (!ScalarEqual(storage, info, self, that, i)) return false;
            } else {
                HeldPair held = ReadReferences(info, self, that, i);
                if (!ValuesEqual(held.a.Get(), held.b.Get(), exact)) return false;
            }
        }
    }
    return true;
}

void DataObject::_DiffProperties(Any* other, const std::string& path, PropertyDiffSet& diffs) const {
    if (other == nullptr) Kernite::PanicAssert("obj", "orbit/DataObject", __LINE__);
    auto* that = dynamic_cast<DataObject*>(other);
    const DataObjectType* type = _GetDataType();
    if (that == nullptr || type == nullptr || that->_GetDataType() != type) {
        diffs.Add(path);
        return;
    }
    auto* self = const_cast<DataObject*>(this);
    for (const DataObjectType* level : Chain(type)) {
        const DataTypeInfo* info = level->GetDataTypeInfo();
        const auto& properties = level->GetProperties();
        for (int i = 0; i < static_cast<int>(properties.size()); ++i) {
            const std::string propertyPath = Join(path, properties[i].name);
            const bool setHere = info->isPropertySet(self, i);
            if (setHere != info->isPropertySet(that, i)) {
                diffs.Add(propertyPath);
                continue;
            }
            if (!setHere) continue;
            const Storage storage = StorageOf(properties[i]);
            if (storage != Storage::Reference) {
                if (!ScalarEqual(storage, info, self, that, i)) diffs.Add(propertyPath);
                continue;
            }
            HeldPair held = ReadReferences(info, self, that, i);
            Any* a = held.a.Get();
            Any* b = held.b.Get();
            if (a == nullptr || b == nullptr) {
                if (a != b) diffs.Add(propertyPath);
            } else if (typeid(*a) != typeid(*b)) {
                diffs.Add(propertyPath);
            } else {
                a->_DiffProperties(b, propertyPath, diffs);
            }
        }
    }
}

Type* DynamicData::_GetType() const { return GetType<DynamicData>(); }
DataObjectType* DynamicData::_GetDataType() const { return GetDoType<DynamicData>(); }
unsigned int DynamicData::_GetSize(SizeFunction f) const { return f(sizeof(DynamicData)); }
Any* DynamicData::_Clone() const { return new DynamicData(*this); }

MethodFault::Exception::Exception(const std::string& message, MethodFault* fault)
    : Kernite::Exception(message), _fault(fault) {}
MethodFault::Exception::~Exception() = default;
MethodFault::Exception* MethodFault::Exception::Clone() const { return new Exception(*this); }
void MethodFault::Exception::Throw() const { throw *this; }

MethodFault::MethodFault(const MethodFault& other)
    : DynamicData(other),
      _msg(other._msg),
      _faultCause(other._faultCause ? static_cast<MethodFault*>(other._faultCause->_Clone()) : nullptr),
      _faultData(other._faultData) {}

MethodFault::MethodFault(const std::string& msg, MethodFault* faultCause, DataArray<KeyAnyValue>* faultData)
    : _msg(msg), _faultCause(faultCause), _faultData(faultData) {}

MethodFault::~MethodFault() = default;

void MethodFault::SetFaultCause(MethodFault* cause) { _faultCause = cause; }
DataArray<KeyAnyValue>* MethodFault::GetFaultData() const { return _faultData.Get(); }
void MethodFault::SetFaultData(DataArray<KeyAnyValue>* data) { _faultData.Set(data); }

Type* MethodFault::_GetType() const { return GetType<MethodFault>(); }
DataObjectType* MethodFault::_GetDataType() const { return GetDoType<MethodFault>(); }

unsigned int MethodFault::_GetSize(SizeFunction f) const {
    unsigned int size = DynamicData::_GetSize(f) - f(sizeof(DynamicData)) + f(sizeof(MethodFault));
    size += f(GetPrimitiveExtraSize(_msg));
    if (_faultCause) size += _faultCause->_GetSize(f);
    if (const auto* data = _faultData.Peek()) size += data->_GetSize(f);
    return size;
}

Any* MethodFault::_Clone() const { return new MethodFault(*this); }

void MethodFault::Throw() { throw Exception(_GetType()->GetName(), this); }

MethodFault::Exception* MethodFault::CreateException() { return new Exception(_GetType()->GetName(), this); }

KeyAnyValue::KeyAnyValue(const KeyAnyValue& other)
    : DynamicData(other), _key(other._key), _value(other._value ? other._value->_Clone() : nullptr) {}

KeyAnyValue::KeyAnyValue(const std::string& key, Any* value) : _key(key), _value(value) {}

KeyAnyValue::~KeyAnyValue() = default;

void KeyAnyValue::SetValue(Any* value) { _value = value; }

Type* KeyAnyValue::_GetType() const { return GetType<KeyAnyValue>(); }
DataObjectType* KeyAnyValue::_GetDataType() const { return GetDoType<KeyAnyValue>(); }

unsigned int KeyAnyValue::_GetSize(SizeFunction f) const {
    unsigned int size = DynamicData::_GetSize(f) - f(sizeof(DynamicData)) + f(sizeof(KeyAnyValue));
    size += f(GetPrimitiveExtraSize(_key));
    if (_value) size += _value->_GetSize(f);
    return size;
}

Any* KeyAnyValue::_Clone() const { return new KeyAnyValue(*this); }

// The records of the runtime's own data types, with their record functions.
namespace {

using detail::kRuntimeVersion;

Any* HeldValue(const void* value) { return static_cast<Any*>(const_cast<void*>(value)); }

void NoGet(DataObject*, int, void*) {}
void NoSet(DataObject*, int, const void*) {}
bool AlwaysSet(DataObject*, int) { return true; }
void NoUnset(DataObject*, int) {}

DataObject* NewDynamicData() { return new DynamicData(); }
Any* NewDynamicDataArray() { return new DataArray<DynamicData>(); }

constexpr PropertyInfo kNoProperties[] = {{nullptr, nullptr, 0, nullptr, Flag::End, nullptr}};

enum MethodFaultProperty { kMsg, kFaultCause, kFaultData };

constexpr PropertyInfo kMethodFaultProperties[] = {
    {"msg", nullptr, 0, &gStringTypeInfo, 0, kRuntimeVersion},
    {"faultCause", nullptr, 0, &gStrataMethodFaultTypeInfo, Flag::Optional, kRuntimeVersion},
    {"faultData", nullptr, 0, &gStrataKeyAnyValueTypeInfo, Flag::Array | Flag::Optional, kRuntimeVersion},
    {nullptr, nullptr, 0, nullptr, Flag::End, nullptr},
};

void GetMethodFaultProperty(DataObject* object, int index, void* value) {
    MethodFault* fault = NarrowTarget<MethodFault, DataObject>(object);
    switch (index) {
        case kMsg: WriteValue<std::string>(value) = fault->GetMsg(); break;
        case kFaultCause: WriteValue<Kernite::Ref<Any>>(value) = fault->GetFaultCause(); break;
        case kFaultData: WriteValue<Kernite::Ref<Any>>(value) = fault->GetFaultData(); break;
        default: break;
    }
}

void SetMethodFaultProperty(DataObject* object, int index, const void* value) {
    MethodFault* fault = NarrowTarget<MethodFault, DataObject>(object);
    switch (index) {
        case kMsg: fault->SetMsg(ReadValue<std::string>(value)); break;
        case kFaultCause: fault->SetFaultCause(Kernite::NarrowToType<MethodFault, Any>(HeldValue(value))); break;
        case kFaultData:
            fault->SetFaultData(Kernite::NarrowToType<DataArray<KeyAnyValue>, Any>(HeldValue(value)));
            break;
        default: break;
    }
}

bool IsMethodFaultPropertySet(DataObject* object, int index) {
    MethodFault* fault = NarrowTarget<MethodFault, DataObject>(object);
    switch (index) {
        case kFaultCause: return fault->GetFaultCause() != nullptr;
        case kFaultData: return !fault->GetFaultData()->IsEmpty();
        default: return true;
    }
}

void UnsetMethodFaultProperty(DataObject* object, int index) {
    MethodFault* fault = NarrowTarget<MethodFault, DataObject>(object);
    switch (index) {
        case kFaultCause: fault->SetFaultCause(nullptr); break;
        case kFaultData: fault->SetFaultData(new DataArray<KeyAnyValue>()); break;
        default: break;
    }
}

DataObject* NewMethodFault() { return new MethodFault(); }
Any* NewMethodFaultArray() { return new DataArray<MethodFault>(); }

enum KeyAnyValueProperty { kKey, kValue };

constexpr PropertyInfo kKeyAnyValueProperties[] = {
    {"key", nullptr, 0, &gStringTypeInfo, 0, kRuntimeVersion},
    {"value", nullptr, 0, &gAnyTypeInfo, 0, kRuntimeVersion},
    {nullptr, nullptr, 0, nullptr, Flag::End, nullptr},
};

void GetKeyAnyValueProperty(DataObject* object, int index, void* value) {
    KeyAnyValue* kav = NarrowTarget<KeyAnyValue, DataObject>(object);
    switch (index) {
        case kKey: WriteValue<std::string>(value) = kav->GetKey(); break;
        case kValue: WriteValue<Kernite::Ref<Any>>(value) = kav->GetValue(); break;
        default: break;
    }
}

void SetKeyAnyValueProperty(DataObject* object, int index, const void* value) {
    KeyAnyValue* kav = NarrowTarget<KeyAnyValue, DataObject>(object);
    switch (index) {
        case kKey: kav->SetKey(ReadValue<std::string>(value)); break;
        case kValue: kav->SetValue(HeldValue(value)); break;
        default: break;
    }
}

bool IsKeyAnyValuePropertySet(DataObject* object, int index) {
    KeyAnyValue* kav = NarrowTarget<KeyAnyValue, DataObject>(object);
    return index != kValue || kav->GetValue() != nullptr;
}

DataObject* NewKeyAnyValue() { return new KeyAnyValue(); }
Any* NewKeyAnyValueArray() { return new DataArray<KeyAnyValue>(); }

}  // namespace

namespace detail {

constinit const DataTypeInfo kDynamicDataInfo{
    &gStrataDynamicDataTypeInfo, nullptr, kNoProperties, NoGet, NoSet, AlwaysSet, NoUnset, NewDynamicData,
    NewDynamicDataArray};

constinit const DataTypeInfo kMethodFaultInfo{
    &gStrataMethodFaultTypeInfo, &gStrataDynamicDataTypeInfo, kMethodFaultProperties, GetMethodFaultProperty,
    SetMethodFaultProperty,      IsMethodFaultPropertySet,    UnsetMethodFaultProperty, NewMethodFault,
    NewMethodFaultArray};

constinit const DataTypeInfo kKeyAnyValueInfo{
    &gStrataKeyAnyValueTypeInfo, &gStrataDynamicDataTypeInfo, kKeyAnyValueProperties, GetKeyAnyValueProperty,
    SetKeyAnyValueProperty,      IsKeyAnyValuePropertySet,    NoUnset,                NewKeyAnyValue,
    NewKeyAnyValueArray};

}  // namespace detail
}  // namespace Orbit
