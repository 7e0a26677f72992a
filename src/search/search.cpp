#include "trl/search.h"

#include <algorithm>
#include <optional>

#include "frame/attributes.h"
#include "frame/error_handler.h"
#include "frame/fixes.h"
#include "frame/general.h"
#include "frame/highest_id.h"
#include "frame/use_object.h"
#include "frame/vocabulary.h"
#include "platform/clock.h"
#include "platform/convert.h"
#include "platform/fs/system_file_system.h"
#include "platform/regexp.h"
#include "schema/schema.h"
#include "search/search_names.h"

namespace trl {

using search::kClass;
using search::kRunLabel;

namespace {

constexpr int32_t kSearchMode = 1;

// What "//c[@c_local='1']" selects first. The selection would gather every node of a document of
// millions of files before its filter; the elements named "c" are few.
xml::Node FirstLocalComputer(xml::Node root) {
  auto isLocal = [](const xml::Node& c) { return c.GetAttribute(vocab::c_local) == "1"; };
  if (root.NodeName() == vocab::c && isLocal(root)) return root;
  // Usually the first computer: the walk ends there rather than at the last of a million files.
  return root.FirstElementByTagName(vocab::c, isLocal);
}

}  // namespace

Search::Search() : Search(nullptr) {
  objFSO = CreateService<fs::FileSystem>("Scripting.FileSystemObject",
                                         [] { return fs::CreateSystemFileSystem(); });
}

Search::Search(std::unique_ptr<fs::FileSystem> fileSystem)
    : Worker(kClass, kSearchMode),
      objFSO(std::move(fileSystem)),
      objRegExp(CreateService<RegExp>("VBScript_RegExp_55.RegExp",
                                      [] { return std::make_unique<RegExp>(); })),
      objSchema(
          CreateService<Schema>("trlSchema.Data", [] { return std::make_unique<Schema>(); })) {}

Search::~Search() = default;

std::string Search::Start(xml::DocumentPtr searchOptions, xml::DocumentPtr applicationOptions,
                          xml::DocumentPtr fingerprint, xml::DocumentPtr& objResultsDOM) {
  return StartFrame(
      [&] { Prepare(searchOptions, applicationOptions, fingerprint, objResultsDOM); });
}

std::string Search::Start(xml::DocumentPtr searchOptions, xml::DocumentPtr applicationOptions,
                          xml::DocumentPtr fingerprint) {
  xml::DocumentPtr results;
  return Start(std::move(searchOptions), std::move(applicationOptions), std::move(fingerprint),
               results);
}

void Search::Prepare(xml::DocumentPtr& searchOptions, xml::DocumentPtr& applicationOptions,
                     xml::DocumentPtr& fingerprint, xml::DocumentPtr& objResultsDOM) {
  OnError on{kClass, search::kStartLabel};
  startTime_ = FormatDateTime(Now());
  objSearchOptionsDOM = searchOptions;
  objApplicationOptionsDOM =
      applicationOptions ? applicationOptions : std::make_shared<xml::Document>();
  objFingerprintDOM = fingerprint ? fingerprint : std::make_shared<xml::Document>();
  if (!objResultsDOM) objResultsDOM = std::make_shared<xml::Document>();

  results_ = std::make_shared<xml::Document>();
  lngComputerCounter = lngDriveCounter = lngFolderCounter = 0;
  if (xml::Node lent = objResultsDOM->DocumentElement()) {
    on([&] { SetCountersFrom(results_->SetDocumentElement(lent)); });
  } else {
    on([&] { results_->SetDocumentElement(results_->CreateElement(vocab::results_root)); });
  }
  on([&] { UpgradeUserData(Use(objSearchOptionsDOM)); });

  lngFolderCount = 0;
  lngFileCounter = 0;
  read_ = Reading{};
  on([&] { Use(objRegExp).Pattern(""); });
  patternUsable_ = true;
  caseExactFrom_ = std::string::npos;
  linkNotes_ = {};
  applicationsById_.reset();
}

void Search::SetCountersFrom(xml::Node root) {
  OnError on{kClass, search::kStartLabel};
  lngComputerCounter = HighestId(on, root, vocab::c);
  lngDriveCounter = HighestId(on, root, vocab::m);
  lngFolderCounter = HighestId(on, root, vocab::d);
}

void Search::RunBody() {
  OnError on{kClass, kRunLabel};
  // Each run sees the disk as it is now, not as an earlier run of this instance found it.
  if (objFSO) objFSO->Forget();
  BeginRun(on);
  if (status_ != kStatusCancelled) WalkSearchOptions();
  Finish();
}

void Search::WalkSearchOptions() {
  OnError on{kClass, kRunLabel};
  xml::Node resultsRoot;
  std::vector<xml::Node> computers;
  on([&] { resultsRoot = results_->DocumentElement(); });
  on([&] {
    xml::Node root = Use(objSearchOptionsDOM).DocumentElement();
    computers = root.SelectNodes("//" + root.NodeName() + "/c");
  });
  Reading& r = read_;
  for (const xml::Node& c : computers) {
    on([&] { r.cText = TextOf(c, vocab::c_text); });
    on([&] { r.cName = TextOf(c, vocab::c_name); });
    on([&] { r.local = TextOf(c, vocab::c_local) == "1"; });
    on([&] {
      r.computer = Use(objSchema).AddComputer(r.cText, r.cName, resultsRoot, lngComputerCounter);
    });
    std::vector<xml::Node> drives;
    on([&] { drives = c.SelectNodes("./m"); });
    for (const xml::Node& m : drives) {
      on([&] { r.mText = TextOf(m, vocab::m_text); });
      on([&] { r.mName = TextOf(m, vocab::m_name); });
      on([&] { r.drive = Use(objSchema).AddDrive(r.mText, r.mName, r.computer, lngDriveCounter); });
      std::vector<xml::Node> entries;
      on([&] { entries = m.SelectNodes("./d"); });
      for (const xml::Node& d : entries) {
        if (!WalkFolderEntry(d)) return;
      }
      if (!linkNotes_.links.empty()) WriteFolderLinks();
      linkNotes_ = {};
    }
  }
}

bool Search::WalkFolderEntry(xml::Node entry) {
  OnError on{kClass, kRunLabel};
  Reading& r = read_;
  on([&] {
    std::string folder = TextOf(entry, vocab::d_text);
    if (!folder.ends_with('\\')) folder += '\\';
    r.folder = std::move(folder);
  });
  // A walk-control attribute as text, its default when absent.
  auto control = [&](std::string_view attribute, const char* fallback) {
    return FixNulls<std::string>(entry.GetAttribute(attribute), fallback);
  };
  std::string walk = "0";
  on([&] { walk = control(vocab::d_search, "0"); });
  if (walk == "1") {
    on([&] { r.recurse = ToBool(control(vocab::d_search_recurse, "True")); });
    on([&] { r.folderMask = ToInt16(control(vocab::d_search_d_attributes, "33")); });
    on([&] { r.fileMask = ToInt16(control(vocab::d_search_f_attributes, "33")); });
    on([&] { r.properties = ToInt16(control(vocab::d_search_f_properties, "0")); });
    on([&] { r.links = control(vocab::d_search_links, "0") == "1"; });
    on([&] { r.fileLinksAnywhere = control(vocab::d_search_f_links, "0") == "1"; });
    r.realFolder.reset();
    r.excluded.clear();
    for (const xml::Node& glob : entry.ChildElements(vocab::d_search_exclude)) {
      r.excluded.push_back(glob.Text());
    }
    if (r.links) NoteSearchedRoot(r.folder);
    // An invalid pattern is reported here, once; AddFile then passes over every name quietly.
    on([&] {
      xml::Node mask = entry.SelectSingleNode(vocab::d_search_mask);
      Use(objRegExp).Pattern(mask.Text());
      patternUsable_ = false;
      objRegExp->Test("");
      patternUsable_ = true;
    });
    FindFiles(FullPath(r.folder), r.drive, r.folder, r.recurse, r.folderMask, r.fileMask,
              r.properties);
  }
  std::vector<xml::Node> applications;
  on([&] { applications = entry.SelectNodes("./a"); });
  for (const xml::Node& a : applications) {
    if (!ProbeApplication(a)) return false;
  }
  return true;
}

std::string Search::FullPath(const std::string& rest) const {
  if (read_.local) return read_.mText + rest;
  return "\\\\" + read_.cText + "\\" + read_.mText + rest;
}

void Search::Finish() {
  OnError on{kClass, kRunLabel};
  on([&] { AddEventsXML(Use(results_)); });
  std::string endTime = FormatDateTime(Now());
  xml::Node root;
  on([&] { root = Use(results_).DocumentElement(); });
  on([&] { root.SetAttribute(vocab::search_start, startTime_); });
  on([&] { root.SetAttribute(vocab::search_end, endTime); });
  on([&] {
    xml::Node local = FirstLocalComputer(root);
    xml::Node first = root.FirstChild();
    if (local && !(local == first)) root.InsertBefore(local, first);
  });
  if (SettleStatus()) on([&] { root.SetAttribute(vocab::cancelled, "1"); });
  EndRun(on);
}

std::string Search::ResultText() {
  xml::Document& results = Use(results_);
  // A document without content has no text for a writer to write.
  if (!resultsWriter_ || !results.DocumentElement()) return results.Xml();
  resultsWriter_(results);
  return "";
}

xml::DocumentPtr Search::ResultsDocument() { return results_; }

void Search::AddStatusCounters(xml::Node e) {
  e.SetAttribute(vocab::e_d_count, std::to_string(lngFolderCount));
  e.SetAttribute(vocab::e_f_count, std::to_string(lngFileCounter));
}

void Search::ReleaseDocuments() {
  objSearchOptionsDOM.reset();
  objApplicationOptionsDOM.reset();
  objFingerprintDOM.reset();
  results_.reset();
  applicationsById_.reset();
}

}  // namespace trl
