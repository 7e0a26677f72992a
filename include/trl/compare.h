#pragma once

#include <cstdint>
#include <memory>
#include <optional>
#include <string>
#include <unordered_map>
#include <unordered_set>
#include <vector>

#include "trl/export.h"
#include "trl/worker.h"
#include "trl/xml.h"

namespace trl {

class LocalFileIndex;
class FingerprintFile;
struct LocalFileFacts;
struct VersionDraft;
class VersionFiles;
class LocalFileRecord;
struct CandidatePlace;
class Schema;
class ReadAhead;
namespace fs {
class File;
class FileSystem;
}  // namespace fs

// The second stage of a locate run: matches the fingerprint database against the local files a
// search recorded. Every application version of which a file was found is filed, with its scores,
// under the computer, drive and application folder where it was found; versions that lack a file
// that carries weight are taken back out.
class TRL_API Compare : public Worker {
 public:
  // Works on this machine's file system, with network paths through the system's network mounts.
  Compare();
  // Works on `fileSystem` (for other share mappings, or a test's file system).
  explicit Compare(std::unique_ptr<fs::FileSystem> fileSystem);
  ~Compare() override;

  // Runs the match. A null document stands for an empty one. The fingerprint gets its bit values
  // written in place. Returns the matches' text when synchronous, "" otherwise.
  std::string Start(xml::DocumentPtr objApplicationOptionsDOM, xml::DocumentPtr objLocalFilesDOM,
                    xml::DocumentPtr objFingerprintDOM);

  // The folder in which the application would be installed if a local file in `folder` (lower
  // case, as the local-file index holds it) were the fingerprint file `f`, or "" when the folder
  // does not fit the file's f_relpath.
  static std::string FindCommonPath(const xml::Node& f, std::string folder);

  // On: the results also tell why, in elements of their own that the other stages pass over:
  // each version taken back for lack of a weighted file is kept in a `taken_back` element under
  // the root, with its place, and each found file whose properties disagreed holds a `p_local`
  // per disagreeing property with the value expected and the value the file has. Off (the
  // default): the results hold only the matches.
  void Explaining(bool on) { explaining_ = on; }

  // How many threads read and hash the candidate files ahead of the match (results and reports
  // stay the same); 0 reads each file on the run's own thread when it is tested. One per core
  // unless set.
  void ReadThreads(unsigned threads) { readThreads_ = threads; }

 protected:
  void RunBody() override;
  std::string ResultText() override;
  xml::DocumentPtr ResultsDocument() override;
  bool OwnsResults() const override { return true; }
  void AddStatusCounters(xml::Node e) override;
  void ReleaseDocuments() override;

  // Off: every find is filed at once through the find-or-add steps, with no version copy kept
  // aside and no place remembered; the results must not change.
  void DraftCopies(bool on) { draftCopies_ = on; }

 private:
  // One results copy of an application, with the ids of its computer, drive and folder: Compare
  // only appends, and each level is numbered from a growing counter, so these ids order the copies
  // as the document does.
  struct TRL_LOCAL ApplicationCopy {
    int32_t computer, drive, folder;
    xml::Node element;
  };

  void Prepare(xml::DocumentPtr& applicationOptions, xml::DocumentPtr& localFiles,
               xml::DocumentPtr& fingerprint);
  void Match();
  void Finish();
  bool MatchApplication(xml::Node a);
  struct TRL_LOCAL VersionMatch;
  bool MatchVersion(xml::Node v);
  // Files the find of a local file for the version's file under its application folder.
  void RecordFind(VersionMatch& match, const LocalFileRecord& record,
                  const CandidatePlace& appFolder, const FingerprintFile& file, int16_t mask);
  // The computer, drive, application folder and application copy of a find, found or added;
  // false when a step failed.
  bool FindPlace(VersionMatch& match, const LocalFileRecord& record,
                 const CandidatePlace& appFolder);
  // The versions of `a` (the ids of `versions`) whose copies can be drafted first and made only
  // when complete: those the application's pruning will certainly find in their final state.
  std::unordered_set<const void*> DraftableVersions(const xml::Node& a,
                                                    const std::vector<xml::Node>& versions) const;
  void MakeVersionCopy(const xml::Node& v, const VersionDraft& draft);
  void RaiseApplicationProgress(xml::Node a, bool matched);
  // The path of the candidate's own file, as the search wrote it, on its own computer or through
  // the network: of names that differ only in case, each reaches its own file.
  static std::string CandidatePath(const LocalFileRecord& record);

