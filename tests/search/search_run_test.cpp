// Whole runs: results passed in, computer order, asynchronous runs and hostile inputs.
#include <gmock/gmock.h>
#include <gtest/gtest.h>
#include <unistd.h>

#include <chrono>
#include <functional>

#include "platform/event_loop.h"
#include "platform/text.h"
#include "search/search_fixture.h"

namespace trl::testing {
namespace {

using ::testing::ElementsAre;
using ::testing::IsEmpty;
using ::testing::SizeIs;
using ::testing::UnorderedElementsAre;
using ::testing::UnorderedElementsAreArray;
using namespace std::chrono_literals;
using namespace std::string_literals;

using SearchRunTest = SearchTest;

TEST_F(SearchRunTest, ResultsPassedInKeepTheirContentAndIdsContinueAfterTheHighest) {
  tree_.AddFile("a.txt");
  const std::string kept =
      R"(<c c_id="2" c_text="alpha" c_name="alpha"><m m_id="3" m_text="x" m_name="x">)"
      R"(<d d_id="4" d_text="\a\" d_name="\a\"/></m></c>)"
      R"(<c c_id="5" c_text="beta" c_name="beta"><m m_id="9" m_text="y" m_name="y">)"
      R"(<d d_id="12" d_text="\b\" d_name="\b\"/><d d_id="7" d_text="\c\" d_name="\c\"/>)"
      R"(</m></c>)";
  xml::DocumentPtr results = Parse("<trl_applicationdata>" + kept + "</trl_applicationdata>");
  Search search(fs::CreatePosixFileSystem({}));
  search.Asynchronous(false);
  auto text = search.Start(Parse(LocalOptions(tree_.Path())), nullptr, nullptr, results);
  std::string root = Folder();
  EXPECT_EQ(Untimed(*Parse(text)),
            R"(<trl_applicationdata><c c_id="6" c_text="localhost" c_name="localhost" )"
            R"(c_local="1"><m m_id="10" m_text="" m_name=""><d d_id="13" d_text=")" +
                root + R"(" d_name=")" + Lower(root) +
                R"("><f f_id="1" f_text="a.txt" f_name="a.txt"/></d></m></c>)" + kept +
                "</trl_applicationdata>");
}

TEST_F(SearchRunTest, LocalComputerComesFirst) {
  tree_.AddFolder("share");
  tree_.AddFile("share/remote.txt");
  tree_.AddFile("local.txt");
  fs::ShareTable shares;
  shares.Add("fileserver", "apps", tree_.Native("share"));
  auto results = Run("<o>" + Computer(1, "fileserver", "apps", Entry(1, "\\")) +
                         Computer(2, "localhost", "",
                                  Entry(2, tree_.Path(), R"(d_search="1" d_search_recurse="0")")) +
                         "</o>",
                     nullptr, nullptr, fs::CreatePosixFileSystem(std::move(shares)));
  EXPECT_THAT(ValuesOf(*results, "/*/c", "c_id"), ElementsAre("2", "1"));
  EXPECT_THAT(ValuesOf(*results, "/*/c/m/d/f", "f_text"), ElementsAre("local.txt", "remote.txt"));
}

// A run's results hold its own events only: none, not an empty list, after an earlier run's.
TEST_F(SearchRunTest, EachRunReportsOnlyItsOwnEvents) {
  tree_.AddFile("a.txt");
  Search search(fs::CreatePosixFileSystem({}));
  search.Asynchronous(false);
  auto first = Parse(search.Start(Parse(LocalOptions(tree_.Path("gone")))));
  EXPECT_THAT(EventsIn(*first), SizeIs(1));
  auto second = Parse(search.Start(Parse(LocalOptions(tree_.Path()))));
  EXPECT_THAT(EventsIn(*second), IsEmpty()) << second->Xml();
}

// What a client of an asynchronous run sees: "S<status>" and "P" per event, in order.
struct Recorder {
  std::vector<std::string> events;
  std::vector<std::string> progressPaths;
  xml::DocumentPtr lastUpdate;
  std::string lastResults;
  std::function<void()> onProgress;

