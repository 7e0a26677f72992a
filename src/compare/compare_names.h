#pragma once

#include <string_view>

namespace trl::compare {

// The class and procedure names the stage reports under.
inline constexpr std::string_view kClass = "Compare";
inline constexpr std::string_view kStartLabel = "Start";
inline constexpr std::string_view kMatchLabel = "Match";
inline constexpr std::string_view kMatchApplicationLabel = "MatchApplication";
inline constexpr std::string_view kMatchVersionLabel = "MatchVersion";
inline constexpr std::string_view kFillRecordsetLabel = "FillRecordset";
inline constexpr std::string_view kFindCommonPathLabel = "FindCommonPath";
inline constexpr std::string_view kMatchFileLabel = "MatchFile";
inline constexpr std::string_view kUpdateFileDetailsLabel = "UpdateFileDetails";
inline constexpr std::string_view kRemoveIncompleteLabel = "RemoveIncompleteApplications";

}  // namespace trl::compare
