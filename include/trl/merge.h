#pragma once

#include <cstdint>
#include <memory>
#include <string>

#include "trl/export.h"
#include "trl/worker.h"
#include "trl/xml.h"

namespace trl {

class Schema;
namespace merge {
class PlaceIndex;
}  // namespace merge

// The last stage of a locate run: folds the results of the run just made into the user data kept
// from earlier runs. Each application found again keeps the client's management setting and
// flags and a history of its version changes; a managed application no longer found where it was
// is moved into the user data's list of missing applications.
class TRL_API Merge : public Worker {
 public:
  Merge();
  ~Merge() override;

  // Runs the merge in place: the old results receive the merged content, and the merged
  // applications leave the new results. Null options stand for empty documents, null results
  // for an empty result set ("trl_applicationdata" without content). Returns the merged
  // results' text when synchronous, "" otherwise.
  std::string Start(xml::DocumentPtr objSearchOptionsDOM, xml::DocumentPtr objApplicationOptionsDOM,
                    xml::DocumentPtr objOldResultsDOM, xml::DocumentPtr objNewResultsDOM);

 protected:
  void RunBody() override;
  std::string ResultText() override;
  xml::DocumentPtr ResultsDocument() override;
  void AddStatusCounters(xml::Node e) override;
  void ReleaseDocuments() override;

 private:
  // The document-wide flag defaults of the old results.
  struct TRL_LOCAL Defaults {
    std::string update;
    std::string dupes;
  };

  void Prepare(xml::DocumentPtr& searchOptions, xml::DocumentPtr& applicationOptions,
               xml::DocumentPtr& oldResults, xml::DocumentPtr& newResults);
  void SeedCounters();
  void CountApplications();
  void Run();
  // Merges every application of one new folder into `oldFolder`; false when a cancel ends the walk.
  bool MergeFolder(xml::Node newFolder, xml::Node oldFolder, const Defaults& defaults);
  void MergeApplication(xml::Node application, xml::Node oldFolder, const Defaults& defaults);
  void RaiseApplicationProgress(const std::string& name);

  bool MissingApplicationsRefresh();
  bool MissingApplicationsSearch();
  bool MissingApplication(xml::Node& application);
  xml::Node MissingList();
  // Takes a missing application out of the old results with the places it leaves empty.
  void RemoveFromTree(const OnError& on, xml::Node application);

  std::unique_ptr<Schema> objSchema;

  xml::DocumentPtr objSearchOptionsDOM;
  xml::DocumentPtr objApplicationOptionsDOM;
  xml::DocumentPtr objOldResultsDOM;
  xml::DocumentPtr objNewResultsDOM;

  int32_t e_match_total_new = 0;
  int32_t e_match_total_old = 0;
  int32_t e_match_merged = 0;
  int32_t e_match_missing = 0;
  int32_t lngComputerCounter = 0;
  int32_t lngDriveCounter = 0;
  int32_t lngFolderCounter = 0;

  // Where the applications of each results document stand, built once per run on first use, so
  // that checking a managed application's place never scans a whole document.
  std::unique_ptr<merge::PlaceIndex> newPlaces_;
  std::unique_ptr<merge::PlaceIndex> oldPlaces_;
  xml::Node missingList_;  // the old results' list, once found or made in this run
};

}  // namespace trl
