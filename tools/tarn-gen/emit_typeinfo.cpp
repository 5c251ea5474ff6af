// The namespace's typeinfo source: records, record functions, class members,
// dispatch, tag tables and the loader.
#include <set>

#include "call_code.h"
#include "emit.h"
#include "members.h"
#include "names.h"
#include "printer.h"
#include "property_kinds.h"

namespace tarngen {
namespace {

std::string Quote(const std::string& s) { return "\"" + s + "\""; }
std::string QuoteOrNull(const std::string& s) { return s.empty() ? "nullptr" : Quote(s); }

// Internal symbols of one type's records: "kTarnCnxmgrConnectionState" + suffix.
std::string Local(const Type& t, const char* suffix) { return "k" + t.flatName + suffix; }

class TypeinfoEmitter {
public:
    TypeinfoEmitter(const Model& model, const Unit& unit) : _model(model), _unit(unit) {}

    std::string Run() {
        _out.Raw(Banner(_unit.source));
        Includes();
        _out.Raw("\n// Header records.\n");
        for (const Type* t : _unit.types)
            _out.Print("constinit const Orbit::TypeInfo $record$ = {$kind$, $wire$, $flat$, $version$};\n",
                       {{"record", t->record}, {"kind", KindExpression(t->kind)}, {"wire", Quote(t->wireName)},
                        {"flat", Quote(t->flatName)}, {"version", Quote(t->version)}});
        bool managed = false;
        for (const Type* t : _unit.types) managed = managed || t->kind == Kind::Managed;
        if (managed)
            _out.Raw("\nnamespace {\n// Shared by every method without parameters or declared faults.\n"
                     "constinit const Orbit::ParamInfo kNoParams[] = {{nullptr, 0, nullptr, Orbit::Flag::End, nullptr}};\n"
                     "constinit const Orbit::TypeInfo* const kNoFaults[] = {nullptr};\n}  // namespace\n");
        for (const Type* t : _unit.types) {
            switch (t->kind) {
            case Kind::Enum: Enumeration(*t); break;
            case Kind::Managed: Managed(*t); break;
            default: DataObject(*t); break;
            }
        }
        Loader();
        return _out.Text();
    }

private:
    void Includes() {
        std::set<std::string> headers = {_unit.header};
        auto note = [&](const TypeRef& ref) {
            if (ref.type && !ref.type->runtime) headers.insert(ref.type->unit->header);
        };
        for (const Type* t : _unit.types) {
            if (t->base && !t->base->runtime) headers.insert(t->base->unit->header);
            for (const Property& p : t->properties) note(p.type);
            for (const Method& m : t->methods) {
                for (const Param& p : m.params) note(p.type);
                if (m.hasResult) note(m.result.type);
                for (const Type* f : m.faults) note(TypeRef{nullptr, f});
            }
        }
        headers.erase(_unit.header);
        _out.Print("#include \"$h$\"\n\n", {{"h", _unit.header}});
        for (const std::string& h : headers) _out.Print("#include \"$h$\"\n", {{"h", h}});
        if (!_unit.standin) _out.Print("#include \"$h$\"\n", {{"h", LibraryFile(_model, "versions.h")}});
    }

    void Section(const Type& t) { _out.Print("\n// $kind$ $wire$\n", {{"kind", KindName(t.kind)}, {"wire", t.wireName}}); }
    static const char* KindName(Kind kind) {
        switch (kind) {
        case Kind::Enum: return "Enumeration";
        case Kind::Data: return "Data object";
        case Kind::Fault: return "Fault";
        case Kind::Managed: return "Managed object";
        }
        return "";
    }

    void PropertyList(const Type& t) {
        _out.Print("constinit const Orbit::PropertyInfo $list$[] = {\n", {{"list", Local(t, "Properties")}});
        for (const Property& p : t.properties)
            _out.Print("    {$name$, $privilege$, 0, $type$, $flags$, $version$},\n",
                       {{"name", Quote(p.name)}, {"privilege", QuoteOrNull(p.privilege)}, {"type", p.type.RecordAddress()},
                        {"flags", FlagsExpression(p.flags)}, {"version", Quote(p.version)}});
        _out.Raw("    {nullptr, nullptr, 0, nullptr, Orbit::Flag::End, nullptr},\n};\n");
    }

    // A catalogued base's type object is made first, so that walks up the base chain
    // (equality, differences, IsA) find it even before its loader registered it.
    static std::string WithBase(const Type& t, const std::string& creation) {
        if (t.base->runtime) return creation;
        return "(Orbit::GetType<" + t.base->className + ">(), " + creation + ")";
    }

