#include "trl/worker.h"

#include <gtest/gtest.h>

#include <chrono>
#include <memory>
#include <string>
#include <vector>

#include "frame/error_handler.h"
#include "platform/event_loop.h"
#include "support/reported_events.h"

namespace trl {
namespace {

using namespace std::chrono_literals;
using Events = std::vector<std::string>;
using testing::TakeReportedEvents;

// A worker whose run makes three progress reports, stopping early when cancelled.
class TestWorker : public Worker {
 public:
  TestWorker() : Worker("TestWorker", 7) {}
  using Worker::CreateService;  // made at instance creation in the real classes

  std::string Start() {
    return StartFrame([this] {
      results_ = std::make_shared<xml::Document>();
      results_->LoadXml("<results/>");
    });
  }

  int runs = 0;
  bool ownsResults = false;

 protected:
  void RunBody() override {
    OnError on{ClassName(), "Run"};
    ++runs;
    BeginRun(on);
    for (int i = 0; i < 3 && status_ != kStatusCancelled; ++i) {
      Progress(on, [&](xml::Node e) { e.SetAttribute("e_step", std::to_string(i)); });
    }
    if (SettleStatus()) results_->DocumentElement().SetAttribute("cancelled", "1");
    EndRun(on);
  }
  std::string ResultText() override { return results_->DocumentElement().Xml(); }
  xml::DocumentPtr ResultsDocument() override { return results_; }
  bool OwnsResults() const override { return ownsResults; }
  void AddStatusCounters(xml::Node e) override { e.SetAttribute("e_runs", std::to_string(runs)); }
  void ReleaseDocuments() override { results_.reset(); }

  xml::DocumentPtr results_;
};

// The value of attribute `name` in an update's text.
std::string AttributeOf(const std::string& text, const std::string& name) {
  size_t start = text.find(name + "=\"") + name.size() + 2;
  return text.substr(start, text.find('"', start) - start);
}

// Records what the client saw: "S<status>" per StatusUpdate and "P<step>" per ProgressUpdate.
class WorkerTest : public ::testing::Test {
 protected:
  void SetUp() override {
    worker.OnStatusUpdate([this](const std::string& update, const std::string& results) {
      events.push_back("S" + AttributeOf(update, "e_status"));
      lastUpdate = update;
      lastResults = results;
      if (onEvent) onEvent(events.back());
    });
    worker.OnProgressUpdate([this](const std::string& update) {
      events.push_back("P" + AttributeOf(update, "e_step"));
      if (onEvent) onEvent(events.back());
    });
  }

  bool RunUntilSettled() {
    return EventLoop::Current().RunUntil(
        [&] { return worker.Status() == kStatusComplete || worker.Status() == kStatusCancelled; },
        5s);
  }

  TestWorker worker;
  Events events;
  std::function<void(const std::string& event)> onEvent;  // the client's answer to each event
  std::string lastUpdate, lastResults;
};

TEST_F(WorkerTest, AsynchronousRunReportsInOrderAndRefusesAnotherStart) {
  onEvent = [&](const std::string& e) {
    if (e != "S3") EXPECT_EQ(worker.Start(), "");  // refused while started or running
  };
  EXPECT_EQ(worker.Start(), "");
  EXPECT_EQ(events, Events{"S1"});  // the run waits for a later pass of the loop

  ASSERT_TRUE(RunUntilSettled());
  EXPECT_EQ(events, (Events{"S1", "S2", "P0", "P1", "P2", "S3"}));
  EXPECT_EQ(lastResults, "<results/>");
  EXPECT_EQ(lastUpdate, R"(<e e_mode="7" e_status="3" e_runs="1"/>)");
}

// Only the last report of a run that made its own results offers them to be kept; a document the
// run was lent may be the caller's, and one taken earlier would still be written to.
TEST_F(WorkerTest, OnlyTheLastReportHandsOverResultsTheRunMade) {
  for (bool owns : {false, true}) {
    worker.ownsResults = owns;
    std::vector<bool> handedOver;
    xml::DocumentPtr kept;
    worker.OnStatusDocument([&](const std::string&, const xml::DocumentPtr& results, bool given) {
      handedOver.push_back(given);
      kept = results;
    });
    worker.Start();
    ASSERT_TRUE(RunUntilSettled());
    EXPECT_EQ(handedOver, (std::vector<bool>{false, false, owns}));
    ASSERT_NE(kept, nullptr);
    EXPECT_EQ(kept.use_count(), 1);  // the worker let go of it
    EXPECT_EQ(kept->Xml(), lastResults);
  }
}

TEST_F(WorkerTest, CancelDuringAYieldStopsTheRunAndTheWorkerMayStartAgain) {
  const std::pair<std::string, Events> cases[] = {{"S2", {"S1", "S2", "S255"}},
                                                  {"P1", {"S1", "S2", "P0", "P1", "S255"}}};
  for (const auto& [answered, expected] : cases) {
    // The client's call arrives while the worker yields after the report it answers.
    onEvent = [&](const std::string& e) {
      if (e == answered) EventLoop::Current().Post([&] { worker.Cancel(); });
    };
    events.clear();
    worker.Start();
    worker.Cancel();  // started, not yet running: lost
    ASSERT_TRUE(RunUntilSettled());
    EXPECT_EQ(events, expected);
    EXPECT_EQ(lastResults, R"(<results cancelled="1"/>)");
  }

  // Started again from its last event, the new run keeps its own documents.
  onEvent = [&](const std::string& e) {
    if (e == "S3" && worker.runs == 3) worker.Start();
  };
  worker.Start();
  ASSERT_TRUE(RunUntilSettled());
  EXPECT_EQ(worker.runs, 4);
  EXPECT_EQ(lastResults, "<results/>");
}

TEST_F(WorkerTest, ServiceCreationFailuresAreReportedAndTheWorkerLives) {
  auto thrown = []() -> std::unique_ptr<int> {
    throw Failure(kPermissionDenied, "Permission denied");
  };
  EXPECT_EQ(worker.CreateService<int>("Throwing.Object", thrown), nullptr);
  EXPECT_EQ(worker.CreateService<int>("Empty.Object", [] { return std::unique_ptr<int>(); }),
            nullptr);
  EXPECT_TRUE(worker.CreateService<int>("Good.Object", [] { return std::make_unique<int>(1); }));
  const std::string source = "trlLocator.TestWorker.Class_Initialize";
  EXPECT_EQ(TakeReportedEvents(), (std::vector<testing::ReportedEvent>{
                                      {kPermissionDenied, 1, "TestWorker", "Class_Initialize",
                                       "Permission denied", "trlLocator"},
                                      {kErrUnableToCreate, 1, "TestWorker", "Class_Initialize",
                                       "Unable to create an instance of Throwing.Object", source},
                                      {kErrUnableToCreate, 1, "TestWorker", "Class_Initialize",
                                       "Unable to create an instance of Empty.Object", source},
                                  }));
}

TEST_F(WorkerTest, TeardownReleasesTheSharedReporter) {
  HandleEvent(1, "x", 1, "trlLocator", "Test", "T", false, false, "", 0, true);
  ASSERT_NE(SharedReporter(), nullptr);
  { TestWorker other; }
  EXPECT_EQ(SharedReporter(), nullptr);
}

}  // namespace
}  // namespace trl
