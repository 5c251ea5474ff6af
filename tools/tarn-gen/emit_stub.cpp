// The namespace's stub source: client stubs that box arguments, pass the member's
// method object and unbox the result.
#include "call_code.h"
#include "emit.h"
#include "members.h"
#include "names.h"
#include "printer.h"

namespace tarngen {
namespace {

void StubMembers(Printer& out, const Unit& unit, const Type& t) {
    out.Print("\n// $wire$\n"
              "$cls$Stub::$name$Stub(const std::string& id, Orbit::StubAdapter* adapter, Orbit::RequestContext* context)\n"
              "    : $stubBase$(id, adapter, context) {}\n"
              "$cls$Stub::~$name$Stub() = default;\n",
              {{"wire", t.wireName}, {"cls", t.className}, {"name", t.name}, {"stubBase", t.base->runtime ? "Orbit::StubImpl" : t.base->className + "Stub"}});
    for (const Member& m : MembersOf(t)) {
        Printer::Vars vars = {{"cls", t.className}, {"ret", m.ReturnType()}, {"op", m.operation}, {"params", m.Parameters()},
                              {"async", m.AsyncParameters()}, {"n", std::to_string(m.params.size())},
                              {"entry", names::MethodObjects(t.wireName) + "[" + std::to_string(m.memberNumber) + "]"}};
        out.Print("\n$ret$ $cls$Stub::$op$$params$ {\n"
                  "    Kernite::Ref<Orbit::Any> _result;\n"
                  "    Kernite::RefVector<Orbit::Any> _args($n$);\n",
                  vars);
        BoxArguments(out, m);
        out.Print("    _Invoke_Task($entry$, _args, _result);\n", vars);
        DeliverResult(out, m, unit.sourcePath + "/stub");
        out.Print("}\n\nvoid $cls$Stub::$op$$async$ {\n    Kernite::RefVector<Orbit::Any> _args($n$);\n", vars);
        BoxArguments(out, m);
        out.Print("    _StartInvoke_Task($entry$, _args, callback, item);\n}\n", vars);
    }
}

}  // namespace

std::string EmitStub(const Model&, const Unit& unit) {
    Printer out;
    out.Raw(Banner(unit.source));
    out.Print("#include \"$h$\"\n", {{"h", unit.header}});
    bool any = false;
    for (const Type* t : unit.types) {
        if (t->kind != Kind::Managed) continue;
        any = true;
        StubMembers(out, unit, *t);
    }
    if (!any) out.Raw("\n// This namespace has no managed types, so no stubs.\n");
    return out.Text();
}

}  // namespace tarngen
