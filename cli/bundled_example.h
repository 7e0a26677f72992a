#pragma once

#include <filesystem>

namespace trl::cli {

// The folder of the bundled example: <prefix>/share/trllocator/examples beside an installed
// command (found from the command's own place, so an installed tree can be moved), else the
// source tree's examples for a command run from its build folder. When neither is there, the
// installed place, for the message that says so.
std::filesystem::path BundledExampleFolder();

}  // namespace trl::cli
