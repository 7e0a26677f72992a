// Planning the reads ahead of the match: the walk the match makes over applications, versions,
// files and candidates, made a little ahead of it and without a report of its own. Whatever fails
// here is left to the match, which meets the same failure where it always did and reports it; a
// file's existence and handle, learnt here, are replayed to the match as they were learnt.

#include <utility>

#include "compare/candidates.h"
#include "compare/file_facts.h"
#include "compare/fingerprint_file.h"
#include "compare/local_file_index.h"
#include "compare/local_files.h"
#include "compare/read_ahead.h"
#include "compare/read_plan.h"
#include "frame/attributes.h"
#include "frame/every_element.h"
#include "frame/use_object.h"
#include "frame/vocabulary.h"
#include "platform/fs/file_system.h"
#include "platform/text.h"
#include "schema/schema.h"
#include "trl/compare.h"

namespace trl {
namespace {

// Files planned but begun by no thread yet: enough to keep every thread busy while the match
// moves through files it need not read, few enough to hold little.
constexpr size_t kReadWindow = 128;
// Files planned before the fingerprint is prepared: enough to keep every thread busy meanwhile.
constexpr size_t kEarlyWindow = 4096;
// Fingerprint files planned at a time, so that a large application is planned as it is matched.
constexpr int kPlanStep = 16;

}  // namespace

void Compare::StartReadAhead(const std::vector<xml::Node>& applications) {
  StopReadAhead();
  if (readThreads_ == 0 || !objFSO || !objSchema || !rsLocalFiles) return;
  readPlan_ = std::make_unique<ReadPlan>();
  readPlan_->applications = applications;
  readAhead_ = std::make_unique<ReadAhead>(*objSchema, readThreads_, kReadWindow,
                                           [this] { return PlanMoreReads(); });
  readAhead_->KeepAhead();
}

void Compare::StartReadAheadEarly(const std::function<void()>& upgrade) {
  // Whatever way this goes, the fingerprint is upgraded once: while other threads read the
  // local files when that is how they are indexed, else once reading ahead has begun.
  bool upgraded = false;
  auto upgradeOnce = [&] {
    if (!std::exchange(upgraded, true)) upgrade();
  };
  if (readThreads_ == 0 || !objFSO || !objSchema) return upgradeOnce();
  std::vector<xml::Node> applications;
  auto index = std::make_unique<LocalFileIndex>();
  size_t files = 0;
  try {
    applications = EveryElement(*objFingerprintDOM, vocab::a);
    files = CountEveryElement(*objLocalFilesDOM, vocab::f);
    if (files == 0) return upgradeOnce();
    KeepOnlyAskedNames(*index, files);
    index->Reserve(files);
    // Filtered, the local files are another document than the fingerprint (one document given as
    // both has as many files as the fingerprint): the upgrade can write while they are read.
    bool filled = index->Filtered() ? TryFillFilteredIndex(*objLocalFilesDOM, *index, upgradeOnce)
                                    : TryFillLocalFileIndex(*objLocalFilesDOM, *index);
    if (!filled) return upgradeOnce();
  } catch (...) {
    return upgradeOnce();  // the run meets the failure again, and reports it
  }
  objFSO->Forget();
  rsLocalFiles = std::move(index);
  indexBuiltEarly_ = true;
  localFilesChanges_ = objLocalFilesDOM->ModificationCount();
  localFilesCount_ = files;
  StartReadAhead(applications);
  readAhead_->KeepAhead(kEarlyWindow);
  upgradeOnce();
}

void Compare::StopReadAhead() {
  readAhead_.reset();
  readPlan_.reset();
}

bool Compare::PlanMoreReads() {
  ReadPlan& plan = *readPlan_;
  for (int step = 0; step < kPlanStep; ++step) {
    while (plan.nextFile == plan.files.size()) {
      if (plan.nextApplication == plan.applications.size()) return false;
      plan.files = PlannableFiles(plan.applications[plan.nextApplication++]);
      plan.nextFile = 0;
    }
    PlanFileReads(plan.files[plan.nextFile++]);
  }
  return true;
}

std::vector<xml::Node> Compare::PlannableFiles(const xml::Node& a) const {
  std::vector<xml::Node> files;
  try {
    if (!objSchema->IsApplicationSelected(a, *objApplicationOptionsDOM)) return files;
    for (const xml::Node& v : a.GetElementsByTagName(vocab::v)) {
      std::vector<xml::Node> ofVersion = v.GetElementsByTagName(vocab::f);
      files.insert(files.end(), ofVersion.begin(), ofVersion.end());
    }
  } catch (...) {
    // Left to the match, which reports it.
  }
  return files;
}

void Compare::PlanFileReads(const xml::Node& f) {
  ReadPlan& plan = *readPlan_;
  try {
    std::string spelled = TextOf(f, vocab::f_name);
    plan.candidates.clear();
    std::string key = objSchema->EncodeName(LowerCase(spelled));
    if (!rsLocalFiles->Covers(key)) return;  // the match widens the index first
    for (LocalFileRecord record : rsLocalFiles->Find(key)) {
      plan.candidates.push_back(record);
    }
    if (plan.candidates.empty()) return;
    FingerprintFile file(f);
    unsigned wanted = 0;
    for (const FingerprintFile::Property& property : file.Properties()) {
      if (property.kind == ReadAhead::kVersion || property.kind == ReadAhead::kDigest) {
        wanted |= 1u << property.kind;
      }
    }
    if (wanted == 0) return;
    for (size_t i = 0; i < plan.candidates.size(); ++i) {
      CandidatePlaces(file.Fit(), *rsLocalFiles, plan.candidates[i], plan.places);
      if (plan.places.empty() || SpeltOtherwiseHere(plan.candidates, i, spelled)) continue;
      PlanPathReads(CandidatePath(plan.candidates[i]), wanted);
    }
  } catch (...) {
    // Left to the match, which reports it.
  }
}

void Compare::PlanPathReads(const std::string& path, unsigned wanted) {
  auto& seen = filesSeen_[path];
  if (!seen) seen = std::make_unique<LocalFileFacts>();
  LocalFileFacts& facts = *seen;
  if (facts.version.Settled()) wanted &= ~(1u << ReadAhead::kVersion);
  if (facts.digest.Settled()) wanted &= ~(1u << ReadAhead::kDigest);
  if (wanted == 0) return;
  if (facts.planned) {
    // Too late when a thread has begun it: the match then reads the kind added itself.
    readAhead_->Widen(*facts.planned, wanted);
    return;
  }
  try {
    if (!facts.exists.Settled()) {
      // The match asks whether the file is there, then for it: one lookup answers both.
      std::unique_ptr<fs::File> found = objFSO->FileIfExists(path);
      bool there = found != nullptr;
      facts.exists.Get([&] { return there; });
      if (there) facts.file.Get([&] { return std::move(found); });
    }
    if (!facts.exists.Get([&] { return objFSO->FileExists(path); })) return;
    const fs::File* file = facts.file.Get([&] { return objFSO->GetFile(path); }).get();
    if (!file || !file->OpensOnAnyThread()) return;
    facts.planned = readAhead_->Plan(*file, wanted);
  } catch (...) {
    // Kept by the facts, and reported when the match asks.
  }
}

std::string Compare::ReadLocalValue(LocalFileFacts& facts, const fs::File& file, int16_t kind) {
  if (readAhead_) {
    readAhead_->KeepAhead();
    if (std::shared_ptr<ReadAhead::Planned> planned = facts.planned) {
      bool exhausted = false;
      std::string value = readAhead_->Take(*planned, kind, exhausted);
      if (exhausted) facts.planned.reset();
      return value;
    }
  }
  const Schema& schema = Use(objSchema);
  return kind == ReadAhead::kVersion ? schema.ReadPropertyType1(file)
                                     : schema.ReadPropertyType3(file);
}

}  // namespace trl
