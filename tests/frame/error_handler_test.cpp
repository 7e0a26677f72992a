#include "frame/error_handler.h"

#include <gtest/gtest.h>

#include <stdexcept>
#include <string>
#include <vector>

#include "support/reported_events.h"

namespace trl {
namespace {

using testing::ReportedEvent;
using testing::TakeReportedEvents;

class ErrorHandlerTest : public ::testing::Test {
 protected:
  void SetUp() override { ReleaseSharedReporter(); }
  void TearDown() override { ReleaseSharedReporter(); }
};

TEST_F(ErrorHandlerTest, AFailingStepIsReportedOnceAndTheNextStepRuns) {
  OnError on{"Search", "FindFiles"};
  int value = 1;
  std::vector<int> ran;
  on([&] { ran.push_back(1); });
  on([&] {
    Fail(kOverflow);
    value = 2;  // a failed step leaves what it was to produce as it was
  });
  on([&] { ran.push_back(3); });
  EXPECT_EQ(value, 1);
  EXPECT_EQ(ran, (std::vector<int>{1, 3}));
  EXPECT_EQ(TakeReportedEvents(), (std::vector<ReportedEvent>{{kOverflow, 1, "Search", "FindFiles",
                                                               "Overflow", "trlLocator"}}));
}

TEST_F(ErrorHandlerTest, FailureInALoopIsReportedOncePerPass) {
  OnError on{"Compare", "Match"};
  int sum = 0;
  for (int i = 0; i < 4; ++i) {
    on([&] {
      if (i % 2 == 1) Fail(kTypeMismatch);
      sum += i;
    });
  }
  EXPECT_EQ(sum, 2);
  EXPECT_EQ(TakeReportedEvents().size(), 2u);
}

TEST_F(ErrorHandlerTest, OtherExceptionsAreReportedToo) {
  OnError on{"Merge", "Merge"};
  EXPECT_FALSE(on([] { throw std::runtime_error("boom"); }));
  auto events = TakeReportedEvents();
  ASSERT_EQ(events.size(), 1u);
  EXPECT_EQ(events[0].description, "boom");
  EXPECT_EQ(events[0].procedure, "Merge");
}

TEST_F(ErrorHandlerTest, RaisedErrorsCarryTheirOperationAsSource) {
  OnError on{"Locate", "AddEvents"};
  on([] {
    Raise(kErrUnableToLoadResults, "Unable to load search results XML", "Locate", "AddEvents");
  });
  EXPECT_EQ(TakeReportedEvents(),
            (std::vector<ReportedEvent>{{-2147220991, 1, "Locate", "AddEvents",
                                         "Unable to load search results XML",
                                         "trlLocator.Locate.AddEvents"}}));
}

TEST_F(ErrorHandlerTest, OwnNumbersAreTheObjectErrorBasePlusTheirOffsets) {
  EXPECT_EQ(kErrUnableToLoadResults, static_cast<int32_t>(0x80040201));
  EXPECT_EQ(kErrUnableToCreate, static_cast<int32_t>(0x80044EE8));
  EXPECT_EQ(kErrPathNotFound, static_cast<int32_t>(0x80044EE9));
  EXPECT_EQ(kErrNotSupported, static_cast<int32_t>(0x80044EEA));
  EXPECT_EQ(kErrUnknownPropertyType, static_cast<int32_t>(0x80044EEB));
}

TEST_F(ErrorHandlerTest, ForceIgnoreOverridesTheReportersAnswer) {
  EXPECT_EQ(SharedReporter(), nullptr);
  HandleEvent(1, "first", 1, "trlLocator", "Search", "Start", false, false, "", 0, true);
  ASSERT_NE(SharedReporter(), nullptr);
  SharedReporter()->DefaultAction(kActionAbort);
  EXPECT_EQ(HandleEvent(1, "a", 1, "trlLocator", "Search", "Start", false, false, "", 0, false),
            kActionAbort);
  EXPECT_EQ(HandleEvent(1, "b", 1, "trlLocator", "Search", "Start", false, false, "", 0, true),
            kActionIgnore);
}

TEST_F(ErrorHandlerTest, WarningsAreKindTwoWithoutSource) {
  ReportWarning(kErrPathNotFound, "Path '\\x\\' could not be found", "Search", "FindFiles");
  EXPECT_EQ(TakeReportedEvents(),
            (std::vector<ReportedEvent>{{kErrPathNotFound, 2, "Search", "FindFiles",
                                         "Path '\\x\\' could not be found", ""}}));
}

TEST_F(ErrorHandlerTest, AReleasedReporterIsRecreatedFresh) {
  HandleEvent(1, "old", 1, "trlLocator", "Filter", "Filter", false, false, "", 0, true);
  ReleaseSharedReporter();
  EXPECT_EQ(SharedReporter(), nullptr);
  HandleEvent(2, "new", 1, "trlLocator", "Filter", "Filter", false, false, "", 0, true);
  auto events = TakeReportedEvents();
  ASSERT_EQ(events.size(), 1u);
  EXPECT_EQ(events[0].description, "new");
}

}  // namespace
}  // namespace trl
