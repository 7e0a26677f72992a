#pragma once

#include <CLI/CLI.hpp>
#include <functional>

namespace trl::cli {

// `trllocator check`: what kind each document is, and what would go wrong when it is used.
std::function<int()> AddCheckCommand(CLI::App& app);

}  // namespace trl::cli
