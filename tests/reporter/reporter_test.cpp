#include "reporter/reporter.h"

#include <gmock/gmock.h>
#include <gtest/gtest.h>
#include <unistd.h>

#include <filesystem>
#include <fstream>
#include <functional>
#include <pugixml.hpp>
#include <regex>
#include <vector>

#include "platform/failure.h"
#include "support/temp_tree.h"

namespace trl {
namespace {

namespace fs = std::filesystem;
using ::testing::ElementsAre;
using ::testing::ElementsAreArray;
using ::testing::HasSubstr;

const std::regex kTime("[0-9]{4}-[0-9]{2}-[0-9]{2} [0-9]{2}:[0-9]{2}:[0-9]{2}");

// The failure `action` throws; number 0 when it throws none.
Failure FailureOf(const std::function<void()>& action) {
  try {
    action();
  } catch (const Failure& failure) {
    return failure;
  }
  return Failure{0, ""};
}

// The lines of a file without their "\n", each time shown as "T".
std::vector<std::string> Lines(const fs::path& path) {
  std::ifstream in(path);
  std::vector<std::string> lines;
  for (std::string line; std::getline(in, line);)
    lines.push_back(std::regex_replace(line, kTime, "T"));
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
    for (auto event : doc.child("events").children("event")) {
      values.emplace_back(event.attribute(name).value());
    }
    return values;
  }

