// The static type-information records that generated code emits and the runtime
// reads. All of them are aggregates of constants, so a library's records are
// constant-initialised read-only data; only tag tables and method-object arrays
// are written, once, at load.
#pragma once

#include <cstdint>
#include <string>

namespace Kernite {
template <class T> class Ref;
template <class T> class RefVector;
}

namespace Orbit {

class Any;
class DataObject;
class ManagedObject;
class ManagedMethod;
class StubAdapter;
class RequestContext;

namespace Kind {
inline constexpr std::uint32_t Primitive = 0x01;  // runtime primitives and anyType
inline constexpr std::uint32_t Array = 0x02;      // array types, made by GetArrayType()
inline constexpr std::uint32_t Enum = 0x0F;
inline constexpr std::uint32_t Data = 0x10;
inline constexpr std::uint32_t Fault = 0x11;
inline constexpr std::uint32_t Managed = 0x12;
}  // namespace Kind

// Flag bits of properties, parameters and results.
namespace Flag {
inline constexpr std::uint32_t Array = 1;
inline constexpr std::uint32_t Optional = 2;
inline constexpr std::uint32_t Carried = 4;      // meaningful to the runtime only
inline constexpr std::uint32_t End = 0xFFFFFFFF;  // list terminator
}  // namespace Flag

// The header record of a type, exported as g<flat name>TypeInfo.
struct TypeInfo {
    std::uint32_t kind;
    const char* name;      // wire name, "tarn.cnxmgr.ConnectionState"
    const char* flatName;  // "TarnCnxmgrConnectionState"
    const char* version;   // the version that introduced the type
};
using TypeHeader = TypeInfo;

struct PropertyInfo {
    const char* name;
    const char* privilege;  // null: none
    std::uint32_t reserved;
    const TypeInfo* type;
    std::uint32_t flags;    // Flag::End terminates a list
    const char* version;
};

struct ParamInfo {
    const char* name;
    std::uint32_t reserved;
    const TypeInfo* type;   // null for the result of a method without one
    std::uint32_t flags;
    const char* version;
};

struct MethodInfo {
    const char* name;       // null terminates a list
    const char* wsdlName;
    const char* privilege;
    std::uint32_t reserved;
    ParamInfo result;
    const ParamInfo* params;
    const TypeInfo* const* faults;  // null-terminated
    std::uint32_t flags;            // 1: task method
    const char* version;
};

using GetPropertyFunction = void (*)(DataObject* object, int index, void* value);
using SetPropertyFunction = void (*)(DataObject* object, int index, const void* value);
using IsPropertySetFunction = bool (*)(DataObject* object, int index);
using UnsetPropertyFunction = void (*)(DataObject* object, int index);
using CreateInstanceFunction = DataObject* (*)();
using CreateArrayFunction = Any* (*)();

// Data objects and faults. The property functions take the index of a property in
// `properties` (own properties only) and act on storage of the property's kind:
//   get: writes std::string, bool, int, long long, double, Kernite::System::DateTime,
//        an enumeration's int, or a Kernite::Ref<Orbit::Any> for objects, anyType and
//        arrays (shared, one more reference);
//   set: reads the same, except that a property held by reference takes `value` as
//        the Orbit::Any* itself (null clears), narrowed to the property's class.
// An index past the own properties: isPropertySet answers true, the others do nothing.
struct DataTypeInfo {
    const TypeInfo* header;
    const TypeInfo* base;
    const PropertyInfo* properties;
    GetPropertyFunction getProperty;
    SetPropertyFunction setProperty;
    IsPropertySetFunction isPropertySet;
    UnsetPropertyFunction unsetProperty;
    CreateInstanceFunction createInstance;
    CreateArrayFunction createArray;
};

using InvokeMemberFunction = void (*)(ManagedObject* target, int index,
                                      Kernite::RefVector<Any>& args, Kernite::Ref<Any>& result);
using CreateStubFunction = ManagedObject* (*)(const std::string& id, StubAdapter* adapter,
                                              RequestContext* context);

// Managed object types. Member numbers: own methods first, then own properties;
// `methodObjects` has room for all of them plus a closing null and is filled by
// CreateManagedObjectType.
struct ManagedTypeInfo {
    const TypeInfo* header;
    const TypeInfo* base;
    const PropertyInfo* properties;
    const MethodInfo* methods;
    InvokeMemberFunction invokeMember;
    CreateStubFunction createStub;
    ManagedMethod** methodObjects;
};

// Enumerations: the tag table is null-terminated; a tag's position is its value.
struct EnumTypeInfo {
    const TypeInfo* header;
    const char* const* tags;
};

// Generated classes befriend their specialisation, so that their record functions
// reach the members directly.
template <class T>
struct RecordAccess;

// Records of the runtime's own types.
extern const TypeInfo gStringTypeInfo;      // "string", flat "String"
extern const TypeInfo gBoolTypeInfo;        // "boolean", flat "Bool"
extern const TypeInfo gIntTypeInfo;         // "int", flat "Int"
extern const TypeInfo gLongTypeInfo;        // "long", flat "Long"
extern const TypeInfo gDoubleTypeInfo;      // "double", flat "Double"
extern const TypeInfo gDateTimeTypeInfo;    // "dateTime", flat "DateTime"
extern const TypeInfo gAnyTypeInfo;         // "anyType", flat "Any"
extern const TypeInfo gMethodNameTypeInfo;  // "methodName", flat "MethodName"
extern const TypeInfo gMoRefTypeInfo;       // "ManagedObjectReference", flat "MoRef"
extern const TypeInfo gStrataManagedObjectTypeInfo;  // "strata.ManagedObject"
extern const TypeInfo gStrataMethodFaultTypeInfo;    // "strata.MethodFault"

}  // namespace Orbit

extern const Orbit::TypeInfo gStrataDynamicDataTypeInfo;  // "strata.DynamicData"
extern const Orbit::TypeInfo gStrataKeyAnyValueTypeInfo;  // "strata.KeyAnyValue"
