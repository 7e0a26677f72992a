#include "trl/merge.h"

#include <algorithm>
#include <unordered_set>
#include <vector>

#include "frame/attributes.h"
#include "frame/error_handler.h"
#include "frame/every_element.h"
#include "frame/fixes.h"
#include "frame/general.h"
#include "frame/highest_id.h"
#include "frame/use_object.h"
#include "frame/vocabulary.h"
#include "merge/id_ledger.h"
#include "merge/merge_names.h"
#include "merge/place_index.h"
#include "platform/convert.h"
#include "schema/schema.h"

namespace trl {

using merge::kClass;

namespace {

constexpr int32_t kMergeMode = 4;

xml::DocumentPtr EmptyResults() {
  auto document = std::make_shared<xml::Document>();
  document->SetDocumentElement(document->CreateElement(vocab::results_root));
  return document;
}

}  // namespace

Merge::Merge()
    : Worker(kClass, kMergeMode),
      objSchema(
          CreateService<Schema>("trlSchema.Data", [] { return std::make_unique<Schema>(); })) {}

Merge::~Merge() = default;

std::string Merge::Start(xml::DocumentPtr searchOptions, xml::DocumentPtr applicationOptions,
                         xml::DocumentPtr oldResults, xml::DocumentPtr newResults) {
  return StartFrame([&] { Prepare(searchOptions, applicationOptions, oldResults, newResults); });
}

void Merge::Prepare(xml::DocumentPtr& searchOptions, xml::DocumentPtr& applicationOptions,
                    xml::DocumentPtr& oldResults, xml::DocumentPtr& newResults) {
  OnError on{kClass, merge::kStartLabel};
  objSearchOptionsDOM = searchOptions ? searchOptions : std::make_shared<xml::Document>();
  objApplicationOptionsDOM =
      applicationOptions ? applicationOptions : std::make_shared<xml::Document>();
  objOldResultsDOM = oldResults;
  objNewResultsDOM = newResults;
  on([&] {
    if (!objOldResultsDOM) objOldResultsDOM = EmptyResults();
  });
  on([&] {
    if (!objNewResultsDOM) objNewResultsDOM = EmptyResults();
  });
  newPlaces_.reset();
  oldPlaces_.reset();
  missingList_ = xml::Node();

  // Read before the upgrade, which may rename but never renumbers.
  SeedCounters();
  on([&] { UpgradeUserData(Use(objOldResultsDOM)); });
  on([&] { UpgradeUserData(Use(objNewResultsDOM)); });
  CountApplications();
}

void Merge::SeedCounters() {
  OnError on{kClass, merge::kStartLabel};
  lngComputerCounter = lngDriveCounter = lngFolderCounter = 0;
  bool empty = true;
  on([&] { empty = Use(objOldResultsDOM).DocumentElement().FirstChild().IsNull(); });
  if (empty) return;
  xml::Node root = objOldResultsDOM->DocumentElement();
  lngComputerCounter = HighestId(on, root, vocab::c);
  lngDriveCounter = HighestId(on, root, vocab::m);
  lngFolderCounter = HighestId(on, root, vocab::d);
}

void Merge::CountApplications() {
  OnError on{kClass, merge::kStartLabel};
  e_match_total_new = e_match_total_old = e_match_merged = e_match_missing = 0;
  on([&] {
    e_match_total_new =
        ToInt32(static_cast<double>(CountEveryElement(*objNewResultsDOM, vocab::a)));
  });
  on([&] {
    e_match_total_old =
        ToInt32(static_cast<double>(CountEveryElement(*objOldResultsDOM, vocab::a)));
  });
}

void Merge::RunBody() { Run(); }

void Merge::Run() {
  OnError on{kClass, merge::kMergeLabel};
  BeginRun(on);
  MergeResults();
  SettleStatus();
  EndRun(on);
}

void Merge::MergeResults() {
  OnError on{kClass, merge::kMergeLabel};
  Defaults defaults;
  xml::Node oldRoot;
  on([&] { oldRoot = objOldResultsDOM->DocumentElement(); });
  on([&] {
    defaults.update = FixNulls(oldRoot.GetAttribute(vocab::a_update_q), std::string("1"));
  });
  on([&] { defaults.dupes = FixNulls(oldRoot.GetAttribute(vocab::a_dupes_q), std::string("1")); });
  MissingApplicationsRefresh();
  MissingApplicationsSearch();

  std::vector<xml::Node> computers;
  on([&] { computers = EveryElement(*objNewResultsDOM, vocab::c); });
  // A find-or-add that fails leaves the element it last gave in use, as a failed step does. What
  // a find-or-add adds is numbered from its counter, which tells a sequence what joined the tree.
  xml::Node oldComputer, oldDrive, oldFolder;
  auto findOrAdd = [&](xml::Node& element, int32_t& counter, const auto& add) {
    int32_t before = counter;
    on([&] { element = add(); });
    if (sequence_ && counter != before) on([&] { NoteAdded(element); });
  };
  bool going = true;
  // A computer can stand inside an application that is moved to the user data.
  VisitRemaining(computers, vocab::c, [&](const xml::Node& c) {
    findOrAdd(oldComputer, lngComputerCounter, [&] {
      return Use(objSchema).AddComputer(TextOf(c, vocab::c_text), TextOf(c, vocab::c_name), oldRoot,
                                        lngComputerCounter);
    });
    if (sequence_ && oldComputer) sequence_->touched.push_back(oldComputer);
    std::vector<xml::Node> drives;
    on([&] { drives = c.ChildElements(vocab::m); });
    for (size_t mi = 0; going && mi < drives.size(); ++mi) {
      const xml::Node& m = drives[mi];
      findOrAdd(oldDrive, lngDriveCounter, [&] {
        return Use(objSchema).AddDrive(TextOf(m, vocab::m_text), TextOf(m, vocab::m_name),
                                       oldComputer, lngDriveCounter);
      });
      std::vector<xml::Node> folders;
      on([&] { folders = m.ChildElements(vocab::d); });
      for (size_t di = 0; going && di < folders.size(); ++di) {
        const xml::Node& d = folders[di];
        findOrAdd(oldFolder, lngFolderCounter, [&] {
          return Use(objSchema).AddFolder(TextOf(d, vocab::d_text), TextOf(d, vocab::d_name),
                                          oldDrive, lngFolderCounter);
        });
        going = MergeFolder(d, oldFolder, defaults);
      }
    }
    return going;
  });
}

bool Merge::MergeFolder(xml::Node newFolder, xml::Node oldFolder, const Defaults& defaults) {
  OnError on{kClass, merge::kMergeLabel};
  std::vector<xml::Node> applications;
  on([&] { applications = newFolder.ChildElements(vocab::a); });
  std::string name;
  for (const xml::Node& a : applications) {
    // Read first, and only for the progress report: the merge moves the element away.
    if (Asynchronous()) on([&] { name = TextOf(a, vocab::a_name); });
    MergeApplication(a, oldFolder, defaults);
    on([&] { e_match_merged = CheckedAdd(e_match_merged, 1); });
    RaiseApplicationProgress(name);
    if (status_ == kStatusCancelled) return false;
  }
  return true;
}

void Merge::RaiseApplicationProgress(const std::string& name) {
  Progress(OnError{kClass, merge::kMergeLabel}, [&](xml::Node e) {
    e.SetAttribute(vocab::a_name, name);
    AddStatusCounters(e);
  });
}

std::string Merge::ResultText() { return Use(objOldResultsDOM).DocumentElement().Xml(); }

xml::DocumentPtr Merge::ResultsDocument() { return objOldResultsDOM; }

void Merge::AddStatusCounters(xml::Node e) {
  e.SetAttribute(vocab::e_match_total_new, std::to_string(e_match_total_new));
  e.SetAttribute(vocab::e_match_total_old, std::to_string(e_match_total_old));
  e.SetAttribute(vocab::e_match_merged, std::to_string(e_match_merged));
  e.SetAttribute(vocab::e_match_missing, std::to_string(e_match_missing));
}

void Merge::ReleaseDocuments() {
  newPlaces_.reset();
  oldPlaces_.reset();
  missingList_ = xml::Node();
  objNewResultsDOM.reset();
  objOldResultsDOM.reset();
  objSearchOptionsDOM.reset();
  objApplicationOptionsDOM.reset();
}

bool Merge::BeginSequence(xml::DocumentPtr applicationOptions, xml::DocumentPtr oldResults) {
  if (sequence_ || status_ == kStatusStarted || status_ == kStatusRunning) return false;
  OnError on{kClass, merge::kStartLabel};
  sequence_ = std::make_unique<Sequence>();
  sequence_->asynchronous = Asynchronous();
  Asynchronous(false);
  status_ = kStatusRunning;
  objApplicationOptionsDOM =
      applicationOptions ? applicationOptions : std::make_shared<xml::Document>();
  objOldResultsDOM = oldResults;
  on([&] {
    if (!objOldResultsDOM) objOldResultsDOM = EmptyResults();
  });
  newPlaces_.reset();
  oldPlaces_.reset();
  missingList_ = xml::Node();
  on([&] {
    sequence_->ids = std::make_unique<merge::IdLedger>(on, Use(objOldResultsDOM).DocumentElement());
  });
  on([&] { UpgradeUserData(Use(objOldResultsDOM)); });
  e_match_total_new = e_match_merged = e_match_missing = 0;
  on([&] {
    e_match_total_old =
        ToInt32(static_cast<double>(CountEveryElement(*objOldResultsDOM, vocab::a)));
  });
  return true;
}

void Merge::MergeNext(xml::DocumentPtr searchOptions, xml::DocumentPtr newResults) {
  if (!sequence_) return;
  OnError on{kClass, merge::kStartLabel};
  objSearchOptionsDOM = searchOptions ? searchOptions : std::make_shared<xml::Document>();
  objNewResultsDOM = newResults;
  on([&] {
    if (!objNewResultsDOM) objNewResultsDOM = EmptyResults();
  });
  newPlaces_.reset();
  // The upgrade a Start gives the whole of the old results changes only the place keys of the
  // applications the run before moved in, which still carry those of the results they came from.
  std::unordered_set<const void*> upgraded;
  for (const xml::Node& c : sequence_->touched) {
    if (upgraded.insert(c.Id()).second) UpgradeComputer(c);
  }
  sequence_->touched.clear();
  lngComputerCounter = lngDriveCounter = lngFolderCounter = 0;
  on([&] {
    lngComputerCounter = Use(sequence_->ids).Highest(vocab::c);
    lngDriveCounter = sequence_->ids->Highest(vocab::m);
    lngFolderCounter = sequence_->ids->Highest(vocab::d);
  });
  on([&] { UpgradeUserData(Use(objNewResultsDOM)); });
  on([&] {
    e_match_total_new =
        CheckedAdd(e_match_total_new,
                   ToInt32(static_cast<double>(CountEveryElement(*objNewResultsDOM, vocab::a))));
  });
  MergeResults();
  objNewResultsDOM.reset();
  objSearchOptionsDOM.reset();
}

void Merge::EndSequence() {
  if (!sequence_) return;
  status_ = kStatusComplete;
  Asynchronous(sequence_->asynchronous);
  sequence_.reset();
  ReleaseDocuments();
}

void Merge::NoteRemoving(const xml::Node& node) {
  if (oldPlaces_) oldPlaces_->Removing(node);
  if (sequence_ && sequence_->ids) sequence_->ids->Removing(node);
}

void Merge::NoteAdded(const xml::Node& node) {
  if (oldPlaces_) oldPlaces_->Added(node);
  if (sequence_ && sequence_->ids) sequence_->ids->Added(node);
}

}  // namespace trl
