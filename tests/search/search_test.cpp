// Runs of the search: the folder walk, the probe, the document they build, the reports, and what
// a second run sees.
#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include <chrono>
#include <filesystem>

#include "platform/event_loop.h"
#include "search/search_fixture.h"
#include "trl/compare.h"
#include "trl/locate.h"

namespace trl::testing {
namespace {

// Each row is one run over the same tree and what it records (see Summary). In the tree: a plain
// file T, a read-only one r, a hidden one .h, a system item p, and files in the folders A, A\B,
// e\S (e holds none), the read-only r and the hidden .d.
TEST_F(SearchTest, RunRecordsWhatItsEntryAdmits) {
  for (const char* folder : {"A/B", "e/S", "r", ".d"}) tree_.AddFolder(folder);
  for (const char* file : {"T", "r.x", ".h", "A/a", "A/B/B", "e/S/s", "r/y", ".d/d"})
    tree_.AddFile(file);
  tree_.AddFifo("p");
  for (const char* readOnly : {"r.x", "r"}) tree_.SetMode(readOnly, 0555);
  const std::string root = tree_.Path(), full = tree_.Path("A/B");
  const auto walk = [&](const std::string& attributes, const std::string& pattern = "") {
    return LocalOptions(root, "d_search='1' " + attributes,
                        "<d_search_mask>" + pattern + "</d_search_mask>");
  };
  const auto probe = [&](const char* id) {
    return LocalOptions(root, "", std::string("<a a_id='") + id + "' a_name='N'/>");
  };
  auto fingerprint = Parse(
      std::string(R"(<fp><a a_id='1'><f f_name='b' f_relpath='A\B\' f_fullpath=''/></a><a )") +
      R"(a_id='2'><f f_name='b' f_relpath='\A\B' f_fullpath=''/></a><a a_id='5' a_parent='1'>)" +
      R"(<f f_name='A' f_relpath='A' f_fullpath=''/></a><a a_id='7'><f f_name='T' f_relpath='')" +
      " f_fullpath=''/></a><a a_id='3'><f f_name='b' f_relpath='" + full + "' f_fullpath='True'/>" +
      "</a><a a_id='4'><f f_name='b' f_relpath='" + full + "' f_fullpath='true'/></a><a a_id='6'>" +
      "<f f_name='T' f_relpath=''/></a></fp>");
  const std::pair<std::string, std::string> cases[] = {
      {walk(""), R"(\ T r.x|\A\ a|\A\B\ B|\e\S\ s|\r\ y)"},
      {walk(R"(d_search_f_attributes="6")"), R"(\ .h T p|\A\ a|\A\B\ B|\e\S\ s|\r\ y)"},
      {walk(R"(d_search_d_attributes="2")"), R"(\ T r.x|\.d\ d|\A\ a|\A\B\ B|\e\S\ s)"},
      {walk("", "T"), R"(\ T|\A\|\A\B\|\e\S\|\r\)"},
      {walk("", "(["), R"(\|\A\|\A\B\|\e\S\|\r\|5017)"},
      {walk(R"(d_search_recurse="0" d_search_f_properties="1")", "T"), R"(\ T#1)"},
      {walk(R"(d_search_recurse="0" d_search_f_properties="15")", "T"), R"(\ T#1#2#3#4)"},
      // A probe looks for the application's files and its children's, by lower-cased paths.
      {probe("1"), R"(\a\ a|\a\b\ B)"},
      {probe("2"), R"(\a\b\ B)"},
      {probe("3"), R"(\a\b\ B)"},
      {probe("4"), "\\" + Lower(full.substr(1)) + "\\"},  // only "True" makes a path full
      {probe("6"), R"(\ T)"},       // a file in the folder itself needs no f_fullpath
      {probe("7"), ""},             // not selected
      {probe("8"), "-2147201302"},  // not in the fingerprint
  };
  auto applicationOptions = Parse("<o><a a_id='7' a_selected='0'/></o>");
  for (const auto& [options, expected] : cases)
    EXPECT_EQ(Summary(*Run(options, fingerprint, applicationOptions), root), expected) << options;
  EXPECT_EQ(ValuesOf(*Run(walk("")), "//d", "d_id"), Words("1 2 3 4 5"));  // numbered from 1

  // A writer is handed the document in place of its text.
  Search search(fs::CreatePosixFileSystem({}));
  search.Asynchronous(false);
  std::string written;
  search.ResultsWriter([&](const xml::Document& results) {
    results.WriteXml([&](std::string_view piece) { written += piece; });
  });
  EXPECT_EQ(search.Start(Parse(walk(""))), "");
  EXPECT_EQ(Summary(*Parse(written), root), std::get<1>(cases[0]));
}

// A report as its status or its path below `below`, then the counts of folders and files.
std::string Noted(const std::string& update, const char* what, const std::string& below) {
  auto document = Parse(update);
  xml::Node e = document->DocumentElement();
  std::string noted = *e.GetAttribute(what);
  if (noted.starts_with(below)) noted.erase(0, below.size());
  return noted + " " + *e.GetAttribute("e_d_count") + " " + *e.GetAttribute("e_f_count") + "|";
}

// A computer that cannot be reached, then a chain of folders with one file each, searched twice
// by one worker into results passed in. The first run cancels in a progress report, the second
// posts the cancel twice over so that it runs in the second yield after its report. Either way
// the walk stops at its next check, the counts start again, ids go on from the highest already
// there and the local computer comes first.
TEST_F(SearchTest, AsynchronousRunReportsEachFolderAndStopsAtTheNextCheck) {
  tree_.AddFolder("a/b");
  for (const char* file : {"f0", "a/f1", "a/b/f2"}) tree_.AddFile(file);
  Search search(fs::CreatePosixFileSystem({}));
  const std::string expected[] = {R"(1 0 0|2 0 0|\\far\c\ 0 0|\ 0 0|\a\ 1 1|255 1 1|)",
                                  R"(1 0 0|2 0 0|\\far\c\ 0 0|\ 0 0|255 0 1|)"};
  for (bool posted : {false, true}) {
    std::string reports;
    xml::DocumentPtr results =
        Parse(R"(<r><c c_id="2"><m m_id="3"><d d_id="12"/><d d_id="7"/></m></c></r>)");
    search.OnStatusUpdate([&](const std::string& update, const std::string& text) {
      reports += Noted(update, "e_status", tree_.Path());
      results = Parse(text);
    });
    search.OnProgressUpdate([&](const std::string& update) {
      reports += Noted(update, "e_d_name", tree_.Path());
      if (!posted && reports.ends_with(R"(\a\ 1 1|)")) return search.Cancel();
      if (posted && reports.ends_with(R"(|\ 0 0|)")) {
        EventLoop::Current().Post([&] { EventLoop::Current().Post([&] { search.Cancel(); }); });
      }
    });
    search.Start(Parse("<o>" + Computer("far", "c", "\\") +
                       Computer("localhost", "", tree_.Path()) + "</o>"),
                 nullptr, nullptr, results);
    ASSERT_TRUE(EventLoop::Current().RunUntil([&] { return search.Status() >= kStatusComplete; },
                                              std::chrono::seconds(10)));
    EXPECT_EQ(reports, expected[posted]);
    EXPECT_EQ(Summary(*results, tree_.Path()), R"(|\ f0|-2147201303)");  // kept folders: no text
    EXPECT_THAT(
        results->Xml(),
        ::testing::ContainsRegex(
            "^<r search_start=\"[-0-9]{10} [:0-9]{8}\" search_end=\"[-0-9]{10} [:0-9]{8}\" "
            "cancelled=\"1\"><c c_id=\"4\"[^>]*><m m_id=\"5\"[^>]*><d d_id=\"13\".*<c "
            "c_id=\"3\" c_text=\"far\" c_name=\"far\"><m m_id=\"4\" m_text=\"c\" m_name=\"c\"/>"));
  }
}

// The same three workers run three times: files in Zeta change and Acme is installed, then Zeta is
// removed. The search walks Zeta, then Apps without recursion (its listing holds Zeta again), and
// probes for Acme's file by a name in another letter case, as the compare looks for it.
TEST_F(SearchTest, EachRunSeesTheDiskAsItIsThen) {
  const std::string apps = tree_.Path("Apps");
  const std::string fingerprint =
      R"(<fp><a a_id='1' a_name='Zeta'><v v_id='1' v_name='1' v_seq='1'><f f_id='1' f_weight='1')"
      R"( f_name='zeta.exe' f_relpath='Zeta' f_fullpath=''/></v></a><a a_id='2' a_name='Acme'><v)"
      R"( v_id='2' v_name='1' v_seq='1'><f f_id='2' f_name='App.exe' f_relpath='Acme' f_weight='1')"
      R"( f_fullpath=''/></v></a></fp>)";
  const std::string options = "<o>" + Computer("localhost", "", apps + "\\Zeta") +
                              Computer("localhost", "", apps, "d_search='1' d_search_recurse='0'",
                                       "<d_search_mask/><a a_id='2' a_name='Acme'/>") +
                              "</o>";
  tree_.AddFolder("Apps/Zeta");
  for (const char* file : {"Zeta.EXE", "old.txt"}) tree_.AddFile("Apps/Zeta/" + std::string(file));
  Search search(fs::CreatePosixFileSystem({}));
  Compare compare(fs::CreatePosixFileSystem({}));
  Locate locate(fs::CreatePosixFileSystem({}), fs::CreatePosixFileSystem({}));
  for (Worker* w : std::initializer_list<Worker*>{&search, &compare, &locate})
    w->Asynchronous(false);
  // What the search, the compare and the locate found, in this order.
  const auto found = [&](const std::string& text) { return Summary(*Parse(text), apps) + " / "; };
  const auto run = [&] {
    return found(search.Start(Parse(options), nullptr, Parse(fingerprint))) +
           found(compare.Start(nullptr, Run(LocalOptions(apps)), Parse(fingerprint))) +
           found(locate.Start(Parse(LocalOptions(apps)), nullptr, 0, Parse(fingerprint)));
  };
  EXPECT_EQ(run(), R"(\Zeta\ Zeta.EXE old.txt|\acme\ / \ Zeta / \ Zeta / )");
  std::filesystem::remove(tree_.Native("Apps/Zeta/old.txt"));
  tree_.AddFolder("Apps/Acme");
  for (const char* file : {"Zeta/new.txt", "Acme/App.EXE"})
    tree_.AddFile("Apps/" + std::string(file));
  EXPECT_EQ(run(), R"(\Zeta\ Zeta.EXE new.txt|\acme\ App.EXE / \ Acme Zeta / \ Acme Zeta / )");
  std::filesystem::remove_all(tree_.Native("Apps/Zeta"));
  EXPECT_EQ(run(), R"(\acme\ App.EXE|-2147201303 / \ Acme / \ Acme / )");
}

}  // namespace
}  // namespace trl::testing
