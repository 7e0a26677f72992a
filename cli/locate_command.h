#pragma once

#include <CLI/CLI.hpp>
#include <functional>

namespace trl::cli {

// Adds `trllocator locate`. The returned function runs it when it was the command given and
// answers the exit code, or -1 when another command was given.
std::function<int()> AddLocateCommand(CLI::App& app);

}  // namespace trl::cli
