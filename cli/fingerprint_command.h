#pragma once

#include <CLI/CLI.hpp>
#include <functional>

namespace trl::cli {

// Adds `trllocator fingerprint add`, which describes one version of an application in a fingerprint
// database from a reference installation. The returned function runs it when it was the command
// given and answers the exit code, or -1 when another command was given.
std::function<int()> AddFingerprintCommand(CLI::App& app);

}  // namespace trl::cli
