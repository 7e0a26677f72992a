#include "trl/worker.h"

#include <gtest/gtest.h>

#include <chrono>
#include <memory>
#include <string>
#include <vector>

#include "frame/error_handler.h"
#include "platform/event_loop.h"
#include "platform/failure.h"
#include "support/reported_events.h"
#include "trl/xml.h"

namespace trl {
namespace {

using namespace std::chrono_literals;

// A worker whose run makes `steps` progress reports, stopping early when cancelled.
class TestWorker : public Worker {
 public:
  explicit TestWorker(int steps = 3) : Worker("TestWorker", 7), steps_(steps) {}

  std::string Start() {
    return StartFrame([this] {
      results_ = std::make_unique<xml::Document>();
      results_->SetDocumentElement(results_->CreateElement("results"));
      done_ = 0;
    });
  }

  int runs = 0;
  std::function<void(int step)> onStep;

 protected:
  void RunBody() override {
    OnError on{ClassName(), "Run"};
    ++runs;
    BeginRun(on);
    for (int i = 0; i < steps_ && status_ != kStatusCancelled; ++i) {
      ++done_;
      if (onStep) onStep(i);
      Progress(on, [&](xml::Node e) { e.SetAttribute("e_step", std::to_string(i)); });
    }
    if (SettleStatus()) results_->DocumentElement().SetAttribute("cancelled", "1");
    EndRun(on);
  }
  std::string ResultText() override { return results_->DocumentElement().Xml(); }
  std::string ResultsXml() override { return results_ ? results_->Xml() : ""; }
  void AddStatusCounters(xml::Node e) override { e.SetAttribute("e_done", std::to_string(done_)); }
  void ReleaseDocuments() override { results_.reset(); }

 private:
  int steps_;
  int done_ = 0;
  std::unique_ptr<xml::Document> results_;
};

// What the client saw: "S<status>" per StatusUpdate and "P<step>" per ProgressUpdate.
struct Recorder {
  std::vector<std::string> events;
  std::string lastResults;
  std::string lastUpdate;

