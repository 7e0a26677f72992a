#include "trl/compare.h"

#include <algorithm>
#include <optional>
#include <unordered_set>
#include <utility>

#include "compare/candidates.h"
#include "compare/compare_names.h"
#include "compare/file_facts.h"
#include "compare/fingerprint_file.h"
#include "compare/local_file_index.h"
#include "compare/read_ahead.h"
#include "compare/read_plan.h"
#include "compare/version_draft.h"
#include "frame/attributes.h"
#include "frame/error_handler.h"
#include "frame/every_element.h"
#include "frame/fixes.h"
#include "frame/general.h"
#include "frame/use_object.h"
#include "frame/vocabulary.h"
#include "platform/clock.h"
#include "platform/convert.h"
#include "platform/fs/system_file_system.h"
#include "platform/text.h"
#include "schema/schema.h"

namespace trl {

using compare::kClass;

namespace {

constexpr int32_t kCompareMode = 2;

}  // namespace

Compare::Compare() : Compare(nullptr) {
  objFSO = CreateService<fs::FileSystem>("Scripting.FileSystemObject",
                                         [] { return fs::CreateSystemFileSystem(); });
}

Compare::Compare(std::unique_ptr<fs::FileSystem> fileSystem)
    : Worker(kClass, kCompareMode),
      objFSO(std::move(fileSystem)),
      objSchema(CreateService<Schema>("trlSchema.Data", [] { return std::make_unique<Schema>(); })),
      readThreads_(ReadAhead::DefaultThreads()) {}

Compare::~Compare() = default;

std::string Compare::Start(xml::DocumentPtr applicationOptions, xml::DocumentPtr localFiles,
                           xml::DocumentPtr fingerprint) {
  return StartFrame([&] { Prepare(applicationOptions, localFiles, fingerprint); });
}

void Compare::Prepare(xml::DocumentPtr& applicationOptions, xml::DocumentPtr& localFiles,
                      xml::DocumentPtr& fingerprint) {
  OnError on{kClass, compare::kStartLabel};
  startTime_ = FormatDateTime(Now());
  auto orEmpty = [](xml::DocumentPtr& document) {
    return document ? document : std::make_shared<xml::Document>();
  };
  objApplicationOptionsDOM = orEmpty(applicationOptions);
  objLocalFilesDOM = orEmpty(localFiles);
  objFingerprintDOM = orEmpty(fingerprint);
  objResultsDOM = std::make_shared<xml::Document>();
  on([&] { objResultsDOM->SetDocumentElement(objResultsDOM->CreateElement(vocab::results_root)); });
  lngComputerCounter = lngDriveCounter = lngFolderCounter = 0;
  e_a_total = e_a_count = e_match_count = 0;
  StopReadAhead();
  rsLocalFiles.reset();
  indexBuiltEarly_ = false;
  copiesById_.clear();
  knownCopies_.clear();
  filesSeen_.clear();
  StartReadAheadEarly([&] { on([&] { UpgradeFingerprintData(*objFingerprintDOM); }); });
}

void Compare::RunBody() {
  if (indexBuiltEarly_ && objLocalFilesDOM->ModificationCount() != localFilesChanges_) {
    // The client changed the local files after Start: what was made of them then goes.
    StopReadAhead();
    filesSeen_.clear();
    rsLocalFiles.reset();
    indexBuiltEarly_ = false;
  }
  // Each run sees the disk as it is now, not as an earlier run of this instance found it (one
  // that began to read ahead in Start looked at it then).
  if (objFSO && !indexBuiltEarly_) objFSO->Forget();
  Match();
}

void Compare::Match() {
  OnError on{kClass, compare::kMatchLabel};
  std::vector<xml::Node> applications;
  on([&] {
    applications = EveryElement(*objFingerprintDOM, vocab::a);
    e_a_total = ToInt32(static_cast<double>(applications.size()));
  });
  size_t files = 0;
  // Counted already when the index was made at Start, of the same local files.
  on([&] {
    files = indexBuiltEarly_ ? localFilesCount_ : CountEveryElement(*objLocalFilesDOM, vocab::f);
  });
  if (files != 0) {
    BeginRun(on);
    FillRecordset(files);
    if (!readAhead_) StartReadAhead(applications);
    for (const xml::Node& a : applications) {
      YieldIfAsynchronous(on);
      if (status_ == kStatusCancelled) break;
      on([&] { MatchApplication(a); });
    }
  }
  Finish();
}

void Compare::Finish() {
  OnError on{kClass, compare::kMatchLabel};
  StopReadAhead();
  std::string endTime = FormatDateTime(Now());
  for (const xml::Node& kept : std::exchange(takenBack_, {})) {
    on([&] { objResultsDOM->DocumentElement().AppendChild(kept); });
  }
  on([&] { AddEventsXML(*objResultsDOM); });
  xml::Node root;
  on([&] { root = objResultsDOM->DocumentElement(); });
  xml::Node localRoot;
  on([&] { localRoot = objLocalFilesDOM->DocumentElement(); });
  for (std::string_view attribute : {vocab::search_start, vocab::search_end}) {
    on([&] {
      root.SetAttribute(attribute, FixNulls<std::string>(localRoot.GetAttribute(attribute), ""));
    });
  }
  on([&] { root.SetAttribute(vocab::compare_start, startTime_); });
  on([&] { root.SetAttribute(vocab::compare_end, endTime); });
  if (SettleStatus()) on([&] { root.SetAttribute(vocab::cancelled, "1"); });
  EndRun(on);
}

bool Compare::MatchApplication(xml::Node a) {
  OnError on{kClass, compare::kMatchApplicationLabel};
  bool selected = false;
  on([&] { selected = Use(objSchema).IsApplicationSelected(a, *objApplicationOptionsDOM); });
  if (!selected) return false;
  if (readAhead_) readAhead_->KeepAhead();
  on([&] { e_a_count = CheckedAdd(e_a_count, 1); });
  RaiseApplicationProgress(a, false);

  int32_t highest = 0;
  bool found = false;
  std::vector<xml::Node> versions;
  on([&] { versions = a.GetElementsByTagName(vocab::v); });
  draftedVersions_ = DraftableVersions(a, versions);
  placesFound_.clear();
  exactPlacesFound_.clear();
  for (const xml::Node& v : versions) {
    on([&] { highest = std::max(highest, ToInt32(TextViewOf(v, vocab::v_seq))); });
    if (MatchVersion(v)) found = true;
  }
  draftedVersions_.clear();
  placesFound_.clear();
  exactPlacesFound_.clear();
  if (found) {
    int16_t remaining = 0;
    on([&] { remaining = RemoveIncompleteApplications(TextOf(a, vocab::a_id), highest); });
    if (remaining != 0) {
      on([&] { e_match_count = CheckedAdd(e_match_count, 1); });
      RaiseApplicationProgress(a, true);
    }
  }
  return found;
}

void Compare::RaiseApplicationProgress(xml::Node a, bool matched) {
  Progress(OnError{kClass, compare::kMatchApplicationLabel}, [&](xml::Node e) {
    e.SetAttribute(vocab::e_a_count, std::to_string(e_a_count));
    e.SetAttribute(vocab::e_match_count, std::to_string(e_match_count));
    e.SetAttribute(vocab::e_matched, matched ? "1" : "0");
    xml::Node copy = e.OwnerDocument().CreateElement(vocab::a);
    for (const auto& [name, value] : a.Attributes()) copy.SetAttribute(name, value);
    e.AppendChild(copy);
  });
}

std::unordered_set<const void*> Compare::DraftableVersions(
    const xml::Node& a, const std::vector<xml::Node>& versions) const {
  // Its copies are pruned only when its a_id can be read and selected by. A version's copy can
  // wait until the version is matched only when no other version matched with the application can
  // reach it: none shares its v_id (an application nested with the same a_id files its versions
  // in the same copies), nor lacks one while it is empty (a find-or-add then looks for "").
  // A version without a v_id gets a new copy at every find.
  std::unordered_set<const void*> drafted;
  std::optional<std::string> id = a.GetAttribute(vocab::a_id);
  // Explaining keeps what pruning takes back, so every copy is made.
  if (!draftCopies_ || explaining_ || !id || id->find('\'') != std::string::npos || !objSchema) {
    return drafted;
  }
  std::unordered_map<std::string, int> versionsById;
  for (const xml::Node& v : versions) ++versionsById[v.GetAttribute(vocab::v_id).value_or("")];
  for (const xml::Node& v : versions) {
    auto versionId = v.GetAttribute(vocab::v_id);
    if (versionId && v.ParentNode() == a && versionsById[*versionId] == 1) drafted.insert(v.Id());
  }
  return drafted;
}

// One fingerprint version being matched: what its last find made or found (kept when a step
// fails, as a failed step leaves its value), and its drafted copies.
struct Compare::VersionMatch {
  VersionMatch(xml::Node v, const std::vector<xml::Node>& files, bool drafting, bool placesKept)
      : v(v), files(files), drafting(drafting), placesKept(placesKept) {}

