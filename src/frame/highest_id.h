#pragma once

#include <cstdint>
#include <string_view>

#include "frame/error_handler.h"
#include "trl/xml.h"

namespace trl {

// The highest id among the `tag` elements (c, m or d) below `root`, so that what a run adds is
// numbered after them; 0 when there is none. An id is an element's first attribute, whatever its
// name: one that is missing or not a whole number is reported under `on` and passed over.
int32_t HighestId(const OnError& on, xml::Node root, std::string_view tag);

}  // namespace trl
