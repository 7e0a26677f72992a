// Whole runs: asynchronous reports, selection, cancel, and a search followed by a compare.
#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include <chrono>
#include <functional>

#include "compare/compare_fixture.h"
#include "platform/event_loop.h"
#include "search/search_fixture.h"

namespace trl::testing {
namespace {

using ::testing::ElementsAre;
using namespace std::chrono_literals;

// What an asynchronous run reports: "S<status>" and "P<a_id>:<e_matched>" in order.
struct Recorder {
  explicit Recorder(Compare& compare) {
    compare.OnStatusUpdate([this](const std::string& update, const std::string& results) {
      lastUpdate = Parse(update);
      events.push_back("S" + Attribute("e_status"));
      lastResults = results;
    });
    compare.OnProgressUpdate([this](const std::string& update) {
      auto e = Parse(update)->DocumentElement();
      xml::Node a = e.FirstChild();
      events.push_back("P" + a.GetAttribute("a_id").value_or("") + ":" +
                       e.GetAttribute("e_matched").value_or(""));
      if (onProgress) onProgress(events.back());
    });
  }
  std::string Attribute(std::string_view name) const {
    return lastUpdate->DocumentElement().GetAttribute(name).value_or("<absent>");
  }

  std::vector<std::string> events;
  xml::DocumentPtr lastUpdate;
  std::string lastResults;
  std::function<void(const std::string&)> onProgress;
};

class CompareRunTest : public CompareTest {
 protected:
  void RunToEnd(std::string_view fingerprint, std::string_view localFiles,
                xml::DocumentPtr options = nullptr) {
    EXPECT_EQ(compare_.Start(std::move(options), Parse(localFiles), Parse(fingerprint)), "");
    ASSERT_TRUE(EventLoop::Current().RunUntil(
        [&] {
          return compare_.Status() == kStatusComplete || compare_.Status() == kStatusCancelled;
        },
        10s));
  }

  Compare compare_{fs::CreatePosixFileSystem({})};
  Recorder recorder_{compare_};
};

TEST_F(CompareRunTest, LocalFilesWithoutFilesExamineNothing) {
  RunToEnd(R"(<fp><a a_id="1"><v v_id="1"><f f_id="1" f_name="x"/></v></a><a a_id="2"/></fp>)",
           R"(<trl_applicationdata search_end="e"><c c_text="h"/></trl_applicationdata>)");
  EXPECT_THAT(recorder_.events, ElementsAre("S1", "S3"));
  EXPECT_EQ(recorder_.Attribute("e_a_total"), "2");
  EXPECT_EQ(recorder_.Attribute("e_a_count"), "0");
  auto results = Parse(recorder_.lastResults);
  std::vector<std::string> names;
  for (const auto& [name, value] : results->DocumentElement().Attributes()) names.push_back(name);
  EXPECT_THAT(names, ElementsAre("search_start", "search_end", "compare_start", "compare_end"));
  EXPECT_EQ(results->DocumentElement().GetAttribute("search_start"), "");
  EXPECT_EQ(results->AsNode().CountNodes("/*/c"), 0u);
}

TEST_F(CompareRunTest, RejectedApplicationsLeaveNoTraceAndCancelEndsBeforeTheNextApplication) {
  for (const char* file : {"one.exe", "two.exe", "three.exe", "four.exe"}) tree_.AddFile(file);
  auto application = [](const char* id, const char* files) {
    std::string text = std::string("<a a_id='") + id + "'><v v_id='1' v_seq='1'>";
    int fileId = 0;
    for (const std::string& name : Words(files)) {
      text += "<f f_id='" + std::to_string(++fileId) + "' f_name='" + name + "' f_weight='1'/>";
    }
    return text + "</v></a>";
  };
  std::string fingerprint = "<fp>" + application("1", "one.exe") +
                            application("2", "two.exe two.dll") + application("3", "three.exe") +
                            application("4", "four.exe") + "</fp>";
  recorder_.onProgress = [&](const std::string& event) {
    if (event == "P3:1") compare_.Cancel();
  };
  RunToEnd(fingerprint, LocalFiles({{Folder(), {"one.exe", "two.exe", "three.exe", "four.exe"}}}),
           Parse("<options><a a_id='1' a_selected='0'/></options>"));
  EXPECT_THAT(recorder_.events, ElementsAre("S1", "S2", "P2:0", "P3:0", "P3:1", "S255"));
  EXPECT_EQ(compare_.Status(), kStatusCancelled);
  EXPECT_EQ(recorder_.Attribute("e_a_count"), "2");
  EXPECT_EQ(recorder_.Attribute("e_match_count"), "1");
  auto results = Parse(recorder_.lastResults);
  EXPECT_EQ(results->DocumentElement().GetAttribute("cancelled"), "1");
  EXPECT_THAT(ValuesOf(*results, "//d/a", "a_id"), ElementsAre("3"));
}

TEST_F(CompareRunTest, SearchThenCompareScoresEachInstalledCopy) {
  for (const char* folder : {"Apps/Acme 1/Bin", "Apps/Acme 2/Bin"}) tree_.AddFolder(folder);
  tree_.AddFile("Apps/Acme 1/Bin/Acme.exe", "first");
  tree_.AddFile("Apps/Acme 1/Readme.txt", "read me");
  tree_.AddFile("Apps/Acme 2/Bin/ACME.EXE", "second!");
  Search search(fs::CreatePosixFileSystem({}));
  search.Asynchronous(false);
  auto localFiles = search.Start(Parse(LocalOptions(tree_.Path("Apps"))));

  Compare compare(fs::CreatePosixFileSystem({}));
  compare.Asynchronous(false);
  auto results = Parse(compare.Start(
      nullptr, Parse(localFiles),
      Parse(R"(<fp><a a_id="7" a_name="Acme">)"
            R"(<v v_id="1" v_seq="1"><f f_id="1" f_name="acme.exe" f_relpath="bin" f_weight="2">)"
            R"(<p p_type="2" p_weight="1" p_value="5"/></f>)"
            R"(<f f_id="2" f_name="readme.txt" f_relpath="" f_weight="1"/></v>)"
            R"(<v v_id="2" v_seq="2"><f f_id="1" f_name="acme.exe" f_relpath="bin" f_weight="2">)"
            R"(<p p_type="2" p_weight="1" p_value="7"/></f></v></a></fp>)")));
  // Both copies carry version 2 (one file, found); only the first also has version 1's readme.
  EXPECT_THAT(ValuesOf(*results, "//d", "d_text"),
              ElementsAre(Lower(Folder("Apps/Acme 1")), Lower(Folder("Apps/Acme 2"))));
  EXPECT_THAT(ValuesOf(*results, "//d/a", "a_max_seq"), ElementsAre("2", "2"));
  EXPECT_THAT(ValuesOf(*results, "//a/v", "v_id"), ElementsAre("1", "2", "2"));
  EXPECT_THAT(ValuesOf(*results, "//a/v", "v_act"), ElementsAre("3", "0", "2"));
  EXPECT_THAT(ValuesOf(*results, "//a/v", "f_act"), ElementsAre("2", "1", "1"));
  EXPECT_THAT(ValuesOf(*results, "//a/v/f", "p_act"), ElementsAre("1", "0", "0", "1"));
}

}  // namespace
}  // namespace trl::testing
