#pragma once

#include <string_view>

namespace trl::locate {

inline constexpr std::string_view kClass = "Locate";
inline constexpr std::string_view kStartLabel = "Start";

}  // namespace trl::locate
