// Managed applications no longer found at their place move to the missing list: the cases the
// generated runs of merge_property_test do not make.
#include <gtest/gtest.h>

#include "merge/merge_fixture.h"
#include "platform/failure.h"

namespace trl::testing {
namespace {

std::string App(std::string_view id) { return Application(id, " a_manage='1'"); }

std::string At(std::string_view id) { return Managed("host", "c:", "\\app\\", id); }

struct Case {
  const char* name;
  std::string searchOptions;  // the body under the options root
  std::string oldResults;     // the body under the results root
  const char* shape;          // of the old results afterwards
  const char* applicationOptions = "";
  std::vector<ReportedEvent> failures = {};
};

const std::string kHostC = Place("Host", "C:", "\\App\\", App("7"));

const Case kCases[] = {
    {"OnlyApplicationTakesTheComputerWithIt", At("7"), kHostC, "missing(7)"},
    {"AnOldIdWrittenWithZerosIsNotFound", At("7"), Place("Host", "C:", "\\App\\", App("007")),
     "c1(m1(d1(a007)))"},
    {"AnotherComputerKeepsTheEmptiedOneInPlace", At("7"),
     kHostC + Place("Other", "C:", "\\App\\", App("9"), "2 2 2"), "c1() c2(m2(d2(a9))) missing(7)"},
    {"UnmanagedIsNotChecked", Managed("host", "c:", "\\app\\", "7", "true"), kHostC,
     "c1(m1(d1(a7)))"},
    {"RejectedAsFoundInTheResultsIsNeverMoved", At("007"), kHostC, "c1(m1(d1(a7)))",
     "<a a_id='7' a_selected='0'/>"},
    {"APlaceNamedTwiceIsSearchedThroughout", At("7"),
     Place("Host", "C:", "\\App\\", App("8")) + Place("Host", "C:", "\\App\\", App("7"), "2 2 2"),
     "c1(m1(d1(a8))) c2() missing(7)"},
    {"ANameWithAnApostropheIsTakenAsTheSelectionReadsIt",
     Managed("nope&apos; or @c_name=&apos;host", "c:", "\\app\\", "7"), kHostC, "missing(7)"},
    {"DuplicateIdsInAFolderMoveTheFirstOnly", At("7"),
     Place("Host", "C:", "\\App\\", App("7") + App("7")), "c1(m1(d1(a7))) missing(7)"},
    // The computer cannot be taken from the root, which does not hold it: the drive still goes.
    {"EachEmptiedLevelIsRemovedOnItsOwn",
     At("7"),
     "<x>" + kHostC + "</x>",
     "x(c1()) missing(7)",
     "",
     {{kInvalidArgument, 1, "Merge", "MissingApplication", "", ""}}},
    {"TheListIsMadeOnceAsTheRootsLastChild", At("7") + Managed("other", "c:", "\\app\\", "9"),
     Place("Host", "C:", "\\App\\", App("7") + App("8")) +
         Place("Other", "C:", "\\App\\", App("9"), "2 2 2"),
     "c1(m1(d1(a8))) c2() missing(7 9)"},
    {"SecondMissingJoinsTheList", At("7") + At("8"),
     Place("Host", "C:", "\\App\\", App("7") + App("8")) + "<a_missing><a a_id='3'/></a_missing>",
     "missing(3 7 8)"},
};

TEST(MissingApplicationsTest, MovesWhatIsGoneFromItsPlace) {
  for (const Case& c : kCases) {
    SCOPED_TRACE(c.name);
    auto old = Parse(Results(c.oldResults));
    auto run = MergeNow(Parse("<options>" + c.searchOptions + "</options>"),
                        Parse(std::string("<options>") + c.applicationOptions + "</options>"), old,
                        nullptr);
    std::vector<ReportedEvent> failures;
    for (ReportedEvent event : run.events) {
      event.description = event.source = "";
      failures.push_back(event);
    }
    EXPECT_EQ(failures, c.failures);
    EXPECT_EQ(Shape(old->DocumentElement()), c.shape);
    // Copies are shallow, and marked as neither managed nor present.
    EXPECT_EQ(old->AsNode().CountNodes(
                  "/*/a_missing/a[@a_id!='3'][* or not(@a_manage='0' and @a_missing='1')]"),
              0u);
  }
}

}  // namespace
}  // namespace trl::testing
