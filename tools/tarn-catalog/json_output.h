// The catalog as one JSON document: {"loaders", "calls", "versions", "types"}.
#pragma once

#include <ostream>

#include "catalog.h"

namespace tarncatalog {

void WriteJson(const Catalog& catalog, std::ostream& out);

}  // namespace tarncatalog
