#include "samples.h"

#include <cctype>
#include <stdexcept>
#include <typeinfo>

namespace Roundtrip {
namespace {

using Kernite::Ref;
using Orbit::Any;
using Orbit::Array;
using Orbit::DataArray;
using Orbit::Primitive;
using Orbit::Type;

// How a type travels, read from its kind and, for the runtime's own types, its name.
enum class Shape { String, Bool, Int, Long, Double, DateTime, MethodName, AnyValue, MoRef, Enum, Data };

Shape ShapeOf(const Type* type) {
    if (type == nullptr) throw std::logic_error("a member's type does not resolve");
    switch (type->GetKind()) {
    case Orbit::Kind::Managed: return Shape::MoRef;
    case Orbit::Kind::Enum: return Shape::Enum;
    case Orbit::Kind::Data:
    case Orbit::Kind::Fault: return Shape::Data;
    default: break;
    }
    const std::string& name = type->GetName();
    if (name == "string") return Shape::String;
    if (name == "boolean") return Shape::Bool;
    if (name == "int") return Shape::Int;
    if (name == "long") return Shape::Long;
    if (name == "double") return Shape::Double;
    if (name == "dateTime") return Shape::DateTime;
    if (name == "methodName") return Shape::MethodName;
    if (name == "anyType") return Shape::AnyValue;
    if (name == "ManagedObjectReference") return Shape::MoRef;
    throw std::logic_error("no sample for type " + name);
}

std::string StringValue(int seed) { return "sample-" + std::to_string(seed); }
// Even seeds give true, so that a result seed can differ from a default false.
bool BoolValue(int seed) { return seed % 2 == 0; }
int IntValue(int seed) { return 100 + seed; }
long long LongValue(int seed) { return 10'000'000'000LL + seed; }
double DoubleValue(int seed) { return 0.25 + seed; }
Kernite::System::DateTime DateTimeValue(int seed) {
    return Kernite::System::DateTime::FromMicroseconds(1'700'000'000'000'000LL + seed);
}
Orbit::MethodName MethodNameValue(int seed) { return Orbit::MethodName("tarn.Sample.method" + std::to_string(seed)); }

// Tags counted from 1, so that a single item is not the enumeration's zero value
// where it has another; consecutive seeds give different tags.
std::string TagOf(const Orbit::EnumType* type, int seed) {
    std::vector<std::string> tags;
    type->GetEnumTags(tags);
    if (tags.empty()) throw std::logic_error("enumeration without tags");
    return tags[static_cast<std::size_t>(seed + 1) % tags.size()];
}

const Orbit::EnumType* EnumOf(Type* type) { return Kernite::NarrowToType<Orbit::EnumType, Type>(type); }
Orbit::DataObjectType* DataTypeOf(Type* type) { return Kernite::NarrowToType<Orbit::DataObjectType, Type>(type); }

// Sets the first string property found in the type or its bases (else the first
// int one), so that two samples of one class are not trivially equal.
void Fill(Orbit::DataObject* object, const Orbit::DataObjectType* type, int seed) {
    for (Shape wanted : {Shape::String, Shape::Int}) {
        for (const Orbit::DataObjectType* t = type; t != nullptr; t = t->GetBaseDataType()) {
            const auto& properties = t->GetProperties();
            for (std::size_t i = 0; i < properties.size(); ++i) {
                const Orbit::Member& p = properties[i];
                if (p.IsArray() || p.GetType() == nullptr || p.GetType()->GetKind() != Orbit::Kind::Primitive ||
                    ShapeOf(p.GetType()) != wanted)
                    continue;
                if (wanted == Shape::String) {
                    const std::string value = StringValue(seed);
                    t->GetDataTypeInfo()->setProperty(object, static_cast<int>(i), &value);
                } else {
                    const int value = IntValue(seed);
                    t->GetDataTypeInfo()->setProperty(object, static_cast<int>(i), &value);
                }
                return;
            }
        }
    }
}

template <class T>
Ref<Any> ArrayOf(T first, T second) {
    return Ref<Any>(new Array<T>{first, second});
}

}  // namespace

std::vector<Orbit::ManagedObjectType*> TarnManagedTypes() {
    std::vector<Orbit::ManagedObjectType*> found;
    for (Type* type : Orbit::GetTypeMap()->GetTypes()) {
        if (type->GetKind() != Orbit::Kind::Managed || type->GetName().rfind("tarn.", 0) != 0) continue;
        found.push_back(Kernite::NarrowToType<Orbit::ManagedObjectType, Type>(type));
    }
    return found;
}

std::vector<Orbit::ManagedMethod*> AllMembers(const Orbit::ManagedObjectType* type) {
    std::vector<const Orbit::ManagedObjectType*> chain;
    for (const Orbit::ManagedObjectType* t = type; t != nullptr; t = t->GetBaseManagedType()) chain.push_back(t);
    std::vector<Orbit::ManagedMethod*> members;
    for (auto it = chain.rbegin(); it != chain.rend(); ++it)
        for (const auto& member : (*it)->GetMembers()) members.push_back(member.Get());
    return members;
}

std::string OperationName(const Orbit::ManagedMethod* member) {
    std::string name = member->GetName();
    if (!name.empty()) name[0] = static_cast<char>(std::toupper(static_cast<unsigned char>(name[0])));
    if (!member->IsPropertyGetter()) return name;
    const Orbit::Member& value = member->GetResult();
    const bool boolean = !value.IsArray() && ShapeOf(value.GetType()) == Shape::Bool;
    return (boolean ? "Is" : "Get") + name;
}

bool HeldByReference(const Orbit::Member& member) {
    if (member.IsArray()) return true;
    const Shape shape = ShapeOf(member.GetType());
    return shape == Shape::AnyValue || shape == Shape::MoRef || shape == Shape::Data;
}

bool IsVoid(const Orbit::ManagedMethod* member) { return member->GetResult().typeRecord == nullptr; }

bool TakesAnyResult(const Orbit::ManagedMethod* member) {
    if (member->IsTask() || IsVoid(member) || member->GetResult().IsArray()) return false;
    return ShapeOf(member->GetResult().GetType()) == Shape::AnyValue;
}

bool ReturnedByValue(const Orbit::ManagedMethod* member) {
    if (member->IsTask() || IsVoid(member) || member->GetResult().IsArray()) return false;
    const Shape shape = ShapeOf(member->GetResult().GetType());
    return shape == Shape::String || shape == Shape::Int || shape == Shape::Long || shape == Shape::Bool;
}

Ref<Any> MakeItem(Type* type, int seed) {
    switch (ShapeOf(type)) {
    case Shape::String: return Ref<Any>(new Primitive<std::string>(StringValue(seed)));
    case Shape::Bool: return Ref<Any>(new Primitive<bool>(BoolValue(seed)));
    case Shape::Int: return Ref<Any>(new Primitive<int>(IntValue(seed)));
    case Shape::Long: return Ref<Any>(new Primitive<long long>(LongValue(seed)));
    case Shape::Double: return Ref<Any>(new Primitive<double>(DoubleValue(seed)));
    case Shape::DateTime: return Ref<Any>(new Primitive<Kernite::System::DateTime>(DateTimeValue(seed)));
    case Shape::MethodName: return Ref<Any>(new Primitive<Orbit::MethodName>(MethodNameValue(seed)));
    // anyType travels here as a string box.
    case Shape::AnyValue: return Ref<Any>(new Primitive<std::string>("any-" + StringValue(seed)));
    case Shape::MoRef: return Ref<Any>(new Orbit::MoRef(type->GetName(), "mo-" + std::to_string(seed)));
    case Shape::Enum: {
        Ref<Any> value;
        EnumOf(type)->StringToEnum(TagOf(EnumOf(type), seed), value);
        return value;
    }
    case Shape::Data: {
        Orbit::DataObjectType* dataType = DataTypeOf(type);
        Ref<Orbit::DataObject> object = dataType->CreateInstance();
        if (!object) throw std::logic_error("no instance of " + type->GetName());
        Fill(object.Get(), dataType, seed);
        return Ref<Any>(object);
    }
    }
    throw std::logic_error("unreachable");
}

Ref<Any> MakeSample(const Orbit::Member& member, int seed) {
    Type* type = member.GetType();
    if (!member.IsArray()) return MakeItem(type, seed);
    switch (ShapeOf(type)) {
    case Shape::String: return ArrayOf(StringValue(seed), StringValue(seed + 1));
    case Shape::Bool: return ArrayOf(BoolValue(seed), BoolValue(seed + 1));
    case Shape::Int: return ArrayOf(IntValue(seed), IntValue(seed + 1));
    case Shape::Long: return ArrayOf(LongValue(seed), LongValue(seed + 1));
    case Shape::Double: return ArrayOf(DoubleValue(seed), DoubleValue(seed + 1));
    case Shape::DateTime: return ArrayOf(DateTimeValue(seed), DateTimeValue(seed + 1));
    case Shape::MethodName: return ArrayOf(MethodNameValue(seed), MethodNameValue(seed + 1));
    case Shape::AnyValue: {
        Ref<DataArray<Any>> items(new DataArray<Any>());
        items->Append(MakeItem(type, seed).Get());
        items->Append(MakeItem(type, seed + 1).Get());
        return Ref<Any>(items);
    }
    case Shape::MoRef: {
        Ref<DataArray<Orbit::MoRef>> items(new DataArray<Orbit::MoRef>());
        items->CheckedAppend(MakeItem(type, seed).Get());
        items->CheckedAppend(MakeItem(type, seed + 1).Get());
        return Ref<Any>(items);
    }
    case Shape::Enum: {
        Ref<Array<std::string>> tags(new Array<std::string>{TagOf(EnumOf(type), seed), TagOf(EnumOf(type), seed + 1)});
        Ref<Any> values;
        EnumOf(type)->StringArrayToEnumArray(tags.Get(), values);
        return values;
    }
    case Shape::Data: {
        Ref<Any> made = DataTypeOf(type)->CreateArray();
        auto* items = Kernite::NarrowToType<Orbit::DataObjectArrayBase, Any>(made.Get());
        if (items == nullptr) throw std::logic_error("no array of " + type->GetName());
        items->CheckedAppend(MakeItem(type, seed).Get());
        items->CheckedAppend(MakeItem(type, seed + 1).Get());
        return made;
    }
    }
    throw std::logic_error("unreachable");
}

Ref<Orbit::DataObject> MakeFullObject(Orbit::DataObjectType* type, int seed, bool optionals,
                                      const Orbit::Version* seenBy, int depth) {
    Ref<Orbit::DataObject> object = type->CreateInstance();
    for (const Orbit::DataObjectType* t = type; t != nullptr; t = t->GetBaseDataType()) {
        const Orbit::DataTypeInfo* info = t->GetDataTypeInfo();
        const auto& properties = t->GetProperties();
        for (int i = 0; i < static_cast<int>(properties.size()); ++i) {
            const Orbit::Member& p = properties[i];
            if ((p.IsOptional() && !optionals) || (seenBy != nullptr && !p.IsVisible(seenBy))) continue;
            const int s = seed + i;
            auto set = [&](const auto& value) { info->setProperty(object.Get(), i, &value); };
            const Shape shape = ShapeOf(p.GetType());
            if (p.IsArray() || shape == Shape::Data || shape == Shape::AnyValue || shape == Shape::MoRef) {
                // Deep enough: what may be left out is.
                if (shape == Shape::Data && depth <= 0 && (p.IsArray() || p.IsOptional())) continue;
                info->setProperty(object.Get(), i, MakeFullSample(p, s, optionals, seenBy, depth - 1).Get());
                continue;
            }
            switch (shape) {
            case Shape::String: set(StringValue(s)); break;
            case Shape::Bool: set(BoolValue(s)); break;
            case Shape::Int: set(IntValue(s)); break;
            case Shape::Long: set(LongValue(s)); break;
            case Shape::Double: set(DoubleValue(s)); break;
            case Shape::DateTime: set(DateTimeValue(s)); break;
            case Shape::MethodName: set(MethodNameValue(s)); break;
            case Shape::Enum: set(EnumOf(p.GetType())->GetValue(TagOf(EnumOf(p.GetType()), s))); break;
            default: break;
            }
        }
    }
    return object;
}

Ref<Any> MakeFullSample(const Orbit::Member& member, int seed, bool optionals, const Orbit::Version* seenBy,
                        int depth) {
    if (ShapeOf(member.GetType()) != Shape::Data) return MakeSample(member, seed);
    Orbit::DataObjectType* type = DataTypeOf(member.GetType());
    if (!member.IsArray()) return Ref<Any>(MakeFullObject(type, seed, optionals, seenBy, depth));
    Ref<Any> made = type->CreateArray();
    auto* items = Kernite::NarrowToType<Orbit::DataObjectArrayBase, Any>(made.Get());
    for (int k = 0; k < 2 && depth >= 0; ++k)
        items->CheckedAppend(MakeFullObject(type, seed + k, optionals, seenBy, depth).Get());
    return made;
}

Ref<Any> MakeTaskReference(int seed) {
    return Ref<Any>(new Orbit::MoRef("cairn.Task", "task-" + std::to_string(seed)));
}

Ref<Orbit::MethodFault> MakeFault(const Orbit::ManagedMethod* member) {
    Ref<Orbit::MethodFault> fault;
    if (!member->GetFaults().empty()) {
        Ref<Orbit::DataObject> made = DataTypeOf(Orbit::FindType(member->GetFaults().front()))->CreateInstance();
        fault = Kernite::NarrowToType<Orbit::MethodFault, Orbit::DataObject>(made.Get());
    } else {
        fault = new Orbit::MethodFault();
    }
    fault->SetMsg("planted on " + member->GetName());
    return fault;
}

Ref<Any> MakeWrongBox(const Orbit::ManagedMethod* member) {
    const Orbit::Member& result = member->GetResult();
    if (!result.IsArray() && result.GetType() != nullptr && ShapeOf(result.GetType()) == Shape::MethodName)
        return Ref<Any>(new Primitive<std::string>("not a method name"));
    return Ref<Any>(new Primitive<Orbit::MethodName>(Orbit::MethodName("not.the.result")));
}

std::string Difference(Any* sent, Any* arrived) {
    if (sent == nullptr || arrived == nullptr) {
        if (sent == arrived) return {};
        return sent == nullptr ? "sent null, received a value" : "sent a value, received null";
    }
    if (sent->_GetType() != arrived->_GetType())
        return "sent a " + sent->_GetType()->GetName() + ", received a " + arrived->_GetType()->GetName();
    if (typeid(*sent) != typeid(*arrived))
        return std::string("sent class ") + typeid(*sent).name() + ", received " + typeid(*arrived).name();
    if (!sent->_IsEqual(arrived)) return "values differ (" + sent->_GetType()->GetName() + ")";
    return {};
}

}  // namespace Roundtrip
