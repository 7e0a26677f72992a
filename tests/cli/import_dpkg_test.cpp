#include <fmt/format.h>
#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include <CLI/CLI.hpp>
#include <algorithm>
#include <cstdlib>
#include <filesystem>
#include <fstream>
#include <iterator>
#include <string>
#include <tuple>
#include <vector>

#include "command_error.h"
#include "debian_version.h"
#include "fingerprint_command.h"
#include "package_import.h"
#include "support/documents.h"
#include "support/temp_tree.h"

namespace trl::cli {
namespace {

using Strings = std::vector<std::string>;

const bool kHaveDpkg = std::filesystem::exists("/usr/bin/dpkg");

TEST(DebianVersionTest, OrdersAsThePackageManagerDoes) {
  const std::vector<std::tuple<std::string, std::string, int>> cases = {
      {"1.0~rc1", "1.0", -1},  {"1.0~~", "1.0~~a", -1},     {"1.0~~a", "1.0~", -1},
      {"1.0", "1.0a", -1},     {"1.0a", "1.0+", -1},        {"1.0a", "1.0.a", -1},
      {"1.0", "1.0+b1", -1},   {"1.9", "1.10", -1},         {"1.01", "1.1", 0},
      {"1:0.1", "2.0", 1},     {"9:2", "10:1", -1},         {"0:1.0", "1.0", 0},
      {"1.0", "1.0-0", 0},     {"1.0-1~bpo1", "1.0-1", -1}, {"1.0-2", "1.0-10", -1},
      {"2.30-1", "2.3-10", 1}, {"1.2-3-4", "1.2-3-10", -1}, {"1.0-a", "1.0-A", 1},
      {"1-1-1", "1-1a-1", -1}, {"1.19", "1.20", -1},
  };
  for (const auto& [a, b, sign] : cases) {
    int got = CompareDebianVersions(a, b), back = CompareDebianVersions(b, a);
    EXPECT_EQ((got > 0) - (got < 0), sign) << a << " vs " << b;
    EXPECT_EQ((back > 0) - (back < 0), -sign) << b << " vs " << a;
    if (!kHaveDpkg) continue;
    const char* relation = sign < 0 ? "lt" : sign > 0 ? "gt" : "eq";
    EXPECT_EQ(
        std::system(fmt::format("dpkg --compare-versions '{}' {} '{}'", a, relation, b).c_str()), 0)
        << "dpkg disagrees: " << a << " " << relation << " " << b;
  }
}

TEST(DocumentationPathTest, FoldersThatOnlyDocumentWeighNothingWhereverUsrShareStands) {
  const std::vector<std::pair<std::string, bool>> cases = {
      {"usr/share/doc/tar/copyright", true},     {"opt/x/usr/share/man/man1/t.1", true},
      {"usr/share/lintian/overrides/tar", true}, {"usr/share/docs/tar", false},
      {"opt/myusr/share/info/t", false},         {"usr/lib/usr/share/locale/de/t.mo", true}};
  for (const auto& [path, documentation] : cases) {
    EXPECT_EQ(IsDocumentationPath(path), documentation) << path;
  }
}

// A fake admin dir and root with "tool" 1.0-1 installed and "other" (Multi-Arch: same), which
// diverts tool's usr/bin/helper and shares usr/lib/shared.so with it; beside it a .deb of tool
// 1.0~rc1-1, an older version.
class ImportDpkgTest : public ::testing::Test {
 protected:
  void SetUp() override {
    if (!kHaveDpkg) GTEST_SKIP() << "dpkg-deb is needed to build a .deb";
    for (const char* folder : {"admin/info", "root/usr/bin", "root/usr/lib", "root/etc",
                               "root/usr/share/doc/tool", "deb/DEBIAN", "deb/usr/bin"})
      tree_.AddFolder(folder);
    tree_.AddFile("admin/status",
                  "Package: tool\nStatus: install ok installed\nArchitecture: amd64\n"
                  "Version: 1.0-1\nConffiles:\n /etc/tool.conf " +
                      kAbc + "\n /etc/old.conf " + kEmpty +
                      " obsolete\n\nPackage: gone\nStatus: deinstall ok config-files\n"
                      "Version: 1\n\nPackage: other\nStatus: install ok installed\n"
                      "Architecture: amd64\nMulti-Arch: same\nVersion: 2\n\nPackage: tool-doc\n"
                      "Status: install ok installed\nVersion: 1\n");
    tree_.AddFile("admin/info/tool.md5sums", kA + "  usr/bin/tool\n" + kA + "  usr/bin/helper\n" +
                                                 kA + "  usr/lib/shared.so\n" + kA +
                                                 "  usr/share/doc/tool/copyright\n" + kA +
                                                 "  usr/bin/missing\n" + kA + "  etc/tool.conf\n");
    tree_.AddFile("admin/info/other:amd64.md5sums", kEmpty + "  usr/lib/shared.so\n");
    tree_.AddFile("admin/info/tool-doc.md5sums", kA + "  usr/share/man/man1/tool.1.gz\n");
    tree_.AddFile("admin/diversions", "/usr/bin/helper\n/usr/bin/helper.tool\nother\n");
    for (const char* file : {"usr/bin/tool", "usr/bin/helper.tool", "usr/lib/shared.so",
                             "usr/share/doc/tool/copyright", "etc/tool.conf"})
      tree_.AddFile(std::string("root/") + file, "four");
    tree_.AddFile("deb/DEBIAN/control",
                  "Package: tool\nVersion: 1.0~rc1-1\nArchitecture: amd64\nMaintainer: A <a@b.c>\n"
                  "Description: a tool\n");
    tree_.AddFile("deb/DEBIAN/md5sums", kAbc + "  usr/bin/tool\n" + kAbc + "  usr/bin/tool2\n");
    tree_.AddFile("deb/usr/bin/tool", "sixsix");
    std::filesystem::create_hard_link(tree_.Native("deb/usr/bin/tool"),
                                      tree_.Native("deb/usr/bin/tool2"));
    ASSERT_EQ(std::system(fmt::format("dpkg-deb --root-owner-group --build {} {} >/dev/null",
                                      tree_.Native("deb"), tree_.Native("tool.deb"))
                              .c_str()),
              0);
    tree_.AddFile("fp.xml", R"(<trl_fingerprint><a a_id="7" a_name="by hand"/></trl_fingerprint>)");
  }

