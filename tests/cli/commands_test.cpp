#include <fmt/format.h>
#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include <CLI/CLI.hpp>
#include <algorithm>
#include <array>
#include <chrono>
#include <csignal>
#include <cstdlib>
#include <filesystem>
#include <fstream>
#include <functional>
#include <iterator>
#include <map>
#include <optional>
#include <string>
#include <thread>
#include <tuple>
#include <vector>

#include "cache_option.h"
#include "command_error.h"
#include "compare_command.h"
#include "detached_end.h"
#include "filter_command.h"
#include "filter_names.h"
#include "fingerprint_author.h"
#include "fingerprint_command.h"
#include "frame/error_handler.h"
#include "interrupt.h"
#include "locate_command.h"
#include "merge_command.h"
#include "platform/event_loop.h"
#include "platform/fs/posix/posix_file_system.h"
#include "search_command.h"
#include "support/documents.h"
#include "support/temp_tree.h"
#include "trl/xml.h"

namespace trl::cli {
namespace {

using Strings = std::vector<std::string>;

// A tree with inputs for each command. Command lines name its files as "@name".
class CommandsTest : public ::testing::Test {
 protected:
  void SetUp() override {
    tree_.AddFolder("App");
    tree_.AddFile("App/Main.exe", "x");
    tree_.AddFile("App/tool.exe", "one");
    tree_.AddFile("search.xml",
                  "<o><c c_id='1' c_text='localhost' c_name='localhost' c_local='1'>"
                  "<m m_id='1' m_text='' m_name=''><d d_id='1' d_text='" +
                      tree_.Path("App") +
                      "' d_search='1'><d_search_mask/></d><d d_id='2' d_text='" +
                      tree_.Path("Gone") + "' d_search='1'><d_search_mask/></d></m></c></o>");
    tree_.AddFolder("share/Tool");
    tree_.AddFile("share/Tool/tool.exe", "one");
    tree_.AddFile("local.xml",
                  "<trl_applicationdata><c c_text='server' c_name='server'><m m_text='apps' "
                  "m_name='apps'><d d_text='\\Tool\\' d_name='\\tool\\'><f f_text='Tool.exe' "
                  "f_name='tool.exe'/></d></m></c></trl_applicationdata>");
    tree_.AddFile("fingerprint.xml",
                  "<fp><a a_id='1' a_name='Tool'>"
                  "<v v_id='1' v_name='1.0' v_seq='1'><f f_id='1' f_name='tool.exe' f_relpath='' "
                  "f_weight='1'><p p_type='2' p_weight='1' p_value='3'/></f></v>"
                  "<v v_id='2' v_name='2.0' v_seq='2'><f f_id='1' f_name='tool.exe' f_relpath='' "
                  "f_weight='1'><p p_type='2' p_weight='1' p_value='5'/></f></v></a></fp>");
    tree_.AddFile("matches.xml",
                  "<trl_applicationdata><c><m><d><a a_id='1'>"
                  "<v v_id='1' v_name='One' v_seq='1' v_max='3' v_act='3' f_max='2' f_act='1'/>"
                  "<v v_id='2' v_name='Two' v_seq='2' v_max='3' v_act='1' f_max='2' f_act='2'/>"
                  "</a></d></m></c></trl_applicationdata>");
    const std::string place =
        "<trl_applicationdata><c c_id='1' c_text='Host' c_name='host'><m m_id='1' m_text='C:' "
        "m_name='c:'><d d_id='1' d_text='\\App\\' d_name='\\app\\'>";
    tree_.AddFile("managed.xml",
                  "<o><c c_name='host'><m m_name='c:'><d d_name='\\app\\'><a a_id='8' "
                  "a_manage='1'/></d></m></c></o>");
    tree_.AddFile("user.xml", place +
                                  "<a a_id='7' a_manage='0' v_id='1'><v v_id='1'/></a>"
                                  "<a a_id='8' a_name='Gone' v_id='1'/></d></m></c>"
                                  "</trl_applicationdata>");
    tree_.AddFile("inventory.xml", kEmptyUserData);
    tree_.AddFile("new.xml", place +
                                 "<a a_id='7' a_name='Kept' v_id='2'><v v_id='2'/></a></d></m></c>"
                                 "</trl_applicationdata>");
  }
  void TearDown() override { ReleaseSharedReporter(); }

