// Search and Compare on real trees: names that differ only in letter case, and links to folders.
#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include <chrono>
#include <filesystem>
#include <map>
#include <regex>

#include "frame/error_handler.h"
#include "platform/event_loop.h"
#include "platform/failure.h"
#include "schema/schema.h"
#include "search/search_fixture.h"
#include "trl/compare.h"

namespace trl::testing {
namespace {

// A fingerprint application: each file as "name relpath size", all of one version "1".
std::string App(const std::string& id, const std::vector<std::string>& files) {
  std::string text = "<a a_id='" + id + "' a_name='" + id + "'><v v_id='1' v_name='1' v_seq='1'>";
  int fileId = 0;
  for (const std::string& file : files) {
    auto words = Words(file);
    text += "<f f_id='" + std::to_string(++fileId) + "' f_name='" + words[0] + "' f_relpath='" +
            words[1] + "' f_weight='1'><p p_type='2' p_weight='1' p_value='" + words[2] + "'/></f>";
  }
  return text + "</v></a>";
}

class DiskTest : public SearchTest {
 protected:
  // Searches the tree with the folder entry's `attributes`, then matches `apps` against it.
  void Locate(const std::string& attributes, const std::string& apps) {
    local_ = Run(LocalOptions(tree_.Path(), "d_search='1' " + attributes));
    Compare compare(fs::CreatePosixFileSystem({}));
    compare.Asynchronous(false);
    results_ = Parse(compare.Start(nullptr, local_, Parse("<fp>" + apps + "</fp>")));
  }

  // Each application copy as its folder below the tree, its a_id, and each version's v_name with
  // its files found and score.
  std::string Found() const {
    std::string found;
    for (const xml::Node& a : results_->AsNode().SelectNodes("//a")) {
      std::string folder = *a.ParentNode().GetAttribute("d_text");
      found += (found.empty() ? "" : "|") + folder.substr(std::min(folder.size(), Root().size())) +
               " " + *a.GetAttribute("a_id");
      for (const xml::Node& v : a.SelectNodes("./v")) {
        found += " " + *v.GetAttribute("v_name") + ":" + *v.GetAttribute("f_act") + "/" +
                 *v.GetAttribute("v_act");
      }
    }
    return found;
  }

  std::string Root() const { return Lower(tree_.Path()); }

