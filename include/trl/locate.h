#pragma once

#include <cstdint>
#include <functional>
#include <memory>
#include <string>
#include <string_view>

#include "trl/export.h"
#include "trl/worker.h"
#include "trl/xml.h"

namespace trl {

class Search;
class Compare;
class Filter;
class Merge;
class Reporter;
namespace fs {
class FileSystem;
}  // namespace fs

// The class a client normally uses: one Start runs Search, Compare, Filter and Merge in order,
// hands each stage's results to the next, relays the stages' reports, gathers the events they
// recorded and delivers the merged user data; with LogFile set it writes a run log.
class TRL_API Locate : public Worker {
 public:
  // Which stage a run is in.
  enum StageMode : int16_t {
    kNoStage = 0,
    kSearchStage = 1,
    kCompareStage = 2,
    kFilterStage = 3,
    kMergeStage = 4,
    kFinished = 5
  };

  // The stages work on this machine's file system, with network paths through its network mounts.
  Locate();
  // Search and Compare work on these file systems (other share mappings, or a test's file system).
  Locate(std::unique_ptr<fs::FileSystem> searchFileSystem,
         std::unique_ptr<fs::FileSystem> compareFileSystem);
  // Runs these stage workers (configured by the caller); a missing one is reported as one that
  // could not be created.
  Locate(std::unique_ptr<Search> search, std::unique_ptr<Compare> compare,
         std::unique_ptr<Filter> filter, std::unique_ptr<Merge> merge);
  ~Locate() override;

  int16_t Mode() const { return stageMode_; }
  const std::string& LogFile() const { return logFile_; }
  void LogFile(std::string strFilename) { logFile_ = std::move(strFilename); }
  void Cancel() override;

  // Runs the whole job. Null search options, application options or fingerprint stand for empty
  // documents; a null user data starts a new, empty one. Merge writes into `objUserDataDOM` in
  // place. Returns the merged results with the run's events when synchronous, "" otherwise.
  std::string Start(xml::DocumentPtr objSearchOptionsDOM, xml::DocumentPtr objApplicationOptionsDOM,
                    int16_t intFilterOptions, xml::DocumentPtr objFingerprintDOM,
                    xml::DocumentPtr objUserDataDOM = nullptr);

  // The options header a logged run begins with.
  static std::string OptionsHeader(bool asynchronous, int16_t filterOptions,
                                   xml::Document& searchOptions, xml::Document& applicationOptions);

 protected:
  void RunBody() override;
  std::string ResultText() override;
  xml::DocumentPtr ResultsDocument() override;
  void AddStatusCounters(xml::Node) override {}
  void ReleaseDocuments() override;
  bool YieldsInStart() const override { return false; }
  void TickerArmed() override;

 private:
  struct TRL_LOCAL Stage;
  void SubscribeTo(Stage& stage);
  // Relays the stage's progress reports while this worker's client follows them (a stage that
  // nobody follows does not build its reports).
  void Prepare(xml::DocumentPtr& searchOptions, xml::DocumentPtr& applicationOptions,
               int16_t filterOptions, xml::DocumentPtr& fingerprint, xml::DocumentPtr& userData);

  void SearchBegin();
  void CompareBegin();
  void FilterBegin();
  void MergeBegin();
  // The part all Begin steps share: `start` calls the stage's Start and answers its text.
  void Begin(Stage& stage, const std::function<std::string()>& start);
  // The step after a stage's Begin: the next Begin, or Finalise after the last stage.
  void Next(const Stage& stage);
  void End(Stage& stage);
  void Finalise();

  void StatusUpdate(Stage& stage, const std::string& strUpdateXML,
                    const xml::DocumentPtr& stageResults, bool handedOver);
  void ProgressUpdate(const Stage& stage, const std::string& strUpdateXML);
  // Moves copies of the events recorded in a stage's results into the gathered events.
  void AddEvents(std::string_view stageName, xml::Document& results, xml::Document& eventsDocument);
  void LogEvent(std::string_view message, std::string_view label);
  void Log(std::string_view message, std::string_view label);

  std::unique_ptr<Search> trlSearch;
  std::unique_ptr<Compare> trlCompare;
  std::unique_ptr<Filter> trlFilter;
  std::unique_ptr<Merge> trlMerge;
  std::unique_ptr<Stage> stages_[4];
  std::unique_ptr<Reporter> reporter_;

  int16_t stageMode_ = kNoStage;
  std::string logFile_;
  bool logging_ = false;
  int16_t filterOptions_ = 0;
  xml::DocumentPtr searchOptions_, applicationOptions_, fingerprint_, userData_;
  xml::DocumentPtr searchResults_, compareResults_, filterResults_, mergeResults_;
  xml::DocumentPtr progressDocument_, events_;
  // The field whose results StatusUpdate carries: search's, then merge's.
  const xml::DocumentPtr* reported_ = nullptr;
};

}  // namespace trl
