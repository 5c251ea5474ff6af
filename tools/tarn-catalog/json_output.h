// The catalog as one JSON document: {"loaders", "versions", "types"}, and with
// `counters` the loaders' registry calls ("calls").
#pragma once

#include <ostream>

#include "catalog.h"

namespace tarncatalog {

void WriteJson(const Catalog& catalog, bool counters, std::ostream& out);

}  // namespace tarncatalog
