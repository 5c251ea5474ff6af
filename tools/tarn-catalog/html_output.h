// The API reference as a static site: index.html (namespaces in loader order with
// their types), versions.html, types/<wire name>.html per type (stand-ins of other
// libraries included), site.css and site.js. Every type, member and version row
// carries the version that introduced it (data-version); site.js hides what the
// version chosen in the page's switch (or in "?v=NAME") does not include.
#pragma once

#include <string>

#include "catalog.h"

namespace tarncatalog {

// Writes the site into `dir` (created if missing); returns the number of pages.
// Throws std::runtime_error when a file cannot be written.
int WriteSite(const Catalog& catalog, const std::string& dir);

}  // namespace tarncatalog
