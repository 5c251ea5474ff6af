#include "orbit/Records.h"

namespace Orbit {

#define ORBIT_DEFINE_RECORD(symbol, wire, kind, root) \
    constinit const TypeInfo g##symbol##TypeInfo{Kind::kind, wire, #symbol, kNoneVersion};
ORBIT_RUNTIME_RECORDS(ORBIT_DEFINE_RECORD)
#undef ORBIT_DEFINE_RECORD

}  // namespace Orbit
