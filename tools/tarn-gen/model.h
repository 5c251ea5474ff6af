// The validated catalogue: every reference resolved, every flag and version
// checked, every derived name computed once. Emitters read only this.
#pragma once

#include <cstdint>
#include <map>
#include <memory>
#include <string>
#include <vector>

#include "syntax.h"

namespace tarngen {

struct Type;
struct Unit;

// Primitive kinds of the catalogue, one row each (see kinds.cpp).
struct Primitive {
    std::string keyword;     // "string"
    std::string cppType;     // "std::string"
    std::string paramType;   // "const std::string&"
    std::string record;      // "Orbit::gStringTypeInfo", from the runtime's table
    bool isObject;           // anyType is held by reference, the others by value
    bool byValueResult;      // may be returned by value from a managed member
};

// What a property, parameter or result names: a primitive or a type.
struct TypeRef {
    const Primitive* primitive = nullptr;
    const Type* type = nullptr;

    bool IsObject() const;          // held by reference: data, fault, anyType, managed reference
    bool IsEnum() const;
    bool IsString() const;
    bool IsManagedReference() const;
    // The C++ type of one value: "std::string", "Tarn::Vmprov::HostState",
    // "Orbit::MoRef" for a managed reference, "Orbit::Any" for anyType.
    std::string CppType() const;
    // Parameter type of one non-array value: "const std::string&", "int", "Orbit::MoRef*".
    std::string ParamType() const;
    // The array class of this item type: "Orbit::DataArray<Orbit::MoRef>", "Orbit::Array<int>".
    std::string ArrayClass() const;
    // Address of the header record: "&Orbit::gStringTypeInfo", "&gTarnFtFtVmInfoTypeInfo".
    std::string RecordAddress() const;
    std::string DisplayName() const;
};

struct Property {
    Location where;
    Doc doc;
    std::string name;
    TypeRef type;
    std::uint32_t flags = 0;
    std::string version;
    std::string privilege;  // empty: none
    int index = 0;          // in the owner's own property list
    int memberNumber = 0;   // managed types: methods first, then properties

    bool IsArray() const { return (flags & Orbit::Flag::Array) != 0; }
    bool IsOptional() const { return (flags & Orbit::Flag::Optional) != 0; }
};

struct Param {
    Location where;
    Doc doc;
    std::string name;
    TypeRef type;
    std::uint32_t flags = 0;
    std::string version;
    bool IsArray() const { return (flags & Orbit::Flag::Array) != 0; }
};

struct Method {
    Location where;
    Doc doc;
    std::string name;       // as catalogued, "reloadSslCertificate"
    std::string operation;  // C++ name, "ReloadSslCertificate"
    std::string wsdlName;
    std::string version;
    bool task = false;
    std::string privilege;
    std::vector<Param> params;
    bool hasResult = false;
    Param result;           // name "result"; meaningful when hasResult
    std::vector<const Type*> faults;
    int memberNumber = 0;
};

struct Type {
    Location where;
    Doc doc;
    Kind kind = Kind::Data;
    Unit* unit = nullptr;
    bool runtime = false;           // owned by the runtime (strata.DynamicData and friends)
    std::string wireName;           // "tarn.vmprov.Action.Input"
    std::string name;               // last segment, "Input"
    std::string flatName;           // "TarnVmprovActionInput"
    std::string className;          // "Tarn::Vmprov::Action::Input"
    std::string record;             // "gTarnVmprovActionInputTypeInfo" (qualified for runtime records)
    std::string version;
    const Type* base = nullptr;     // the catalogue base, or the runtime root
    const Type* outer = nullptr;    // the enclosing type of a nested type
    std::vector<std::string> classNamespaces;  // {"Tarn", "Vmprov"}
    std::vector<Property> properties;
    std::vector<Method> methods;
    std::vector<std::string> tags;

    bool IsDataLike() const { return kind == Kind::Data || kind == Kind::Fault; }
    // Own methods then own properties.
    int MemberCount() const { return static_cast<int>(methods.size() + properties.size()); }
    // Every property of the base chain, root-most base first, then the own ones;
    // runtime bases contribute none.
    std::vector<const Property*> ChainProperties() const;
};

// What one generated file set holds: a catalogue namespace, or a stand-in library.
struct Unit {
    std::string file;          // as messages name it
    std::string source;        // as generated files name it: "idl/tarn.vmprov.idl"
    std::string name;          // "tarn.vmprov", "tarn", "cairn"
    bool standin = false;
    std::string flatName;      // "TarnVmprov"
    std::string outputDir;     // "tarn/vmprov", "tarn", "cairn"
    std::string header;        // "tarn/vmprov.h", "tarn/tarn.h", "cairn/cairn.h"
    std::string detailHeader;  // records and loader: "tarn/detail/vmprov.h", "cairn/detail/cairn.h"
    std::string sourcePath;    // "tarn/vmprov" (the prefix of "…/typeinfo" and "…/stub")
    std::string loaderClass;   // "TarnVmprovTypeinfoTypeInfoLoader"
    int loadOrder = 0;         // position among the units of its library
    std::vector<Type*> types;  // declaration order
    // Registration order: managed, then data and faults, then enumerations.
    std::vector<const Type*> RegistrationOrder() const;
    // Types in an order the header can define them (bases and outer types first).
    std::vector<const Type*> DefinitionOrder() const;
    // Units whose classes this unit's header needs (data, fault and enum types used by value or class).
    std::vector<const Unit*> HeaderDependencies() const;
};

struct Version {
    Location where;
    std::string name;
    std::string serviceNamespace;
    std::string versionId;
    std::uint32_t flag = 0;
    std::vector<int> direct;    // indexes into Model::versions
    std::vector<int> included;  // full set, itself included, in registration order
};

struct Model {
    // The catalogue's root namespace, from the first namespace of the loader order:
    // "tarn". It names the library-wide files ("tarn/versions.h") and the C++
    // namespace of the version registration ("Tarn::RegisterVersions").
    std::string root;
    std::vector<Version> versions;
    std::vector<std::unique_ptr<Unit>> units;    // tarn units in load order, then stand-ins
    std::vector<std::unique_ptr<Type>> types;    // every type, runtime ones included
    std::map<std::string, Type*> byWireName;

    std::vector<const Unit*> Units(bool standin) const;
    int InclusionCount() const;
};

// Builds the model from parsed files. One file's 'loaders' statement lists the
// catalogue namespaces in the order their loaders run; every namespace file must be
// named there. Throws CatalogueError naming file and line.
Model Resolve(std::vector<FileSyntax> files);

// The primitive table.
const std::vector<Primitive>& Primitives();

// How generated code spells a kind, property flags and method flags:
// "Orbit::Kind::Data", "Orbit::Flag::Array | Orbit::Flag::Optional", "0".
std::string KindExpression(Kind kind);
std::string FlagsExpression(std::uint32_t flags);
std::string MethodFlagsExpression(bool task);

}  // namespace tarngen
