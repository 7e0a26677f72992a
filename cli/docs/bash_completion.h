#pragma once

#include <CLI/CLI.hpp>
#include <string>

namespace trl::cli {

// A bash completion script for the program: its subcommands at every depth, each one's options,
// the values of an option that takes one of a set (the filter rule names of --filter, in comma
// lists), and file names for the other options that take text and for arguments.
std::string BashCompletion(const CLI::App& program);

}  // namespace trl::cli
