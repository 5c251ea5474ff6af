// The primitive table and what every kind of value looks like in C++.
#include "model.h"
#include "names.h"

namespace tarngen {

const std::vector<Primitive>& Primitives() {
    static const std::vector<Primitive> table = {
        // keyword      C++ type                      parameter type                             record                        object  by-value result
        {"string",     "std::string",               "const std::string&",                      "Orbit::gStringTypeInfo",     false, true},
        {"boolean",    "bool",                      "bool",                                    "Orbit::gBoolTypeInfo",       false, true},
        {"int",        "int",                       "int",                                     "Orbit::gIntTypeInfo",        false, true},
        {"long",       "long long",                 "long long",                               "Orbit::gLongTypeInfo",       false, true},
        {"double",     "double",                    "double",                                  "Orbit::gDoubleTypeInfo",     false, false},
        {"dateTime",   "Kernite::System::DateTime", "const Kernite::System::DateTime&",        "Orbit::gDateTimeTypeInfo",   false, false},
        {"methodName", "Orbit::MethodName",         "const Orbit::MethodName&",                "Orbit::gMethodNameTypeInfo", false, false},
        {"anyType",    "Orbit::Any",                "Orbit::Any*",                             "Orbit::gAnyTypeInfo",        true,  false},
    };
    return table;
}

bool TypeRef::IsObject() const {
    if (primitive) return primitive->isObject;
    return type->kind != Kind::Enum;
}

bool TypeRef::IsEnum() const { return type != nullptr && type->kind == Kind::Enum; }

bool TypeRef::IsString() const { return primitive != nullptr && primitive->keyword == "string"; }

bool TypeRef::IsManagedReference() const { return type != nullptr && type->kind == Kind::Managed; }

std::string TypeRef::CppType() const {
    if (primitive) return primitive->cppType;
    if (type->kind == Kind::Managed) return "Orbit::MoRef";
    return type->className;
}

std::string TypeRef::ParamType() const {
    if (primitive) return primitive->paramType;
    if (type->kind == Kind::Enum) return type->className;
    return CppType() + "*";
}

std::string TypeRef::ArrayClass() const {
    return (IsObject() ? "Orbit::DataArray<" : "Orbit::Array<") + CppType() + ">";
}

std::string TypeRef::RecordAddress() const { return "&" + (primitive ? primitive->record : type->record); }

std::string TypeRef::DisplayName() const { return primitive ? primitive->keyword : type->wireName; }

}  // namespace tarngen
