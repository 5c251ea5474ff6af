#include <deque>
#include <mutex>
#include <unordered_map>

#include "internal.h"
#include "kernite/Assert.h"
#include "kernite/System.h"
#include "orbit/DataObject.h"
#include "orbit/Managed.h"
#include "orbit/Registry.h"
#include "orbit/Type.h"

namespace Orbit {
namespace {

// Types by header record. Never destroyed: types outlive every static.
struct CreatedTypes {
    std::mutex mutex;
    std::unordered_map<const TypeInfo*, Type*> byHeader;
    std::vector<Kernite::Ref<Type>> kept;
};

CreatedTypes& Created() {
    static auto* created = new CreatedTypes();
    return *created;
}

// Synthetic records of array types, kept for the life of the process.
struct ArrayRecord {
    std::string name;
    std::string flatName;
    TypeInfo info{};
};

const char* Text(const char* s) { return s ? s : ""; }

Member MakeMember(const char* name, const TypeInfo* type, std::uint32_t flags, const char* version,
                  const char* privilege) {
    Member m;
    m.name = Text(name);
    m.typeRecord = type;
    m.flags = flags;
    m.version = Text(version);
    m.privilege = privilege;
    return m;
}

Member MakeMember(const PropertyInfo& p) { return MakeMember(p.name, p.type, p.flags, p.version, p.privilege); }
Member MakeMember(const ParamInfo& p) { return MakeMember(p.name, p.type, p.flags, p.version, nullptr); }

std::vector<Member> ReadProperties(const PropertyInfo* list) {
    std::vector<Member> out;
    for (const PropertyInfo* p = list; p != nullptr && p->flags != Flag::End; ++p) out.push_back(MakeMember(*p));
    return out;
}

// Registers `type` under its header unless one is there already; returns the registered one.
Type* Remember(TypeImpl* type) {
    Kernite::Ref<TypeImpl> guard(type);
    CreatedTypes& created = Created();
    std::lock_guard<std::mutex> lock(created.mutex);
    created.kept.emplace_back(type);
    return created.byHeader.emplace(type->GetRecord(), type).first->second;
}

Type* MakeRuntimeType(const TypeInfo* header) { return Remember(new TypeImpl(header)); }

}  // namespace

bool Type::IsA(const Type* other) const {
    if (other == nullptr) return false;
    for (const Type* t = this; t != nullptr; t = t->GetBaseType())
        if (t == other) return true;
    return false;
}

TypeImpl::TypeImpl(const TypeInfo* record)
    : _record(record),
      _name(record ? Text(record->name) : ""),
      _flatName(record ? Text(record->flatName) : "") {
    if (record == nullptr) Kernite::PanicAssert("record != __null", "orbit/types", __LINE__);
}

TypeImpl::~TypeImpl() {
    if (Type* array = _arrayType.exchange(nullptr, std::memory_order_acq_rel)) array->DecRef();
}

Type* TypeImpl::GetArrayType() {
    if (Type* current = _arrayType.load(std::memory_order_acquire)) return current;
    Type* created = new ArrayType(this);
    created->IncRef();
    Type* expected = nullptr;
    if (_arrayType.compare_exchange_strong(expected, created, std::memory_order_acq_rel,
                                           std::memory_order_acquire)) {
        Kernite::FenceAfterInstall();
        return created;
    }
    created->DecRef();
    return expected;
}

Version* TypeImpl::GetVersion() const {
    return _record->version ? GetVersionMap()->GetVersion(_record->version) : nullptr;
}

bool TypeImpl::IsVisible(Version* version) const { return version != nullptr && version->Sees(GetVersion()); }

ArrayType::ArrayType(Type* itemType) : TypeImpl(MakeRecord(itemType)), _itemType(itemType) {}

const TypeInfo* ArrayType::MakeRecord(Type* itemType) {
    static auto* records = new std::deque<ArrayRecord>();
    static auto* mutex = new std::mutex();
    if (itemType == nullptr) Kernite::PanicAssert("itemType != __null", "orbit/types", __LINE__);
    auto* item = dynamic_cast<TypeImpl*>(itemType);
    std::lock_guard<std::mutex> lock(*mutex);
    ArrayRecord& r = records->emplace_back();
    r.name = itemType->GetName() + "[]";
    r.flatName = "ArrayOf" + itemType->GetWsdlName();
    r.info = TypeInfo{Kind::Array, r.name.c_str(), r.flatName.c_str(), item ? item->GetVersionName() : nullptr};
    return &r.info;
}

Type* Member::GetType() const { return typeRecord ? FindType(typeRecord) : nullptr; }

Version* Member::GetVersion() const { return version.empty() ? nullptr : GetVersionMap()->GetVersion(version); }

bool Member::IsVisible(const Version* seenBy) const { return seenBy != nullptr && seenBy->Sees(GetVersion()); }

DataObjectType::DataObjectType(const DataTypeInfo* record)
    : TypeImpl(record ? record->header : nullptr), _info(record), _properties(ReadProperties(record->properties)) {}

Type* DataObjectType::GetBaseType() const { return _info->base ? FindType(_info->base) : nullptr; }

DataObjectType* DataObjectType::GetBaseDataType() const { return dynamic_cast<DataObjectType*>(GetBaseType()); }

Kernite::Ref<DataObject> DataObjectType::CreateInstance() const {
    return Kernite::Ref<DataObject>(_info->createInstance ? _info->createInstance() : nullptr);
}

Kernite::Ref<Any> DataObjectType::CreateArray() const {
    return Kernite::Ref<Any>(_info->createArray ? _info->createArray() : nullptr);
}

ManagedMethod::ManagedMethod(ManagedObjectType* owner, int memberNumber, const MethodInfo* method)
    : _owner(owner),
      _memberNumber(memberNumber),
      _name(Text(method->name)),
      _wsdlName(Text(method->wsdlName)),
      _privilege(method->privilege),
      _version(Text(method->version)),
      _task((method->flags & 1u) != 0),
      _result(MakeMember(method->result)) {
    for (const ParamInfo* p = method->params; p != nullptr && p->flags != Flag::End; ++p)
        _params.push_back(MakeMember(*p));
    for (const TypeInfo* const* f = method->faults; f != nullptr && *f != nullptr; ++f) _faults.push_back(*f);
}

// A property's getter answers under the property's own name, on the wire too.
ManagedMethod::ManagedMethod(ManagedObjectType* owner, int memberNumber, const PropertyInfo* property)
    : _owner(owner),
      _memberNumber(memberNumber),
      _name(Text(property->name)),
      _wsdlName(_name),
      _privilege(property->privilege),
      _version(Text(property->version)),
      _getter(true),
      _result(MakeMember(*property)) {}

Version* ManagedMethod::GetVersion() const { return _version.empty() ? nullptr : GetVersionMap()->GetVersion(_version); }

bool ManagedMethod::IsVisible(const Version* seenBy) const { return seenBy != nullptr && seenBy->Sees(GetVersion()); }

ManagedObjectType::ManagedObjectType(const ManagedTypeInfo* record)
    : TypeImpl(record ? record->header : nullptr), _info(record), _properties(ReadProperties(record->properties)) {
    int number = 0;
    for (const MethodInfo* m = record->methods; m != nullptr && m->name != nullptr; ++m)
        _members.emplace_back(new ManagedMethod(this, number++, m));
    for (const PropertyInfo* p = record->properties; p != nullptr && p->flags != Flag::End; ++p)
        _members.emplace_back(new ManagedMethod(this, number++, p));
    if (record->methodObjects != nullptr) {
        for (std::size_t i = 0; i < _members.size(); ++i) record->methodObjects[i] = _members[i].Get();
        record->methodObjects[_members.size()] = nullptr;
    }
}

Type* ManagedObjectType::GetBaseType() const { return _info->base ? FindType(_info->base) : nullptr; }

ManagedObjectType* ManagedObjectType::GetBaseManagedType() const {
    return dynamic_cast<ManagedObjectType*>(GetBaseType());
}

ManagedMethod* ManagedObjectType::FindMember(const std::string& name) const {
    for (const auto& member : _members)
        if (member->GetName() == name) return member.Get();
    ManagedObjectType* base = GetBaseManagedType();
    return base ? base->FindMember(name) : nullptr;
}

Kernite::Ref<ManagedObject> ManagedObjectType::CreateStub(const std::string& id, StubAdapter* adapter,
                                                          RequestContext* context) const {
    return Kernite::Ref<ManagedObject>(_info->createStub ? _info->createStub(id, adapter, context) : nullptr);
}

// Creation is serialised, and a second call for the same record returns the first
// type, so a method-object array is never filled twice.
DataObjectType* CreateDataObjectType(const DataTypeInfo* record) {
    if (record == nullptr || record->header == nullptr)
        Kernite::PanicAssert("record != __null && record->header != __null", "orbit/types", __LINE__);
    CreatedTypes& created = Created();
    std::lock_guard<std::mutex> lock(created.mutex);
    if (auto it = created.byHeader.find(record->header); it != created.byHeader.end())
        return dynamic_cast<DataObjectType*>(it->second);
    Kernite::Ref<DataObjectType> type(new DataObjectType(record));
    created.kept.emplace_back(type.Get());
    created.byHeader.emplace(record->header, type.Get());
    return type.Get();
}

ManagedObjectType* CreateManagedObjectType(const ManagedTypeInfo* record) {
    if (record == nullptr || record->header == nullptr)
        Kernite::PanicAssert("record != __null && record->header != __null", "orbit/types", __LINE__);
    CreatedTypes& created = Created();
    std::lock_guard<std::mutex> lock(created.mutex);
    if (auto it = created.byHeader.find(record->header); it != created.byHeader.end())
        return dynamic_cast<ManagedObjectType*>(it->second);
    Kernite::Ref<ManagedObjectType> type(new ManagedObjectType(record));
    created.kept.emplace_back(type.Get());
    created.byHeader.emplace(record->header, type.Get());
    return type.Get();
}

Type* FindType(const TypeInfo* header) {
    if (header == nullptr) return nullptr;
    {
        CreatedTypes& created = Created();
        std::lock_guard<std::mutex> lock(created.mutex);
        if (auto it = created.byHeader.find(header); it != created.byHeader.end()) return it->second;
    }
    return detail::RuntimeTypeByHeader(header);
}

// The type stays alive even when its header was taken already: its creator may
// still hand it out.
void RegisterCreatedType(TypeImpl* type) {
    if (type == nullptr) Kernite::PanicAssert("type != __null", "orbit/types", __LINE__);
    Remember(type);
}

template <> Type* GetType<std::string>() {
    static Type* const type = MakeRuntimeType(&gStringTypeInfo);
    return type;
}
template <> Type* GetType<bool>() {
    static Type* const type = MakeRuntimeType(&gBoolTypeInfo);
    return type;
}
template <> Type* GetType<int>() {
    static Type* const type = MakeRuntimeType(&gIntTypeInfo);
    return type;
}
template <> Type* GetType<long long>() {
    static Type* const type = MakeRuntimeType(&gLongTypeInfo);
    return type;
}
template <> Type* GetType<double>() {
    static Type* const type = MakeRuntimeType(&gDoubleTypeInfo);
    return type;
}
template <> Type* GetType<Kernite::System::DateTime>() {
    static Type* const type = MakeRuntimeType(&gDateTimeTypeInfo);
    return type;
}
template <> Type* GetType<MethodName>() {
    static Type* const type = MakeRuntimeType(&gMethodNameTypeInfo);
    return type;
}
template <> Type* GetType<Any>() {
    static Type* const type = MakeRuntimeType(&gAnyTypeInfo);
    return type;
}
template <> Type* GetType<MoRef>() {
    static Type* const type = MakeRuntimeType(&gMoRefTypeInfo);
    return type;
}
template <> Type* GetType<DynamicData>() {
    static Type* const type = CreateDataObjectType(&detail::kDynamicDataInfo);
    return type;
}
template <> Type* GetType<MethodFault>() {
    static Type* const type = CreateDataObjectType(&detail::kMethodFaultInfo);
    return type;
}
template <> Type* GetType<KeyAnyValue>() {
    static Type* const type = CreateDataObjectType(&detail::kKeyAnyValueInfo);
    return type;
}
template <> Type* GetType<ManagedObject>() {
    static Type* const type = CreateManagedObjectType(&detail::kManagedObjectInfo);
    return type;
}

namespace detail {
namespace {

struct RuntimeEntry {
    const TypeInfo* header;
    Type* (*get)();
};

constexpr RuntimeEntry kRuntimeTypes[] = {
    {&gStringTypeInfo, &GetType<std::string>},
    {&gBoolTypeInfo, &GetType<bool>},
    {&gIntTypeInfo, &GetType<int>},
    {&gLongTypeInfo, &GetType<long long>},
    {&gDoubleTypeInfo, &GetType<double>},
    {&gDateTimeTypeInfo, &GetType<Kernite::System::DateTime>},
    {&gMethodNameTypeInfo, &GetType<MethodName>},
    {&gAnyTypeInfo, &GetType<Any>},
    {&gMoRefTypeInfo, &GetType<MoRef>},
    {&gStrataDynamicDataTypeInfo, &GetType<DynamicData>},
    {&gStrataMethodFaultTypeInfo, &GetType<MethodFault>},
    {&gStrataKeyAnyValueTypeInfo, &GetType<KeyAnyValue>},
    {&gStrataManagedObjectTypeInfo, &GetType<ManagedObject>},
};

}  // namespace

Type* RuntimeTypeByHeader(const TypeInfo* header) {
    for (const RuntimeEntry& entry : kRuntimeTypes)
        if (entry.header == header) return entry.get();
    return nullptr;
}

Type* RuntimeTypeByName(const std::string& name) {
    for (const RuntimeEntry& entry : kRuntimeTypes)
        if (name == entry.header->name) return entry.get();
    return nullptr;
}

}  // namespace detail
}  // namespace Orbit
