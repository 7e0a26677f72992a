#pragma once

#include <string_view>

namespace trl::cli {

// Orders two Debian package versions ([epoch:]upstream[-revision]) as the package manager does:
// negative when `a` comes before `b`, 0 when they are the same version, positive after. Epochs
// compare as numbers; upstream parts and revisions compare in runs of non-digits (a "~" before
// everything, even the end; letters before other characters) and runs of digits (as numbers).
int CompareDebianVersions(std::string_view a, std::string_view b);

}  // namespace trl::cli