  std::pair<int, std::string> Import(const std::string& more,
                                     const std::string& admin = "admin") const {
    std::vector<std::string> args = testing::Words(
        fmt::format("fingerprint import-dpkg --admindir {} --root {} --database {} {}",
                    tree_.Native(admin), tree_.Native("root"), tree_.Native("fp.xml"), more));
    try {
      CLI::App app;
      auto run = AddFingerprintCommand(app);
      std::reverse(args.begin(), args.end());
      app.parse(args);
      return {run(), ""};
    } catch (const CommandError& error) {
      return {error.ExitCode(), error.what()};
    }
  }

  // Each file of a version as "relpath name weight", then its property values in order.
  Strings Files(xml::Document& database, const std::string& version) const {
    Strings files;
    for (const xml::Node& f :
         database.AsNode().SelectNodes("//a[@a_name='tool']/v[@v_name='" + version + "']/f")) {
      files.push_back(fmt::format("{} {} {}", *f.GetAttribute("f_relpath"),
                                  *f.GetAttribute("f_name"), *f.GetAttribute("f_weight")));
      for (const xml::Node& p : f.ChildElements("p"))
        files.back() += " " + *p.GetAttribute("p_value");
    }
    return files;
  }

  xml::DocumentPtr Database() const {
    std::ifstream in(tree_.Native("fp.xml"));
    return testing::Parse(std::string(std::istreambuf_iterator<char>(in), {}));
  }

