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
inline constexpr std::uint32_t All = Array | Optional | Carried;
inline constexpr std::uint32_t End = 0xFFFFFFFF;  // list terminator
}  // namespace Flag

// Flag bits of methods.
namespace MethodFlag {
inline constexpr std::uint32_t Task = 1;
}  // namespace MethodFlag

// A constant's value and its name as generated code spells it ("Orbit::Kind::" + name).
struct NamedValue {
    std::uint32_t value;
    const char* name;
};
inline constexpr NamedValue kKindNames[] = {{Kind::Primitive, "Primitive"}, {Kind::Array, "Array"}, {Kind::Enum, "Enum"},
                                            {Kind::Data, "Data"},           {Kind::Fault, "Fault"}, {Kind::Managed, "Managed"}};
inline constexpr NamedValue kFlagNames[] = {{Flag::Array, "Array"}, {Flag::Optional, "Optional"}, {Flag::Carried, "Carried"}};

// The version that means "none": the runtime's own records carry it, and so does the
// result of a method that returns nothing.
inline constexpr const char* kNoneVersion = "strata.version.version0";

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
    std::uint32_t flags;            // MethodFlag bits
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

// The runtime's own records, one row each: X(symbol, wire name, kind, root). The record
// is Orbit::g<symbol>TypeInfo and its flat name is <symbol>. A catalogue names a
// primitive by its wire name; a catalogued type that names no base derives from the
// root row of its kind, whose class is Orbit::<last segment of the wire name>.
#define ORBIT_RUNTIME_RECORDS(X)                                \
    X(String, "string", Primitive, false)                       \
    X(Bool, "boolean", Primitive, false)                        \
    X(Int, "int", Primitive, false)                             \
    X(Long, "long", Primitive, false)                           \
    X(Double, "double", Primitive, false)                       \
    X(DateTime, "dateTime", Primitive, false)                   \
    X(Any, "anyType", Primitive, false)                         \
    X(MethodName, "methodName", Primitive, false)               \
    X(MoRef, "ManagedObjectReference", Primitive, false)        \
    X(StrataManagedObject, "strata.ManagedObject", Managed, true) \
    X(StrataMethodFault, "strata.MethodFault", Fault, true)     \
    X(StrataDynamicData, "strata.DynamicData", Data, true)      \
    X(StrataKeyAnyValue, "strata.KeyAnyValue", Data, false)

#define ORBIT_DECLARE_RECORD(symbol, wire, kind, root) extern const TypeInfo g##symbol##TypeInfo;
ORBIT_RUNTIME_RECORDS(ORBIT_DECLARE_RECORD)
#undef ORBIT_DECLARE_RECORD

struct RuntimeRecord {
    const char* symbol;
    const char* wireName;
    std::uint32_t kind;
    bool root;
};
#define ORBIT_RECORD_ROW(symbol, wire, kind, root) {#symbol, wire, Kind::kind, root},
inline constexpr RuntimeRecord kRuntimeRecords[] = {ORBIT_RUNTIME_RECORDS(ORBIT_RECORD_ROW)};
#undef ORBIT_RECORD_ROW

}  // namespace Orbit

// Older spellings of the two data roots, from before they joined the table above.
using Orbit::gStrataDynamicDataTypeInfo;
using Orbit::gStrataKeyAnyValueTypeInfo;
