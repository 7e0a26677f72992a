#include <gtest/gtest.h>
#include <sys/stat.h>

#include <CLI/CLI.hpp>
#include <algorithm>
#include <fstream>
#include <functional>
#include <iterator>
#include <map>

#include "command_error.h"
#include "compare_command.h"
#include "document_check.h"
#include "document_files.h"
#include "document_kind.h"
#include "filter_command.h"
#include "fingerprint_command.h"
#include "inventory_command.h"
#include "locate_command.h"
#include "manage_command.h"
#include "merge_command.h"
#include "native_path.h"
#include "path_search_options.h"
#include "search_command.h"
#include "support/documents.h"
#include "support/temp_tree.h"
#include "terminal_text.h"

namespace trl::cli {
namespace {

TEST(DocumentKindTest, EachKindIsToldByItsRootAndWhatLiesBelowIt) {
  using K = DocumentKind;
  const std::pair<const char*, DocumentKind> cases[] = {
      {"<o><c><m><d><a a_manage='1'/></d></m></c></o>", K::kSearchOptions},
      {"<trl_applicationoptions/>", K::kApplicationOptions},
      {"<o a_selected='0'/>", K::kApplicationOptions},
      {"<o><a a_id='1' a_selected='0'/></o>", K::kApplicationOptions},
      {"<trl_fingerprint/>", K::kFingerprint},
      {"<fp><a><v/></a></fp>", K::kFingerprint},
      {"<fp><a><f/></a></fp>", K::kFingerprint},
      {"<fp><a><a/></a></fp>", K::kFingerprint},
      {"<trl_applicationdata><c><m><d><f/></d></m></c></trl_applicationdata>", K::kLocalFiles},
      {"<trl_applicationdata><c><m><d><a/></d></m></c></trl_applicationdata>", K::kResults},
      {"<trl_applicationdata><a_missing/></trl_applicationdata>", K::kResults},
      {"<trl_applicationdata><c/></trl_applicationdata>", K::kEmptyResults},
      {"<events/>", K::kOther},
      {"<e/>", K::kOther},
      {"<o><a a_id='1'/></o>", K::kUnknown},
  };
  for (const auto& [text, kind] : cases) EXPECT_EQ(KindOf(*testing::Parse(text)), kind) << text;
}

// Each flaw found, with the element's place: a missing attribute, an id that is no number or is
// used twice, a weight out of range, an apostrophe in a name, versions no file tells apart.
TEST(DocumentCheckTest, EachFlawIsFoundWithItsPlace) {
  const std::string version =
      "v_name='1' v_seq='1'><f f_id='1' f_name='x' f_weight='16'><p "
      "p_type='2' p_weight='1' p_value='3'/></f></v>";
  const std::pair<std::string, std::vector<std::string>> cases[] = {
      {"<fp><a a_id='1' a_name='A'><v v_id='1' " + version + "<v v_id='x' " + version +
           "</a><a a_id='1'/></fp>",
       {"a[a_id=1]: has no a_name", "a[a_id=1]: a_id 1 is used twice in the document",
        "a[a_id=1]/v[v_id=x]: v_id 'x' is not a number",
        "a[a_id=1]/v[v_id=1]/f[f_id=1]: f_weight '16' is not a whole number from 0 to 15",
        "a[a_id=1]/v[v_id=x]/f[f_id=1]: f_weight '16' is not a whole number from 0 to 15",
        "a[a_id=1]/v[v_id=x]: cannot be told apart from a[a_id=1]/v[v_id=1] by any file"}},
      {"<o><c c_text='h' c_name=\"h'x\"><m m_text='' m_name=''><d/></m></c></o>",
       {"c: c_name holds an apostrophe, which breaks the selections it is used in",
        "c/m/d: has no d_text"}},
  };
  for (const auto& [text, findings] : cases) {
    auto document = testing::Parse(text);
    EXPECT_EQ(CheckDocument(*document, KindOf(*document)), findings) << text;
  }
}

class DocumentFilesTest : public ::testing::Test {
 protected:
  std::string Read(const std::string& name) const {
    std::ifstream in(tree_.Native(name), std::ios::binary);
    return {std::istreambuf_iterator<char>(in), {}};
  }
  // The message of the CommandError (exit 2) that loading `name` for `role` ends in, or "".
  std::string Refusal(const std::string& name, const DocumentRole& role) const {
    try {
      LoadDocumentFile(tree_.Native(name), role);
    } catch (const CommandError& error) {
      EXPECT_EQ(error.ExitCode(), kExitBadInput);
      return error.what();
    }
    return "";
  }
  // Runs a locate or fingerprint command line, "@name" naming a file of the tree; answers the exit
  // code and the message of the error that ended it.
  std::pair<int, std::string> Run(const std::string& line) const {
    std::vector<std::string> args = testing::Words(line);
    for (auto& arg : args) {
      if (arg.starts_with("@")) arg = tree_.Native(arg.substr(1));
    }
    static const std::map<std::string, std::function<std::function<int()>(CLI::App&)>> kCommands{
        {"search", AddSearchCommand},       {"compare", AddCompareCommand},
        {"filter", AddFilterCommand},       {"merge", AddMergeCommand},
        {"locate", AddLocateCommand},       {"fingerprint", AddFingerprintCommand},
        {"inventory", AddInventoryCommand}, {"manage", AddManageCommand}};
    CLI::App app;
    auto run = kCommands.at(args[0])(app);
    std::reverse(args.begin(), args.end());
    app.parse(args);
    try {
      return {run(), ""};
    } catch (const CommandError& error) {
      return {error.ExitCode(), error.what()};
    }
  }
  testing::TempTree tree_;
};

TEST(PrintableTest, ControlsAndBytesThatAreNotUtf8AreEscaped) {
  EXPECT_EQ(Printable("a\x1b[31mb\x7f\xc2\x9b\xff\xc3\xa9\xe2\x82"),
            "a\\x1b[31mb\\x7f\\xc2\\x9b\\xff\xc3\xa9\\xe2\\x82");
}

// A document is refused, naming the file and what it holds, for an option that takes another
// kind, and nothing is written: neither the fingerprint a locate would save over nor the search
// options a fingerprint would be added to.
TEST_F(DocumentFilesTest, AFileOfAnotherKindIsRefusedBeforeAnythingIsWritten) {
  const std::string search = "<o><c c_text='localhost'/></o>";
  const std::string fingerprint = "<fp><a a_id='1'><v v_id='1'/></a></fp>";
  tree_.AddFile("search.xml", search);
  tree_.AddFile("fp.xml", fingerprint);
  tree_.AddFile("empty.xml");
  tree_.AddFile("user.xml", "<trl_applicationdata/>");
  EXPECT_EQ(Refusal("fp.xml", kUserDataRole),
            "'" + tree_.Native("fp.xml") +
                "' was given as the user data, but it holds a "
                "fingerprint database (applications with versions); nothing was written");
  EXPECT_NE(Refusal("search.xml", kFingerprintRole).find("holds search options"),
            std::string::npos);
  EXPECT_EQ(Refusal("empty.xml", kSearchOptionsRole),
            "the search options '" + tree_.Native("empty.xml") + "' is empty");
  EXPECT_EQ(Refusal("user.xml", kUserDataRole), "");
  EXPECT_EQ(Refusal("user.xml", kLocalFilesRole), "");
  for (const char* line :
       {"locate --search-options @search.xml --fingerprint @fp.xml --user-data @fp.xml --save",
        "locate --search-options @fp.xml", "locate --application-options @fp.xml",
        "locate --fingerprint @search.xml", "search --search-options @fp.xml",
        "search @ --fingerprint @search.xml", "search @ --results @fp.xml",
        "search @ --application-options @search.xml",
        "compare --local-files @fp.xml "
        "--fingerprint @fp.xml",
        "compare --local-files @user.xml --fingerprint @search.xml",
        "filter --filter 0 --matches @search.xml",
        "merge --search-options @fp.xml --user-data @user.xml "
        "--new-results @user.xml",
        "merge --search-options @search.xml --user-data @fp.xml "
        "--new-results @user.xml",
        "merge --search-options @search.xml --user-data @user.xml "
        "--new-results @search.xml",
        "fingerprint add --folder @ --app-id 1 --app-name A "
        "--version-id 2 --version-name 2 --seq 2 --database @search.xml"}) {
    auto [status, message] = Run(line);
    EXPECT_NE(message.find("was given as the"), std::string::npos) << line << ": " << message;
  }
  tree_.AddFolder("ref");
  tree_.AddFile("ref/a");
  auto [status, message] =
      Run("fingerprint add --folder @ref --app-id 2 --app-name \x1b[31mred --version-id 1 "
          "--version-name 1 --seq 1 --database @fp.xml");
  EXPECT_EQ(status, kExitBadInput) << message;
  EXPECT_EQ(Read("fp.xml"), fingerprint);
  EXPECT_EQ(Read("search.xml"), search);
}

// Folders named as a shell passes them (relative, with blanks, mixed case, a byte that is not
// UTF-8) become one folder entry each, in the component's form; a path that is no folder is
// refused.
TEST_F(DocumentFilesTest, FoldersGivenOnTheCommandLineAreSearchedAsGiven) {
  tree_.AddFolder("My Dir/CLI\xff");
  tree_.AddFile("file");
  auto cwd = std::filesystem::current_path();
  std::filesystem::current_path(tree_.Root());
  auto options = SearchOptionsForPaths({"My Dir/./CLI\xff", tree_.Root()});
  EXPECT_EQ(testing::ValuesOf(*options, "//c/m/d", "d_text"),
            (std::vector<std::string>{tree_.Path("My Dir/CLI\xff") + "\\", tree_.Path() + "\\"}));
  EXPECT_EQ(KindOf(*options), DocumentKind::kSearchOptions);
  // A folder the documents hold lower-cased is shown as the disk spells it, in its own bytes.
  EXPECT_EQ(NativePath(testing::Lower(tree_.Path("My Dir/CLI\xff")) + "\\"),
            tree_.Native("My Dir/CLI\xff") + "/");
  tree_.AddFile("My Dir/CLI\xff/inside");
  ASSERT_EQ(Run("search . --exclude CLI* -o @out.xml").first, kExitOk);
  EXPECT_EQ(Read("out.xml").find("inside"), std::string::npos);
  EXPECT_NE(Read("out.xml").find("f_text=\"file\""), std::string::npos);
  std::string left;
  auto wholeDisk = SearchOptionsForPaths({"/"});
  for (const auto& glob : wholeDisk->AsNode().SelectNodes("//d_search_exclude")) {
    left += glob.Text() + " ";
  }
  EXPECT_EQ(left, "/proc /sys /dev ");
  EXPECT_THROW(SearchOptionsForPaths({"file"}), CommandError);
  EXPECT_THROW(SearchOptionsForPaths({"none"}), CommandError);
  // A warning names the folder natively, in the case the disk has where it exists.
  tree_.AddFile("gone.xml",
                "<o><c c_id='1' c_text='localhost' c_name='localhost' c_local='1'>"
                "<m m_id='1' m_text='' m_name=''><d d_id='1' d_text='" +
                    testing::Lower(tree_.Path("My Dir")) +
                    "\\Gone\\' d_search='1'><d_search_mask/></d></m></c></o>");
  ::testing::internal::CaptureStderr();
  Run("search --search-options @gone.xml -o @out.xml");
  EXPECT_EQ(
      ::testing::internal::GetCapturedStderr(),
      "trllocator: warning: Path '" + tree_.Native("My Dir/Gone/") + "' could not be found\n");
  std::filesystem::current_path(cwd);
}

// The first save makes the user data; a run that completes with a failure reported (a property
// of an unknown type) exits 3; a log that cannot be written stops the command before it runs.
TEST_F(DocumentFilesTest, FirstSaveMakesTheUserDataAndReportedFailuresExitThree) {
  tree_.AddFolder("app");
  tree_.AddFile("app/tool.exe", "x");
  tree_.AddFile("fp.xml",
                "<fp><a a_id='1' a_name='Tool'><v v_id='1' v_name='1' v_seq='1'><f f_id='1' "
                "f_name='tool.exe' f_relpath='' f_weight='1'><p p_type='9' p_weight='1' "
                "p_value='x'/></f></v></a></fp>");
  EXPECT_EQ(Run("locate @app --fingerprint @fp.xml --user-data @user.xml --save --sync "
                "--output @out.xml")
                .first,
            kExitFailuresReported);
  ::testing::internal::CaptureStdout();
  EXPECT_EQ(Run("inventory --user-data @user.xml").first, kExitOk);
  EXPECT_NE(::testing::internal::GetCapturedStdout().find("localhost  " + tree_.Native("app/")),
            std::string::npos);
  auto [failed, said] =
      Run("locate @app --fingerprint @fp.xml --user-data @user.xml --save "
          "--output @none/out.xml");
  EXPECT_EQ(failed, kExitFailed);
  EXPECT_TRUE(said.ends_with("; the user data was saved to '" + tree_.Native("user.xml") + "'"));
  tree_.AddFile("fp.xml", "<fp><a a_id='1' a_name='Tool'/></fp>");
  ::testing::internal::CaptureStderr();
  EXPECT_EQ(Run("locate @app --fingerprint @fp.xml -v --log @log.txt --output @out.xml").first,
            kExitOk);  // no failure: the run log's entries are shown, but count for nothing
  EXPECT_NE(::testing::internal::GetCapturedStderr().find("Locate.Start: Created XML DOM objects"),
            std::string::npos);
  auto [status, message] = Run("locate @app --fingerprint @fp.xml --log @none/x.log");
  EXPECT_EQ(status, kExitBadInput);
  EXPECT_EQ(message,
            "cannot write the log '" + tree_.Native("none/x.log") + "': No such file or directory");
  // A file that cannot be read is named, once, though every version that looks at it reports it.
  std::filesystem::remove(tree_.Native("app/tool.exe"));
  ASSERT_EQ(mkfifo(tree_.Native("app/tool.exe").c_str(), 0600), 0);
  std::string version =
      "<f f_id='1' f_name='tool.exe' f_relpath='' f_weight='1'><p p_type='3' "
      "p_weight='1' p_value='x'/></f></v>";
  tree_.AddFile("fp.xml", "<fp><a a_id='1' a_name='Tool'><v v_id='1' v_name='1' v_seq='1'>" +
                              version + "<v v_id='2' v_name='2' v_seq='2'>" + version +
                              "</a></fp>");
  ::testing::internal::CaptureStderr();
  EXPECT_EQ(Run("locate @app --fingerprint @fp.xml --sync --output @out.xml").first,
            kExitFailuresReported);
  EXPECT_EQ(::testing::internal::GetCapturedStderr(),
            "trllocator: error: '" + tree_.Native("app/tool.exe") + "': Path/File access error\n");
  // A second run on the user data the first saved, naming no other document, runs on the bundled
  // example as the first did, rather than on no documents at all.
  ASSERT_EQ(Run("locate --user-data @example.xml --save --sync -q --output @out.xml").first,
            kExitOk);
  EXPECT_EQ(Run("locate --user-data @example.xml --sync -q --output @out.xml").first, kExitOk);
}

// An application found and saved on a run over folders is watched from then on: once its folder is
// gone, the next run over the same folders reports it missing; unless the user stopped watching it.
TEST_F(DocumentFilesTest, AnApplicationSavedFromFoldersIsReportedMissingOnceGone) {
  tree_.AddFolder("tree/app");
  tree_.AddFile("tree/app/tool.exe", "x");
  tree_.AddFile("fp.xml",
                "<fp><a a_id='1' a_name='Tool'><v v_id='1' v_name='1' v_seq='1'><f f_id='1' "
                "f_name='tool.exe' f_relpath='' f_weight='1'/></v></a></fp>");
  const std::string run =
      "locate @tree --fingerprint @fp.xml --user-data @user.xml --save --sync "
      "--format table --output @table.txt";
  ASSERT_EQ(Run(run).first, kExitOk);
  EXPECT_NE(Read("table.txt").find("Tool         1        100%   new"), std::string::npos);
  std::string saved = Read("user.xml");
  EXPECT_EQ(Run("manage --user-data @user.xml @nowhere").first, kExitBadInput);
  EXPECT_EQ(Read("user.xml"), saved);
  std::filesystem::remove_all(tree_.Native("tree/app"));
  ASSERT_EQ(Run(run).first, kExitOk);
  EXPECT_NE(Read("table.txt").find("Tool         1        -      missing"), std::string::npos)
      << Read("table.txt");
  tree_.AddFolder("tree/app");
  tree_.AddFile("tree/app/tool.exe", "x");
  ASSERT_EQ(Run(run).first, kExitOk);
  EXPECT_NE(Read("table.txt").find("new; still on the missing list"), std::string::npos)
      << Read("table.txt");
  tree_.AddFile("user.xml", saved);
  std::filesystem::remove_all(tree_.Native("tree/app"));
  ASSERT_EQ(Run("manage --user-data @user.xml --off tool").first, kExitOk);
  ASSERT_EQ(Run(run).first, kExitOk);
  EXPECT_EQ(Read("table.txt").find("missing"), std::string::npos) << Read("table.txt");
}

}  // namespace
}  // namespace trl::cli
