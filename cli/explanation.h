#pragma once

#include <cstdint>
#include <optional>
#include <string>
#include <vector>

#include "trl/xml.h"

namespace trl::cli {

// A weighted property of a found file that did not agree: its type (1 version resource, 2 size,
// 3 MD5, 4 date) and the values expected and found, where a document tells them.
struct PropertyDisagreement {
  int type = 0;
  std::optional<std::string> expected, actual;
};

struct FileExplanation {
  std::string id, name;
  int64_t weight = 0;
  bool found = false;
  int64_t propertiesScored = 0, propertiesMax = 0;  // of a found file
  // Of a found file that scored below its most: from the run's own record, else from the
  // fingerprint (without actual values); empty when neither tells.
  std::vector<PropertyDisagreement> disagreed;
};

struct VersionExplanation {
  std::string id, name, seq;  // as the compare filed it
  std::string outcome;        // "kept", "removed" or "taken back"
  std::string rule;           // the filter rule that removed it, or "compare" for taken back
  std::string reason;         // why, as words that follow a colon
  std::string label, labelRule, labelReason;  // a name a rule gave it ("Multiple Matches")
  std::optional<double> weight;               // its score's share of the most, as filtered
  int64_t score = 0, maxScore = 0, filesFound = 0, filesExpected = 0;
  std::vector<FileExplanation> files;
};

struct ApplicationExplanation {
  std::string computer, folder, applicationId, application;
  bool local = false;
  std::string verdict;  // "identified", "unidentified", "no match" or "not found"
  std::string versionId, versionName, versionSeq;  // the verdict as the filter wrote it
  bool managed = false;
  std::string unmanagedRule, unmanagedReason;  // why it is not manageable, when replayed
  std::vector<VersionExplanation> versions;
};

struct Explanation {
  bool rulesReplayed = false;  // from matches: the filter was run again to see each rule's doing
  std::vector<std::string> rules;  // the rules applied, by name, in the order they run
  std::vector<ApplicationExplanation> applications;
};

// Why each application of a compare's matches ends as the filter rules `filterOptions` leave it:
// the filter is run on copies with the rules added one at a time. `fingerprint` (may be null)
// names the properties behind each file's score.
Explanation ExplainMatches(const xml::Document& matches, int16_t filterOptions,
                           xml::Document* fingerprint);
// The same from saved user data, which holds only the versions the filter left.
Explanation ExplainUserData(xml::Document& userData, xml::Document* fingerprint);

}  // namespace trl::cli
