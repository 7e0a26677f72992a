#pragma once

#include <CLI/CLI.hpp>
#include <functional>

namespace trl::cli {

// Adds `trllocator collect`, the part of a fleet's inventory that runs on each machine. The
// returned function runs it when it was the command given and answers the exit code, or -1 when
// another command was given.
std::function<int()> AddCollectCommand(CLI::App& app);

}  // namespace trl::cli
