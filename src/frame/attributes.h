#pragma once

#include <string>
#include <string_view>

#include "trl/xml.h"

namespace trl {

// The attribute read as text; an absent attribute fails with kInvalidUseOfNull (94), so that the
// step reading it is reported and skipped.
std::string TextOf(const xml::Node& node, std::string_view attribute);
// The same without a copy, for a value used at once (valid until the attribute changes).
std::string_view TextViewOf(const xml::Node& node, std::string_view attribute);

}  // namespace trl
