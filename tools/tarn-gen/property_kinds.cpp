#include "property_kinds.h"

#include "names.h"

namespace tarngen {
namespace {

// The C++ type of one value of the property ("Orbit::MethodFault" for the runtime's
// fault root, "Orbit::Any" for anyType).
std::string ValueType(const Property& p) { return p.type.CppType(); }

// Required string: a std::string, always set.
class StringKind : public PropertyKind {
public:
    using PropertyKind::PropertyKind;
    std::string MemberType() const override { return "std::string"; }
    std::string ParamType() const override { return "const std::string&"; }
    void InlineAccessors(Printer& out) const override {
        out.Print("    const std::string& $get$() const { return $m$; }\n"
                  "    void $set$(const std::string& value) { $m$ = value; }\n",
                  {{"get", getter}, {"set", setter}, {"m", member}});
    }
    std::string SizeTerm() const override { return "size += f(Orbit::GetPrimitiveExtraSize(" + member + "));"; }
    std::string Get() const override { return "Orbit::WriteValue<std::string>(value) = self->" + member + ";"; }
    std::string Set() const override { return "self->" + member + " = Orbit::ReadValue<std::string>(value);"; }
};

// Required scalar or enumeration: the value itself, zeroed by the default constructor.
class ScalarKind : public PropertyKind {
public:
    using PropertyKind::PropertyKind;
    std::string MemberType() const override { return ValueType(property); }
    std::string ParamType() const override { return property.type.ParamType(); }
    std::string DefaultInit() const override { return member + "{}"; }
    void InlineAccessors(Printer& out) const override {
        out.Print("    $type$ $get$() const { return $m$; }\n"
                  "    void $set$($param$ value) { $m$ = value; }\n",
                  {{"type", MemberType()}, {"get", getter}, {"set", setter}, {"m", member}, {"param", ParamType()}});
    }
    std::string SizeTerm() const override { return ""; }
    std::string Get() const override {
        if (property.type.IsEnum()) return "Orbit::WriteValue<int>(value) = static_cast<int>(self->" + member + ");";
        return "Orbit::WriteValue<" + MemberType() + ">(value) = self->" + member + ";";
    }
    std::string Set() const override {
        if (property.type.IsEnum())
            return "self->" + member + " = static_cast<" + MemberType() + ">(Orbit::ReadEnum(value, " +
                   std::to_string(property.type.type->tags.size()) + "));";
        return "self->" + member + " = Orbit::ReadValue<" + MemberType() + ">(value);";
    }
};

// Optional scalar, enumeration or string: a Kernite::Optional.
class OptionalKind : public PropertyKind {
public:
    using PropertyKind::PropertyKind;
    std::string MemberType() const override { return "Kernite::Optional<" + ValueType(property) + ">"; }
    std::string ParamType() const override { return "const " + MemberType() + "&"; }
    void InlineAccessors(Printer& out) const override {
        out.Print("    const $type$& $get$() const { return $m$; }\n"
                  "    void $set$(const $type$& value) { $m$ = value; }\n",
                  {{"type", MemberType()}, {"get", getter}, {"set", setter}, {"m", member}});
    }
    std::string SizeTerm() const override {
        if (!property.type.IsString()) return "";
        return "if (" + member + ".IsSet()) size += f(sizeof(std::string)) + f(Orbit::GetPrimitiveExtraSize(" + member +
               ".GetValue()));";
    }
    std::string Get() const override {
        if (property.type.IsEnum()) return "Orbit::WriteValue<int>(value) = static_cast<int>(self->" + member + ".GetValue());";
        return "Orbit::WriteValue<" + ValueType(property) + ">(value) = self->" + member + ".GetValue();";
    }
    std::string Set() const override {
        if (property.type.IsEnum())
            return "self->" + member + ".SetValue(static_cast<" + ValueType(property) + ">(Orbit::ReadEnum(value, " +
                   std::to_string(property.type.type->tags.size()) + ")));";
        return "self->" + member + ".SetValue(Orbit::ReadValue<" + ValueType(property) + ">(value));";
    }
    std::string IsSet() const override { return "return self->" + member + ".IsSet();"; }
    std::string Unset() const override { return "self->" + member + ".Reset();"; }
};

// Object (data object, fault, anyType, managed object reference): a counted reference.
class ReferenceKind : public PropertyKind {
public:
    using PropertyKind::PropertyKind;
    std::string MemberType() const override { return "Kernite::Ref<" + ValueType(property) + ">"; }
    std::string ParamType() const override { return ValueType(property) + "*"; }
    std::string CopyInit(const std::string& other) const override {
        return member + "(Orbit::CloneOf(" + other + "." + member + "))";
    }
    void InlineAccessors(Printer& out) const override {
        out.Print("    $type$* $get$() const { return $m$.Get(); }\n",
                  {{"type", ValueType(property)}, {"get", getter}, {"m", member}});
    }
    void OutOfLineDeclarations(Printer& out) const override {
        out.Print("    void $set$($type$* value);\n", {{"set", setter}, {"type", ValueType(property)}});
    }
    void OutOfLineDefinitions(Printer& out, const std::string& cls) const override {
        out.Print("void $cls$::$set$($type$* value) { $m$ = value; }\n",
                  {{"cls", cls}, {"set", setter}, {"type", ValueType(property)}, {"m", member}});
    }
    std::string SizeTerm() const override { return "if (" + member + ") size += " + member + "->_GetSize(f);"; }
    std::string Get() const override { return "Orbit::WriteValue<Kernite::Ref<Orbit::Any>>(value) = self->" + member + ".Get();"; }
    std::string Set() const override {
        return "self->" + setter + "(Kernite::NarrowToType<" + ValueType(property) + ", Orbit::Any>(Orbit::ReadObject(value)));";
    }
    std::string IsSet() const override { return "return self->" + member + ".Get() != nullptr;"; }
    std::string Unset() const override { return property.IsOptional() ? "self->" + member + " = nullptr;" : ""; }
};

// Array: an ArrayField, created empty on first read.
class ArrayKind : public PropertyKind {
public:
    using PropertyKind::PropertyKind;
    std::string Array() const { return property.type.ArrayClass(); }
    std::string MemberType() const override { return "Orbit::ArrayField<" + Array() + ">"; }
    std::string ParamType() const override { return Array() + "*"; }
    void InlineAccessors(Printer&) const override {}
    void OutOfLineDeclarations(Printer& out) const override {
        out.Print("    $array$* $get$() const;\n"
                  "    void $set$($array$* value);\n",
                  {{"array", Array()}, {"get", getter}, {"set", setter}});
    }
    void OutOfLineDefinitions(Printer& out, const std::string& cls) const override {
        out.Print("$array$* $cls$::$get$() const { return $m$.Get(); }\n"
                  "void $cls$::$set$($array$* value) { $m$.Set(value); }\n",
                  {{"array", Array()}, {"cls", cls}, {"get", getter}, {"set", setter}, {"m", member}});
    }
    std::string SizeTerm() const override { return "if (auto* array = " + member + ".Peek()) size += array->_GetSize(f);"; }
    std::string Get() const override { return "Orbit::WriteValue<Kernite::Ref<Orbit::Any>>(value) = self->" + member + ".Get();"; }
    std::string Set() const override {
        return "self->" + member + ".Set(Kernite::NarrowToType<" + Array() + ", Orbit::Any>(Orbit::ReadObject(value)));";
    }
    std::string IsSet() const override {
        return "auto* array = self->" + member + ".Peek();\n            return array != nullptr && !array->IsEmpty();";
    }
    std::string Unset() const override { return property.IsOptional() ? "self->" + member + ".Reset();" : ""; }
};

}  // namespace

PropertyKind::PropertyKind(const Property& p)
    : property(p),
      member(names::Member(p.name)),
      getter(names::Accessor("Get", p.name)),
      setter(names::Accessor("Set", p.name)),
      param(names::Identifier(p.name)) {}

std::string PropertyKind::CopyInit(const std::string& other) const { return member + "(" + other + "." + member + ")"; }

std::unique_ptr<PropertyKind> MakePropertyKind(const Property& p) {
    if (p.IsArray()) return std::make_unique<ArrayKind>(p);
    if (p.type.IsObject()) return std::make_unique<ReferenceKind>(p);
    if (p.IsOptional()) return std::make_unique<OptionalKind>(p);
    if (p.type.IsString()) return std::make_unique<StringKind>(p);
    return std::make_unique<ScalarKind>(p);
}

}  // namespace tarngen