    void GetTypeDefinition(const Type& t, const std::string& creation) {
        _out.Print("\ntemplate <>\nOrbit::Type* Orbit::GetType<$cls$>() {\n"
                   "    static Orbit::Type* const type = $creation$;\n"
                   "    return type;\n}\n",
                   {{"cls", t.className}, {"creation", creation}});
    }

    // ---- Data objects and faults ----

    void DataObject(const Type& t) {
        Section(t);
        std::vector<std::unique_ptr<PropertyKind>> kinds;
        for (const Property& p : t.properties) kinds.push_back(MakePropertyKind(p));
        ClassMembers(t, kinds);
        RecordFunctions(t, kinds);
        _out.Raw("\nnamespace {\n");
        PropertyList(t);
        _out.Print("constinit const Orbit::DataTypeInfo $rec$ = {\n"
                   "    &$header$, &$base$, $props$,\n"
                   "    &$access$::GetProperty, &$access$::SetProperty, &$access$::IsPropertySet,\n"
                   "    &$access$::UnsetProperty, &$access$::CreateInstance, &$access$::CreateArray};\n"
                   "}  // namespace\n",
                   {{"rec", Local(t, "Record")}, {"header", t.record}, {"base", t.base->record}, {"props", Local(t, "Properties")},
                    {"access", "Orbit::RecordAccess<" + t.className + ">"}});
        GetTypeDefinition(t, WithBase(t, "Orbit::CreateDataObjectType(&" + Local(t, "Record") + ")"));
        _out.Print("\ntemplate class Orbit::DataArray<$cls$>;\n", {{"cls", t.className}});
    }

    void ClassMembers(const Type& t, const std::vector<std::unique_ptr<PropertyKind>>& kinds) {
        const std::string& cls = t.className;
        const std::string& base = t.base->className;
        Printer::Vars vars = {{"cls", cls}, {"name", t.name}, {"base", base}};
        // Default constructor.
        std::string defaults;
        for (const auto& k : kinds)
            if (!k->DefaultInit().empty()) defaults += (defaults.empty() ? " : " : ", ") + k->DefaultInit();
        vars["defaults"] = defaults;
        _out.Print("\n$cls$::$name$()$defaults$ {}\n", vars);
        // Full constructor: the base's properties first, then the own ones.
        std::vector<const Property*> chain = t.ChainProperties();
        if (!chain.empty()) {
            std::string params, baseArgs;
            std::size_t inherited = chain.size() - t.properties.size();
            for (std::size_t i = 0; i < chain.size(); ++i) {
                auto k = MakePropertyKind(*chain[i]);
                params += (i ? ", " : "") + k->ParamType() + " " + k->param;
                if (i < inherited) baseArgs += (i ? ", " : "") + k->param;
            }
            std::string inits = inherited ? " : " + base + "(" + baseArgs + ")" : "";
            for (const auto& k : kinds) inits += (inits.empty() ? " : " : ", ") + names::Member(k->property.name) + "(" + k->param + ")";
            _out.Print("$cls$::$name$($params$)$inits$ {}\n", {{"cls", cls}, {"name", t.name}, {"params", params}, {"inits", inits}});
        }
        // Copy constructor: deep.
        std::string copies = " : " + base + "(other)";
        for (const auto& k : kinds) copies += ", " + k->CopyInit("other");
        vars["copies"] = copies;
        _out.Print("$cls$::$name$(const $name$& other)$copies$ {}\n"
                   "$cls$::~$name$() = default;\n",
                   vars);
        for (const auto& k : kinds) k->OutOfLineDefinitions(_out, cls);
        _out.Print("Orbit::Type* $cls$::_GetType() const { return Orbit::GetType<$name$>(); }\n"
                   "Orbit::DataObjectType* $cls$::_GetDataType() const { return Orbit::GetDoType<$name$>(); }\n"
                   "Orbit::Any* $cls$::_Clone() const { return new $name$(*this); }\n"
                   "unsigned int $cls$::_GetSize(Orbit::SizeFunction f) const {\n"
                   "    unsigned int size = $base$::_GetSize(f) - f(sizeof($base$)) + f(sizeof($name$));\n",
                   vars);
        for (const auto& k : kinds)
            if (!k->SizeTerm().empty()) _out.Print("    $term$\n", {{"term", k->SizeTerm()}});
        _out.Raw("    return size;\n}\n");
        if (t.kind == Kind::Fault) {
            _out.Print("$cls$::Exception* $cls$::Exception::Clone() const { return new Exception(*this); }\n"
                       "void $cls$::Exception::Throw() const { throw Exception(*this); }\n"
                       "void $cls$::Throw() { throw Exception(_GetType()->GetName(), this); }\n"
                       "$cls$::Exception* $cls$::CreateException() { return new Exception(_GetType()->GetName(), this); }\n",
                       vars);
        }
    }

