#pragma once

#include <optional>
#include <string>

#include "trl/xml.h"

namespace trl::cli {

// The results of one machine of a fleet, as `collect` writes them there and a central `merge`
// reads them: the search options the machine searched with and the filtered matches, with the
// machine's own computer named as the fleet knows it:
//   <trl_machine c_text="web01" c_name="web01"><trl_searchoptions>...</trl_searchoptions>
//   <trl_applicationdata>...</trl_applicationdata></trl_machine>
// A merge needs both: the folders searched tell which managed applications count as missing.

// The document for `computer` (its name as the fleet knows it): what the two documents hold moves
// into it. The local computer of both, searched as "localhost", takes the machine's name.
xml::DocumentPtr MachineResults(const std::string& computer, xml::Document& searchOptions,
                                xml::Document& results);

// A machine's name as the fleet knows it (c_text) and its encoded form (c_name).
struct MachineName {
  std::string text, name;
};

// The machine a results file is of, read from the beginning of the file alone (inflated when it
// is gzip); nothing when that does not tell.
std::optional<MachineName> MachineNameOf(const std::string& path);

// The two documents a machine's results hold: the search options are moved out of `machine`,
// which is left holding the results alone. A CommandError naming `path` when they are not there.
struct MachineRun {
  MachineName machine;
  xml::DocumentPtr searchOptions, results;
};
MachineRun SplitMachineResults(xml::DocumentPtr machine, const std::string& path);

}  // namespace trl::cli
