#pragma once

#include <string>
#include <string_view>

#include "trl/xml.h"

namespace trl {

// The attribute read as text; an absent attribute fails with kInvalidUseOfNull (94), so that the
// step reading it is reported and skipped.
std::string TextOf(const xml::Node& node, std::string_view attribute);

}  // namespace trl