    void RecordFunctions(const Type& t, const std::vector<std::unique_ptr<PropertyKind>>& kinds) {
        _out.Print("\n// The record functions reach the members directly.\n"
                   "template <>\nstruct Orbit::RecordAccess<$cls$> {\n"
                   "    using T = $cls$;\n",
                   {{"cls", t.className}});
        struct Fn { const char* signature; const char* fallback; std::string (PropertyKind::*body)() const; };
        const Fn functions[] = {
            {"void GetProperty(Orbit::DataObject* object, int index, void* value)", "", &PropertyKind::Get},
            {"void SetProperty(Orbit::DataObject* object, int index, const void* value)", "", &PropertyKind::Set},
            {"bool IsPropertySet(Orbit::DataObject* object, int index)", "return true;", &PropertyKind::IsSet},
            {"void UnsetProperty(Orbit::DataObject* object, int index)", "", &PropertyKind::Unset},
        };
        for (const Fn& fn : functions) {
            _out.Print("    static $sig$ {\n", {{"sig", fn.signature}});
            std::vector<std::pair<int, std::string>> cases;
            for (const auto& k : kinds) {
                std::string body = (k.get()->*fn.body)();
                if (!body.empty()) cases.emplace_back(k->property.index, body);
            }
            if (cases.empty()) {
                // Still narrows: an object of another class is refused.
                _out.Print("        Orbit::NarrowTarget<T, Orbit::DataObject>(object);\n"
                           "        (void)index;\n$unusedValue$",
                           {{"unusedValue", std::string(fn.signature).find("value") != std::string::npos ? "        (void)value;\n" : ""}});
                if (*fn.fallback) _out.Print("        $fallback$\n", {{"fallback", fn.fallback}});
            } else {
                _out.Raw("        T* self = Orbit::NarrowTarget<T, Orbit::DataObject>(object);\n        switch (index) {\n");
                bool returns = *fn.fallback != 0;
                for (const auto& [index, body] : cases) {
                    if (returns) _out.Print("        case $i$: {\n            $body$\n        }\n", {{"i", std::to_string(index)}, {"body", body}});
                    else _out.Print("        case $i$: $body$ break;\n", {{"i", std::to_string(index)}, {"body", body}});
                }
                if (returns) _out.Print("        default: $fallback$\n        }\n", {{"fallback", fn.fallback}});
                else _out.Raw("        default: break;\n        }\n");
            }
            _out.Raw("    }\n");
        }
        _out.Raw("    static Orbit::DataObject* CreateInstance() { return new T(); }\n"
                 "    static Orbit::Any* CreateArray() { return new Orbit::DataArray<T>(); }\n};\n");
    }

    // ---- Enumerations ----

    void Enumeration(const Type& t) {
        Section(t);
        std::string scope = t.outer ? t.outer->className + "::" : t.className.substr(0, t.className.rfind("::") + 2);
        for (const std::string& tag : t.tags)
            _out.Print("const char* const $scope$$constant$ = $tag$;\n",
                       {{"scope", scope}, {"constant", names::TagConstant(t.name, tag)}, {"tag", Quote(tag)}});
        _out.Print("\nnamespace {\n"
                   "// Filled from the tag constants while the library loads, before the loader runs.\n"
                   "const char* $tags$[$n$];\n"
                   "constinit const Orbit::EnumTypeInfo $rec$ = {&$header$, $tags$};\n"
                   "}  // namespace\n",
                   {{"tags", Local(t, "Tags")}, {"n", std::to_string(t.tags.size() + 1)}, {"rec", Local(t, "Record")}, {"header", t.record}});
        GetTypeDefinition(t, "Orbit::CreateEnumType<" + t.className + ">(&" + Local(t, "Record") + ")");
        _out.Print("\ntemplate class Orbit::Array<$cls$>;\ntemplate class Orbit::Primitive<$cls$>;\ntemplate class Orbit::EnumTypeImpl<$cls$>;\n",
                   {{"cls", t.className}});
    }

