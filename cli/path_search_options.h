#pragma once

#include <CLI/CLI.hpp>
#include <string>
#include <vector>

#include "trl/xml.h"

namespace trl::cli {

// The options that say what a command searches: folders as arguments, --search-options (told as
// `searchOptionsHelp`) in their place, and --exclude.
void AddFolderOptions(CLI::App& command, std::vector<std::string>& paths,
                      std::string& searchOptions, std::vector<std::string>& excluded,
                      const std::string& searchOptionsHelp = "Search options document");

// The search options a command was given: those of `paths` (see SearchOptionsForPaths), or else
// the document `file`; either way without the folders `excluded` matches (see ExcludeFolders).
xml::DocumentPtr GivenSearchOptions(const std::vector<std::string>& paths, const std::string& file,
                                    const std::vector<std::string>& excluded);

// Search options for folders named on the command line, as any Linux tool takes them (relative
// or absolute; a link is searched as given): the local computer, one folder entry per path, walked
// with recursion, every attribute admitted, links to folders noted. A path that is not a folder
// is a CommandError naming it.
xml::DocumentPtr SearchOptionsForPaths(const std::vector<std::string>& paths);

// Leaves the folders that `globs` match (by name, or by native path) out of the walk of every
// folder entry of `searchOptions`.
void ExcludeFolders(xml::Document& searchOptions, const std::vector<std::string>& globs);

// Lists in `searchOptions` (made by SearchOptionsForPaths) the managed applications of this
// computer that `userData` holds below the searched folders, each at its own place, so that one
// no longer found there is reported missing.
void ListManagedApplications(xml::Document& searchOptions, xml::Document& userData);
// The same for each computer and drive of `searchOptions` that `userData` holds, found by their
// encoded names: below the folders searched there (d_search "1").
void ListManagedApplicationsByName(xml::Document& searchOptions, xml::Document& userData);

}  // namespace trl::cli
