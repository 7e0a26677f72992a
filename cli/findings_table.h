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
  std::string applicationId = {};
  // The same in parts, for the formats scripts read.
  std::string verdict = {};  // "identified", "unidentified", "no match" or "missing"
  std::string versionId = {}, versionName = {}, versionSeq = {};
  std::string guessId = {}, guessName = {};  // the best guess of an unidentified version
  // Of the version the verdict names (or the best guess): its weighted score and the most it could
  // reach, and its files found and expected.
  int64_t score = 0, maxScore = 0, filesFound = 0, filesExpected = 0;
  // Property types that agreed on at least one file (bit 1 version resource, 2 size, 4 digest, 8
  // date).
  unsigned propertiesMatched = 0;
  bool local = false, managed = false, stillMissing = false;
  std::string changeKind = {};   // "new", "updated", "no longer identified", "missing" or ""
  std::string changedFrom = {};  // the version name before an update
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
    std::string computer, folder, application, versionId, versionName, applicationId, computerId;
    bool local = false;
  };
  std::map<std::string, Entry> entries_;  // by place and application id
  size_t missing_ = 0;                    // entries of the missing list
};

// The findings as a text table with a heading and a closing count, aligned by display width.
std::string FindingsTable(const std::vector<Finding>& findings);
// A finding's score for a person: its share of the most it could score ("98%"), or "-".
std::string ScoreText(const Finding& finding);

}  // namespace trl::cli
