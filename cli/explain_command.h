#pragma once

#include <CLI/CLI.hpp>
#include <functional>

namespace trl::cli {

// `trllocator explain`: why each application got its verdict, version by version and file by
// file, from the matches of a compare (the filter rules replayed) or from saved user data.
std::function<int()> AddExplainCommand(CLI::App& app);

}  // namespace trl::cli
