// The API as the runtime registered it: a plain copy of what the type and version
// maps and the type objects say, taken once, optionally seen through one version.
#pragma once

#include <cstdint>
#include <optional>
#include <string>
#include <vector>

namespace Orbit {
class Version;
}

namespace tarncatalog {

// A property, parameter or result. Types are named by their header's flat name.
struct MemberEntry {
    std::string name;
    std::optional<std::string> privilege;
    std::optional<std::string> type;  // none for a void result
    std::optional<std::string> typeWireName;
    std::uint32_t flags = 0;
    std::string version;
    int memberNumber = -1;  // properties only: the record-function index or the member number
};

struct MethodEntry {
    std::string name;
    std::string wsdlName;
    std::optional<std::string> privilege;
    std::string version;
    bool task = false;
    int memberNumber = 0;
    MemberEntry result;
    std::vector<MemberEntry> params;
    std::vector<std::string> faults;
};

struct TypeEntry {
    std::string name;
    std::string flatName;
    std::string className;  // "Tarn::DebugManager::TraceResult"
    std::string header;     // to include: "tarn/tarn.h"
    bool standin = false;   // a stand-in for another library's type
    std::uint32_t kind = 0;
    std::string version;
    std::string ns;
    std::optional<std::string> base;  // none for enumerations
    std::vector<std::string> baseChain;  // wire names, the direct base first, up to the runtime's root
    std::vector<MemberEntry> properties;
    std::vector<MethodEntry> methods;  // managed types only
    std::vector<std::string> tags;     // enumerations only
    int hiddenMembers = 0;             // own properties and methods the chosen version does not see
};

struct VersionEntry {
    std::string name;
    std::string serviceNamespace;
    std::string versionId;
    std::uint32_t flag = 0;
    std::vector<std::string> includes;  // registration order, itself included
};

struct Calls {
    long addVersion = 0;
    long addIncludedVersion = 0;
    long addType = 0;
};

struct Catalog {
    std::optional<std::string> seenBy;  // the version the catalog is restricted to
    std::vector<std::string> loaders;   // namespaces, in the order their loaders ran
    Calls calls;
    std::vector<VersionEntry> versions;
    std::vector<TypeEntry> types;       // type-map registration order
    std::vector<TypeEntry> standins;    // the other libraries' types the records name
    int registeredTypes = 0;            // tarn types in the map, visible or not
};

// The namespace part of a wire name: its leading segments that begin with a small
// letter ("tarn.DebugManager.TraceResult" is in "tarn").
std::string NamespaceOf(const std::string& wireName);

// Null when the version map has no such version.
Orbit::Version* FindVersion(const std::string& name);

// Walks the maps. With `seenBy`, keeps only the types, properties, methods and
// versions that version includes.
Catalog ReadCatalog(Orbit::Version* seenBy);

// A tarn or stand-in type by wire name, flat name or C++ class name; null if none.
const TypeEntry* FindType(const Catalog& catalog, const std::string& name);
// Up to three registered names close to a mistyped one, closest first.
std::vector<std::string> CloseNames(const Catalog& catalog, const std::string& name);
// The bases of `type` that the catalog holds, the direct base first, each with the
// members `type` inherits from it.
std::vector<const TypeEntry*> Ancestors(const Catalog& catalog, const TypeEntry& type);

}  // namespace tarncatalog
