#pragma once

#include <CLI/CLI.hpp>
#include <functional>

namespace trl::cli {

// Adds `fingerprint import-dpkg` to the `fingerprint` command group: describes installed Debian
// packages, and those in .deb files, in a fingerprint database. The returned function runs it
// when it was the command given and answers the exit code, or -1 otherwise.
std::function<int()> AddImportDpkgCommand(CLI::App& group);

}  // namespace trl::cli
