// Plain-text views of a catalog, for people.
#pragma once

#include <ostream>

#include "catalog.h"

namespace tarncatalog {

// Namespaces in loader order, each with its types.
void WriteListing(const Catalog& catalog, std::ostream& out);
// One type with its own members.
void WriteType(const Catalog& catalog, const TypeEntry& type, std::ostream& out);
// The versions with what each includes.
void WriteVersions(const Catalog& catalog, std::ostream& out);

}  // namespace tarncatalog
