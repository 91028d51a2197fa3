// What `tov filters` prints.
#ifndef TOV_TOOLS_FILTER_LISTING_H
#define TOV_TOOLS_FILTER_LISTING_H

#include <optional>
#include <string>

#include "tov/tov.h"

namespace tool {

// Every filter, or the named one, as the library describes it; plain text or Markdown.
std::string listFilters(tov_context context, const std::optional<std::string>& name, bool markdown);

}  // namespace tool

#endif