    // ---- Managed objects ----

    void Managed(const Type& t) {
        Section(t);
        Printer::Vars vars = {{"cls", t.className}, {"objects", names::MethodObjects(t.wireName)},
                              {"slots", std::to_string(t.MemberCount() + 1)}};
        _out.Print("Orbit::ManagedMethod* $objects$[$slots$];\n", vars);
        for (const Method& m : t.methods)
            _out.Print("const char* const $cls$::$constant$ = $value$;\n",
                       {{"cls", t.className}, {"constant", names::MethodConstant(m.name)}, {"value", Quote(t.wireName + "." + m.name)}});
        _out.Print("Orbit::Type* $cls$::_GetType() const { return Orbit::GetTypeHelper<$cls$, Orbit::ManagedObjectType>(); }\n", vars);

        _out.Raw("\nnamespace {\n");
        for (const Method& m : t.methods) MethodLists(t, m);
        _out.Print("constinit const Orbit::MethodInfo $list$[] = {\n", {{"list", Local(t, "Methods")}});
        for (const Method& m : t.methods) {
            std::string prefix = Local(t, "") + "_" + m.name;
            _out.Print("    {$name$, $wsdl$, $privilege$, 0, {\"result\", 0, $rtype$, $rflags$, $rversion$}, $params$, $faults$, $flags$, $version$},\n",
                       {{"name", Quote(m.name)}, {"wsdl", Quote(m.wsdlName)}, {"privilege", QuoteOrNull(m.privilege)},
                        {"rtype", m.hasResult ? m.result.type.RecordAddress() : "nullptr"},
                        {"rflags", FlagsExpression(m.hasResult ? m.result.flags : 0)}, {"rversion", Quote(m.result.version)},
                        {"params", m.params.empty() ? "kNoParams" : prefix + "Params"},
                        {"faults", m.faults.empty() ? "kNoFaults" : prefix + "Faults"},
                        {"flags", MethodFlagsExpression(m.task)}, {"version", Quote(m.version)}});
        }
        _out.Raw("    {nullptr, nullptr, nullptr, 0, {nullptr, 0, nullptr, 0, nullptr}, nullptr, nullptr, 0, nullptr},\n};\n");
        PropertyList(t);
        Dispatch(t);
        _out.Print("Orbit::ManagedObject* $create$(const std::string& id, Orbit::StubAdapter* adapter, Orbit::RequestContext* context) {\n"
                   "    return new $cls$Stub(id, adapter, context);\n}\n\n"
                   "constinit const Orbit::ManagedTypeInfo $rec$ = {\n"
                   "    &$header$, &$base$, $props$, $methods$,\n"
                   "    &$invoke$, &$create$, $objects$};\n"
                   "}  // namespace\n",
                   {{"create", "Create" + t.flatName + "Stub"}, {"cls", t.className}, {"rec", Local(t, "Record")},
                    {"header", t.record}, {"base", t.base->record}, {"props", Local(t, "Properties")},
                    {"methods", Local(t, "Methods")}, {"invoke", "Invoke" + t.flatName}, {"objects", vars["objects"]}});
        GetTypeDefinition(t, WithBase(t, "Orbit::CreateManagedObjectType(&" + Local(t, "Record") + ")"));
    }

    void MethodLists(const Type& t, const Method& m) {
        std::string prefix = Local(t, "") + "_" + m.name;
        if (!m.params.empty()) {
            _out.Print("constinit const Orbit::ParamInfo $list$[] = {\n", {{"list", prefix + "Params"}});
            for (const Param& p : m.params)
                _out.Print("    {$name$, 0, $type$, $flags$, $version$},\n",
                           {{"name", Quote(p.name)}, {"type", p.type.RecordAddress()}, {"flags", FlagsExpression(p.flags)},
                            {"version", Quote(p.version)}});
            _out.Raw("    {nullptr, 0, nullptr, Orbit::Flag::End, nullptr},\n};\n");
        }
        if (!m.faults.empty()) {
            std::string faults;
            for (const Type* f : m.faults) faults += "&" + f->record + ", ";
            _out.Print("constinit const Orbit::TypeInfo* const $list$[] = {$faults$nullptr};\n", {{"list", prefix + "Faults"}, {"faults", faults}});
        }
    }

