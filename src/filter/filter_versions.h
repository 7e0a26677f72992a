#pragma once

#include <cstdint>
#include <string>

#include "trl/xml.h"

namespace trl::filter {

// Filters one application whose versions carry their v_weight: marks it manageable, runs the
// rules the options select in bit order against thresholds taken from the versions it had on
// entry, and writes its verdict (v_id, v_name, v_seq): the one remaining version's, with that
// version's n and o children moved in front of it; "0", "N/A", "0" when none is left; "-1",
// "Unsupported Version", "-1" when several are. Answers the application's v_id.
std::string FilterVersions(xml::Node a, int16_t intFilterOptions);

}  // namespace trl::filter