  std::string Read(const std::string& name) const {
    std::ifstream in(tree_.Native(name), std::ios::binary);
    return {std::istreambuf_iterator<char>(in), {}};
  }

  // `text` with each "@name" replaced by the native path of `name` in the tree.
  std::string Expand(std::string text) const {
    for (size_t at = text.find('@'); at != std::string::npos; at = text.find('@', at)) {
      size_t end = std::min(text.find_first_of(" ':", at), text.size());
      std::string path = tree_.Native(text.substr(at + 1, end - at - 1));
      text.replace(at, end - at, path);
      at += path.size();
    }
    return text;
  }

  // Runs a command line; answers the exit code and the message of the error that ended it.
  std::pair<int, std::string> Run(const std::string& line) const {
    static const std::map<std::string, std::function<std::function<int()>(CLI::App&)>> kCommands{
        {"search", AddSearchCommand}, {"compare", AddCompareCommand},
        {"filter", AddFilterCommand}, {"merge", AddMergeCommand},
        {"locate", AddLocateCommand}, {"fingerprint", AddFingerprintCommand}};
    std::vector<std::string> args = testing::Words(Expand(line));
    try {
      CLI::App app;
      auto run = kCommands.at(args[0])(app);
      std::reverse(args.begin(), args.end());  // CLI11 takes the arguments last first
      app.parse(args);
      return {run(), ""};
    } catch (const CommandError& error) {
      return {error.ExitCode(), error.what()};
    } catch (const CLI::ParseError& error) {
      return {kExitBadInput, error.what()};
    }
  }

  // Locate on the localhost search, with user data that starts empty.
  int Locate(const std::string& more) {
    const std::string inputs = "--search-options @search.xml --fingerprint @fingerprint.xml ";
    return Run("locate " + inputs + "--user-data @inventory.xml " + more).first;
  }

  // A new version of application "Tool" in the "ref" folder.
  ReferenceVersion Version(std::string appId, std::string versionId) const {
    return {tree_.Path("ref"), appId, "Tool", std::nullopt, versionId, "1.0", "3"};
  }
  void Add(xml::Document& database, const ReferenceVersion& version) {
    AddReferenceVersion(database, version, *fileSystem_);
  }

