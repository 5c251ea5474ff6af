// Type objects: what the runtime builds from the records. Type objects belong to
// the runtime and live as long as the process; nobody releases them.
#pragma once

#include <atomic>
#include <cstdint>
#include <string>
#include <vector>

#include "kernite/Narrow.h"
#include "kernite/Object.h"
#include "kernite/Ref.h"
#include "orbit/Records.h"

namespace Kernite::System {
class DateTime;
}

namespace Orbit {

class Version;
class DataObjectType;
class ManagedObjectType;

class Type : public virtual Kernite::Object {
public:
    virtual const std::string& GetName() const = 0;      // wire name
    virtual const std::string& GetWsdlName() const = 0;  // flat name
    virtual std::uint32_t GetKind() const = 0;
    // The type of arrays of this type, made on first request.
    virtual Type* GetArrayType() = 0;
    // Null while the version map does not know the type's version.
    virtual Version* GetVersion() const = 0;
    // Whether `version` sees this type: it includes the type's version.
    virtual bool IsVisible(Version* version) const = 0;
    // The base type, or null at the root; looked up when asked, so a type may be
    // created before its base.
    virtual Type* GetBaseType() const = 0;

    // This type or one of its bases is `other`.
    bool IsA(const Type* other) const;
};

class TypeImpl : public Kernite::ObjectImpl, public virtual Type {
public:
    explicit TypeImpl(const TypeInfo* record);
    ~TypeImpl() override;

    const std::string& GetName() const override { return _name; }
    const std::string& GetWsdlName() const override { return _flatName; }
    std::uint32_t GetKind() const override { return _record->kind; }
    Type* GetArrayType() override;
    Version* GetVersion() const override;
    bool IsVisible(Version* version) const override;
    Type* GetBaseType() const override { return nullptr; }

    const TypeInfo* GetRecord() const noexcept { return _record; }
    const char* GetVersionName() const noexcept { return _record->version; }

private:
    const TypeInfo* _record;
    std::string _name;
    std::string _flatName;
    std::atomic<Type*> _arrayType{nullptr};
};

// The type of arrays of an item type: name "<item>[]", flat name "ArrayOf<item flat>".
class ArrayType : public TypeImpl {
public:
    explicit ArrayType(Type* itemType);
    Type* GetItemType() const noexcept { return _itemType; }

private:
    static const TypeInfo* MakeRecord(Type* itemType);
    Type* _itemType;
};

// A property, parameter or result as the records describe it.
struct Member {
    std::string name;
    const TypeInfo* typeRecord = nullptr;  // null only for a void result
    std::uint32_t flags = 0;
    std::string version;
    const char* privilege = nullptr;

    bool IsArray() const noexcept { return (flags & Flag::Array) != 0; }
    bool IsOptional() const noexcept { return (flags & Flag::Optional) != 0; }
    // The item type (for an array, the type of one item); null if unresolved.
    Type* GetType() const;
    Version* GetVersion() const;
    // Whether `version` sees this member (Version::Sees on the member's version).
    bool IsVisible(const Version* version) const;
};

class DataObjectType : public TypeImpl {
public:
    explicit DataObjectType(const DataTypeInfo* record);

    const DataTypeInfo* GetDataTypeInfo() const noexcept { return _info; }
    Type* GetBaseType() const override;
    DataObjectType* GetBaseDataType() const;
    // Own properties, in record order: the index is the record functions' index.
    const std::vector<Member>& GetProperties() const noexcept { return _properties; }

    Kernite::Ref<DataObject> CreateInstance() const;
    Kernite::Ref<Any> CreateArray() const;

private:
    const DataTypeInfo* _info;
    std::vector<Member> _properties;
};

// One member of a managed type as the runtime knows it: a method, or the getter
// of a property. Its member number is its index in the type's method-object array.
class ManagedMethod : public Kernite::ObjectImpl {
public:
    ManagedMethod(ManagedObjectType* owner, int memberNumber, const MethodInfo* method);
    ManagedMethod(ManagedObjectType* owner, int memberNumber, const PropertyInfo* property);

