// Test doubles for the testing library: per managed interface a class that records
// its calls and answers what the test programmed, and an asynchronous invoker that
// drives a stub's completion-callback overloads from boxed arguments.
#include "call_code.h"
#include "emit.h"
#include "members.h"
#include "names.h"
#include "printer.h"

namespace tarngen {
namespace {

std::string DoubleBase(const Type& t) { return t.base->runtime ? "Tarn::Testing::Double" : t.base->className + "Double"; }

std::string Namespace(const Type& t) {
    std::string out;
    for (const std::string& part : t.classNamespaces) out += (out.empty() ? "" : "::") + part;
    return out;
}

std::vector<const Type*> ManagedTypes(const Unit& unit) {
    std::vector<const Type*> out;
    for (const Type* t : unit.DefinitionOrder())
        if (t->kind == Kind::Managed) out.push_back(t);
    return out;
}

}  // namespace

std::string DoublesHeaderPath(const Unit& unit) { return unit.outputDir + "/doubles.h"; }

std::string EmitDoublesHeader(const Model&, const Unit& unit) {
    Printer out;
    out.Raw(Banner(unit.source));
    out.Print("#pragma once\n\n#include \"$h$\"\n#include \"tarn/testing/Double.h\"\n", {{"h", unit.header}});
    for (const Type* t : ManagedTypes(unit))
        if (!t->base->runtime && t->base->unit != &unit) out.Print("#include \"$h$\"\n", {{"h", DoublesHeaderPath(*t->base->unit)}});
    for (const Type* t : ManagedTypes(unit)) {
        out.Print("\nnamespace $ns$ {\n\n"
                  "// Records every call and answers what the test programmed (see Tarn::Testing::Double).\n"
                  "class $name$Double : public $base$, public virtual $name$ {\n"
                  "public:\n"
                  "    explicit $name$Double(const std::string& id);\n",
                  {{"ns", Namespace(*t)}, {"name", t->name}, {"base", DoubleBase(*t)}});
        for (const Member& m : SlotOrder(*t))
            out.Print("    $ret$ $op$$params$ override;\n", {{"ret", m.ReturnType()}, {"op", m.operation}, {"params", m.Parameters()}});
        out.Print("};\n\n}  // namespace $ns$\n", {{"ns", Namespace(*t)}});
    }
    return out.Text();
}

std::string EmitDoubles(const Model&, const Unit& unit) {
    Printer out;
    out.Raw(Banner(unit.source));
    out.Print("#include \"$h$\"\n", {{"h", DoublesHeaderPath(unit)}});
    std::vector<const Type*> types = ManagedTypes(unit);
    for (const Type* t : types) {
        Printer::Vars vars = {{"cls", t->className}, {"name", t->name}, {"base", DoubleBase(*t)}, {"flat", t->flatName}};
        out.Print("\n// $cls$\n$cls$Double::$name$Double(const std::string& id) : $base$(id) {}\n", vars);
        std::vector<Member> members = MembersOf(*t);
        for (const Member& m : members) {
            out.Print("\n$ret$ $cls$Double::$op$$params$ {\n    Kernite::RefVector<Orbit::Any> _args($n$);\n",
                      {{"ret", m.ReturnType()}, {"cls", t->className}, {"op", m.operation}, {"params", m.Parameters()},
                       {"n", std::to_string(m.params.size())}});
            BoxArguments(out, m);
            if (m.delivery == Delivery::Void) {
                out.Print("    Answer(\"$op$\", _args);\n}\n", {{"op", m.operation}});
            } else {
                out.Print("    Kernite::Ref<Orbit::Any> _result = Answer(\"$op$\", _args);\n", {{"op", m.operation}});
                if (m.delivery == Delivery::ByValue) out.Print("    return Tarn::Testing::ValueOf<$type$>(_result);\n", {{"type", m.resultType}});
                else DeliverResult(out, m, "");
                out.Raw("}\n");
            }
        }
        // The asynchronous invoker: invokeMember's mirror image on the client side.
        out.Print("\nnamespace {\n\n"
                  "void Start$flat$(Orbit::ManagedObject* target, int index, Kernite::RefVector<Orbit::Any>& args,\n"
                  "    const Orbit::CompletionCallback& callback, Kernite::Ref<Kernite::System::ScheduledItem>& item) {\n"
                  "    $cls$Stub* stub = Orbit::NarrowTarget<$cls$Stub, Orbit::ManagedObject>(target);\n",
                  vars);
        if (members.empty()) {
            out.Raw("    (void)stub;\n    (void)index;\n    (void)args;\n    (void)callback;\n    (void)item;\n}\n\n");
        } else {
            out.Raw("    switch (index) {\n");
            for (const Member& m : members) {
                out.Print("    case $n$: {\n        Orbit::CheckArgumentCount(args, $count$);\n",
                          {{"n", std::to_string(m.memberNumber)}, {"count", std::to_string(m.params.size())}});
                std::string call = UnboxArguments(out, m, "        ");
                out.Print("        stub->$op$($call$$sep$callback, item);\n        break;\n    }\n",
                          {{"op", m.operation}, {"call", call}, {"sep", call.empty() ? "" : ", "}});
            }
            out.Raw("    default:\n        break;\n    }\n}\n\n");
        }
        out.Print("Orbit::ManagedObject* Create$flat$Double(const std::string& id) { return new $cls$Double(id); }\n\n"
                  "}  // namespace\n",
                  vars);
    }
    out.Raw("\nnamespace {\n\n// Makes the doubles and invokers of this namespace findable by managed type.\n"
            "struct Registration {\n    Registration() {\n");
    for (const Type* t : types)
        out.Print("        Tarn::Testing::RegisterDouble(&$record$, &Create$flat$Double, &Start$flat$);\n",
                  {{"record", t->record}, {"flat", t->flatName}});
    out.Raw("    }\n};\n\nRegistration sRegistration;\n\n}  // namespace\n");
    return out.Text();
}

std::string EmitDoublesUmbrella(const Model& model) {
    Printer out;
    out.Raw(Banner("the catalogue's loader order"));
    out.Raw("// The test doubles of every namespace.\n#pragma once\n\n");
    for (const Unit* unit : model.Units(false)) out.Print("#include \"$h$\"\n", {{"h", DoublesHeaderPath(*unit)}});
    return out.Text();
}

}  // namespace tarngen
