#include "reporter/reporter.h"

#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include <fstream>
#include <pugixml.hpp>
#include <regex>
#include <vector>

#include "platform/failure.h"
#include "support/failure_of.h"
#include "support/temp_tree.h"

namespace trl {
namespace {

using ::testing::ElementsAre;
using testing::FailureOf;

const std::regex kTime("[0-9]{4}-[0-9]{2}-[0-9]{2} [0-9]{2}:[0-9]{2}:[0-9]{2}");

// The lines of a file without their "\n", each time shown as "T".
std::vector<std::string> Lines(const std::string& path) {
  std::ifstream in(path);
  std::vector<std::string> lines;
  for (std::string line; std::getline(in, line);) lines.push_back(regex_replace(line, kTime, "T"));
  return lines;
}

class ReporterTest : public ::testing::Test {
 protected:
  int32_t Add(int32_t number, int32_t kind = 1, std::string_view description = "d") {
    return reporter_.Report(number, description, kind, "C", "K", "P", false, false, "S", 0);
  }

  // One attribute of every event, read back through a real parser.
  std::vector<std::string> Attributes(const char* name) {
    pugi::xml_document doc;
    EXPECT_TRUE(doc.load_string(reporter_.EventsXML().c_str()));
    std::vector<std::string> values;
    for (auto event : doc.child("events").children("event"))
      values.push_back(event.attribute(name).value());
    return values;
  }

  testing::TempTree tree_;
  Reporter reporter_;
};

// Markup characters and the blanks a parser would fold are escaped; bytes that are not UTF-8 and
// characters XML cannot carry become U+FFFD.
TEST_F(ReporterTest, EventsKeepReportOrderAttributeOrderAndEveryText) {
  const std::string text("\"<&>'\t\n\r\x01\0\xFF\xC3\xA9\xEF\xBF\xBE\xC3", 17);
  EXPECT_EQ(reporter_.EventsXML(), "<events/>");
  EXPECT_EQ(reporter_.Report(7, "first", 2, "C1", "K1", "P1", true, false, "S1", 3), 5);
  reporter_.DefaultAction(2);
  EXPECT_EQ(reporter_.Report(-9, text, 4, "C2", "K2", "P2", false, true, "S2", 0), 2);
  EXPECT_EQ(regex_replace(reporter_.EventsXML(), kTime, "T"),
            "<events><event number=\"7\" description=\"first\" kind=\"2\" component=\"C1\" "
            "class=\"K1\" procedure=\"P1\" source=\"S1\" time=\"T\"/><event number=\"-9\" "
            "description=\"&quot;&lt;&amp;&gt;'&#9;&#10;&#13;\xEF\xBF\xBD\xEF\xBF\xBD\xEF\xBF\xBD"
            "\xC3\xA9\xEF\xBF\xBD\xEF\xBF\xBD\" kind=\"4\" component=\"C2\" class=\"K2\" "
            "procedure=\"P2\" source=\"S2\" time=\"T\"/></events>");
}

TEST_F(ReporterTest, EventLimitCountsAndResets) {
  reporter_.MaxEvents(2);
  for (int32_t kind : {1, 1, 2, 4, 3}) Add(kind, kind);
  EXPECT_THAT(Attributes("number"), ElementsAre("4", "3")) << "the newest are kept";
  reporter_.MaxEvents(1);
  EXPECT_THAT(Attributes("number"), ElementsAre("3")) << "lowering the limit drops at once";
  Reporter& r = reporter_;
  auto counts = [&] { return std::vector{r.Count(1), r.Count(2), r.Count(3), r.Count(4)}; };
  EXPECT_THAT(counts(), ElementsAre(2, 1, 1, 1));
  EXPECT_TRUE(reporter_.ClearEvents());
  EXPECT_THAT(counts(), ElementsAre(2, 1, 1, 1));
  reporter_.MaxEvents(0);
  Add(8);
  Add(9, 4);
  EXPECT_TRUE(reporter_.ResetCounts());
  EXPECT_THAT(counts(), ElementsAre(0, 0, 0, 0));
  EXPECT_THAT(Attributes("number"), ElementsAre("8", "9"));
  EXPECT_EQ(FailureOf([&] { reporter_.MaxEvents(-1); }), kInvalidArgument);
  EXPECT_EQ(FailureOf([&] { reporter_.LogMode(2); }), kInvalidArgument);
}

// Logged kinds go to the named file, one line each; mode 1 empties a file once, when the first
// line after its naming comes; no name, no log. Echo writes every kind, only while it is on.
TEST_F(ReporterTest, LogAndEchoLines) {
  std::FILE* echo = std::fopen(tree_.Native("echo").c_str(), "w");
  reporter_.SetEchoStream(echo);
  for (const char* name : {"a.log", "b.log"}) tree_.AddFile(name, "old\n");
  reporter_.LogFileName(tree_.Native("a.log"));
  for (int32_t kind : {1, 2, 3, 4}) Add(10 + kind, kind, "a\tb\nc\rd");
  reporter_.LogMode(1);
  reporter_.LogFileName(tree_.Native("b.log"));
  Add(1);
  reporter_.Echo(true);
  Add(2);
  reporter_.LogFileName("");
  Add(3, 3);
  reporter_.Echo(false);
  Add(4);
  EXPECT_THAT(Lines(tree_.Native("a.log")),
              ElementsAre("old", "T\t1\tK.P\t11\ta b c d", "T\t2\tK.P\t12\ta b c d",
                          "T\t4\tK.P\t14\ta b c d"));
  EXPECT_THAT(Lines(tree_.Native("b.log")), ElementsAre("T\t1\tK.P\t1\td", "T\t1\tK.P\t2\td"));
  std::fclose(echo);
  EXPECT_THAT(Lines(tree_.Native("echo")), ElementsAre("T\t1\tK.P\t2\td", "T\t3\tK.P\t3\td"));
}

TEST_F(ReporterTest, UnwritableLogFailsAfterRecording) {
  const std::pair<std::string, int32_t> cases[] = {{tree_.Native("missing/run.log"), kPathNotFound},
                                                   {tree_.Root(), kPathFileAccessError},
                                                   {"/dev/full", kPathFileAccessError}};
  for (const auto& [path, number] : cases) {
    reporter_.LogFileName(path);
    reporter_.ClearEvents();
    std::string failure;
    try {
      Add(42);
    } catch (const Failure& raised) {
      failure = std::to_string(raised.number) + " " + raised.description;
    }
    EXPECT_EQ(failure, std::to_string(number) + " " + StandardDescription(number) + ": " + path);
    EXPECT_THAT(Attributes("number"), ElementsAre("42")) << path;
  }
}

}  // namespace
}  // namespace trl
