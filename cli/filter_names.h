#pragma once

#include <array>
#include <cstdint>
#include <string_view>
#include <vector>

#include "trl/filter.h"

namespace trl::cli {

// The filter options a command line gives: a number from 0 to 63, or a comma list of the names
// low-weights, missing-files, low-file-count, duplicate-matches, flag-unknowns, flag-unmanaged
// and all. Anything else is a CommandError.
int16_t ParseFilterOptions(std::string_view text);

// How the filter options are written, for the help of each option that takes them.
inline constexpr std::string_view kFilterOptionsForm =
    "a number from 0 to 63, or a comma list of low-weights, missing-files, low-file-count, "
    "duplicate-matches, flag-unknowns, flag-unmanaged, or all";

// The rules in the order the filter applies them.
inline constexpr std::array<int16_t, 6> kFilterOrder{LowWeights,       MissingFiles, LowFileCount,
                                                     DuplicateMatches, FlagUnknowns, FlagUnmanaged};
// The name of one rule's bit, as ParseFilterOptions takes it.
std::string_view FilterName(int16_t bit);
// Every name ParseFilterOptions takes, in the order above, "all" last.
std::vector<std::string_view> FilterNames();

}  // namespace trl::cli
