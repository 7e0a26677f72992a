#pragma once

#include <CLI/CLI.hpp>
#include <functional>

namespace trl::cli {

// `trllocator search`: walks the folders of a search options document and writes the local-files
// document. Adds the subcommand to `app`; the returned function runs it and answers the exit code.
std::function<int()> AddSearchCommand(CLI::App& app);

}  // namespace trl::cli
