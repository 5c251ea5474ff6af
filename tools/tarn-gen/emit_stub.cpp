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
    out.Raw(Banner(unit.file));
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

std::string EmitVersionsHeader(const Model&) {
    return Banner("idl/versions.idl") +
           "#pragma once\n\n#include \"orbit/Registry.h\"\n\n"
           "namespace Tarn {\n\n"
           "// Declares every catalogued version and its full set of included versions (itself\n"
           "// first among them by registration order), as each namespace's loader must.\n"
           "void RegisterVersions(Orbit::VersionMap* versionMap);\n\n"
           "}  // namespace Tarn\n";
}

std::string EmitVersions(const Model& model) {
    Printer out;
    out.Raw(Banner("idl/versions.idl"));
    out.Raw("#include \"tarn/versions.h\"\n\n#include <string>\n\nnamespace {\n\n"
            "struct VersionRow {\n    const char* name;\n    const char* serviceNamespace;\n    const char* versionId;\n"
            "    unsigned int flag;\n};\n\n"
            "constexpr VersionRow kVersions[] = {\n");
    for (const Version& v : model.versions)
        out.Print("    {\"$name$\", \"$ns$\", \"$id$\", $flag$},\n",
                  {{"name", v.name}, {"ns", v.serviceNamespace}, {"id", v.versionId}, {"flag", std::to_string(v.flag)}});
    out.Raw("};\n\n// Pairs of (version, included version) by row, in registration order.\nconstexpr unsigned char kInclusions[][2] = {\n");
    for (std::size_t i = 0; i < model.versions.size(); ++i) {
        std::string row = "   ";
        for (int j : model.versions[i].included) row += " {" + std::to_string(i) + ", " + std::to_string(j) + "},";
        out.Print("$row$\n", {{"row", row}});
    }
    out.Print("};\n\nstatic_assert(sizeof(kInclusions) / sizeof(kInclusions[0]) == $count$);\n\n}  // namespace\n\n",
              {{"count", std::to_string(model.InclusionCount())}});
    out.Raw("void Tarn::RegisterVersions(Orbit::VersionMap* versionMap) {\n"
            "    for (const VersionRow& v : kVersions)\n"
            "        versionMap->AddVersion(v.name, v.serviceNamespace, v.versionId, v.flag, \"cairn.Task\", 0, std::string());\n"
            "    for (const auto& pair : kInclusions)\n"
            "        versionMap->AddIncludedVersion(kVersions[pair[0]].name, kVersions[pair[1]].name);\n"
            "}\n");
    return out.Text();
}

std::string EmitUmbrella(const Model& model) {
    Printer out;
    out.Raw(Banner("idl/library.idl"));
    out.Raw("// Every namespace of the library.\n#pragma once\n\n");
    for (const Unit* unit : model.Units(false)) out.Print("#include \"$h$\"\n", {{"h", unit->header}});
    return out.Text();
}

}  // namespace tarngen