    // invokeMember: narrow the target and each argument in parameter order, call, box the result.
    void Dispatch(const Type& t) {
        _out.Print("\nvoid Invoke$flat$(Orbit::ManagedObject* target, int index, Kernite::RefVector<Orbit::Any>& args,\n"
                   "    Kernite::Ref<Orbit::Any>& result) {\n"
                   "    result = nullptr;\n"
                   "    $cls$* self = Orbit::NarrowTarget<$cls$, Orbit::ManagedObject>(target);\n",
                   {{"flat", t.flatName}, {"cls", t.className}});
        std::vector<Member> members = MembersOf(t);
        if (members.empty()) {
            _out.Raw("    (void)self;\n    (void)index;\n    (void)args;\n}\n\n");
            return;
        }
        _out.Raw("    switch (index) {\n");
        for (const Member& m : members) {
            _out.Print("    case $n$: {  // $label$\n        Orbit::CheckArgumentCount(args, $count$);\n",
                       {{"n", std::to_string(m.memberNumber)}, {"label", m.label}, {"count", std::to_string(m.params.size())}});
            std::string call = UnboxArguments(_out, m, "        ");
            Printer::Vars vars = {{"op", m.operation}, {"call", call}, {"type", m.resultType}};
            switch (m.delivery) {
            case Delivery::Void: _out.Print("        self->$op$($call$);\n", vars); break;
            case Delivery::ByValue: _out.Print("        result = new Orbit::Primitive<$type$>(self->$op$($call$));\n", vars); break;
            case Delivery::RefOut:
                vars["sep"] = call.empty() ? "" : ", ";
                _out.Print("        Kernite::Ref<$type$> value;\n        self->$op$($call$$sep$value);\n        result = value;\n", vars);
                break;
            }
            _out.Raw("        break;\n    }\n");
        }
        _out.Raw("    default:\n        break;\n    }\n}\n\n");
    }

    // ---- Loader ----

    void Loader() {
        Printer::Vars vars = {{"loader", _unit.loaderClass}, {"path", Quote(_unit.sourcePath + "/typeinfo")},
                              {"versions", VersionsFunction(_model)}};
        _out.Print("\nOrbit::$loader$::$loader$() {\n", vars);
        if (!_unit.standin) {
            _out.Print("    Orbit::VersionMap* versionMap = Orbit::GetVersionMap();\n"
                       "    if (!(versionMap != nullptr)) Kernite::PanicAssert(\"versionMap != __null\", $path$, __LINE__);\n"
                       "    $versions$(versionMap);\n",
                       vars);
        }
        _out.Print("    Orbit::TypeMap* typeMap = Orbit::GetTypeMap();\n"
                   "    if (!(typeMap != nullptr)) Kernite::PanicAssert(\"typeMap != __null\", $path$, __LINE__);\n",
                   vars);
        for (const Type* t : _unit.RegistrationOrder())
            _out.Print("    typeMap->AddType(Orbit::GetType<$cls$>());\n", {{"cls", t->className}});
        _out.Print("}\n\nOrbit::$loader$::~$loader$() {}\n", vars);

        // Priorities make the loaders of one library run in catalogue order, whatever
        // order the linker gives the sources.
        vars["priority"] = std::to_string((_unit.standin ? 1000 : 2000) + _unit.loadOrder);
        _out.Raw("\nnamespace {\n");
        bool tags = false;
        for (const Type* t : _unit.types) tags = tags || t->kind == Kind::Enum;
        if (tags) {
            _out.Raw("struct TagTables {\n    TagTables() {\n");
            for (const Type* t : _unit.types) {
                if (t->kind != Kind::Enum) continue;
                std::string scope = t->outer ? t->outer->className + "::" : t->className.substr(0, t->className.rfind("::") + 2);
                for (std::size_t i = 0; i < t->tags.size(); ++i)
                    _out.Print("        $tags$[$i$] = $scope$$constant$;\n",
                               {{"tags", Local(*t, "Tags")}, {"i", std::to_string(i)}, {"scope", scope},
                                {"constant", names::TagConstant(t->name, t->tags[i])}});
            }
            _out.Print("    }\n};\nTagTables sTagTables __attribute__((init_priority($priority$)));\n", vars);
        }
        _out.Print("Orbit::$loader$ sLoader __attribute__((init_priority($priority$)));\n}  // namespace\n", vars);
    }

    const Model& _model;
    const Unit& _unit;
    Printer _out;
};

}  // namespace

std::string EmitTypeinfo(const Model& model, const Unit& unit) { return TypeinfoEmitter(model, unit).Run(); }

}  // namespace tarngen