  static constexpr const char* kEmptyUserData = "<trl_applicationdata/>";
  testing::TempTree tree_;
  std::unique_ptr<fs::FileSystem> fileSystem_ = fs::CreatePosixFileSystem({});
};

TEST_F(CommandsTest, EachStageCommandWritesItsDocumentAndPrintsWhatTheStageReports) {
  // A command line, what it prints, and a path to exactly one node of its output.
  const std::tuple<std::string, std::string, std::string> cases[] = {
      {"search --search-options @search.xml",
       "trllocator: warning: Path '" + tree_.Native("Gone") + "/' could not be found\n",
       "/*/c/m/d/f[@f_text='Main.exe']"},
      {"compare --local-files @local.xml --fingerprint @fingerprint.xml --share "
       "\\\\server\\apps=@share",
       "", "/trl_applicationdata/c/m/d/a/v[@v_act='1']"},
      {"filter --filter low-weights,flag-unmanaged --matches @matches.xml", "",
       "/trl_applicationdata/c/m/d/a[@v_name='One'][@a_manage='0'][count(v)=1]"},
      {"merge --search-options @managed.xml --user-data @user.xml --new-results @new.xml", "",
       "/trl_applicationdata[a_missing/a[@a_id='8']]/c/m/d/a[@a_id='7'][@a_manage='0']/v_history/"
       "v[@v_id='1']"},
  };
  for (const auto& [line, printed, selects] : cases) {
    SCOPED_TRACE(line);
    ::testing::internal::CaptureStderr();
    EXPECT_EQ(Run(line + " --output @out.xml"), std::make_pair(kExitOk, std::string()));
    EXPECT_EQ(::testing::internal::GetCapturedStderr(), printed);
    xml::Document out;
    ASSERT_TRUE(out.LoadXml(Read("out.xml")));
    EXPECT_EQ(out.AsNode().CountNodes(selects), 1u);
    std::filesystem::remove(tree_.Native("out.xml"));
  }
}

TEST_F(CommandsTest, BadRequestsAreRefusedSayingWhatIsWrongAndWriteNothing) {
  tree_.AddFile("broken.xml", "<a>\n  <b></a>");
  std::string deep;
  for (int i = 0; i < 257; ++i) deep += "<a>";
  tree_.AddFile("deep.xml", deep);
  const std::string add = "fingerprint add --app-id 1 --version-name v --seq 1 --folder ";
  // A command line, its exit code and how its message begins.
  const std::tuple<std::string, int, std::string> cases[] = {
      {"search --search-options @missing.xml", kExitBadInput,
       "cannot read the search options '@missing.xml': No such file or directory"},
      {"search --search-options @", kExitBadInput,
       "cannot read the search options '@': Is a directory"},
      {"search --search-options @broken.xml", kExitBadInput,
       "the search options '@broken.xml' is not well-formed XML: line 2, column"},
      {"search --search-options @search.xml --share host=dir --output @out.xml", kExitBadInput,
       "--share 'host=dir' is not a share mapping"},
      {"search --search-options @search.xml --output /nonexistent/out.xml", kExitFailed,
       "cannot write '/nonexistent/out.xml': No such file or directory"},
      {"compare --local-files @local.xml --fingerprint @none.xml", kExitBadInput,
       "cannot read the fingerprint database '@none.xml'"},
      {"merge --search-options @managed.xml --user-data @user.xml --new-results @none.xml",
       kExitBadInput, "cannot read the new results '@none.xml'"},
      {"filter --filter 64 --matches @matches.xml", kExitBadInput, "--filter '64' is not a filter"},
      {"filter --filter 1 --matches /dev/zero", kExitBadInput,
       "cannot read the results document '/dev/zero': it is a device, not a file"},
      {"filter --filter 1 --matches @deep.xml", kExitBadInput,
       "the results document '@deep.xml' is over a limit: line 1, column 769: the elements are "
       "nested "
       "more than 256 deep"},
      {"locate --search-options @search.xml --save --output @out.xml", kExitBadInput,
       "--save needs the user data"},
      {"locate --search-options @search.xml --filter low-weights,bogus --output @out.xml",
       kExitBadInput, "--filter 'low-weights,bogus'"},
      {add + "@App --version-id 1 --database @fingerprint.xml", kExitBadInput,
       "application 1 already has a version 1"},
      {add + "@App --version-id 2 --database @broken.xml", kExitBadInput,
       "the fingerprint database '@broken.xml' is not well-formed XML"},
      {add + "@App --version-id -2 --database @db.xml", kExitBadInput,
       "--version-id: '-2' is not a"},
      {add + "@none --version-id 2 --database @db.xml", kExitBadInput,
       "the folder '@none' does not exist"},
  };
  ::testing::internal::CaptureStderr();
  for (const auto& [line, exitCode, begins] : cases) {
    auto [code, message] = Run(line);
    EXPECT_EQ(code, exitCode) << line;
    EXPECT_EQ(message.substr(0, Expand(begins).size()), Expand(begins));
  }
  ::testing::internal::GetCapturedStderr();
  EXPECT_FALSE(std::filesystem::exists(tree_.Native("out.xml")));
  EXPECT_FALSE(std::filesystem::exists(tree_.Native("db.xml")));
}

TEST_F(CommandsTest, SaveReplacesTheUserDataAndKeepsTheOldOneAsBackup) {
  ASSERT_EQ(Locate("--save --output @out.xml"), kExitOk);
  xml::Document saved;
  ASSERT_TRUE(saved.LoadXml(Read("inventory.xml")));
  EXPECT_EQ(saved.AsNode().CountNodes("/trl_applicationdata/c/m/d/a[@v_name='1.0']"), 1u);
  // The user data holds the inventory only; the run's events go to the output.
  EXPECT_EQ(saved.AsNode().CountNodes("//events"), 0u);
  EXPECT_THAT(Read("out.xml"), ::testing::HasSubstr("</events></trl_applicationdata>"));
  EXPECT_EQ(Read("inventory.xml.bak"), kEmptyUserData);
  // No temporary file is left beside them: two folders, eight inputs, out.xml, the backup and the
  // save's lock file.
  EXPECT_EQ(std::distance(std::filesystem::directory_iterator(tree_.Root()), {}), 13);
}

TEST_F(CommandsTest, CancelledRunNeverTouchesTheUserData) {
  // Ctrl-C arrives on the first pass of the event loop, before the search has begun.
  Timer interrupt;
  interrupt.Tick([&interrupt] {
    interrupt.Enabled(false);
    std::raise(SIGINT);
  });
  interrupt.Interval(1);
  interrupt.Enabled(true);
  int code = Locate("--save --output @out.xml");
  EXPECT_EQ(code, kExitInterrupted);
  EXPECT_EQ(Read("inventory.xml"), kEmptyUserData);
  EXPECT_FALSE(std::filesystem::exists(tree_.Native("inventory.xml.bak")));
  // What the search had when it stopped is written, marked as cancelled.
  EXPECT_THAT(Read("out.xml"), ::testing::HasSubstr("cancelled=\"1\""));
}

// After Ctrl-C, a run that does not end (its guard let go) within the grace period is not waited
// for, and one that ends in time is left to end as it will.
TEST(InterruptGuardTest, ARunThatDoesNotStopInTimeIsNotWaitedFor) {
  GTEST_FLAG_SET(death_test_style, "threadsafe");
  auto interrupted = [](bool stops) {
    {
      InterruptGuard guard([] { return std::string("gave up"); }, std::chrono::milliseconds(20));
      std::raise(SIGINT);
      if (!stops) std::this_thread::sleep_for(std::chrono::seconds(30));
    }
    std::exit(InterruptGuard::Requested() ? 7 : 0);
  };

  EXPECT_EXIT(interrupted(false), ::testing::ExitedWithCode(kExitInterrupted),
              "^trllocator: gave up\n$");
  EXPECT_EXIT(interrupted(true), ::testing::ExitedWithCode(7), "^$");
}

// The program ends as its child does: with the code it tells before ending, with the code it
// returns, or by the signal that ended it.
TEST(DetachedEndTest, TheProgramEndsAsItsChildDoes) {
  GTEST_FLAG_SET(death_test_style, "threadsafe");
  EXPECT_EXIT(std::exit(RunWithDetachedEnd([] {
                QuickEnd(5);
                return 6;
              })),
              ::testing::ExitedWithCode(5), "");
  EXPECT_EXIT(std::exit(RunWithDetachedEnd([] { return 4; })), ::testing::ExitedWithCode(4), "");
  EXPECT_EXIT(std::exit(RunWithDetachedEnd([] { return std::raise(SIGTERM); })),
              ::testing::KilledBySignal(SIGTERM), "");
  // Ctrl-C that no command handles: the parent does not wait for the child to be gone.
  EXPECT_EXIT(std::exit(RunWithDetachedEnd([] { return std::raise(SIGINT); })),
              ::testing::KilledBySignal(SIGINT), "");
}

TEST_F(CommandsTest, TableTellsWhatChangedSinceTheLastRun) {
  ASSERT_EQ(Locate("--save --format table --output @first.txt"), kExitOk);
  EXPECT_THAT(Read("first.txt"), ::testing::ContainsRegex("Tool +1\\.0 +100% +new\n"));

  tree_.AddFile("App/tool.exe", "three");
  ASSERT_EQ(Locate("--save --format table --output @second.txt"), kExitOk);
  std::string second = Read("second.txt");
  EXPECT_THAT(second, ::testing::ContainsRegex("Tool +2\\.0 +100% +updated from 1\\.0\n"));
  EXPECT_THAT(second, ::testing::HasSubstr("1 application listed, 1 changed since the last run"));
}

TEST_F(CommandsTest, FingerprintAddCreatesThenRewritesTheDatabase) {
  tree_.AddFile("share/Tool/README.md", "1");
  tree_.AddFolder("db");
  const std::string add =
      "fingerprint add --app-id 4 --app-name Tool --seq 1 --folder @share --database @db/fp.xml";
  EXPECT_EQ(Run(add + " --version-id 1 --version-name v1").first, kExitOk);
  ::testing::internal::CaptureStdout();
  EXPECT_EQ(Run(add + " --version-id 2 --version-name v2").first, kExitOk);
  EXPECT_EQ(::testing::internal::GetCapturedStdout(),
            Expand("@db/fp.xml: application 4, version 2 (v2): 2 files\n"));
  auto written = testing::Parse(Read("db/fp.xml"));
  EXPECT_EQ(testing::ValuesOf(*written, "/trl_fingerprint/a/v", "v_id"), (Strings{"1", "2"}));
  EXPECT_EQ(testing::ValuesOf(*written, "//f", "f_weight"), (Strings{"0", "1", "0", "1"}));
  // Neither a backup nor a temporary file is left beside the database, only its lock file.
  EXPECT_EQ(std::distance(std::filesystem::directory_iterator(tree_.Native("db")), {}), 2);
}

TEST_F(CommandsTest, TheCacheChangesNoDocumentAndASecondRunReadsNoFile) {
  tree_.AddFile("App/lib.dll", "library");
  ::testing::internal::CaptureStdout();
  ASSERT_EQ(Run("fingerprint add --app-id 4 --app-name App --version-id 1 --version-name 1 --seq 1 "
                "--folder @App --database @digests.xml --no-cache")
                .first,
            kExitOk);
  ::testing::internal::GetCapturedStdout();
  // What a locate run writes, and the property cache's line among what it prints.
  auto locate = [&](const std::string& options) {
    ::testing::internal::CaptureStderr();
    Run("locate @App --fingerprint @digests.xml -v --output @out.xml " + options);
    std::string printed = ::testing::internal::GetCapturedStderr();
    size_t at = printed.find("trllocator: property cache:");
    return std::make_pair(Read("out.xml"), at == std::string::npos
                                               ? ""
                                               : printed.substr(at, printed.find('\n', at) - at));
  };
  const std::string cache = "--cache @cache/properties.sqlite";
  auto counts = [](int reused, int read, int stored) {
    return fmt::format(
        "trllocator: property cache: {} values reused, {} files read, {} values stored", reused,
        read, stored);
  };
  // Files written a moment ago: their times cannot vouch for them yet.
  auto [document, line] = locate(cache);
  EXPECT_EQ(line, counts(0, 3, 0));
  EXPECT_THAT(document, ::testing::HasSubstr("a_id=\"4\""));  // the version was found
  std::this_thread::sleep_for(std::chrono::milliseconds(2100));
  EXPECT_EQ(locate(cache), std::make_pair(document, counts(0, 3, 3)));
  EXPECT_EQ(locate(cache), std::make_pair(document, counts(3, 0, 0)));
  EXPECT_EQ(locate("--no-cache"), std::make_pair(document, std::string()));
}

TEST(CacheFileTest, TheOptionThenXdgCacheHomeThenHome) {
  // Options, XDG_CACHE_HOME, HOME (nullptr: not set) and the file the cache is kept in.
  const std::tuple<CacheOptions, const char*, const char*, std::string> cases[] = {
      {{"c.db", false}, "/xdg", "/home/u", "c.db"},
      {{"", true}, "/xdg", "/home/u", ""},
      {{}, "/xdg", "/home/u", "/xdg/trllocator/properties.sqlite"},
      {{}, "xdg", "/home/u", "/home/u/.cache/trllocator/properties.sqlite"},  // must be absolute
      {{}, nullptr, nullptr, ""},
  };
  auto set = [](const char* name, const char* value) {
    value ? ::setenv(name, value, 1) : ::unsetenv(name);
  };
  auto saved = [](const char* name) {
    const char* value = std::getenv(name);
    return value ? std::optional<std::string>(value) : std::nullopt;
  };
  const std::optional<std::string> xdg = saved("XDG_CACHE_HOME"), home = saved("HOME");
  for (const auto& [options, xdgCacheHome, homeFolder, file] : cases) {
    set("XDG_CACHE_HOME", xdgCacheHome);
    set("HOME", homeFolder);
    EXPECT_EQ(CacheFile(options), file) << (xdgCacheHome ? xdgCacheHome : "-");
  }
  set("XDG_CACHE_HOME", xdg ? xdg->c_str() : nullptr);
  set("HOME", home ? home->c_str() : nullptr);
}

// Contents are RFC 1321 test inputs, so the expected digests are the published ones.
TEST_F(CommandsTest, DescribesEveryFileWithItsFolderWeightSizeAndDigest) {
  // Rows: path below the installation, content, f_relpath, f_weight (2 for documentation, 3 for
  // the rest) and digest; in the expected order: a folder's files by name (byte order), then its
  // subfolders.
  const std::vector<std::array<std::string, 5>> cases = {
      {"ChangeLog", "abc", "", "2", "900150983cd24fb0d6963f7d28e17f72"},
      {"README", "", "", "2", "d41d8cd98f00b204e9800998ecf8427e"},
      {"md", "a", "", "3", "0cc175b9c0f1b6a831c399e269772661"},
      {"my-readme", "abc", "", "3", "900150983cd24fb0d6963f7d28e17f72"},
      {"tool", "", "", "3", "d41d8cd98f00b204e9800998ecf8427e"},
      {"lib/License-MIT", "a", "lib", "2", "0cc175b9c0f1b6a831c399e269772661"},
      {"lib/main.js", "message digest", "lib", "3", "f96b697d7cb7938d525a2f31aaf161d0"},
      {"lib/sub/.hidden", "abc", "lib\\sub", "3", "900150983cd24fb0d6963f7d28e17f72"},
      {"lib/sub/notes.MD", "", "lib\\sub", "2", "d41d8cd98f00b204e9800998ecf8427e"},
  };
  tree_.AddFolder("ref/lib/sub");
  tree_.AddFolder("ref/empty");
  for (auto it = cases.rbegin(); it != cases.rend(); ++it)
    tree_.AddFile("ref/" + (*it)[0], (*it)[1]);
  ReferenceVersion version = Version("1", "10");
  version.docWeight = 2;
  version.fileWeight = 3;
  xml::Document database;
  Add(database, version);

  std::vector<xml::Node> files = database.AsNode().SelectNodes("/trl_fingerprint/a/v/f");
  ASSERT_EQ(files.size(), cases.size());
  for (size_t i = 0; i < cases.size(); ++i) {
    const auto& [path, content, relpath, weight, md5] = cases[i];
    EXPECT_EQ(
        files[i].Xml(),
        fmt::format(R"(<f f_id="{}" f_name="{}" f_relpath="{}" f_weight="{}"><p p_type="2" )"
                    R"(p_weight="1" p_value="{}"/><p p_type="3" p_weight="2" p_value="{}"/></f>)",
                    i + 1, path.substr(path.rfind('/') + 1), relpath, weight, content.size(), md5))
        << path;
  }
  EXPECT_EQ(database.DocumentElement().SelectSingleNode("a/v").Attributes(),
            (std::vector<std::pair<std::string, std::string>>{
                {"v_id", "10"}, {"v_name", "1.0"}, {"v_seq", "3"}}));
}

TEST_F(CommandsTest, VersionsGoToTheApplicationWithTheSameIdAndATakenIdNeedsReplace) {
  tree_.AddFolder("ref");
  tree_.AddFile("ref/tool", "new");
  const std::string before = R"(<db><a a_id="1" a_name="Other"/><a a_id="7" a_name="Old name">)"
                             R"(<v v_id="1"/><v v_id="2" v_name="old"/><v v_id="3"/></a></db>)";
  auto database = testing::Parse(before);
  EXPECT_THROW(Add(*database, Version("7", "2")), CommandError);
  EXPECT_EQ(database->Xml(), before);

  ReferenceVersion again = Version("7", "2");
  again.replace = true;
  Add(*database, again);
  ReferenceVersion added = Version("7", "4");
  added.parentId = "1";
  Add(*database, added);
  ReferenceVersion another = Version("8", "1");
  another.parentId = "7";
  another.appName.reset();
  EXPECT_THROW(Add(*database, another), CommandError);  // a new application needs its name
  another.appName = "Tool";
  Add(*database, another);

  EXPECT_EQ(testing::ValuesOf(*database, "/db/a", "a_name"),
            (Strings{"Other", "Old name", "Tool"}));
  EXPECT_EQ(testing::ValuesOf(*database, "/db/a", "a_parent"),
            (Strings{"<absent>", "<absent>", "7"}));
  EXPECT_EQ(testing::ValuesOf(*database, "/db/a[@a_id='7']/v", "v_id"),
            (Strings{"1", "2", "3", "4"}));
  EXPECT_EQ(testing::ValuesOf(*database, "/db/a/v[@v_id='2']/f/p[@p_type='2']", "p_value"),
            Strings{"3"});
}

TEST(FilterNamesTest, NumbersAndNamesGiveTheOptionBitsAndAnythingElseIsRefused) {
  const std::pair<const char*, int16_t> accepted[] = {
      {"63", 63},
      {"007", 7},
      {"missing-files,low-file-count,duplicate-matches,flag-unknowns", 30},
      {"low-weights,low-weights", 1},
      {"all", 63}};
  for (auto [text, options] : accepted) EXPECT_EQ(ParseFilterOptions(text), options) << text;
  for (const char* text :
       {"", "64", "-1", "3x", "Low-Weights", "low-weights,", ",all", "99999999999999999999"}) {
    EXPECT_THROW(ParseFilterOptions(text), CommandError) << text;
  }
}

}  // namespace
}  // namespace trl::cli