  static constexpr size_t kNoDraft = SIZE_MAX;  // the copy was made already: no draft

  xml::Node v;
  const std::vector<xml::Node>& files;
  bool drafting;
  // Whether the places of finds are remembered: an application without an a_id gets a new copy at
  // every find.
  bool placesKept;
  std::optional<VersionFiles> shape;
  std::vector<VersionDraft> drafts;
  std::unordered_map<const void*, size_t> draftOf;  // by application copy
  xml::Node c, m, d, aResult, vResult;
};

bool Compare::MatchVersion(xml::Node v) {
  OnError on{kClass, compare::kMatchVersionLabel};
  bool found = false;
  std::vector<xml::Node> files;
  on([&] { files = v.GetElementsByTagName(vocab::f); });
  VersionMatch match(v, files, draftedVersions_.contains(v.Id()),
                     draftCopies_ && v.ParentNode().GetAttribute(vocab::a_id));
  // What a failed step would have produced keeps its value from the file or candidate before.
  std::string spelled, name, key;
  int16_t mask = -1;
  std::vector<LocalFileRecord>& records = candidates_;
  std::vector<CandidatePlace>& places = places_;
  for (const xml::Node& f : files) {
    YieldIfAsynchronous(on);
    on([&] {
      spelled = TextOf(f, vocab::f_name);
      name = LowerCase(spelled);
    });
    on([&] { key = Use(objSchema).EncodeName(name); });
    LocalFileIndex::Matches candidates;
    on([&] {
      // A name the index was not made for: the fingerprint changed during the run.
      if (rsLocalFiles && !rsLocalFiles->Covers(key)) IndexEveryFile();
      candidates = Use(rsLocalFiles).Find(key);
    });
    records.clear();
    for (LocalFileRecord record : candidates) records.push_back(record);
    std::optional<FingerprintFile> file;
    for (size_t i = 0; i < records.size(); ++i) {
      const LocalFileRecord& record = records[i];
      YieldIfAsynchronous(on);
      if (!file) file.emplace(f);
      CandidatePlaces(file->Fit(), *rsLocalFiles, record, places);
      if (!places.empty() && !SpeltOtherwiseHere(records, i, spelled)) {
        std::string path = CandidatePath(record);
        on([&] { mask = MatchFile(path, *file); });
      } else {
        mask = -1;
      }
      YieldIfAsynchronous(on);
      if (mask < 0) continue;
      for (const CandidatePlace& place : places) RecordFind(match, record, place, *file, mask);
      found = true;
    }
  }
  for (const VersionDraft& draft : match.drafts) {
    if (!draft.Incomplete(*match.shape)) MakeVersionCopy(v, draft);
  }
  return found;
}

void Compare::RecordFind(VersionMatch& match, const LocalFileRecord& record,
                         const CandidatePlace& appFolder, const FingerprintFile& file,
                         int16_t mask) {
  OnError on{kClass, compare::kMatchVersionLabel};
  if (match.placesKept) {
    // While one application is matched the results only grow, so a place found once is found
    // again by the same find-or-add steps, which add nothing and report nothing then.
    // Keyed by the listed drive rather than its names: a computer listed twice only costs a
    // second find of the same place.
    const void* application = match.v.ParentNode().Id();
    auto& here = (appFolder.exact() ? exactPlacesFound_ : placesFound_)[appFolder.folder];
    auto known = std::find_if(here.begin(), here.end(), [&](const FoundPlace& place) {
      return place.drive == record.DriveIndex() && place.application == application;
    });
    if (known != here.end()) {
      match.c = known->c;
      match.m = known->m;
      match.d = known->d;
      match.aResult = known->a;
    } else if (FindPlace(match, record, appFolder)) {
      here.push_back({record.DriveIndex(), application, match.c, match.m, match.d, match.aResult});
    }
  } else {
    FindPlace(match, record, appFolder);
  }
  if (match.drafting && match.aResult) {
    auto [at, added] = match.draftOf.try_emplace(match.aResult.Id(), match.drafts.size());
    if (added) {
      if (objResultsDOM->FindChild(match.aResult, vocab::v, vocab::v_id,
                                   match.v.GetAttribute(vocab::v_id).value_or(""))) {
        at->second = VersionMatch::kNoDraft;
      } else {
        if (!match.shape) match.shape.emplace(match.files);
        match.drafts.emplace_back(match.aResult, match.files.size());
      }
    }
    if (at->second != VersionMatch::kNoDraft) {
      UpdateDraftDetails(match.drafts[at->second], *match.shape, file, mask);
      return;
    }
  }
  on([&] { match.vResult = Use(objSchema).AddVersion(match.v, match.aResult); });
  on([&] { UpdateFileDetails(match.vResult, file, mask); });
}

void Compare::MakeVersionCopy(const xml::Node& v, const VersionDraft& draft) {
  OnError on{kClass, compare::kMatchVersionLabel};
  xml::Node vResult;
  if (!on([&] { vResult = Use(objSchema).AddVersion(v, draft.application); })) return;
  // The copy holds one f per file of the version, in the same order.
  std::vector<xml::Node> copies = vResult.ChildElements(vocab::f);
  for (size_t i = 0; i < draft.found.size() && i < copies.size(); ++i) {
    if (!draft.found[i]) continue;
    copies[i].SetAttribute(vocab::p_max, std::to_string(draft.maxMask[i]));
    copies[i].SetAttribute(vocab::p_act, std::to_string(draft.mask[i]));
    copies[i].SetAttribute(vocab::f_exists, "1");
  }
  vResult.SetAttribute(vocab::f_act, std::to_string(draft.filesFound));
  vResult.SetAttribute(vocab::v_act, std::to_string(draft.score));
}

bool Compare::FindPlace(VersionMatch& match, const LocalFileRecord& record,
                        const CandidatePlace& appFolder) {
  OnError on{kClass, compare::kMatchVersionLabel};
  bool found = on([&] {
    match.c = Use(objSchema).AddComputer(record.Machine(), record.EncodedMachine(),
                                         objResultsDOM->DocumentElement(), lngComputerCounter);
  });
  found &= on([&] {
    match.m =
        Use(objSchema).AddDrive(record.Drive(), record.EncodedDrive(), match.c, lngDriveCounter);
  });
  found &= on([&] {
    Schema& schema = Use(objSchema);
    const std::string& text = appFolder.folder;
    match.d = schema.AddFolder(text,
                               appFolder.exact() ? schema.EncodeExactName(text, appFolder.exactFrom)
                                                 : schema.EncodeName(text),
                               match.m, lngFolderCounter);
  });
  found &= on([&] {
    match.aResult = Use(objSchema).AddApplication(match.v.ParentNode(), match.d);
    RememberCopy(match.aResult);
  });
  return found;
}

std::string Compare::CandidatePath(const LocalFileRecord& record) {
  std::string path;
  path.reserve(record.Machine().size() + record.Drive().size() + record.ExactFolder().size() +
               record.Filename().size() + 3);
  if (!record.LocalMachine()) {
    path += "\\\\";
    path += record.Machine();
    path += '\\';
  }
  path += record.Drive();
  path += record.ExactFolder();
  path += record.Filename();
  return path;
}

std::string Compare::ResultText() { return Use(objResultsDOM).DocumentElement().Xml(); }

xml::DocumentPtr Compare::ResultsDocument() { return objResultsDOM; }

void Compare::AddStatusCounters(xml::Node e) {
  e.SetAttribute(vocab::e_a_total, std::to_string(e_a_total));
  e.SetAttribute(vocab::e_a_count, std::to_string(e_a_count));
  e.SetAttribute(vocab::e_match_count, std::to_string(e_match_count));
}

void Compare::ReleaseDocuments() {
  objApplicationOptionsDOM.reset();
  objLocalFilesDOM.reset();
  objFingerprintDOM.reset();
  objResultsDOM.reset();
  StopReadAhead();
  rsLocalFiles.reset();
  indexBuiltEarly_ = false;
  copiesById_.clear();
  knownCopies_.clear();
  filesSeen_.clear();
  takenBack_.clear();
}

}  // namespace trl