  xml::DocumentPtr local_, results_;
};

// Sub and sub, Makefile and makefile: four files, each recorded, each read from its own inode
// (told by its size), each a candidate of a lookup in any case; README is found as readme. An
// application above the folders with a case sibling is one, whole.
TEST_F(DiskTest, NamesThatDifferOnlyInCaseAreDistinctEverywhere) {
  for (const char* folder : {"Sub", "sub", "d", "x"}) tree_.AddFolder(folder);
  tree_.AddFile("Sub/a.txt", "1");
  tree_.AddFile("sub/a.txt", "22");
  tree_.AddFile("d/Makefile", "333");
  tree_.AddFile("d/makefile", "4444");
  tree_.AddFile("x/readme", "55555");
  Locate("", App("one", {"a.txt \\ 1"}) + App("two", {"A.TXT \\ 2"}) +
                 App("make", {"Makefile d 3", "makefile d 4"}) + App("doc", {"README x 5"}) +
                 App("whole", {"a.txt Sub 1", "README x 5"}));
  EXPECT_EQ(Summary(*local_, tree_.Path()),
            "\\Sub\\ a.txt|\\d\\ Makefile makefile|\\sub\\ a.txt|\\x\\ readme");
  EXPECT_EQ(Found(),
            "\\Sub\\ one 1:1/1|\\Sub\\ two 1:1/0|\\sub\\ one 1:1/0|\\sub\\ two 1:1/1|"
            "\\ make 1:2/2|\\ doc 1:1/1|\\ whole 1:2/2");
}

// A package split between bin\ (a link to usr\bin, and b2, a link to that link) and usr\sbin is
// found once, whole, at the root; one that lies only under bin\ at the root, not at usr\, with its
// file counted once; an application wholly behind a link (current -> 1.2) once, where it really
// is. A link out of the tree is not noted, and a loop (up -> ..) leads nowhere. Without the option,
// links stay unseen.
TEST_F(DiskTest, LinksToFoldersPlaceFilesWhereTheLinksPutThem) {
  for (const char* folder : {"usr/bin", "usr/sbin", "opt/app/1.2/lib"}) tree_.AddFolder(folder);
  tree_.AddFile("usr/bin/tar", "tar");
  tree_.AddFile("usr/sbin/rmt", "rmtx");
  tree_.AddFile("opt/app/1.2/lib/x.js", "x");
  tree_.AddLink("bin", "usr/bin");
  tree_.AddLink("b2", "bin");
  tree_.AddLink("usr/bin/up", "..");
  tree_.AddLink("opt/app/current", "1.2");
  tree_.AddLink("out", "/usr/share");
  const std::string apps = App("tar", {"tar bin 3", "rmt usr\\sbin 4"}) +
                           App("binonly", {"tar bin 3"}) + App("js", {"x.js lib 1"}) +
                           App("loop", {"tar up\\bin 3"});
  Locate("d_search_links='1'", apps);
  std::map<std::string, std::string> links;
  for (const xml::Node& l : local_->AsNode().SelectNodes("//m/l")) {
    links[l.GetAttribute("l_text")->substr(Root().size())] =
        l.GetAttribute("l_target")->substr(Root().size());
  }
  EXPECT_THAT(links,
              ::testing::ElementsAre(::testing::Pair("\\b2\\", "\\usr\\bin\\"),
                                     ::testing::Pair("\\bin\\", "\\usr\\bin\\"),
                                     ::testing::Pair("\\opt\\app\\current\\", "\\opt\\app\\1.2\\"),
                                     ::testing::Pair("\\usr\\bin\\up\\", "\\usr\\")));
  EXPECT_EQ(Found(), "\\ tar 1:2/2|\\ binonly 1:1/1|\\opt\\app\\1.2\\ js 1:1/1");
  Locate("d_search_links='1' d_search_recurse='0'", "");  // usr\bin is not walked then
  EXPECT_TRUE(local_->AsNode().SelectNodes("//m/l").empty());
  Locate("", apps);
  EXPECT_TRUE(local_->AsNode().SelectNodes("//m/l").empty());
  EXPECT_EQ(Found(), "\\usr\\ binonly 1:1/1|\\opt\\app\\1.2\\ js 1:1/1");
}

// A folder an exclusion matches, by its name or by its native path, is not walked.
TEST_F(DiskTest, ExcludedFoldersAreNotWalked) {
  for (const char* file : {"a/node_modules/x/f", "a/keep/f", "b/skip/f", "c/f"}) {
    tree_.AddFolder(std::string(file).substr(0, std::string(file).rfind('/')));
    tree_.AddFile(file);
  }
  auto local = Run(LocalOptions(tree_.Path(), "d_search='1'",
                                "<d_search_mask/><d_search_exclude>node_*</d_search_exclude>"
                                "<d_search_exclude>" +
                                    tree_.Native("b") + "/*</d_search_exclude>"));
  EXPECT_EQ(Summary(*local, tree_.Path()), "\\a\\keep\\ f|\\c\\ f");
}

// A property read touches regular files only: a link to /dev/zero is not hashed for ever.
TEST_F(DiskTest, OnlyRegularFilesAreRead) {
  tree_.AddLink("z", "/dev/zero");
  auto fileSystem = fs::CreatePosixFileSystem({});
  EXPECT_THROW(Schema().ReadPropertyType3(*fileSystem->GetFile(tree_.Path("z"))), Failure);
}

// A link to a file is read only when the file lies in the searched folder, unless the options say
// links may lead anywhere; without properties to read, nothing leaks and every name is recorded.
TEST_F(DiskTest, FileLinksAreReadOnlyWithinTheSearchedFolder) {
  tree_.AddFolder("in/sub");
  tree_.AddFolder("out");
  tree_.AddFile("in/a", "1");
  tree_.AddFile("out/secret", "22");
  tree_.AddLink("in/sub/inside", "../a");
  tree_.AddLink("in/sub/outside", "../../out/secret");
  const std::pair<const char*, const char*> cases[] = {
      {"d_search_f_properties='2'", "\\ a#2|\\sub\\ inside#2"},
      {"d_search_f_properties='2' d_search_f_links='1'", "\\ a#2|\\sub\\ inside#2 outside#2"},
      {"", "\\ a|\\sub\\ inside outside"},
  };
  for (const auto& [attributes, expected] : cases) {
    auto local = Run(LocalOptions(tree_.Path("in"), std::string("d_search='1' ") + attributes));
    EXPECT_EQ(Summary(*local, tree_.Path("in")), expected) << attributes;
  }
}

// A cancel reaches a run hashing a huge file while it reads, not after it.
TEST_F(DiskTest, CancelStopsTheHashingOfAHugeFile) {
  tree_.AddFile("huge");
  std::filesystem::resize_file(tree_.Native("huge"), uintmax_t{64} << 30);  // sparse
  Search search(fs::CreatePosixFileSystem({}));
  Timer cancel([&] { search.Cancel(); });  // fires once the walk has begun to read
  cancel.Interval(50);
  cancel.Enabled(true);
  search.Start(Parse(LocalOptions(tree_.Path(), "d_search='1' d_search_f_properties='4'")));
  auto started = std::chrono::steady_clock::now();
  ASSERT_TRUE(EventLoop::Current().RunUntil([&] { return search.Status() >= kStatusComplete; },
                                            std::chrono::seconds(60)));
  EXPECT_EQ(search.Status(), kStatusCancelled);
  EXPECT_LT(std::chrono::steady_clock::now() - started, std::chrono::seconds(20));
}

// Reading ahead on other threads changes nothing in the results: the same scores, the same
// failures in the same order, whatever the number of threads. Every lib.so is a candidate of every
// application's lib.so; half the versions expect other contents; one data file became a fifo.
TEST_F(DiskTest, ReadingAheadGivesTheResultsOfReadingInTurn) {
  auto fileSystem = fs::CreatePosixFileSystem({});
  std::string fingerprint = "<fp>";
  for (int app = 0; app < 24; ++app) {
    std::string id = std::to_string(app);
    tree_.AddFolder("app" + id);
    tree_.AddFile("app" + id + "/lib.so", "lib " + id);
    tree_.AddFile("app" + id + "/data.bin", std::string(app * 1000, 'd'));
    fingerprint += "<a a_id='" + id + "' a_name='app" + id + "'>";
    for (int version = 1; version <= 2; ++version) {
      auto digest = [&](const std::string& name) {
        if (version == 2 || (app == 7 && name == "data.bin")) return std::string("00");
        return Schema().ReadPropertyType3(
            *fileSystem->GetFile(tree_.Path("app" + id + "/" + name)));
      };
      fingerprint += "<v v_id='" + std::to_string(version) + "' v_name='" +
                     std::to_string(version) + "' v_seq='" + std::to_string(version) + "'>";
      int fileId = 0;
      for (const std::string name : {"lib.so", "data.bin"}) {
        fingerprint += "<f f_id='" + std::to_string(++fileId) + "' f_name='" + name +
                       "' f_relpath='' f_weight='1'><p p_type='1' p_weight='1' p_value=''/>"
                       "<p p_type='3' p_weight='2' p_value='" +
                       digest(name) + "'/></f>";
      }
      fingerprint += "</v>";
    }
    fingerprint += "</a>";
  }
  fingerprint += "</fp>";
  auto local = Run(LocalOptions(tree_.Path(), "d_search='1'"));
  std::filesystem::remove(tree_.Native("app7/data.bin"));
  tree_.AddFifo("app7/data.bin");

  auto results = [&](unsigned threads) {
    Compare compare(fs::CreatePosixFileSystem({}));
    compare.Asynchronous(false);
    compare.ReadThreads(threads);
    std::string text = compare.Start(nullptr, local, Parse(fingerprint));
    ReleaseSharedReporter();
    return std::regex_replace(text, std::regex(R"( (compare_start|compare_end|time)="[^"]*")"), "");
  };
  std::string inTurn = results(0);
  ASSERT_THAT(inTurn, ::testing::HasSubstr("<event"));  // the fifo's failures
  for (unsigned threads : {1u, 3u}) EXPECT_EQ(results(threads), inTurn) << threads << " threads";
}

// A cancel reaches a compare waiting for a thread that hashes a huge file.
TEST_F(DiskTest, CancelStopsACompareWaitingForAHugeFile) {
  tree_.AddFile("huge");
  std::filesystem::resize_file(tree_.Native("huge"), uintmax_t{64} << 30);  // sparse
  auto local = Run(LocalOptions(tree_.Path(), "d_search='1'"));
  Compare compare(fs::CreatePosixFileSystem({}));
  compare.ReadThreads(2);
  Timer cancel([&] { compare.Cancel(); });
  cancel.Interval(300);  // once the run waits for the thread reading it
  cancel.Enabled(true);
  compare.Start(nullptr, local,
                Parse("<fp><a a_id='1'><v v_id='1' v_seq='1'><f f_id='1' f_name='huge' "
                      "f_relpath='' f_weight='1'><p p_type='3' p_weight='1' p_value='0'/></f>"
                      "</v></a></fp>"));
  auto started = std::chrono::steady_clock::now();
  ASSERT_TRUE(EventLoop::Current().RunUntil([&] { return compare.Status() >= kStatusComplete; },
                                            std::chrono::seconds(60)));
  EXPECT_EQ(compare.Status(), kStatusCancelled);
  EXPECT_LT(std::chrono::steady_clock::now() - started, std::chrono::seconds(20));
}

}  // namespace
}  // namespace trl::testing
