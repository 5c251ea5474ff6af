// Shared between the runtime's sources only.
#pragma once

#include <string>

#include "orbit/Records.h"

namespace Orbit {
class Type;

namespace detail {

inline constexpr const char* kRuntimeVersion = kNoneVersion;

// Registration records of the runtime's own data and managed types.
extern const DataTypeInfo kDynamicDataInfo;
extern const DataTypeInfo kMethodFaultInfo;
extern const DataTypeInfo kKeyAnyValueInfo;
extern const ManagedTypeInfo kManagedObjectInfo;

// The runtime's own types, created on demand; null for any other record or name.
Type* RuntimeTypeByHeader(const TypeInfo* header);
Type* RuntimeTypeByName(const std::string& name);

}  // namespace detail
}  // namespace Orbit