  explicit Recorder(Search& search) {
    search.OnStatusUpdate([this](const std::string& update, const std::string& results) {
      lastUpdate = Parse(update);
      events.push_back("S" + lastUpdate->DocumentElement().GetAttribute("e_status").value_or(""));
      lastResults = results;
    });
    search.OnProgressUpdate([this](const std::string& update) {
      events.push_back("P");
      progressPaths.push_back(
          Parse(update)->DocumentElement().GetAttribute("e_d_name").value_or(""));
      if (onProgress) onProgress();
    });
  }
  std::string Last(std::string_view attribute) const {
    return lastUpdate->DocumentElement().GetAttribute(attribute).value_or("");
  }
};

void RunToEnd(Search& search, std::string_view options) {
  search.Start(Parse(options));
  ASSERT_TRUE(EventLoop::Current().RunUntil(
      [&] { return search.Status() == kStatusComplete || search.Status() == kStatusCancelled; },
      10s));
}

class SearchAsynchronousTest : public SearchTest {
 protected:
  void SetUp() override {
    SearchTest::SetUp();
    for (const char* folder : {"a/b", "c", ".hidden"}) tree_.AddFolder(folder);
    for (const char* file : {"f0.txt", "a/f1.txt", "a/b/f2.txt", "c/f3.txt", ".hidden/h.txt"}) {
      tree_.AddFile(file);
    }
  }

  Search search_{fs::CreatePosixFileSystem({})};
  Recorder recorder_{search_};
};

TEST_F(SearchAsynchronousTest, CompleteRunCountsFoldersSearchedAndFilesRecorded) {
  RunToEnd(search_, LocalOptions(tree_.Path()));
  EXPECT_EQ(search_.Status(), kStatusComplete);
  std::vector<std::string> expected{"S1", "S2", "P", "P", "P", "P", "P", "S3"};
  EXPECT_EQ(recorder_.events, expected);
  EXPECT_EQ(recorder_.Last("e_d_count"), "4");  // the hidden folder is not searched
  EXPECT_EQ(recorder_.Last("e_f_count"), "4");
  EXPECT_THAT(recorder_.progressPaths, UnorderedElementsAre(Folder(), Folder("a"), Folder("a/b"),
                                                            Folder("c"), Folder(".hidden")));
  EXPECT_THAT(ValuesOf(*Parse(recorder_.lastResults), "//f", "f_text"), SizeIs(4));
}

// Nothing after the cancel: no more walking, no more reports, no more computers.
TEST_F(SearchAsynchronousTest, CancelStopsTheWalkAndMarksTheResults) {
  recorder_.onProgress = [&] {
    if (recorder_.progressPaths.size() == 2) search_.Cancel();
  };
  RunToEnd(search_, "<o>" + Computer(1, "localhost", "", Entry(1, tree_.Path())) +
                        Computer(2, "fileserver", "apps", Entry(2, "\\")) + "</o>");
  EXPECT_EQ(search_.Status(), kStatusCancelled);
  // Later entries are still visited, but their walk stops right after its announcement.
  std::vector<std::string> expected{"S1", "S2", "P", "P", "P", "S255"};
  EXPECT_EQ(recorder_.events, expected);
  EXPECT_EQ(recorder_.progressPaths.back(), "\\\\fileserver\\apps\\");
  auto results = Parse(recorder_.lastResults);
  EXPECT_EQ(results->DocumentElement().GetAttribute("cancelled"), "1");
  EXPECT_LT(ValuesOf(*results, "//f", "f_text").size(), 4u);
  EXPECT_THAT(ValuesOf(*results, "/*/c", "c_text"), ElementsAre("localhost", "fileserver"));
  EXPECT_EQ(results->AsNode().CountNodes("//c[@c_text='fileserver']//d"), 0u);
}

// A cancel that arrives in the yield after a file ends the folder's file loop there.
TEST_F(SearchAsynchronousTest, CancelBetweenFilesStopsAtTheNextFile) {
  for (const char* file : {"c/g1.txt", "c/g2.txt", "c/g3.txt"}) tree_.AddFile(file);
  recorder_.onProgress = [&] {
    // Posted twice over: the first yield (after this event) posts it again, and the next one,
    // after the folder's first file, runs the cancel.
    EventLoop::Current().Post([&] { EventLoop::Current().Post([&] { search_.Cancel(); }); });
    recorder_.onProgress = nullptr;
  };
  RunToEnd(search_, LocalOptions(tree_.Path("c")));
  EXPECT_EQ(search_.Status(), kStatusCancelled);
  EXPECT_THAT(ValuesOf(*Parse(recorder_.lastResults), "//f", "f_text"), SizeIs(1));
}

