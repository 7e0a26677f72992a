#pragma once

#include <CLI/CLI.hpp>
#include <string>
#include <string_view>

namespace trl::cli {

// The manual page of `command` (the program or one of its subcommands, at any depth) in roff:
// what its --help shows, put together by the same formatter from the same definitions, in the
// sections a manual page has.
std::string ManualPage(const CLI::App& command, std::string_view version);

// The page's name: "trllocator", "trllocator-locate", "trllocator-fingerprint-add".
std::string ManualPageName(const CLI::App& command);

}  // namespace trl::cli
