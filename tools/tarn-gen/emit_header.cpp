// The namespace header (classes, stubs, enumerations) and its detail header (records,
// type declarations for the runtime, the loader).
#include <set>

#include "emit.h"
#include "members.h"
#include "names.h"
#include "printer.h"
#include "property_kinds.h"
#include "version.h"

namespace tarngen {
namespace {

std::string Join(const std::vector<std::string>& parts, const char* separator) {
    std::string out;
    for (const std::string& part : parts) out += (out.empty() ? "" : separator) + part;
    return out;
}

// "Tarn::DebugManager::TraceResult" within namespace "Tarn" -> "DebugManager::TraceResult"
std::string NameInNamespace(const Type& t) { return t.className.substr(Join(t.classNamespaces, "::").size() + 2); }

std::vector<const Type*> NestedIn(const Unit& unit, const Type& outer) {
    std::vector<const Type*> out;
    for (const Type* t : unit.types)
        if (t->outer == &outer) out.push_back(t);
    return out;
}

// The catalogue's "##" lines, as comments.
void Documentation(Printer& out, const Doc& doc, const std::string& indent) {
    for (const std::string& line : doc) out.Print("$in$//$sep$$line$\n", {{"in", indent}, {"sep", line.empty() ? "" : " "}, {"line", line}});
}

// A method's own lines, then one entry per documented parameter.
Doc MethodDoc(const Method& m) {
    Doc doc = m.doc;
    for (const Param& p : m.params) {
        for (std::size_t i = 0; i < p.doc.size(); ++i) doc.push_back((i == 0 ? "`" + p.name + "`: " : "    ") + p.doc[i]);
    }
    return doc;
}

void EmitEnum(Printer& out, const Type& e, const char* indent, bool member) {
    std::string enumerators;
    for (std::size_t i = 0; i < e.tags.size(); ++i)
        enumerators += (i ? ", " : "") + names::Identifier(e.tags[i]) + " = " + std::to_string(i);
    out.Print("$in$enum class $name$ : int { $values$ };\n", {{"in", indent}, {"name", e.name}, {"values", enumerators}});
    for (const std::string& tag : e.tags)
        out.Print("$in$$storage$const char* const $constant$;\n",
                  {{"in", indent}, {"storage", member ? "static " : "extern "}, {"constant", names::TagConstant(e.name, tag)}});
}

// Declarations that live inside a class body: nested classes and enumerations.
void EmitNested(Printer& out, const Unit& unit, const Type& outer) {
    for (const Type* nested : NestedIn(unit, outer)) {
        if (nested->kind == Kind::Enum) {
            Documentation(out, nested->doc, "    ");
            EmitEnum(out, *nested, "    ", true);
        } else out.Print("    class $name$;\n", {{"name", nested->name}});
    }
}

void EmitDataClass(Printer& out, const Unit& unit, const Type& t) {
    Printer::Vars vars = {{"name", t.name}, {"qualified", NameInNamespace(t)}, {"base", t.base->className}};
    Documentation(out, t.doc, "");
    out.Print("class $qualified$ : public $base$ {\n"
              "    friend struct Orbit::RecordAccess<$name$>;\n\n"
              "public:\n",
              vars);
    EmitNested(out, unit, t);
    out.Print("    $name$();\n", vars);
    std::vector<const Property*> chain = t.ChainProperties();
    if (!chain.empty()) {
        std::string params;
        for (const Property* p : chain) {
            auto kind = MakePropertyKind(*p);
            params += (params.empty() ? "" : ", ") + kind->ParamType() + " " + kind->param;
        }
        out.Print("    $explicit$$name$($params$);\n", {{"explicit", chain.size() == 1 ? "explicit " : ""}, {"name", t.name}, {"params", params}});
    }
    out.Print("    $name$(const $name$& other);\n"
              "    $name$& operator=(const $name$&) = delete;\n"
              "    ~$name$() override;\n\n",
              vars);
    for (const Property& p : t.properties) {
        auto kind = MakePropertyKind(p);
        Documentation(out, p.doc, "    ");
        kind->InlineAccessors(out);
        kind->OutOfLineDeclarations(out);
    }
    if (!t.properties.empty()) out.Raw("\n");
    out.Raw("    Orbit::Type* _GetType() const override;\n"
            "    Orbit::DataObjectType* _GetDataType() const override;\n"
            "    unsigned int _GetSize(Orbit::SizeFunction f) const override;\n"
            "    Orbit::Any* _Clone() const override;\n");
    if (t.kind == Kind::Fault) {
        out.Print("\n"
                  "    // Thrown by Throw(); carries this fault.\n"
                  "    class Exception : public $base$::Exception {\n"
                  "    public:\n"
                  "        using $base$::Exception::Exception;\n"
                  "        Exception* Clone() const override;\n"
                  "        [[noreturn]] void Throw() const override;\n"
                  "    };\n\n"
                  "    [[noreturn]] void Throw() override;\n"
                  "    Exception* CreateException() override;\n",
                  vars);
    }
    if (!t.properties.empty()) {
        out.Raw("\nprivate:\n");
        for (const Property& p : t.properties)
            out.Print("    $type$ $member$;\n", {{"type", MakePropertyKind(p)->MemberType()}, {"member", names::Member(p.name)}});
    }
    out.Raw("};\n");
}

void EmitInterface(Printer& out, const Unit& unit, const Type& t) {
    Documentation(out, t.doc, "");
    out.Print("class $qualified$ : public virtual $base$ {\npublic:\n", {{"qualified", NameInNamespace(t)}, {"base", t.base->className}});
    EmitNested(out, unit, t);
    for (const Method& m : t.methods)
        out.Print("    static const char* const $constant$;\n", {{"constant", names::MethodConstant(m.name)}});
    out.Raw("\n    Orbit::Type* _GetType() const override;\n");
    // Slot order: the property getters, then the methods.
    std::vector<Member> slots = SlotOrder(t);
    for (std::size_t i = 0; i < slots.size(); ++i) {
        const Member& m = slots[i];
        Documentation(out, i < t.properties.size() ? t.properties[i].doc : MethodDoc(t.methods[i - t.properties.size()]), "    ");
        out.Print("    virtual $ret$ $op$$params$ = 0;\n", {{"ret", m.ReturnType()}, {"op", m.operation}, {"params", m.Parameters()}});
    }
    out.Raw("};\n");
}

std::string StubBase(const Type& t) { return t.base->runtime ? "Orbit::StubImpl" : t.base->className + "Stub"; }

void EmitStubClass(Printer& out, const Type& t) {
    Printer::Vars vars = {{"name", t.name}, {"stubBase", StubBase(t)}};
    out.Print("// Sends every call through its adapter to the object named by its id.\n"
              "class $name$Stub : public virtual $name$, public $stubBase$ {\n"
              "public:\n"
              "    $name$Stub(const std::string& id, Orbit::StubAdapter* adapter, Orbit::RequestContext* context);\n"
              "    ~$name$Stub() override;\n",
              vars);
    for (const Member& m : SlotOrder(t)) {
        out.Print("    $ret$ $op$$params$ override;\n    void $op$$async$;\n",
                  {{"ret", m.ReturnType()}, {"op", m.operation}, {"params", m.Parameters()}, {"async", m.AsyncParameters()}});
    }
    out.Raw("};\n");
}

// Opens a type's namespace unless it is open already; consecutive types of one
// namespace share one block.
class Scope {
public:
    explicit Scope(Printer& out) : _out(out) {}
    ~Scope() { Close(); }
    void Enter(const Type& t) {
        std::string ns = Join(t.classNamespaces, "::");
        if (ns == _open) {
            _out.Raw("\n");
            return;
        }
        Close();
        _out.Print("\nnamespace $ns$ {\n\n", {{"ns", ns}});
        _open = ns;
    }
    void Close() {
        if (!_open.empty()) _out.Print("\n}  // namespace $ns$\n", {{"ns", _open}});
        _open.clear();
    }

private:
    Printer& _out;
    std::string _open;
};

// Generated code is compiled against the runtime it was generated for, or not at all:
// records and class layouts change between runtime versions.
void VersionGuard(Printer& out, const Unit& unit) {
    out.Print("#if ORBIT_VERSION_NUMBER != $number$\n"
              "#error \"$header$ was generated by tarn-gen $version$ for the runtime of the same version, but orbit/Version.h on the include path is another version: generate it again with that runtime's tarn-gen\"\n"
              "#endif\n",
              {{"number", std::to_string(kRuntimeVersionNumber)}, {"header", unit.header}, {"version", kGeneratorVersion}});
}

}  // namespace

std::string Banner(const std::string& source) {
    return "// Generated by tarn-gen from " + source + ". Do not edit.\n";
}

std::string EmitHeader(const Model&, const Unit& unit) {
    Printer out;
    out.Raw(Banner(unit.source));
    out.Raw("#pragma once\n\n#include \"orbit/Orbit.h\"\n\n");
    VersionGuard(out, unit);
    out.Raw("\n");
    for (const Unit* dep : unit.HeaderDependencies()) out.Print("#include \"$h$\"\n", {{"h", dep->header}});

    Scope scope(out);
    // Top-level declarations first, so that any class may name any other.
    std::string open;
    for (const Type* t : unit.types) {
        if (t->outer) continue;
        std::string ns = Join(t->classNamespaces, "::");
        if (ns != open) {
            if (!open.empty()) out.Print("}  // namespace $ns$\n", {{"ns", open}});
            out.Print("\nnamespace $ns$ {\n", {{"ns", ns}});
            open = ns;
        }
        if (t->kind == Kind::Enum) {
            Documentation(out, t->doc, "");
            EmitEnum(out, *t, "", false);
        } else {
            out.Print("class $name$;\n", {{"name", t->name}});
        }
    }
    if (!open.empty()) out.Print("}  // namespace $ns$\n", {{"ns", open}});
    std::vector<const Type*> order = unit.DefinitionOrder();
    for (const Type* t : order) {
        if (t->kind == Kind::Enum) continue;
        scope.Enter(*t);
        if (t->kind == Kind::Managed) EmitInterface(out, unit, *t);
        else EmitDataClass(out, unit, *t);
    }
    for (const Type* t : order) {
        if (t->kind != Kind::Managed) continue;
        scope.Enter(*t);
        EmitStubClass(out, *t);
    }
    scope.Close();
    out.Print("\n#include \"$detail$\"\n", {{"detail", unit.detailHeader}});
    return out.Text();
}

std::string EmitDetailHeader(const Model&, const Unit& unit) {
    Printer out;
    out.Raw(Banner(unit.source));
    out.Print("// The records and the loader behind $header$, which includes this file.\n"
              "#pragma once\n\n#include \"$header$\"\n\n",
              {{"header", unit.header}});
    for (const Type* t : unit.types) out.Print("extern const Orbit::TypeInfo $record$;\n", {{"record", t->record}});
    for (const Type* t : unit.types)
        if (t->kind == Kind::Managed)
            out.Print("extern Orbit::ManagedMethod* $objects$[];\n", {{"objects", names::MethodObjects(t->wireName)}});

    out.Raw("\nnamespace Orbit {\n");
    for (const Type* t : unit.types) out.Print("template <> Type* GetType<$cls$>();\n", {{"cls", t->className}});
    for (const Type* t : unit.types) {
        if (t->IsDataLike()) out.Print("extern template class DataArray<$cls$>;\n", {{"cls", t->className}});
        if (t->kind == Kind::Enum)
            out.Print("extern template class Array<$cls$>;\nextern template class Primitive<$cls$>;\n", {{"cls", t->className}});
    }
    out.Print("\n// Registers the namespace's types (and, for the catalogue, the version list) when the\n"
              "// library loads. It holds nothing and undoes nothing.\n"
              "class $loader$ {\npublic:\n    $loader$();\n    ~$loader$();\n};\n",
              {{"loader", unit.loaderClass}});
    out.Raw("}  // namespace Orbit\n");
    return out.Text();
}

}  // namespace tarngen
