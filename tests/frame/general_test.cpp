#include "frame/general.h"

#include <gtest/gtest.h>

#include <optional>
#include <string>
#include <vector>

#include "frame/error_handler.h"
#include "frame/highest_id.h"
#include "support/documents.h"

namespace trl {
namespace {

using testing::TakeReportedEvents;
using testing::ValuesOf;

TEST(FixNullsTest, OnlyAnAbsentValueTakesTheDefault) {
  EXPECT_EQ(FixNulls<std::string>(std::nullopt, "33"), "33");
  EXPECT_EQ(FixNulls<std::string>(std::string(), "33"), "");
}

class AddEventsXmlTest : public ::testing::Test {
 protected:
  void SetUp() override { ReleaseSharedReporter(); }
  void TearDown() override { ReleaseSharedReporter(); }
};

TEST_F(AddEventsXmlTest, EventsAreAppendedLastAndTheReporterIsResetEvenWhenAppendingFails) {
  xml::Document results, rootless;
  ASSERT_TRUE(results.LoadXml("<trl_applicationdata><c/></trl_applicationdata>"));
  EXPECT_FALSE(AddEventsXML(results));
  EXPECT_EQ(SharedReporter(), nullptr) << "must not create the reporter";
  EXPECT_EQ(results.Xml(), "<trl_applicationdata><c/></trl_applicationdata>");

  HandleEvent(6, "Overflow", 1, "trlLocator", "Search", "Search", false, false, "x", 0, true);
  HandleEvent(7, "Out of memory", 1, "trlLocator", "Search", "AddFile", false, false, "y", 0, true);
  EXPECT_TRUE(AddEventsXML(results));
  auto children = results.DocumentElement().ChildNodes();
  ASSERT_EQ(children.size(), 2u);
  EXPECT_EQ(children[1].NodeName(), "events");
  EXPECT_EQ(ValuesOf(results, "//event", "procedure"),
            (std::vector<std::string>{"Search", "AddFile"}));
  EXPECT_TRUE(TakeReportedEvents().empty());
  EXPECT_EQ(SharedReporter()->Count(1), 0);

  HandleEvent(6, "Overflow", 1, "trlLocator", "Search", "Search", false, false, "", 0, true);
  // The failed append is reported before the resets clear it with the rest: seen as it happens.
  std::vector<std::string> seen;
  ObserveReports([&](const ReportedEventView& event) {
    seen.push_back(std::string(event.className) + "." + std::string(event.procedure) + " " +
                   std::to_string(event.number));
  });
  EXPECT_TRUE(AddEventsXML(rootless));
  ObserveReports(nullptr);
  EXPECT_EQ(rootless.Xml(), "");
  EXPECT_EQ(seen, std::vector<std::string>{"basGeneral.AddEventsXML 91"});
  EXPECT_TRUE(TakeReportedEvents().empty());
  EXPECT_EQ(SharedReporter()->Count(1), 0);
}

TEST_F(AddEventsXmlTest, HighestIdReadsFirstAttributesAndReportsThoseThatAreNoNumber) {
  struct Case {
    const char* document;
    int32_t highest;
    std::vector<int32_t> failures;
  } cases[] = {
      {"<r/>", 0, {}},
      {"<r><c c_id='3'/><c c_id='9'/><x><c c_id='5'/></x></r>", 9, {}},
      {"<r><c c_key='7' c_id='2'/></r>", 7, {}},
      {"<r><c c_id='-5'/></r>", -5, {}},
      {"<r><c c_text='a' c_id='5'/><c c_id='2'/></r>", 2, {kTypeMismatch}},
      {"<r><c/><c c_id='4'/><c c_id='x'/></r>", 4, {kObjectNotSet, kTypeMismatch}},
  };
  for (const Case& c : cases) {
    SCOPED_TRACE(c.document);
    xml::Document document;
    ASSERT_TRUE(document.LoadXml(c.document));
    EXPECT_EQ(HighestId(OnError{"Merge", "Start"}, document.DocumentElement(), "c"), c.highest);
    std::vector<int32_t> reported;
    for (const auto& event : TakeReportedEvents()) reported.push_back(event.number);
    EXPECT_EQ(reported, c.failures);
  }
}

}  // namespace
}  // namespace trl
