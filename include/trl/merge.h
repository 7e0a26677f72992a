#pragma once

#include <cstdint>
#include <memory>
#include <string>
#include <vector>

#include "trl/export.h"
#include "trl/worker.h"
#include "trl/xml.h"

namespace trl {

class Schema;
namespace merge {
class IdLedger;
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

  // Merges the results of many runs into one user data, one run after another: BeginSequence
  // once, MergeNext for each run's search options and results, EndSequence at the end. The old
  // results end as a synchronous Start for each run in turn would leave them, but they are
  // upgraded, numbered and indexed once instead of once per run, so that the whole costs time in
  // proportion to the size of the documents: for the runs of many computers, each naming its
  // own. Synchronous, without events. BeginSequence answers false, and the sequence does nothing,
  // while a run is under way.
  bool BeginSequence(xml::DocumentPtr objApplicationOptionsDOM, xml::DocumentPtr objOldResultsDOM);
  void MergeNext(xml::DocumentPtr objSearchOptionsDOM, xml::DocumentPtr objNewResultsDOM);
  void EndSequence();

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
  // What a run does to the old results, without the reports around it: the missing
  // applications, then the walk of the new results.
  void MergeResults();
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
  // Keeps what the old results' indexes know in step with a change of their tree: `node`, and
  // what it holds, is about to leave the tree, or has just joined it.
  void NoteRemoving(const xml::Node& node);
  void NoteAdded(const xml::Node& node);

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

  // What a sequence of merges keeps from one run to the next.
  struct Sequence {
    std::unique_ptr<merge::IdLedger> ids;
    // The computers of the old results the last run merged into: the next run's upgrade of the
    // old results would give their applications their place keys.
    std::vector<xml::Node> touched;
    bool asynchronous = false;  // the worker's own mode, given back at the end
  };
  std::unique_ptr<Sequence> sequence_;
};

}  // namespace trl
