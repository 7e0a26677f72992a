#pragma once

#include <string_view>

namespace trl::search {

// The class and procedure names the stage reports under.
inline constexpr std::string_view kClass = "Search";
inline constexpr std::string_view kRunLabel = "Search";
inline constexpr std::string_view kStartLabel = "Start";
inline constexpr std::string_view kFindFilesLabel = "FindFiles";
inline constexpr std::string_view kAddFileLabel = "AddFile";

}  // namespace trl::search
