// The primitive table and what every kind of value looks like in C++.
#include "model.h"
#include "names.h"

#include <stdexcept>

namespace tarngen {

namespace {

// The C++ side of each catalogue keyword; the record comes from the runtime's table.
struct Shape {
    const char* keyword;
    const char* cppType;
    const char* paramType;
    bool isObject;
    bool byValueResult;
};
constexpr Shape kShapes[] = {
    // keyword      C++ type                      parameter type                       object  by-value result
    {"string",     "std::string",               "const std::string&",                false, true},
    {"boolean",    "bool",                      "bool",                              false, true},
    {"int",        "int",                       "int",                               false, true},
    {"long",       "long long",                 "long long",                         false, true},
    {"double",     "double",                    "double",                            false, false},
    {"dateTime",   "Kernite::System::DateTime", "const Kernite::System::DateTime&",  false, false},
    {"methodName", "Orbit::MethodName",         "const Orbit::MethodName&",          false, false},
    {"anyType",    "Orbit::Any",                "Orbit::Any*",                       true,  false},
};

std::string Named(const char* scope, std::uint32_t value, const auto& table) {
    for (const Orbit::NamedValue& row : table)
        if (row.value == value) return std::string(scope) + row.name;
    throw std::logic_error("no name for value " + std::to_string(value));
}

}  // namespace

const std::vector<Primitive>& Primitives() {
    static const std::vector<Primitive> table = [] {
        std::vector<Primitive> rows;
        for (const Shape& shape : kShapes) {
            const Orbit::RuntimeRecord* record = nullptr;
            for (const Orbit::RuntimeRecord& r : Orbit::kRuntimeRecords)
                if (r.kind == Orbit::Kind::Primitive && std::string(r.wireName) == shape.keyword) record = &r;
            if (!record) throw std::logic_error(std::string("the runtime has no record for '") + shape.keyword + "'");
            rows.push_back({shape.keyword, shape.cppType, shape.paramType, names::RuntimeRecord(record->symbol),
                            shape.isObject, shape.byValueResult});
        }
        return rows;
    }();
    return table;
}

std::string KindExpression(Kind kind) { return Named("Orbit::Kind::", static_cast<std::uint32_t>(kind), Orbit::kKindNames); }

std::string FlagsExpression(std::uint32_t flags) {
    std::string out;
    for (const Orbit::NamedValue& row : Orbit::kFlagNames)
        if (flags & row.value) out += (out.empty() ? "" : " | ") + std::string("Orbit::Flag::") + row.name;
    if ((flags & ~Orbit::Flag::All) != 0)
        throw std::logic_error("unnamed flag bits in " + std::to_string(flags));
    return out.empty() ? "0" : out;
}

std::string MethodFlagsExpression(bool task) { return task ? "Orbit::MethodFlag::Task" : "0"; }

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
