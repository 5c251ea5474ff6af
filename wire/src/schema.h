// What one API version sees of the records, resolved once into tables that the
// encoder, the decoder and the WSDL writer share: the hot path asks no registry and
// looks no version up by name.
#pragma once

#include <cstdint>
#include <memory>
#include <string>
#include <string_view>
#include <unordered_map>
#include <vector>

#include "orbit/DataObject.h"
#include "orbit/Enum.h"
#include "orbit/Registry.h"

namespace Orbit::Wire {

// How a value of a member's item type travels.
enum class Shape : std::uint8_t { String, Bool, Int, Long, Double, DateTime, MethodName, AnyValue, MoRef, Enum, Data };

struct DataTable;

// A property, parameter or result as the version sees it.
struct Slot {
    std::string name;                 // element name
    Shape shape = Shape::String;
    bool array = false;
    bool optional = false;
    bool visible = true;               // parameters only: the version may not see them
    Type* type = nullptr;              // item type as written: for data, the nearest visible base
    Type* declared = nullptr;          // item type as the record declares it
    const EnumType* enumType = nullptr;
    const DataTable* data = nullptr;   // Shape::Data: the table of `type`
    // Properties only: where the record functions find it.
    const DataTypeInfo* info = nullptr;
    int index = -1;

    // A member that must be present: not optional, not an array.
    bool Required() const noexcept { return !optional && !array; }
};

struct DataTable {
    DataObjectType* type = nullptr;     // the class
    DataObjectType* written = nullptr;  // the nearest of the class and its bases the version sees
    bool visible = false;               // written == type
    std::vector<Slot> properties;       // of `written`, base first, only those the version sees
};

struct MethodTable {
    ManagedMethod* method = nullptr;
    ManagedObjectType* owner = nullptr;  // the declaring type
    std::string element;                 // the operation's element name
    std::vector<Slot> params;            // every parameter, in order
    Slot result;
    bool hasResult = false;
    std::vector<Slot> results;           // the result alone, or nothing
};

// Adds the wire's fault types to the type map, once; every schema is made after it.
void RegisterFaultTypes();

// Lets maps keyed by std::string be searched with a std::string_view.
struct TextHash {
    using is_transparent = void;
    std::size_t operator()(std::string_view text) const noexcept { return std::hash<std::string_view>{}(text); }
};

class Schema {
public:
    // The tables of `version`, built on first request and kept for the process.
    static const Schema& For(const Version& version);

    const Version& GetVersion() const noexcept { return *_version; }
    const std::string& Namespace() const noexcept { return _namespace; }

    // Null for a type that is no registered data type.
    const DataTable* Data(const Type* type) const;
    // Null when the version does not see the method or its type.
    const MethodTable* Method(const ManagedMethod* method) const;
    const MethodTable* MethodByElement(std::string_view element) const;
    // A type by the name xsi:type gives it; null when the version does not see it.
    Type* TypeByXsiName(std::string_view name) const;
    // The name xsi:type gives a type: "xsd:int", "t:tarn.vmprov.HostState", "t:ArrayOfInt".
    const std::string& XsiName(const Type* type) const;
    // How a value of `type` (an item type, not an array) travels when it is named by
    // xsi:type; its name is the item element name of arrays of it. Null when the
    // version does not see the type.
    const Slot* ValueSlot(const Type* type) const;
    // A managed type the version sees, by wire name; null otherwise.
    ManagedObjectType* ManagedType(std::string_view name) const;

    // For the WSDL: in registration order.
    const std::vector<const DataTable*>& DataTables() const noexcept { return _dataOrder; }
    const std::vector<const MethodTable*>& Methods() const noexcept { return _methodOrder; }
    const std::vector<const EnumType*>& Enums() const noexcept { return _enums; }
    const std::vector<ManagedObjectType*>& ManagedTypes() const noexcept { return _managed; }
    // Item types whose arrays may travel as anyType values.
    const std::vector<Type*>& ArrayItemTypes() const noexcept { return _arrayItems; }

    // How values of `type` travel; Shape::Data for data objects and faults.
    static Shape ShapeOf(const Type* type);

private:
    explicit Schema(const Version& version);
    DataTable* Ensure(DataObjectType* type);
    Slot MakeSlot(const Member& member);
    void AddMethod(ManagedMethod* method, ManagedObjectType* owner);
    void AddXsiName(Type* type, std::string name);

    const Version* _version;
    std::string _namespace;
    std::unordered_map<const Type*, std::unique_ptr<DataTable>> _data;
    std::vector<const DataTable*> _dataOrder;
    std::unordered_map<const ManagedMethod*, std::unique_ptr<MethodTable>> _methods;
    std::vector<const MethodTable*> _methodOrder;
    std::unordered_map<std::string_view, const MethodTable*> _byElement;
    std::unordered_map<std::string, Type*, TextHash, std::equal_to<>> _byXsiName;
    std::unordered_map<const Type*, std::string> _xsiNames;
    std::unordered_map<std::string_view, ManagedObjectType*> _managedByName;
    std::vector<ManagedObjectType*> _managed;
    std::vector<const EnumType*> _enums;
    std::vector<Type*> _arrayItems;
    std::unordered_map<const Type*, Slot> _valueSlots;
};

}  // namespace Orbit::Wire
