#include "trl/worker.h"

#include <cstdio>
#include <exception>
#include <string>

#include "frame/error_handler.h"
#include "frame/vocabulary.h"
#include "platform/event_loop.h"
#include "platform/fs/long_read.h"

namespace trl {

Worker::Worker(std::string_view className, int32_t mode)
    : className_(className), mode_(mode), progress_(std::make_unique<xml::Document>()) {}

Worker::~Worker() {
  brxTicker_.reset();  // a worker released before its tick never runs
  ReleaseSharedReporter();
}

void Worker::Cancel() {
  if (status_ == kStatusRunning) status_ = kStatusCancelled;
}

std::string Worker::StartFrame(const std::function<void()>& prepare) {
  std::string result;
  LastResort([&] { result = StartSteps(prepare); });
  return result;
}

std::string Worker::StartSteps(const std::function<void()>& prepare) {
  OnError on{className_, "Start"};
  if (status_ == kStatusCancelled) {
    status_ = kStatusIdle;
  } else if (status_ != kStatusIdle && status_ != kStatusComplete) {
    return "";
  }
  ++generation_;
  progress_ = std::make_unique<xml::Document>();
  prepare();

  if (asynchronous_) {
    status_ = kStatusStarted;
    on([&] { RaiseStatusUpdate(); });
    if (YieldsInStart()) on([&] { Yield(); });
    on([&] { ArmTicker(); });
    TickerArmed();
    return "";
  }
  std::string result;
  RunBody();
  on([&] { result = ResultText(); });
  status_ = kStatusComplete;
  on([&] { ReleaseDocuments(); });
  return result;
}

void Worker::ArmTicker() {
  brxTicker_ = std::make_unique<Timer>([this] { brxTicker_Tick(); });
  brxTicker_->Interval(50);
  brxTicker_->Enabled(true);
}

void Worker::brxTicker_Tick() {
  LastResort([&] { TickSteps(); });
}

void Worker::TickSteps() {
  OnError on{className_, "brxTicker_Tick"};
  // The timer is released on a later pass: this call runs inside its own Tick, and a client may
  // start this worker again from the run's last event, arming a new one.
  auto ticker = std::shared_ptr<Timer>(std::move(brxTicker_));
  on([&] {
    ticker->Interval(0);
    ticker->Enabled(false);
  });
  on([&] { EventLoop::Current().Post([ticker] {}); });
  // A client's cancel reaches the run inside a long read of one file too.
  fs::LongReadPoll poll([this] {
    YieldIfAsynchronous(OnError{className_, "brxTicker_Tick"});
    return status_ == kStatusCancelled;
  });
  if (status_ == kStatusStarted) RunBody();
}

void Worker::BeginRun(const OnError& on) {
  status_ = kStatusRunning;
  if (!asynchronous_) return;
  on([&] { RaiseStatusUpdate(); });
  on([&] { Yield(); });
}

void Worker::Progress(const OnError& on, const std::function<void(xml::Node e)>& fill) {
  if (!asynchronous_) return;
  on([&] { RaiseProgressUpdate(fill); });
  on([&] { Yield(); });
}

void Worker::YieldIfAsynchronous(const OnError& on) {
  if (asynchronous_) on([&] { Yield(); });
}

bool Worker::SettleStatus() {
  if (status_ == kStatusCancelled) return true;
  status_ = kStatusComplete;
  return false;
}

void Worker::EndRun(const OnError& on) {
  if (!asynchronous_) return;
  uint64_t generation = generation_;
  on([&] { RaiseStatusUpdate(true); });
  on([&] { Yield(); });
  // A client that started this worker again from the last event owns the documents now.
  if (generation == generation_) on([&] { ReleaseDocuments(); });
}

xml::Node Worker::NewProgressElement() {
  xml::Node e = progress_->SetDocumentElement(progress_->CreateElement(vocab::e));
  e.SetAttribute(vocab::e_mode, std::to_string(mode_));
  e.SetAttribute(vocab::e_status, std::to_string(status_));
  return e;
}

void Worker::RaiseStatusUpdate(bool last) {
  if (!asynchronous_) return;
  AddStatusCounters(NewProgressElement());
  RaiseStatusUpdate(progress_->Xml(), ResultsDocument(), last && OwnsResults());
}

void Worker::RaiseStatusUpdate(const std::string& update, const xml::DocumentPtr& results,
                               bool handedOver) {
  if (!asynchronous_) return;
  if (statusUpdate_) statusUpdate_(update, results ? results->Xml() : std::string());
  if (statusDocument_) statusDocument_(update, results, handedOver);
}

void Worker::RaiseProgressUpdate(const std::string& update) {
  if (asynchronous_ && progressUpdate_) progressUpdate_(update);
}

void Worker::RaiseProgressUpdate(const std::function<void(xml::Node e)>& fill) {
  // Nobody listening: the report is not even built (a walk reports every folder).
  if (!asynchronous_ || !ProgressObserved()) return;
  fill(NewProgressElement());
  RaiseProgressUpdate(progress_->Xml());
}

void Worker::LastResort(const std::function<void()>& steps) {
  try {
    steps();
  } catch (const std::exception& error) {
    // Only a reporter that cannot report gets here: nothing is left to tell but the console.
    std::fprintf(stderr, "trlLocator: %s: %s\n", className_.c_str(), error.what());
  } catch (...) {
    std::fprintf(stderr, "trlLocator: %s: unexpected failure\n", className_.c_str());
  }
}

bool Worker::RunCreation(const std::function<void()>& create) {
  return OnError{className_, "Class_Initialize"}(create);
}

void Worker::ReportCreationFailure(std::string_view progId) {
  OnError{className_, "Class_Initialize"}([&] {
    Raise(kErrUnableToCreate, "Unable to create an instance of " + std::string(progId), className_,
          "Class_Initialize");
  });
}

}  // namespace trl
