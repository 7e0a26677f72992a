#include "trl/locate.h"

#include "frame/error_handler.h"
#include "frame/use_object.h"
#include "frame/vocabulary.h"
#include "locate/locate_names.h"
#include "locate/stage.h"
#include "platform/fs/file_system.h"
#include "reporter/reporter.h"
#include "trl/compare.h"
#include "trl/filter.h"
#include "trl/merge.h"
#include "trl/search.h"

namespace trl {

using locate::kClass;
using locate::kStartLabel;

namespace {

constexpr int32_t kLocateMode = 0;

}  // namespace

Locate::Locate() : Locate(nullptr, nullptr) {}

Locate::Locate(std::unique_ptr<fs::FileSystem> searchFileSystem,
               std::unique_ptr<fs::FileSystem> compareFileSystem)
    : Locate(searchFileSystem ? std::make_unique<Search>(std::move(searchFileSystem))
                              : std::make_unique<Search>(),
             compareFileSystem ? std::make_unique<Compare>(std::move(compareFileSystem))
                               : std::make_unique<Compare>(),
             std::make_unique<Filter>(), std::make_unique<Merge>()) {}

Locate::Locate(std::unique_ptr<Search> search, std::unique_ptr<Compare> compare,
               std::unique_ptr<Filter> filter, std::unique_ptr<Merge> merge)
    : Worker(kClass, kLocateMode) {
  trlSearch = CreateService<Search>("trlLocator.Search", [&] { return std::move(search); });
  trlCompare = CreateService<Compare>("trlLocator.Compare", [&] { return std::move(compare); });
  trlFilter = CreateService<Filter>("trlLocator.Filter", [&] { return std::move(filter); });
  trlMerge = CreateService<Merge>("trlLocator.Merge", [&] { return std::move(merge); });

  stages_[0] = std::make_unique<Stage>(locate::kSearchStage, trlSearch.get(), &searchResults_);
  stages_[1] = std::make_unique<Stage>(locate::kCompareStage, trlCompare.get(), &compareResults_);
  stages_[2] = std::make_unique<Stage>(locate::kFilterStage, trlFilter.get(), &filterResults_);
  stages_[3] = std::make_unique<Stage>(locate::kMergeStage, trlMerge.get(), &mergeResults_);
  for (auto& stage : stages_) SubscribeTo(*stage);

  reporter_ = CreateService<Reporter>("trlReporter.Reporter", [] {
    auto reporter = std::make_unique<Reporter>();
    reporter->DefaultAction(kActionIgnore);
    reporter->LogFileName("");
    reporter->MaxEvents(2);
    reporter->Echo(false);
    reporter->LogMode(0);
    return reporter;
  });
}

Locate::~Locate() = default;

void Locate::Cancel() {
  OnError on{kClass, "Cancel"};
  if (status_ != kStatusRunning) return;
  for (auto& stage : stages_) {
    if (stage->names.mode == stageMode_) on([&] { Use(stage->worker).Cancel(); });
  }
}

std::string Locate::Start(xml::DocumentPtr searchOptions, xml::DocumentPtr applicationOptions,
                          int16_t filterOptions, xml::DocumentPtr fingerprint,
                          xml::DocumentPtr userData) {
  stageMode_ = kNoStage;
  return StartFrame(
      [&] { Prepare(searchOptions, applicationOptions, filterOptions, fingerprint, userData); });
}

void Locate::Prepare(xml::DocumentPtr& searchOptions, xml::DocumentPtr& applicationOptions,
                     int16_t filterOptions, xml::DocumentPtr& fingerprint,
                     xml::DocumentPtr& userData) {
  OnError on{kClass, kStartLabel};
  logging_ = !logFile_.empty();
  if (logging_) {
    on([&] { Use(reporter_.get()).LogFileName(logFile_); });
    xml::Document empty;
    std::string header =
        OptionsHeader(Asynchronous(), filterOptions, searchOptions ? *searchOptions : empty,
                      applicationOptions ? *applicationOptions : empty);
    Log(header, kStartLabel);
  }

  for (xml::DocumentPtr* document :
       {&searchOptions_, &applicationOptions_, &fingerprint_, &userData_, &searchResults_,
        &compareResults_, &filterResults_, &mergeResults_, &progressDocument_, &events_}) {
    *document = std::make_shared<xml::Document>();
  }
  Log("Created XML DOM objects", kStartLabel);

  if (searchOptions) searchOptions_ = searchOptions;
  if (applicationOptions) applicationOptions_ = applicationOptions;
  if (fingerprint) fingerprint_ = fingerprint;
  Log("Assigned XML DOM data", kStartLabel);

  if (!userData) {
    on([&] { userData_->SetDocumentElement(userData_->CreateElement(vocab::results_root)); });
    Log("Created new results XML DOM", kStartLabel);
  } else {
    userData_ = userData;
    Log("Assigned results XML DOM data", kStartLabel);
  }

  on([&] { events_->SetDocumentElement(events_->CreateElement(vocab::events)); });
  filterOptions_ = filterOptions;
  for (Worker* stage : std::initializer_list<Worker*>{trlSearch.get(), trlCompare.get(),
                                                      trlFilter.get(), trlMerge.get()}) {
    on([&] { Use(stage).Asynchronous(Asynchronous()); });
  }
  Log("Assigned options", kStartLabel);

  ProgressMode(stageMode_);
  reported_ = &searchResults_;
}

void Locate::TickerArmed() { Log("Timer started...", kStartLabel); }

void Locate::RunBody() { SearchBegin(); }

std::string Locate::ResultText() {
  std::string text;
  OnError{kClass, kStartLabel}([&] { text = mergeResults_->DocumentElement().Xml(); });
  return text;
}

xml::DocumentPtr Locate::ResultsDocument() { return reported_ ? *reported_ : nullptr; }

void Locate::ReleaseDocuments() {
  searchResults_.reset();
  compareResults_.reset();
  filterResults_.reset();
  mergeResults_.reset();
  reported_ = nullptr;
}

void Locate::SearchBegin() {
  Begin(*stages_[0], [&] {
    return Use(trlSearch.get()).Start(searchOptions_, applicationOptions_, fingerprint_);
  });
}

void Locate::CompareBegin() {
  Begin(*stages_[1], [&] {
    return Use(trlCompare.get()).Start(applicationOptions_, searchResults_, fingerprint_);
  });
}

void Locate::FilterBegin() {
  Begin(*stages_[2], [&] { return Use(trlFilter.get()).Start(filterOptions_, compareResults_); });
}

void Locate::MergeBegin() {
  Begin(*stages_[3], [&] {
    return Use(trlMerge.get())
        .Start(searchOptions_, applicationOptions_, userData_, filterResults_);
  });
}

void Locate::Begin(Stage& stage, const std::function<std::string()>& start) {
  const locate::StageNames& names = stage.names;
  OnError on{kClass, names.beginLabel};
  stageMode_ = names.mode;
  status_ = kStatusIdle;
  Log(names.about, names.beginLabel);
  std::string text;
  on([&] { text = start(); });
  on([&] { Use(stage.results->get()).LoadXml(text); });
  if (Asynchronous()) return;
  Log(names.complete, names.beginLabel);
  Next(stage);
}

void Locate::Next(const Stage& stage) {
  switch (stage.names.mode) {
    case locate::kSearchStage.mode:
      CompareBegin();
      break;
    case locate::kCompareStage.mode:
      FilterBegin();
      break;
    case locate::kFilterStage.mode:
      MergeBegin();
      break;
    default:
      Finalise();
  }
}

void Locate::End(Stage& stage) {
  const locate::StageNames& names = stage.names;
  OnError on{kClass, names.endLabel};
  Log(names.complete, names.endLabel);
  on([&] { AddEvents(names.eventList, Use(stage.results->get()), *events_); });
  Next(stage);
}

void Locate::Finalise() {
  OnError on{kClass, "Finalise"};
  stageMode_ = kFinished;
  status_ = kStatusComplete;
  on([&] { mergeResults_->DocumentElement().AppendChild(events_->DocumentElement()); });
  if (Asynchronous()) {
    ProgressMode(stageMode_);
    reported_ = &mergeResults_;
    on([&] { RaiseStatusUpdate(); });
  }
  Log("Locate process complete", "Finalise");
}

void Locate::Log(std::string_view message, std::string_view label) {
  if (logging_) LogEvent(message, label);
}

void Locate::LogEvent(std::string_view message, std::string_view label) {
  OnError{kClass, "LogEvent"}([&] {
    Use(reporter_.get())
        .Report(0, message, Reporter::kLog, kComponentName, kClass, label, true, true, "", 0);
  });
  ShowObserver({0, message, Reporter::kLog, kClass, label, {}});
}

}  // namespace trl
