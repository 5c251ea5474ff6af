// Statement blocks shared by stubs, dispatch functions and test doubles: boxing
// arguments into an argument vector, narrowing them back, and delivering a result.
#pragma once

#include <string>

#include "members.h"
#include "printer.h"

namespace tarngen {

// "_args[i] = ..." for every parameter: objects as they are, values in a new box.
void BoxArguments(Printer& out, const Member& m);
// "const T& argN = ..." for every parameter, in parameter order; returns "arg0, arg1".
std::string UnboxArguments(Printer& out, const Member& m, const char* indent);
// Hands `_result` back to the caller of `m`. A void member checks that nothing came
// back when `sourcePath` is set ("tarn/stub"), and ignores it otherwise.
void DeliverResult(Printer& out, const Member& m, const std::string& sourcePath);

}  // namespace tarngen