  const std::string kEmpty = "d41d8cd98f00b204e9800998ecf8427e",
                    kA = "0cc175b9c0f1b6a831c399e269772661",
                    kAbc = "900150983cd24fb0d6963f7d28e17f72";
  testing::TempTree tree_;
};

TEST_F(ImportDpkgTest, InstalledAndArchivedVersionsKeepTheirIdsAndFollowDebianOrder) {
  ::testing::internal::CaptureStdout();
  ASSERT_EQ(Import("tool --deb " + tree_.Native("tool.deb")).first, kExitOk);
  EXPECT_THAT(
      ::testing::internal::GetCapturedStdout(),
      ::testing::EndsWith(": 2 versions added, 0 described again, 8 files (1 not on disk)\n"));
  auto first = Database();
  EXPECT_EQ(testing::ValuesOf(*first, "/*/a", "a_id"), (Strings{"7", "8"}));
  EXPECT_EQ(testing::ValuesOf(*first, "/*/a[@a_id='8']/v", "v_id"), (Strings{"1", "2"}));
  EXPECT_EQ(testing::ValuesOf(*first, "/*/a[@a_id='8']/v", "v_seq"), (Strings{"2", "1"}));
  // Documentation, the conffile and the file "other" also lists weigh 0; the diverted file lives
  // where the diversion put it; a file missing on disk keeps its digest but has no size.
  EXPECT_EQ(Files(*first, "1.0-1"),
            (Strings{"etc tool.conf 0 " + kAbc, "usr\\bin helper.tool 1 4 " + kA,
                     "usr\\bin missing 1 " + kA, "usr\\bin tool 1 4 " + kA,
                     "usr\\lib shared.so 0 4 " + kA, "usr\\share\\doc\\tool copyright 0 4 " + kA}));
  EXPECT_EQ(Files(*first, "1.0~rc1-1"),
            (Strings{"usr\\bin tool 1 6 " + kAbc, "usr\\bin tool2 1 6 " + kAbc}));

  ASSERT_EQ(Import("other:amd64 tool --deb " + tree_.Native("tool.deb")).first, kExitOk);
  auto second = Database();
  EXPECT_EQ(testing::ValuesOf(*second, "/*/a", "a_name"),
            (Strings{"by hand", "tool", "other:amd64"}));
  EXPECT_EQ(testing::ValuesOf(*second, "/*/a", "a_id"), (Strings{"7", "8", "9"}));
  EXPECT_EQ(second->AsNode().SelectSingleNode("//a[@a_id='8']").Xml(),
            first->AsNode().SelectSingleNode("//a[@a_id='8']").Xml());
  // The file both packages list weighs 0 for "other" too; a package of documentation only is
  // known by its documentation.
  EXPECT_EQ(testing::ValuesOf(*second, "//a[@a_id='9']/v/f", "f_weight"), Strings{"0"});
  ASSERT_EQ(Import("tool-doc").first, kExitOk);
  EXPECT_EQ(testing::ValuesOf(*Database(), "//a[@a_name='tool-doc']/v/f", "f_weight"),
            Strings{"1"});
}

TEST_F(ImportDpkgTest, BadRequestsSayWhatIsWrongAndWriteNothing) {
  tree_.AddFile("broken.deb", "not an archive");
  const std::vector<std::tuple<std::string, std::string, std::string>> cases = {
      {"gone", "admin", "the package 'gone' is not installed"},
      {"--deb " + tree_.Native("broken.deb"), "admin", "broken.deb': dpkg-deb: error"},
      {"--all", "nowhere", "cannot read the package database file"},
  };
  for (const auto& [line, admin, message] : cases) {
    auto [code, said] = Import(line, admin);
    EXPECT_EQ(code, kExitBadInput) << line;
    EXPECT_THAT(said, ::testing::HasSubstr(message)) << line;
  }
  EXPECT_EQ(testing::ValuesOf(*Database(), "/*/a", "a_id"), Strings{"7"});
}

}  // namespace
}  // namespace trl::cli