    const std::string& GetName() const noexcept { return _name; }
    const std::string& GetWsdlName() const noexcept { return _wsdlName; }
    const char* GetPrivilege() const noexcept { return _privilege; }
    const std::string& GetVersionName() const noexcept { return _version; }
    Version* GetVersion() const;
    bool IsVisible(const Version* version) const;
    bool IsTask() const noexcept { return _task; }
    bool IsPropertyGetter() const noexcept { return _getter; }
    int GetMemberNumber() const noexcept { return _memberNumber; }
    ManagedObjectType* GetDeclaringType() const noexcept { return _owner; }
    // The result; `typeRecord` is null for a method without one.
    const Member& GetResult() const noexcept { return _result; }
    const std::vector<Member>& GetParameters() const noexcept { return _params; }
    const std::vector<const TypeInfo*>& GetFaults() const noexcept { return _faults; }

private:
    ManagedObjectType* _owner;
    int _memberNumber;
    std::string _name;
    std::string _wsdlName;
    const char* _privilege;
    std::string _version;
    bool _task = false;
    bool _getter = false;
    Member _result;
    std::vector<Member> _params;
    std::vector<const TypeInfo*> _faults;
};

class ManagedObjectType : public TypeImpl {
public:
    explicit ManagedObjectType(const ManagedTypeInfo* record);

    const ManagedTypeInfo* GetManagedTypeInfo() const noexcept { return _info; }
    Type* GetBaseType() const override;
    ManagedObjectType* GetBaseManagedType() const;
    const std::vector<Member>& GetProperties() const noexcept { return _properties; }
    // Own members by member number: methods, then property getters.
    const std::vector<Kernite::Ref<ManagedMethod>>& GetMembers() const noexcept { return _members; }
    // By name (a method's name or a property's name), searching the bases too.
    ManagedMethod* FindMember(const std::string& name) const;

    Kernite::Ref<ManagedObject> CreateStub(const std::string& id, StubAdapter* adapter,
                                           RequestContext* context) const;

private:
    const ManagedTypeInfo* _info;
    std::vector<Member> _properties;
    std::vector<Kernite::Ref<ManagedMethod>> _members;
};

// Builds the type object of a record. Called once per type, by GetType<T>().
// A managed type's method-object array is filled before this returns.
DataObjectType* CreateDataObjectType(const DataTypeInfo* record);
ManagedObjectType* CreateManagedObjectType(const ManagedTypeInfo* record);

// The type created from a header record, or null if none was created yet. The
// runtime's own records always resolve.
Type* FindType(const TypeInfo* header);
// Makes a type created outside the functions above (enumerations) findable by its
// header. The runtime keeps it alive from then on.
void RegisterCreatedType(TypeImpl* type);

// The type object of a C++ type. Defined by the runtime for its own types and by
// each generated library for its types.
template <class T>
Type* GetType();

class MethodName;
class MoRef;
class DynamicData;
class MethodFault;
class KeyAnyValue;
template <> Type* GetType<std::string>();
template <> Type* GetType<bool>();
template <> Type* GetType<int>();
template <> Type* GetType<long long>();
template <> Type* GetType<double>();
template <> Type* GetType<Kernite::System::DateTime>();
template <> Type* GetType<MethodName>();
template <> Type* GetType<Any>();
template <> Type* GetType<MoRef>();
template <> Type* GetType<DynamicData>();
template <> Type* GetType<MethodFault>();
template <> Type* GetType<KeyAnyValue>();
template <> Type* GetType<ManagedObject>();

// The type narrowed to K, kept in a static after the first call. Racing first
// callers store the same pointer, so no lock is needed.
template <class T, class K>
K* GetTypeHelper() {
    static std::atomic<K*> sPType{nullptr};
    K* type = sPType.load(std::memory_order_acquire);
    if (type == nullptr) {
        type = Kernite::NarrowToType<K, Type>(GetType<T>());
        sPType.store(type, std::memory_order_release);
    }
    return type;
}

template <class T>
DataObjectType* GetDoType() {
    return GetTypeHelper<T, DataObjectType>();
}

}  // namespace Orbit
