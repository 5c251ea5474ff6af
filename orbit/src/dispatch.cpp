#include "orbit/Dispatch.h"

namespace Orbit {

void ThrowArgumentCount(std::size_t expected, std::size_t found) {
    throw Kernite::InvalidArgumentException(
        Kernite::MessageFormatter::ASPrint("%1 arguments where %2 were expected", found, expected));
}

void ThrowNullArgument(std::size_t index) {
    throw Kernite::InvalidArgumentException(Kernite::MessageFormatter::ASPrint("argument %1 is null", index));
}

void ThrowMissingResult(const char* expected) { Kernite::ThrowTypeMismatch(expected, "null"); }

}  // namespace Orbit
