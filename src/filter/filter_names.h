#pragma once

#include <string_view>

namespace trl::filter {

// The class and procedure names the stage reports under.
inline constexpr std::string_view kClass = "Filter";
inline constexpr std::string_view kStartLabel = "Start";
inline constexpr std::string_view kFilterLabel = "Filter";
inline constexpr std::string_view kFilterVersionsLabel = "FilterVersions";
inline constexpr std::string_view kRemoveLowestVersionWeightsLabel = "RemoveLowestVersionWeights";
inline constexpr std::string_view kRemoveHighestMissingFilesLabel = "RemoveHighestMissingFiles";
inline constexpr std::string_view kRemoveLowestFileCountLabel = "RemoveLowestFileCount";
inline constexpr std::string_view kRemoveDuplicateMatchesLabel = "RemoveDuplicateMatches";
inline constexpr std::string_view kFlagAsUnknownLabel = "FlagAsUnknown";
inline constexpr std::string_view kFlagAsUnmanagedLabel = "FlagAsUnmanaged";

// The values the stage writes.
inline constexpr std::string_view kUnidentified = "-1";  // v_id and v_seq of a relabelled version
inline constexpr std::string_view kUnsupportedVersion = "Unsupported Version";
inline constexpr std::string_view kMultipleMatches = "Multiple Matches";
inline constexpr std::string_view kNoVersionId = "0";  // v_id and v_seq when no version is left
inline constexpr std::string_view kNoVersionName = "N/A";
inline constexpr std::string_view kManaged = "1";
inline constexpr std::string_view kUnmanaged = "0";

}  // namespace trl::filter
