#include "internal.h"
#include "orbit/Records.h"

namespace Orbit {

using detail::kRuntimeVersion;

constinit const TypeInfo gStringTypeInfo{Kind::Primitive, "string", "String", kRuntimeVersion};
constinit const TypeInfo gBoolTypeInfo{Kind::Primitive, "boolean", "Bool", kRuntimeVersion};
constinit const TypeInfo gIntTypeInfo{Kind::Primitive, "int", "Int", kRuntimeVersion};
constinit const TypeInfo gLongTypeInfo{Kind::Primitive, "long", "Long", kRuntimeVersion};
constinit const TypeInfo gDoubleTypeInfo{Kind::Primitive, "double", "Double", kRuntimeVersion};
constinit const TypeInfo gDateTimeTypeInfo{Kind::Primitive, "dateTime", "DateTime", kRuntimeVersion};
constinit const TypeInfo gAnyTypeInfo{Kind::Primitive, "anyType", "Any", kRuntimeVersion};
constinit const TypeInfo gMethodNameTypeInfo{Kind::Primitive, "methodName", "MethodName", kRuntimeVersion};
constinit const TypeInfo gMoRefTypeInfo{Kind::Primitive, "ManagedObjectReference", "MoRef", kRuntimeVersion};
constinit const TypeInfo gStrataManagedObjectTypeInfo{Kind::Managed, "strata.ManagedObject", "StrataManagedObject",
                                                      kRuntimeVersion};
constinit const TypeInfo gStrataMethodFaultTypeInfo{Kind::Fault, "strata.MethodFault", "StrataMethodFault",
                                                    kRuntimeVersion};

}  // namespace Orbit

constinit const Orbit::TypeInfo gStrataDynamicDataTypeInfo{Orbit::Kind::Data, "strata.DynamicData",
                                                           "StrataDynamicData", Orbit::detail::kRuntimeVersion};
constinit const Orbit::TypeInfo gStrataKeyAnyValueTypeInfo{Orbit::Kind::Data, "strata.KeyAnyValue",
                                                           "StrataKeyAnyValue", Orbit::detail::kRuntimeVersion};
