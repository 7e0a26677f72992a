#pragma once

#include <cstdint>
#include <string>

#include "trl/export.h"
#include "trl/worker.h"
#include "trl/xml.h"

namespace trl {

// The filter options, a bit set: which rules Filter applies. The rules run in this bit order.
enum trlFilterOptions : int16_t {
  None = 0,
  LowWeights = 1,        // keep the versions within 0.00001 of the best weight
  MissingFiles = 2,      // keep the versions that miss the fewest files
  LowFileCount = 4,      // keep the versions with the most files
  DuplicateMatches = 8,  // collapse several candidates into the first, labelled
  FlagUnknowns = 16,     // label every partly matched version "Unsupported Version"
  FlagUnmanaged = 32,    // mark an application whose version lacks files as not manageable
};

// The third stage of a locate run: scores every version a compare matched, reduces each found
// application to the versions the filter options let stand, and writes on each application the
// identity of its one remaining version, or a marker that none or several are left.
class TRL_API Filter : public Worker {
 public:
  Filter();
  ~Filter() override;

  // Filters `objMatchesDOM` in place (a null document stands for an empty one); the worker holds
  // it until the run ends. Returns the text of its root element when synchronous, "" otherwise.
  std::string Start(int16_t intFilterOptions, xml::DocumentPtr objMatchesDOM);

 protected:
  void RunBody() override;
  std::string ResultText() override;
  xml::DocumentPtr ResultsDocument() override;
  void AddStatusCounters(xml::Node e) override;
  void ReleaseDocuments() override;

 private:
  // Visits the applications under every computer, drive and folder, in document order, until a
  // cancel arrives.
  void WalkApplications();
  // Scores the application's versions, filters it, and reports it when a version is left;
  // false when a cancel arrived meanwhile.
  bool FilterApplication(xml::Node a);

  int16_t intFilterOptions_ = None;
  xml::DocumentPtr objMatchesDOM;
  int32_t e_match_total = 0;
  int32_t e_match_count = 0;
};

}  // namespace trl
