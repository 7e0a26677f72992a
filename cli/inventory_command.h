#pragma once

#include <CLI/CLI.hpp>
#include <functional>

namespace trl::cli {

// `trllocator inventory`: the saved inventory, shown without a scan.
std::function<int()> AddInventoryCommand(CLI::App& app);

}  // namespace trl::cli
