#pragma once

#include <string_view>

namespace trl::merge {

// The class and procedure names the stage reports under.
inline constexpr std::string_view kClass = "Merge";
inline constexpr std::string_view kStartLabel = "Start";
inline constexpr std::string_view kMergeLabel = "Merge";
inline constexpr std::string_view kRefreshLabel = "MissingApplicationsRefresh";
inline constexpr std::string_view kSearchLabel = "MissingApplicationsSearch";
inline constexpr std::string_view kMissingLabel = "MissingApplication";

}  // namespace trl::merge