  void Attach(Worker& worker) {
    worker.OnStatusUpdate([this](const std::string& update, const std::string& results) {
      xml::Document e;
      EXPECT_TRUE(e.LoadXml(update));
      EXPECT_EQ(e.DocumentElement().GetAttribute("e_mode"), "7");
      events.push_back("S" + e.DocumentElement().GetAttribute("e_status").value_or("?"));
      lastResults = results;
      lastUpdate = update;
    });
    worker.OnProgressUpdate([this](const std::string& update) {
      xml::Document e;
      EXPECT_TRUE(e.LoadXml(update));
      events.push_back("P" + e.DocumentElement().GetAttribute("e_step").value_or("?"));
    });
  }
};

bool RunUntilSettled(Worker& worker) {
  return EventLoop::Current().RunUntil(
      [&] { return worker.Status() == kStatusComplete || worker.Status() == kStatusCancelled; },
      5s);
}

TEST(WorkerTest, SynchronousStartRunsAtOnceAndRaisesNothing) {
  TestWorker worker;
  Recorder recorder;
  recorder.Attach(worker);
  worker.Asynchronous(false);
  EXPECT_EQ(worker.Start(), "<results/>");
  EXPECT_EQ(worker.Status(), kStatusComplete);
  EXPECT_EQ(worker.runs, 1);
  EXPECT_TRUE(recorder.events.empty());
}

TEST(WorkerTest, AsynchronousRunReportsEveryStageInOrder) {
  TestWorker worker;
  Recorder recorder;
  recorder.Attach(worker);
  EXPECT_EQ(worker.Start(), "");
  EXPECT_EQ(worker.Status(), kStatusStarted);
  EXPECT_EQ(worker.runs, 0) << "the run must wait for a later pass of the loop";
  EXPECT_EQ(recorder.events, std::vector<std::string>{"S1"});
  EXPECT_EQ(recorder.lastUpdate, R"(<e e_mode="7" e_status="1" e_done="0"/>)");

  ASSERT_TRUE(RunUntilSettled(worker));
  EXPECT_EQ(recorder.events, (std::vector<std::string>{"S1", "S2", "P0", "P1", "P2", "S3"}));
  EXPECT_EQ(recorder.lastResults, "<results/>");
  EXPECT_EQ(recorder.lastUpdate, R"(<e e_mode="7" e_status="3" e_done="3"/>)");
  EXPECT_EQ(worker.Status(), kStatusComplete);
}

TEST(WorkerTest, StartWhileStartedOrRunningIsRefused) {
  TestWorker worker;
  Recorder recorder;
  recorder.Attach(worker);
  worker.Start();
  EXPECT_EQ(worker.Start(), "");  // status 1
  worker.onStep = [&](int) {
    EXPECT_EQ(worker.Start(), "");  // status 2
  };
  ASSERT_TRUE(RunUntilSettled(worker));
  EXPECT_EQ(worker.runs, 1);
  EXPECT_EQ(recorder.events.front(), "S1");
  EXPECT_EQ(std::count(recorder.events.begin(), recorder.events.end(), "S1"), 1);
}

TEST(WorkerTest, CancelDuringAYieldStopsAtTheNextCheck) {
  TestWorker worker(10);
  Recorder recorder;
  recorder.Attach(worker);
  worker.OnProgressUpdate([&](const std::string&) {
    recorder.events.push_back("P");
    // The client's call arrives while the worker yields after this report.
    EventLoop::Current().Post([&] { worker.Cancel(); });
  });
  worker.Start();
  ASSERT_TRUE(RunUntilSettled(worker));
  EXPECT_EQ(worker.Status(), kStatusCancelled);
  EXPECT_EQ(recorder.events, (std::vector<std::string>{"S1", "S2", "P", "S255"}));
  EXPECT_EQ(recorder.lastResults, "<results cancelled=\"1\"/>");
}

TEST(WorkerTest, CancelOutsideARunHasNoEffect) {
  TestWorker worker;
  worker.Cancel();  // idle
  EXPECT_EQ(worker.Status(), kStatusIdle);
  worker.Start();
  worker.Cancel();  // started, not yet running: lost
  EXPECT_EQ(worker.Status(), kStatusStarted);
  ASSERT_TRUE(RunUntilSettled(worker));
  EXPECT_EQ(worker.Status(), kStatusComplete);
  worker.Cancel();
  EXPECT_EQ(worker.Status(), kStatusComplete);
}

TEST(WorkerTest, CancelledWorkerStartsAgainFromIdle) {
  TestWorker worker(5);
  worker.onStep = [&](int step) {
    if (step == 1) worker.Cancel();
  };
  worker.Start();
  ASSERT_TRUE(RunUntilSettled(worker));
  ASSERT_EQ(worker.Status(), kStatusCancelled);

  worker.onStep = nullptr;
  Recorder recorder;
  recorder.Attach(worker);
  worker.Start();
  ASSERT_TRUE(RunUntilSettled(worker));
  EXPECT_EQ(worker.Status(), kStatusComplete);
  EXPECT_EQ(recorder.events.front(), "S1");
  EXPECT_EQ(recorder.events.back(), "S3");
  EXPECT_EQ(worker.runs, 2);
}

TEST(WorkerTest, WorkerReleasedBeforeItsTickNeverRuns) {
  bool ran = false;
  {
    TestWorker worker;
    worker.onStep = [&](int) { ran = true; };
    worker.Start();
  }
  EventLoop::Current().RunUntil([] { return false; }, 150ms);
  EXPECT_FALSE(ran);
}

TEST(WorkerTest, SwitchingToSynchronousMidRunSilencesTheRestOfTheRun) {
  TestWorker worker(4);
  Recorder recorder;
  recorder.Attach(worker);
  worker.onStep = [&](int step) {
    if (step == 1) worker.Asynchronous(false);
  };
  worker.Start();
  EventLoop::Current().RunUntil([&] { return worker.Status() == kStatusComplete; }, 5s);
  EXPECT_EQ(worker.Status(), kStatusComplete);
  EXPECT_EQ(recorder.events, (std::vector<std::string>{"S1", "S2", "P0"}));
}

TEST(WorkerTest, ClientMayStartTheWorkerAgainFromItsLastEvent) {
  TestWorker worker(1);
  int finished = 0;
  worker.OnStatusUpdate([&](const std::string& update, const std::string&) {
    if (update.find("e_status=\"3\"") == std::string::npos) return;
    if (++finished == 1) {
      EXPECT_EQ(worker.Start(), "");
    }
  });
  worker.Start();
  EventLoop::Current().RunUntil([&] { return finished == 2; }, 5s);
  EXPECT_EQ(finished, 2);
  EXPECT_EQ(worker.runs, 2);
}

// A worker whose service objects cannot be made.
class BrokenWorker : public Worker {
 public:
  BrokenWorker() : Worker("Broken", 1) {
    thrown_ = CreateService<int>("Throwing.Object", []() -> std::unique_ptr<int> {
      throw Failure(kPermissionDenied, "Permission denied");
    });
    empty_ = CreateService<int>("Empty.Object", [] { return std::unique_ptr<int>(); });
    made_ = CreateService<int>("Good.Object", [] { return std::make_unique<int>(1); });
  }
  bool HasMade() const { return made_ != nullptr; }

 protected:
  void RunBody() override {}
  std::string ResultText() override { return ""; }
  std::string ResultsXml() override { return ""; }
  void AddStatusCounters(xml::Node) override {}
  void ReleaseDocuments() override {}

 private:
  std::unique_ptr<int> thrown_, empty_, made_;
};

TEST(WorkerTest, ServiceCreationFailuresAreReportedAndTheWorkerLives) {
  testing::TakeReportedEvents();
  auto worker = std::make_unique<BrokenWorker>();
  const std::string source = "trlLocator.Broken.Class_Initialize";
  std::vector<testing::ReportedEvent> expected{
      {kPermissionDenied, 1, "Broken", "Class_Initialize", "Permission denied", "trlLocator"},
      {kErrUnableToCreate, 1, "Broken", "Class_Initialize",
       "Unable to create an instance of Throwing.Object", source},
      {kErrUnableToCreate, 1, "Broken", "Class_Initialize",
       "Unable to create an instance of Empty.Object", source},
  };
  EXPECT_EQ(testing::TakeReportedEvents(), expected);
  EXPECT_TRUE(worker->HasMade());
}

TEST(WorkerTest, TeardownReleasesTheSharedReporter) {
  HandleEvent(1, "x", 1, "trlLocator", "Test", "T", false, false, "", 0, true);
  ASSERT_NE(SharedReporter(), nullptr);
  { TestWorker worker; }
  EXPECT_EQ(SharedReporter(), nullptr);
  HandleEvent(1, "y", 1, "trlLocator", "Test", "T", false, false, "", 0, true);
  EXPECT_EQ(testing::TakeReportedEvents().size(), 1u) << "a new reporter holds only the new event";
}

}  // namespace
}  // namespace trl