  testing::TempTree tree_;
  fs::path dir_ = tree_.Root();
  Reporter reporter_;
};

TEST_F(ReporterTest, EventsKeepReportOrderAndAttributeOrder) {
  EXPECT_EQ(reporter_.EventsXML(), "<events/>");
  EXPECT_EQ(reporter_.Report(7, "first", 2, "C1", "K1", "P1", true, false, "S1", 3), 5);
  reporter_.DefaultAction(2);
  EXPECT_EQ(reporter_.Report(-9, "second", 4, "C2", "K2", "P2", false, true, "S2", 0), 2);
  EXPECT_EQ(std::regex_replace(reporter_.EventsXML(), kTime, "T"),
            "<events><event number=\"7\" description=\"first\" kind=\"2\" component=\"C1\" "
            "class=\"K1\" procedure=\"P1\" source=\"S1\" time=\"T\"/><event number=\"-9\" "
            "description=\"second\" kind=\"4\" component=\"C2\" class=\"K2\" procedure=\"P2\" "
            "source=\"S2\" time=\"T\"/></events>");
}

TEST_F(ReporterTest, EveryTextSurvivesAReload) {
  const std::string kBad = "\xEF\xBF\xBD";
  const std::string kSame = "caf\xC3\xA9 \xF0\x9F\x98\x80 a \"q\" & <b> 'c' one\ntwo\r\nthree\tend";
  struct Case {
    std::string text, reloaded;
  } cases[] = {
      {kSame, kSame},
      {"bad\xFFx\xC3", "bad" + kBad + "x" + kBad},
      {"overlong\xC0\xAF surrogate\xED\xA0\x80",
       "overlong" + kBad + kBad + " surrogate" + kBad + kBad + kBad},
      {std::string("ctl\x01\0!\xEF\xBF\xBE", 9), "ctl" + kBad + kBad + "!" + kBad},
  };
  for (const auto& c : cases) {
    reporter_.Report(1, c.text, 1, c.text, c.text, c.text, false, false, c.text, 0);
  }
  for (const char* name : {"description", "component", "class", "procedure", "source"}) {
    auto values = Attributes(name);
    ASSERT_EQ(values.size(), std::size(cases)) << name;
    for (size_t i = 0; i < values.size(); ++i) EXPECT_EQ(values[i], cases[i].reloaded) << name;
  }
}

TEST_F(ReporterTest, MaxEventsKeepsTheNewest) {
  struct Case {
    int32_t max, reports;
    std::vector<std::string> kept;
  } cases[] = {{0, 4, {"1", "2", "3", "4"}}, {2, 4, {"3", "4"}}, {1, 3, {"3"}}, {5, 2, {"1", "2"}}};
  for (const auto& c : cases) {
    reporter_.ClearEvents();
    reporter_.MaxEvents(c.max);
    for (int32_t i = 1; i <= c.reports; ++i) Add(i);
    EXPECT_THAT(Attributes("number"), ElementsAreArray(c.kept)) << "max " << c.max;
  }
  reporter_.MaxEvents(1);
  EXPECT_THAT(Attributes("number"), ElementsAre("2")) << "lowering the limit drops at once";
  EXPECT_EQ(FailureOf([&] { reporter_.MaxEvents(-1); }).number, kInvalidArgument);
  EXPECT_EQ(FailureOf([&] { reporter_.LogMode(2); }).number, kInvalidArgument);
}

TEST_F(ReporterTest, CountsAndResetsAreIndependent) {
  for (int32_t kind : {1, 1, 2, 4, 3, 1}) Add(0, kind);
  auto counts = [&] {
    return std::vector{reporter_.Count(1), reporter_.Count(2), reporter_.Count(3),
                       reporter_.Count(4)};
  };
  EXPECT_THAT(counts(), ElementsAre(3, 1, 1, 1));
  EXPECT_TRUE(reporter_.ClearEvents());
  EXPECT_EQ(reporter_.EventsXML(), "<events/>");
  EXPECT_THAT(counts(), ElementsAre(3, 1, 1, 1));
  Add(9);
  EXPECT_TRUE(reporter_.ResetCounts());
  EXPECT_THAT(counts(), ElementsAre(0, 0, 0, 0));
  EXPECT_THAT(Attributes("number"), ElementsAre("9"));
  Add(0, 4);
  EXPECT_THAT(counts(), ElementsAre(0, 0, 0, 1));
}

TEST_F(ReporterTest, LogHasOneLinePerLoggedKind) {
  reporter_.LogFileName((dir_ / "run.log").string());
  for (int32_t kind : {1, 2, 3, 4}) Add(10 + kind, kind, "a\tb\nc\rd");
  EXPECT_THAT(
      Lines(dir_ / "run.log"),
      ElementsAre("T\t1\tK.P\t11\ta b c d", "T\t2\tK.P\t12\ta b c d", "T\t4\tK.P\t14\ta b c d"));
}

TEST_F(ReporterTest, LogModeAppendsOrReplacesOnce) {
  struct Case {
    int32_t mode;
    std::vector<std::string> lines;
  } cases[] = {{0, {"old", "T\t1\tK.P\t1\td", "T\t1\tK.P\t2\td"}},
               {1, {"T\t1\tK.P\t1\td", "T\t1\tK.P\t2\td"}}};
  for (const auto& c : cases) {
    fs::path path = dir_ / std::to_string(c.mode);
    std::ofstream(path) << "old\n";
    reporter_.LogMode(c.mode);
    reporter_.LogFileName(path.string());
    Add(1);
    Add(2);
    EXPECT_THAT(Lines(path), ElementsAreArray(c.lines)) << "mode " << c.mode;
  }
}

TEST_F(ReporterTest, ChangingTheLogNameMovesTheLog) {
  reporter_.LogFileName((dir_ / "a.log").string());
  Add(1);
  reporter_.LogFileName((dir_ / "b.log").string());
  Add(2);
  reporter_.LogFileName("");
  Add(3);
  EXPECT_THAT(Lines(dir_ / "a.log"), ElementsAre("T\t1\tK.P\t1\td"));
  EXPECT_THAT(Lines(dir_ / "b.log"), ElementsAre("T\t1\tK.P\t2\td"));
  EXPECT_THAT(Attributes("number"), ElementsAre("1", "2", "3"));
}

TEST_F(ReporterTest, UnwritableLogFailsAfterRecording) {
  tree_.AddFile("file", "x");
  tree_.AddFolder("locked");
  tree_.SetMode("locked", 0500);
  struct Case {
    fs::path path;
    int32_t number;
  };
  std::vector<Case> cases = {{dir_ / "missing" / "run.log", kPathNotFound},
                             {dir_ / "file" / "run.log", kPathNotFound},
                             {dir_, kPathFileAccessError},
                             {"/dev/full", kPathFileAccessError}};
  if (geteuid() != 0) cases.push_back({dir_ / "locked" / "run.log", kPermissionDenied});
  for (const auto& c : cases) {
    reporter_.LogFileName(c.path.string());
    reporter_.ClearEvents();
    Failure failure = FailureOf([&] { Add(42); });
    EXPECT_EQ(failure.number, c.number) << c.path;
    EXPECT_THAT(failure.description, HasSubstr(c.path.string()));
    EXPECT_THAT(Attributes("number"), ElementsAre("42")) << c.path;
  }
}

TEST_F(ReporterTest, EchoWritesEveryReportToTheStream) {
  std::FILE* stream = std::tmpfile();
  ASSERT_NE(stream, nullptr);
  reporter_.SetEchoStream(stream);
  reporter_.LogFileName((dir_ / "run.log").string());  // a logged line is not echoed unless asked
  Add(1);
  reporter_.Echo(true);
  Add(2, 1, "two");
  Add(3, 3, "three");
  reporter_.Echo(false);
  Add(4);
  std::rewind(stream);
  std::string echoed(256, '\0');
  echoed.resize(std::fread(echoed.data(), 1, echoed.size(), stream));
  std::fclose(stream);
  EXPECT_EQ(std::regex_replace(echoed, kTime, "T"), "T\t1\tK.P\t2\ttwo\nT\t3\tK.P\t3\tthree\n");
}

}  // namespace
}  // namespace trl
