#include "frame/error_handler.h"

#include <gtest/gtest.h>

#include <stdexcept>
#include <vector>

#include "support/reported_events.h"

namespace trl {
namespace {

using testing::ReportedEvent;
using testing::TakeReportedEvents;

TEST(ErrorHandlerTest, FailingStepsAndWarningsAreReportedAndTheOperationGoesOn) {
  OnError on{"Search", "FindFiles"};
  const std::vector<bool> succeeded{on([] {}), on([] { Fail(kOverflow); }),
                                    on([] { throw std::runtime_error("boom"); })};
  ReportWarning(kErrPathNotFound, "Path '\\x\\' could not be found", "Search", "Walk");
  EXPECT_EQ(succeeded, (std::vector<bool>{true, false, false}));
  EXPECT_EQ(TakeReportedEvents(),
            (std::vector<ReportedEvent>{
                {kOverflow, 1, "Search", "FindFiles", "Overflow", "trlLocator"},
                {kInvalidArgument, 1, "Search", "FindFiles", "boom", "trlLocator"},
                {kErrPathNotFound, 2, "Search", "Walk", "Path '\\x\\' could not be found", ""}}));
}

TEST(ErrorHandlerTest, ForceIgnoreOverridesTheReportersAnswer) {
  HandleEvent(1, "first", 1, "trlLocator", "Search", "Start", false, false, "", 0, true);
  SharedReporter()->DefaultAction(kActionAbort);
  EXPECT_EQ(HandleEvent(1, "a", 1, "trlLocator", "Search", "Start", false, false, "", 0, false),
            kActionAbort);
  EXPECT_EQ(HandleEvent(1, "b", 1, "trlLocator", "Search", "Start", false, false, "", 0, true),
            kActionIgnore);
  ReleaseSharedReporter();  // the next test gets a reporter with its usual answer
}

}  // namespace
}  // namespace trl
