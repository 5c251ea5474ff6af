#include "schema.h"

#include <mutex>

#include "kernite/Exception.h"
#include "orbit/Type.h"

namespace Orbit::Wire {
namespace {

bool Sees(const Version& version, const Type* type) {
    return type != nullptr && const_cast<Type*>(type)->IsVisible(const_cast<Version*>(&version));
}

struct PrimitiveName {
    Type* (*get)();
    Shape shape;
    const char* xsiName;
};

const PrimitiveName kPrimitives[] = {
    {&GetType<std::string>, Shape::String, "xsd:string"},
    {&GetType<bool>, Shape::Bool, "xsd:boolean"},
    {&GetType<int>, Shape::Int, "xsd:int"},
    {&GetType<long long>, Shape::Long, "xsd:long"},
    {&GetType<double>, Shape::Double, "xsd:double"},
    {&GetType<Kernite::System::DateTime>, Shape::DateTime, "xsd:dateTime"},
    {&GetType<MethodName>, Shape::MethodName, "t:methodName"},
    {&GetType<Any>, Shape::AnyValue, "xsd:anyType"},
    {&GetType<MoRef>, Shape::MoRef, nullptr},  // named after its record
};

}  // namespace

Shape Schema::ShapeOf(const Type* type) {
    if (type == nullptr) throw Kernite::Exception("a member's type does not resolve");
    switch (type->GetKind()) {
    case Kind::Managed: return Shape::MoRef;
    case Kind::Enum: return Shape::Enum;
    case Kind::Data:
    case Kind::Fault: return Shape::Data;
    default: break;
    }
    for (const PrimitiveName& p : kPrimitives)
        if (p.get() == type) return p.shape;
    throw Kernite::Exception("no wire form for type " + type->GetName());
}

const Schema& Schema::For(const Version& version) {
    static auto* mutex = new std::mutex();
    static auto* made = new std::unordered_map<const Version*, std::unique_ptr<Schema>>();
    std::lock_guard<std::mutex> lock(*mutex);
    RegisterFaultTypes();
    std::unique_ptr<Schema>& slot = (*made)[&version];
    if (!slot) slot.reset(new Schema(version));
    return *slot;
}

Schema::Schema(const Version& version)
    : _version(&version),
      _namespace("urn:" + (version.GetServiceNamespace().empty() ? version.GetName()
                                                                  : version.GetServiceNamespace())) {
    for (const PrimitiveName& p : kPrimitives) {
        Type* type = p.get();
        AddXsiName(type, p.xsiName ? p.xsiName : "t:" + type->GetName());
        _arrayItems.push_back(type);
    }
    std::vector<Type*> types{GetType<DynamicData>(), GetType<MethodFault>(), GetType<KeyAnyValue>()};
    for (Type* type : GetTypeMap()->GetTypes()) types.push_back(type);

    for (Type* type : types) {
        // Every data type gets a table, seen or not: a value of a class the version
        // does not see is written as its nearest base that it sees.
        if (auto* data = dynamic_cast<DataObjectType*>(type)) {
            Ensure(data);
            continue;
        }
        if (!Sees(version, type)) continue;
        switch (type->GetKind()) {
        case Kind::Enum:
            if (auto* e = dynamic_cast<EnumType*>(type)) {
                _enums.push_back(e);
                AddXsiName(type, "t:" + type->GetName());
                _arrayItems.push_back(type);
            }
            break;
        case Kind::Managed:
            if (auto* managed = dynamic_cast<ManagedObjectType*>(type)) {
                _managed.push_back(managed);
                _managedByName.emplace(managed->GetName(), managed);
            }
            break;
        default: break;
        }
    }
    for (ManagedObjectType* managed : _managed)
        for (const auto& member : managed->GetMembers())
            if (member->IsVisible(&version)) AddMethod(member.Get(), managed);
    for (Type* item : _arrayItems) {
        Type* array = item->GetArrayType();
        AddXsiName(array, "t:" + array->GetWsdlName());
        Slot slot;
        slot.name = item->GetWsdlName();
        slot.shape = ShapeOf(item);
        slot.type = slot.declared = item;
        if (slot.shape == Shape::Enum) slot.enumType = dynamic_cast<const EnumType*>(item);
        if (slot.shape == Shape::Data) slot.data = Data(item);
        _valueSlots.emplace(item, std::move(slot));
    }
}

void Schema::AddXsiName(Type* type, std::string name) {
    _byXsiName.emplace(name, type);
    _xsiNames.emplace(type, std::move(name));
}

// Tables are made before their slots, so that a type may hold itself (a snapshot's
// children are snapshots).
DataTable* Schema::Ensure(DataObjectType* type) {
    if (auto it = _data.find(type); it != _data.end()) return it->second.get();
    auto table = std::make_unique<DataTable>();
    DataTable* made = table.get();
    made->type = type;
    made->written = type;
    while (made->written != nullptr && !Sees(*_version, made->written)) made->written = made->written->GetBaseDataType();
    if (made->written == nullptr) made->written = Kernite::NarrowToType<DataObjectType, Type>(GetType<DynamicData>());
    made->visible = made->written == type;
    _data.emplace(type, std::move(table));
    if (made->visible) {
        _dataOrder.push_back(made);
        AddXsiName(type, "t:" + type->GetName());
        _arrayItems.push_back(type);
    }

    std::vector<const DataObjectType*> chain;
    for (const DataObjectType* t = made->written; t != nullptr; t = t->GetBaseDataType()) chain.push_back(t);
    for (auto level = chain.rbegin(); level != chain.rend(); ++level) {
        const auto& properties = (*level)->GetProperties();
        for (std::size_t i = 0; i < properties.size(); ++i) {
            if (!properties[i].IsVisible(_version)) continue;
            Slot slot = MakeSlot(properties[i]);
            slot.info = (*level)->GetDataTypeInfo();
            slot.index = static_cast<int>(i);
            made->properties.push_back(std::move(slot));
        }
    }
    return made;
}

Slot Schema::MakeSlot(const Member& member) {
    Slot slot;
    slot.name = member.name;
    slot.array = member.IsArray();
    slot.optional = member.IsOptional();
    slot.visible = member.IsVisible(_version);
    slot.type = slot.declared = member.GetType();
    slot.shape = ShapeOf(slot.type);
    if (slot.shape == Shape::Enum) slot.enumType = dynamic_cast<const EnumType*>(slot.type);
    // A reference to any managed type travels as one type.
    if (slot.shape == Shape::MoRef) slot.type = GetType<MoRef>();
    if (slot.shape == Shape::Data) {
        DataTable* declared = Ensure(Kernite::NarrowToType<DataObjectType, Type>(slot.type));
        slot.type = declared->written;
        slot.data = Ensure(declared->written);
    }
    return slot;
}

void Schema::AddMethod(ManagedMethod* method, ManagedObjectType* owner) {
    auto table = std::make_unique<MethodTable>();
    table->method = method;
    table->owner = owner;
    table->element = method->IsPropertyGetter() ? owner->GetWsdlName() + "." + method->GetName()
                                                : method->GetWsdlName();
    for (const Member& param : method->GetParameters()) table->params.push_back(MakeSlot(param));
    if (method->IsTask()) {
        table->hasResult = true;
        table->result.shape = Shape::MoRef;
        table->result.type = table->result.declared = GetType<MoRef>();
    } else if (method->GetResult().typeRecord != nullptr) {
        table->hasResult = true;
        table->result = MakeSlot(method->GetResult());
    }
    table->result.name = "result";
    table->result.visible = true;
    if (table->hasResult) table->results.push_back(table->result);
    const MethodTable* made = table.get();
    if (!_byElement.emplace(made->element, made).second)
        throw Kernite::Exception("two operations named " + made->element);
    _methodOrder.push_back(made);
    _methods.emplace(method, std::move(table));
}

const DataTable* Schema::Data(const Type* type) const {
    auto it = _data.find(type);
    return it == _data.end() ? nullptr : it->second.get();
}

const MethodTable* Schema::Method(const ManagedMethod* method) const {
    auto it = _methods.find(method);
    return it == _methods.end() ? nullptr : it->second.get();
}

const MethodTable* Schema::MethodByElement(std::string_view element) const {
    auto it = _byElement.find(element);
    return it == _byElement.end() ? nullptr : it->second;
}

Type* Schema::TypeByXsiName(std::string_view name) const {
    auto it = _byXsiName.find(name);
    return it == _byXsiName.end() ? nullptr : it->second;
}

const std::string& Schema::XsiName(const Type* type) const {
    static const std::string kNone;
    auto it = _xsiNames.find(type);
    return it == _xsiNames.end() ? kNone : it->second;
}

const Slot* Schema::ValueSlot(const Type* type) const {
    auto it = _valueSlots.find(type);
    return it == _valueSlots.end() ? nullptr : &it->second;
}

ManagedObjectType* Schema::ManagedType(std::string_view name) const {
    auto it = _managedByName.find(name);
    return it == _managedByName.end() ? nullptr : it->second;
}

}  // namespace Orbit::Wire