TEST_F(SearchAsynchronousTest, MissingPathIsAnnouncedOnce) {
  std::string missing = tree_.Path("gone") + "\\";
  RunToEnd(search_, LocalOptions(missing));
  EXPECT_THAT(recorder_.progressPaths, ElementsAre(missing));
  EXPECT_THAT(EventsIn(*Parse(recorder_.lastResults)), SizeIs(1));
}

// Each hostile input gives a well-formed document and reports each failure once.
TEST_F(SearchRunTest, HostileInputsGiveAWellFormedDocument) {
  const std::string quoted = R"(it's "q")";
  tree_.AddFolder("plain");
  tree_.AddFile("plain/a.txt");
  tree_.AddFolder("quotes/" + quoted);
  tree_.AddFile("quotes/" + quoted + "/o'neil \"x\".txt");
  tree_.AddFolder("pattern/sub");
  for (const char* file : {"x.txt", "y.txt", "sub/z.txt"}) tree_.AddFile("pattern/"s + file);
  std::vector<std::string> deep;
  for (std::string path = "deep", folder = "\\"; deep.size() < 100;) {
    tree_.AddFolder(path += "/d");
    tree_.AddFile(path + "/f.txt");
    deep.push_back(folder += "d\\");
  }
  tree_.AddFolder("loop/a");
  tree_.AddFile("loop/a/in.txt");
  tree_.AddLink("loop/a/up", tree_.Native("loop"));
  tree_.AddFolder("utf8");
  tree_.AddFile("utf8/bad\xff.txt");
  tree_.AddFolder("locked/in");
  tree_.AddFile("locked/open.txt");
  tree_.AddFile("locked/in/in.txt");
  tree_.SetMode("locked/in", 0);

  const auto walk = [&](std::string_view folder, std::string_view inner = "<d_search_mask/>") {
    return LocalOptions(tree_.Path(folder), R"(d_search="1")", inner);
  };
  struct Case {
    std::string folder, options;
    std::vector<std::string> events;  // "number procedure"
    std::vector<std::string> files, folders;
  };
  const Case cases[] = {
      // The upgrade and the walk each fail on the missing root.
      {"", "", {"91 UpgradeUserData", "91 Search"}, {}, {}},
      // The upgrade takes a missing c_text from the name.
      {"plain",
       R"(<o><c c_id="1" c_name="localhost" c_local="1"><m m_id="1" m_text="" m_name="">)" +
           Entry(1, tree_.Path("plain")) + "</m></c></o>",
       {},
       {"a.txt"},
       {"\\"}},
      // A missing pattern keeps the one before it.
      {"plain", walk("plain", ""), {"91 Search"}, {"a.txt"}, {"\\"}},
      {"quotes",
       walk("quotes", R"(<d_search_mask/><a a_id="a'1&quot;" a_name="it's &quot;x&quot;"/>)"),
       {"-2147201302 Search"},
       {"o'neil \"x\".txt"},
       {"\\" + quoted + "\\"}},
      {"pattern",
       walk("pattern", "<d_search_mask>([</d_search_mask>"),
       {"5017 Search"},
       {},
       {"\\", "\\sub\\"}},
      {"deep", walk("deep"), {}, std::vector<std::string>(100, "f.txt"), deep},
      {"loop", walk("loop"), {}, {"in.txt"}, {"\\a\\"}},
      {"utf8", walk("utf8"), {}, {NameFromNative("bad\xff.txt")}, {"\\"}},
      {"locked", walk("locked"), {}, {"open.txt"}, {"\\"}},
  };
  for (const Case& c : cases) {
    SCOPED_TRACE(c.options);
    if (c.folder == "locked" && geteuid() == 0) continue;  // root reads any folder
    auto results = Run(c.options);
    ASSERT_EQ(results->DocumentElement().NodeName(), "trl_applicationdata");
    std::vector<std::string> events;
    for (const ReportedEvent& e : EventsIn(*results)) {
      events.push_back(std::to_string(e.number) + " " + e.procedure);
    }
    EXPECT_EQ(events, c.events);
    EXPECT_THAT(ValuesOf(*results, "//f", "f_text"), UnorderedElementsAreArray(c.files));
    EXPECT_THAT(FoldersBelow(*results, tree_.Path(c.folder)), UnorderedElementsAreArray(c.folders));
  }
}

}  // namespace
}  // namespace trl::testing
