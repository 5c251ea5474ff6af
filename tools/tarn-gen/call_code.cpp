#include "call_code.h"

namespace tarngen {

void BoxArguments(Printer& out, const Member& m) {
    for (std::size_t i = 0; i < m.params.size(); ++i) {
        const MemberParam& p = m.params[i];
        Printer::Vars vars = {{"i", std::to_string(i)}, {"name", p.name}, {"type", p.valueType}};
        if (p.boxed) out.Print("    _args[$i$] = new Orbit::Primitive<$type$>($name$);\n", vars);
        else out.Print("    _args[$i$] = $name$;\n", vars);
    }
}

std::string UnboxArguments(Printer& out, const Member& m, const char* indent) {
    std::string call;
    for (std::size_t i = 0; i < m.params.size(); ++i) {
        const MemberParam& p = m.params[i];
        Printer::Vars vars = {{"in", indent}, {"type", p.valueType}, {"arg", "arg" + std::to_string(i)}, {"i", std::to_string(i)}};
        if (p.boxed) out.Print("$in$const $type$& $arg$ = Orbit::UnboxArgument<$type$>(args, $i$);\n", vars);
        else out.Print("$in$$type$* $arg$ = Orbit::NarrowArgument<$type$>(args, $i$);\n", vars);
        call += (i ? ", " : "") + vars["arg"];
    }
    return call;
}

void DeliverResult(Printer& out, const Member& m, const std::string& sourcePath) {
    Printer::Vars vars = {{"type", m.resultType}, {"result", m.resultName}, {"path", "\"" + sourcePath + "\""}};
    switch (m.delivery) {
    case Delivery::Void:
        if (!sourcePath.empty()) out.Print("    Orbit::CheckNoResult(_result, $path$, __LINE__);\n", vars);
        break;
    case Delivery::ByValue: out.Print("    return Orbit::UnboxResult<$type$>(_result);\n", vars); break;
    case Delivery::RefOut:
        if (m.anyResult) out.Print("    $result$ = _result;\n", vars);
        else out.Print("    Orbit::NarrowResult(_result, $result$);\n", vars);
        break;
    }
}

}  // namespace tarngen
