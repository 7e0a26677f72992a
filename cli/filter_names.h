#pragma once

#include <cstdint>
#include <string_view>

namespace trl::cli {

// The filter options a command line gives: a number from 0 to 63, or a comma list of the names
// low-weights, missing-files, low-file-count, duplicate-matches, flag-unknowns, flag-unmanaged
// and all. Anything else is a CommandError.
int16_t ParseFilterOptions(std::string_view text);

}  // namespace trl::cli