  // `files`: how many f the local files hold, at most what the index gets.
  void FillRecordset(size_t files);
  // Has `index` keep only the files named as the fingerprint's files are (the match asks for no
  // other name) when the local files, `files` of them, far outnumber those.
  void KeepOnlyAskedNames(LocalFileIndex& index, size_t files) const;
  // Makes the index anew with every file, for a name it was not made for.
  void IndexEveryFile();
  // Starts reading ahead the candidates of `applications`, planned as the match will test them.
  void StartReadAhead(const std::vector<xml::Node>& applications);
  // The same before the fingerprint is prepared, when the local-file index builds without a
  // failure: the threads then hash while this one runs `upgrade` (the fingerprint's bit values),
  // which is run once whatever happens.
  void StartReadAheadEarly(const std::function<void()>& upgrade);
  void StopReadAhead();
  // Plans the reads of the next few fingerprint files; false once all are planned.
  bool PlanMoreReads();
  std::vector<xml::Node> PlannableFiles(const xml::Node& a) const;
  void PlanFileReads(const xml::Node& f);
  void PlanPathReads(const std::string& path, unsigned wanted);
  // The value of a property of kind 1 or 3 of a tested file, read ahead or now.
  std::string ReadLocalValue(LocalFileFacts& facts, const fs::File& file, int16_t kind);
  int16_t MatchFile(const std::string& path, const FingerprintFile& f);
  bool UpdateFileDetails(xml::Node vResult, const FingerprintFile& f, int16_t mask);
  // The same for a drafted copy, with the same reports.
  void UpdateDraftDetails(VersionDraft& draft, const VersionFiles& files, const FingerprintFile& f,
                          int16_t mask);

  int16_t RemoveIncompleteApplications(const std::string& id, int32_t highestSequence);
  void RemoveIncompleteVersions(xml::Node copy, int32_t highestSequence);
  // Keeps a copy of the version `v` of the application copy `copy`, with its place, before it is
  // taken back.
  void KeepTakenBack(const xml::Node& copy, const xml::Node& v);
  // Records on the results file `copy` the properties the last MatchFile found disagreeing.
  void KeepDisagreements(xml::Node copy) const;
  // Takes out the copies with this a_id left without versions, each with whatever that leaves
  // empty, in document order.
  void RemoveEmptiedCopies(const std::string& id);
  // Takes out one copy, or the folder, drive or computer it alone fills.
  static void RemoveEmptiedCopy(xml::Node copy);
  void RememberCopy(xml::Node copy);
  // The copies of the application with this a_id, in document order.
  std::vector<xml::Node> CopiesOf(const std::string& id) const;

  std::unique_ptr<fs::FileSystem> objFSO;
  std::unique_ptr<Schema> objSchema;

  xml::DocumentPtr objApplicationOptionsDOM;
  xml::DocumentPtr objLocalFilesDOM;
  xml::DocumentPtr objFingerprintDOM;
  xml::DocumentPtr objResultsDOM;
  std::unique_ptr<LocalFileIndex> rsLocalFiles;

  int32_t e_a_total = 0;
  int32_t e_a_count = 0;
  int32_t e_match_count = 0;
  int32_t lngComputerCounter = 0;
  int32_t lngDriveCounter = 0;
  int32_t lngFolderCounter = 0;
  std::string startTime_;  // formatted
  bool draftCopies_ = true;
  bool explaining_ = false;
  // A property of the file MatchFile tested last that did not agree: its kind, the value expected
  // and the file's own, each as it was compared (absent when it could not be read).
  struct TRL_LOCAL Disagreement {
    int16_t kind;
    std::optional<std::string> expected, local;
  };
  std::vector<Disagreement> disagreements_;
  std::vector<xml::Node> takenBack_;  // made while explaining, put under the root at the end
  std::unordered_set<const void*> draftedVersions_;  // of the application being matched
  // A place the application being matched was found in: the listed drive and the fingerprint
  // application, with the computer, drive, folder and copy the results hold for them.
  struct TRL_LOCAL FoundPlace {
    uint32_t drive;
    const void* application;
    xml::Node c, m, d, a;
  };
  // By application folder; a folder is mostly found on one drive only.
  std::unordered_map<std::string, std::vector<FoundPlace>> placesFound_;
  std::unordered_map<std::string, std::vector<FoundPlace>> exactPlacesFound_;
  // Reused by each fingerprint file: its candidates, and the places one of them stands for.
  std::vector<LocalFileRecord> candidates_;
  std::vector<CandidatePlace> places_;

  // Every results copy of an application by a_id, so that pruning one application never scans
  // the whole results.
  std::unordered_map<std::string, std::vector<ApplicationCopy>> copiesById_;
  std::unordered_set<const void*> knownCopies_;
  // What the run has learnt of each local file it tested, by path.
  std::unordered_map<std::string, std::unique_ptr<LocalFileFacts>> filesSeen_;

  unsigned readThreads_;
  bool indexBuiltEarly_ = false;    // rsLocalFiles was filled in Start, without a report
  uint64_t localFilesChanges_ = 0;  // the local files' modification count then
  size_t localFilesCount_ = 0;      // their f elements
  struct TRL_LOCAL ReadPlan;
  std::unique_ptr<ReadPlan> readPlan_;
  // Reads files of filesSeen_, so it goes first.
  std::unique_ptr<ReadAhead> readAhead_;
};

}  // namespace trl
