#pragma once

#include <map>
#include <string>
#include <vector>

#include "trl/xml.h"

namespace trl::cli {

// What a person wants to read of a run: each application found or gone, where, which version, and
// what changed since the run before.
struct Finding {
  std::string computer, folder, application, version, change;
  std::string applicationId = {};  // not shown
};

// The applications of a user-data document as they stood before a run, so that the run's changes
// can be told afterwards.
class Inventory {
 public:
  explicit Inventory(xml::Document& userData);

  // The findings of the run that turned this inventory into `merged`; best guesses are named from
  // `fingerprint`. Sorted by computer, folder and application.
  std::vector<Finding> Changes(xml::Document& merged, xml::Document& fingerprint) const;

 private:
  struct Entry {
    std::string computer, folder, application, versionId, versionName, applicationId;
  };
  std::map<std::string, Entry> entries_;  // by place and application id
  size_t missing_ = 0;                    // entries of the missing list
};

// The findings as an aligned text table with a heading and a closing count.
std::string FindingsTable(const std::vector<Finding>& findings);

}  // namespace trl::cli
