#pragma once

#include <CLI/CLI.hpp>
#include <functional>

namespace trl::cli {

// `trllocator manage`: switches the watch for going missing on or off for saved applications.
std::function<int()> AddManageCommand(CLI::App& app);

}  // namespace trl::cli
