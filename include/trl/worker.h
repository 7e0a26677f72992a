#pragma once

#include <cstdint>
#include <functional>
#include <memory>
#include <string>
#include <string_view>

#include "trl/export.h"
#include "trl/xml.h"

namespace trl {

class OnError;
class Timer;

// Worker status values, the same in every class.
inline constexpr int16_t kStatusIdle = 0;
inline constexpr int16_t kStatusStarted = 1;  // asynchronous Start made, waiting for the tick
inline constexpr int16_t kStatusRunning = 2;
inline constexpr int16_t kStatusComplete = 3;
inline constexpr int16_t kStatusCancelled = 255;

// What every worker class shares: Start runs the whole job at once (synchronous) or on a timer tick
// a moment later (asynchronous, the default) while the client follows StatusUpdate and
// ProgressUpdate; Status tells where the run stands and Cancel stops a running one. No failure ever
// leaves a public member: failures are reported to the thread's reporter and the work goes on.
// A client must not destroy a worker from inside one of that worker's events.
class TRL_API Worker {
 public:
  using StatusUpdateHandler =
      std::function<void(const std::string& strUpdateXML, const std::string& strResultsXML)>;
  using ProgressUpdateHandler = std::function<void(const std::string& strUpdateXML)>;
  // StatusUpdate with the results document itself instead of its text, for a host that relays the
  // results or needs their text only at the end. `handedOver` is true at the last report of a run
  // when the document is the worker's own: the worker lets go of it right after, so the handler
  // may keep it instead of a copy.
  using StatusDocumentHandler = std::function<void(
      const std::string& strUpdateXML, const xml::DocumentPtr& results, bool handedOver)>;

  virtual ~Worker();
  Worker(const Worker&) = delete;
  Worker& operator=(const Worker&) = delete;

  bool Asynchronous() const { return asynchronous_; }
  void Asynchronous(bool fAsynchronous) { asynchronous_ = fAsynchronous; }
  int16_t Status() const { return status_; }
  // Asks a running worker to stop at its next check; has no effect in any other state.
  virtual void Cancel();

  // Events, raised only while Asynchronous is true.
  void OnStatusUpdate(StatusUpdateHandler handler) { statusUpdate_ = std::move(handler); }
  void OnStatusDocument(StatusDocumentHandler handler) { statusDocument_ = std::move(handler); }
  void OnProgressUpdate(ProgressUpdateHandler handler) { progressUpdate_ = std::move(handler); }
  // A handler that passes reports on: `followed` tells, at each report, whether anyone is
  // following them further, so that nobody's reports are not even built.
  void OnProgressUpdate(ProgressUpdateHandler handler, std::function<bool()> followed) {
    progressUpdate_ = std::move(handler);
    progressFollowed_ = std::move(followed);
  }
  bool ProgressObserved() const {
    return progressUpdate_ && (!progressFollowed_ || progressFollowed_());
  }

 protected:
  Worker(std::string_view className, int32_t mode);

  std::string_view ClassName() const { return className_; }

  // The frame of Start around the class's preparation: the entry rule, then either the timer
  // hand-off (asynchronous) or the whole run and its result (synchronous).
  std::string StartFrame(const std::function<void()>& prepare);

  // What each class adds.
  virtual void RunBody() = 0;
  virtual std::string ResultText() = 0;  // the result of a synchronous Start
  virtual xml::DocumentPtr
  ResultsDocument() = 0;  // its text is the second argument of StatusUpdate
  // Whether the results document is made by the run itself rather than lent by the caller.
  virtual bool OwnsResults() const { return false; }
  virtual void AddStatusCounters(xml::Node e) = 0;
  virtual void ReleaseDocuments() = 0;
  virtual bool YieldsInStart() const { return true; }
  // Called by the asynchronous Start right after it armed the ticker.
  virtual void TickerArmed() {}

  // Pieces of a run body, reported under the body's own label.
  void BeginRun(const OnError& on);  // status 2, first report
  // A progress report: a new `e` with e_mode and e_status, completed by `fill`.
  void Progress(const OnError& on, const std::function<void(xml::Node e)>& fill);
  void YieldIfAsynchronous(const OnError& on);
  // Status 3 unless cancelled; returns whether the run was cancelled.
  bool SettleStatus();
  void EndRun(const OnError& on);  // last report, then the run's documents are released

  // Raised only when asynchronous. `last`: the run's last report, after which the run lets go of
  // its documents.
  void RaiseStatusUpdate(bool last = false);
  void RaiseProgressUpdate(const std::function<void(xml::Node e)>& fill);
  xml::Node NewProgressElement();
  // The same with a report made elsewhere (a relay of another worker's reports).
  void RaiseStatusUpdate(const std::string& update, const xml::DocumentPtr& results,
                         bool handedOver = false);
  void RaiseProgressUpdate(const std::string& update);
  // The e_mode of the progress elements this worker makes from now on.
  void ProgressMode(int32_t mode) { mode_ = mode; }

  // Creates a service object at instance creation; a creation that fails is reported, then
  // reported again as "Unable to create an instance of <progId>", and the worker lives without it.
  template <class T, class Factory>
  std::unique_ptr<T> CreateService(std::string_view progId, Factory factory);

  int16_t status_ = kStatusIdle;

 private:
  std::string StartSteps(const std::function<void()>& prepare);
  void ArmTicker();
  void brxTicker_Tick();
  void TickSteps();
  // Keeps any failure, even one of the reporter itself, from leaving a public member or a tick.
  void LastResort(const std::function<void()>& steps);
  void ReportCreationFailure(std::string_view progId);
  bool RunCreation(const std::function<void()>& create);

  std::string className_;
  int32_t mode_;
  bool asynchronous_ = true;
  uint64_t generation_ = 0;  // counts Start calls that got past the entry rule
  std::unique_ptr<Timer> brxTicker_;
  std::unique_ptr<xml::Document> progress_;
  StatusUpdateHandler statusUpdate_;
  StatusDocumentHandler statusDocument_;
  ProgressUpdateHandler progressUpdate_;
  std::function<bool()> progressFollowed_;
};

template <class T, class Factory>
std::unique_ptr<T> Worker::CreateService(std::string_view progId, Factory factory) {
  std::unique_ptr<T> object;
  RunCreation([&] { object = factory(); });
  if (!object) ReportCreationFailure(progId);
  return object;
}

}  // namespace trl
