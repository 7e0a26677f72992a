#pragma once

#include <cstdint>
#include <functional>
#include <memory>
#include <optional>
#include <string>
#include <unordered_map>
#include <utility>
#include <vector>

#include "trl/export.h"
#include "trl/worker.h"
#include "trl/xml.h"

namespace trl {

class RegExp;
class Schema;
namespace fs {
class File;
class FileSystem;
class Folder;
}  // namespace fs

// The first stage of a locate run: walks the computers, drives and folders the search options
// name, looks in those folders for the files of the applications they list, and records what it
// finds in the local-files document (computers, drives, folders, files and file properties).
class TRL_API Search : public Worker {
 public:
  // Works on this machine's file system, with network paths through the system's network mounts.
  Search();
  // Works on `fileSystem` (for other share mappings, or a test's file system).
  explicit Search(std::unique_ptr<fs::FileSystem> fileSystem);
  ~Search() override;

  // Runs the search. The application options and the fingerprint may be null (an empty document
  // stands in). A null `objResultsDOM` gets a new empty document; one with a root element lends
  // that root and its content to the run, which adds to it. Returns the local-files document's
  // text when synchronous, "" otherwise.
  std::string Start(xml::DocumentPtr objSearchOptionsDOM, xml::DocumentPtr objApplicationOptionsDOM,
                    xml::DocumentPtr objFingerprintDOM, xml::DocumentPtr& objResultsDOM);
  std::string Start(xml::DocumentPtr objSearchOptionsDOM,
                    xml::DocumentPtr objApplicationOptionsDOM = nullptr,
                    xml::DocumentPtr objFingerprintDOM = nullptr);

  // With a writer, a synchronous Start hands the local-files document to it where it would take
  // the document's text, and returns "": a document of millions of files is written out without
  // being held a second time as one text. A failure of the writer is reported as any other.
  void ResultsWriter(std::function<void(const xml::Document&)> write) {
    resultsWriter_ = std::move(write);
  }

 protected:
  void RunBody() override;
  std::string ResultText() override;
  xml::DocumentPtr ResultsDocument() override;
  bool OwnsResults() const override { return true; }
  void AddStatusCounters(xml::Node e) override;
  void ReleaseDocuments() override;

 private:
  // What the run last read from the search options and the fingerprint. A value that cannot be
  // read keeps what the previous element gave, so these live for the whole run.
  struct TRL_LOCAL Reading {
    std::string cText, cName, mText, mName, folder, aId, aName, fName, fRelpath, fFullpath;
    bool local = false;
    bool recurse = false;
    int16_t folderMask = 0;
    int16_t fileMask = 0;
    int16_t properties = 0;
    bool links = false;                     // links to folders are noted
    bool fileLinksAnywhere = false;         // links to files are read wherever they lead
    std::optional<std::string> realFolder;  // the folder entry's real path, once needed
    std::vector<std::string> excluded;      // globs of folders left out
    xml::Node computer;                     // the c and m elements of the results being added to
    xml::Node drive;
  };

  void Prepare(xml::DocumentPtr& searchOptions, xml::DocumentPtr& applicationOptions,
               xml::DocumentPtr& fingerprint, xml::DocumentPtr& objResultsDOM);
  void SetCountersFrom(xml::Node root);
  void WalkSearchOptions();
  // Both answer false when a cancel ends the walk.
  bool WalkFolderEntry(xml::Node entry);
  bool ProbeApplication(xml::Node application);
  // The full path of `rest` (a folder below the drive, or a file) on the current drive.
  std::string FullPath(const std::string& rest) const;
  void Finish();

  void FindFiles(const std::string& path, xml::Node parent, const std::string& relativePath,
                 bool recurse, int16_t folderMask, int16_t fileMask, int16_t properties);
  bool AddFile(xml::Node folder, const fs::File& file, int16_t properties);
  // Whether `file` is a link to a file outside the folder entry being walked.
  bool LeadsOutside(const fs::File& file);
  // Whether the folder at `path` (the component's form) is left out of the walk.
  bool Excluded(const std::string& name, const std::string& path) const;
  // The encoded name of a folder: with its case kept below a folder that has a case sibling.
  std::string EncodedFolder(const std::string& relativePath) const;

  // Links to folders, noted while the folders of one drive are walked and written under its
  // element when they are done, for those that lead into a walked folder.
  struct TRL_LOCAL LinkNotes {
    struct Root {
      std::string real, relative;
      bool recurse;
    };
    std::vector<Root> roots;
    std::vector<std::pair<std::string, std::string>> links;  // relative path, target's real path
  };
  void NoteSearchedRoot(const std::string& relativePath);
  void NoteFolderLinks(fs::Folder& folder, const std::string& relativePath);
  void WriteFolderLinks();
  static bool CheckAttributes(int16_t attributes, int16_t mask);
  void ReportPathNotFound(const std::string& path);
  void RaiseProgress(const OnError& on, const std::string& path);

  // The fingerprint applications with this a_id or a_parent, in document order.
  const std::vector<xml::Node>& FingerprintApplications(const std::string& id);

  std::unique_ptr<fs::FileSystem> objFSO;
  std::unique_ptr<RegExp> objRegExp;
  std::unique_ptr<Schema> objSchema;

  xml::DocumentPtr objSearchOptionsDOM;
  xml::DocumentPtr objApplicationOptionsDOM;
  xml::DocumentPtr objFingerprintDOM;
  xml::DocumentPtr results_;
  std::function<void(const xml::Document&)> resultsWriter_;

  int32_t lngComputerCounter = 0;
  int32_t lngDriveCounter = 0;
  int32_t lngFolderCounter = 0;
  int32_t lngFolderCount = 0;
  int32_t lngFileCounter = 0;
  std::string startTime_;  // formatted
  Reading read_;
  bool patternUsable_ = true;  // an invalid pattern is reported once, where it is set
  // Where the first folder with a case sibling begins in the folder text of the walk below it.
  size_t caseExactFrom_ = std::string::npos;
  LinkNotes linkNotes_;

  // Built on the first probe of a run: the fingerprint applications by a_id and by a_parent.
  std::unique_ptr<std::unordered_map<std::string, std::vector<xml::Node>>> applicationsById_;
};

}  // namespace trl
