#include "platform/fs/posix/posix_file_system.h"

#include <dirent.h>
#include <fcntl.h>
#include <gmock/gmock.h>
#include <gtest/gtest.h>
#include <sys/stat.h>
#include <sys/wait.h>
#include <unistd.h>

#include <functional>
#include <map>
#include <set>
#include <tuple>

#include "platform/failure.h"
#include "platform/fs/dos_attributes.h"
#include "platform/fs/posix/sys_calls.h"
#include "platform/fs/posix/walk_memory.h"
#include "platform/text.h"
#include "support/failure_of.h"
#include "support/fault_injecting_file_system.h"
#include "support/temp_tree.h"

namespace trl::fs {
namespace {

using ::testing::ElementsAre;
using ::testing::ElementsAreArray;
using trl::testing::FaultInjectingFileSystem;
using trl::testing::TempTree;

// The failure number `action` raises, 0 when it raises none.
using testing::FailureOf;

std::string ReadAll(const File& file) {
  auto reader = file.Open();
  std::string content(reader->Size(), '\0');
  content.resize(reader->ReadAt(0, content.data(), content.size()));
  return content;
}

template <class Item>
std::vector<std::string> NamesOf(const Collection<Item>& items) {
  std::vector<std::string> names;
  for (const auto& item : items) names.push_back(item->Name());
  return names;
}

// The `kept` names of a folder in the order an independent readdir gives them.
std::vector<std::string> ReaddirOrder(const std::string& folder, std::set<std::string> kept) {
  std::vector<std::string> names;
  DIR* stream = opendir(folder.c_str());
  while (const dirent* entry = readdir(stream)) {
    if (kept.contains(entry->d_name)) names.emplace_back(entry->d_name);
  }
  closedir(stream);
  return names;
}

class PosixFileSystemTest : public ::testing::Test {
 protected:
  TempTree tree_;
  std::unique_ptr<FileSystem> fs_ = CreatePosixFileSystem({});
};

TEST_F(PosixFileSystemTest, NamesResolveRegardlessOfCaseExactSpellingFirst) {
  tree_.AddFile("Foo", "upper");
  tree_.AddFile("foo", "lower");
  tree_.AddFolder("Opt/Acme/Bin");
  tree_.AddFile("Opt/Acme/Bin/App.EXE", "app");
  struct Case {
    const char* relative;
    const char* name;
    const char* content;
  };
  const Case cases[] = {
      {"foo", "foo", "lower"},
      {"Foo", "Foo", "upper"},
      {"FOO", "Foo", "upper"},  // the first in byte order
      {R"(opt\acme\bin\app.exe)", "App.EXE", "app"},
      {R"(OPT//acme\.\bin/\x\..\APP.exe)", "App.EXE", "app"},
  };
  for (const auto& c : cases) {
    SCOPED_TRACE(c.relative);
    auto file = fs_->GetFile(tree_.Path() + "\\" + c.relative);
    EXPECT_EQ(file->Name(), c.name);
    EXPECT_EQ(ReadAll(*file), c.content);
  }
  EXPECT_EQ(fs_->GetFile(tree_.Path() + R"(\opt\acme\bin\app.exe)")->Path(),
            tree_.Path() + R"(\opt\acme\bin\App.EXE)");
  EXPECT_TRUE(fs_->FolderExists(tree_.Path() + R"(\OPT\ACME)"));

  // An exact hit costs one stat; a folder's listing is read once for all the misses in it.
  auto before = posix::CountedSysCalls();
  EXPECT_TRUE(fs_->FileExists(tree_.Path("Opt/Acme/Bin/App.EXE")));
  EXPECT_TRUE(fs_->FileExists(tree_.Path() + R"(\OPT\acme\BIN\app.EXE)"));
  EXPECT_FALSE(fs_->FileExists(tree_.Path() + R"(\opt\acme\bin\app.com)"));
  auto after = posix::CountedSysCalls();
  EXPECT_EQ(after.opendir, before.opendir);
  EXPECT_EQ(after.stat - before.stat, 4u);  // one hit; two misses, each one failing and one found
}

TEST_F(PosixFileSystemTest, ListsInReaddirOrderSkippingFolderLinksAndDanglingLinks) {
  tree_.AddFolder("list/sub");
  tree_.AddFolder("list/other");
  for (const char* name : {"b.txt", "a.txt", ".hidden"}) tree_.AddFile(std::string("list/") + name);
  tree_.AddLink("list/loop", "..");
  tree_.AddLink("list/tofile", "a.txt");
  tree_.AddLink("list/dangling", "nowhere");
  tree_.AddFifo("list/pipe");
  auto folder = fs_->GetFolder(tree_.Path("list"));
  EXPECT_THAT(NamesOf(folder->Files()),
              ElementsAreArray(ReaddirOrder(tree_.Native("list"),
                                            {"a.txt", "b.txt", ".hidden", "tofile", "pipe"})));
  EXPECT_THAT(NamesOf(folder->SubFolders()),
              ElementsAreArray(ReaddirOrder(tree_.Native("list"), {"sub", "other"})));
  EXPECT_EQ(folder->Files().front()->Path(),
            tree_.Path("list") + "\\" + folder->Files().front()->Name());
  EXPECT_EQ(folder->SubFolders().front()->Path(),
            tree_.Path("list") + "\\" + folder->SubFolders().front()->Name());

  auto root = fs_->GetFolder("\\");
  EXPECT_EQ(root->Path(), "\\");
  EXPECT_EQ(root->Name(), "");
  for (const auto& sub : root->SubFolders()) EXPECT_EQ(sub->Path(), "\\" + sub->Name());
}

TEST_F(PosixFileSystemTest, OddNamesRoundTripFromNameToGetFile) {
  const std::string names[] = {"caf\xE9.txt", "new\nline", "back\\slash", "caf\xC3\xA9.txt"};
  tree_.AddFolder("odd");
  for (const auto& name : names) tree_.AddFile("odd/" + name, name);
  auto folder = fs_->GetFolder(tree_.Path("odd"));
  ASSERT_EQ(folder->Files().size(), std::size(names));
  for (const auto& file : folder->Files()) {
    std::string name = file->Name();
    SCOPED_TRACE(name);
    EXPECT_TRUE(IsXmlSafe(name));
    EXPECT_EQ(name.find('\\'), std::string::npos);
    EXPECT_EQ(ReadAll(*fs_->GetFile(folder->Path() + "\\" + name)), NameToNative(name));
  }
  EXPECT_TRUE(fs_->FileExists(tree_.Path("odd") + "\\caf\xC3\xA9.txt"));  // valid UTF-8 as is
}

TEST_F(PosixFileSystemTest, ExistsAnswersByKindOfItem) {
  tree_.AddFolder("dir");
  tree_.AddFile("file.txt");
  tree_.AddLink("tofile", "file.txt");
  tree_.AddLink("todir", "dir");
  tree_.AddLink("dangling", "nowhere");
  struct Case {
    std::string path;
    bool file, folder;
  };
  const Case cases[] = {
      {tree_.Path("file.txt"), true, false},   {tree_.Path("dir"), false, true},
      {tree_.Path("dir") + "\\", false, true}, {tree_.Path("file.txt") + "\\", false, false},
      {tree_.Path("tofile"), true, false},     {tree_.Path("todir"), false, true},
      {tree_.Path("dangling"), false, false},  {tree_.Path("file.txt") + R"(\below)", false, false},
      {R"(\\nohost\share\x)", false, false},   {"", false, false},
  };
  for (const auto& c : cases) {
    SCOPED_TRACE(c.path);
    EXPECT_EQ(fs_->FileExists(c.path), c.file);
    EXPECT_EQ(fs_->FolderExists(c.path), c.folder);
  }
}

TEST_F(PosixFileSystemTest, FailingCallsRaiseTheirNumbers) {
  tree_.AddFolder("dir");
  tree_.AddFolder("gone");
  tree_.AddFile("file.txt", "x");
  tree_.AddFile("dir/vanishing.txt", "x");
  auto gone = fs_->GetFolder(tree_.Path("gone"));
  auto dir = fs_->GetFolder(tree_.Path("dir"));
  const File& listed = *dir->Files().front();
  auto lost = fs_->GetFile(tree_.Path("dir/vanishing.txt"));
  rmdir(tree_.Native("gone").c_str());
  unlink(tree_.Native("dir/vanishing.txt").c_str());
  struct Case {
    const char* what;
    std::function<void()> action;
    int32_t number;
  };
  const Case cases[] = {
      {"GetFile of a folder", [&] { fs_->GetFile(tree_.Path("dir")); }, kFileNotFound},
      {"GetFile below a file", [&] { fs_->GetFile(tree_.Path("file.txt") + "\\x"); },
       kFileNotFound},
      {"GetFile of an unknown share", [&] { fs_->GetFile(R"(\\nohost\share\x)"); }, kFileNotFound},
      {"GetFolder of a file", [&] { fs_->GetFolder(tree_.Path("file.txt")); }, kPathNotFound},
      {"GetFolder of a missing one", [&] { fs_->GetFolder(tree_.Path("no")); }, kPathNotFound},
      {"GetFolder of an unknown share", [&] { fs_->GetFolder(R"(\\nohost\share)"); },
       kPathNotFound},
      {"listing a removed folder", [&] { gone->SubFolders(); }, kPathNotFound},
      {"Open of a removed file", [&] { lost->Open(); }, kFileNotFound},
      {"Size of a removed listed file", [&] { listed.Size(); }, kFileNotFound},
  };
  for (const auto& c : cases) {
    SCOPED_TRACE(c.what);
    EXPECT_EQ(FailureOf(c.action), c.number);
  }
}

// Runs `probe` in a child process without root's privileges and returns what it said, or nothing
// when the child could not give them up.
std::optional<std::string> RunUnprivileged(const std::function<std::string()>& probe) {
  int channel[2];
  if (pipe(channel) != 0) return std::nullopt;
  pid_t child = fork();
  if (child == 0) {
    close(channel[0]);
    bool dropped = geteuid() != 0 || (setgid(65534) == 0 && setuid(65534) == 0);
    std::string report = dropped ? probe() : "";
    bool sent = write(channel[1], report.data(), report.size()) == ssize_t(report.size());
    _exit(dropped && sent ? 0 : 1);
  }
  close(channel[1]);
  std::string report;
  char buffer[256];
  for (ssize_t n; (n = read(channel[0], buffer, sizeof buffer)) > 0;) report.append(buffer, n);
  close(channel[0]);
  int status = 0;
  waitpid(child, &status, 0);
  if (!WIFEXITED(status) || WEXITSTATUS(status) != 0) return std::nullopt;
  return report;
}

TEST_F(PosixFileSystemTest, PermissionProblemsRaise70) {
  tree_.AddFolder("locked");
  tree_.AddFile("locked/inner.txt");
  tree_.AddFile("secret.txt", "s");
  tree_.SetMode("", 0755);
  tree_.SetMode("locked", 0700);
  tree_.SetMode("secret.txt", 0600);
  std::string locked = tree_.Path("locked");
  const std::function<void(FileSystem&)> actions[] = {
      [&](FileSystem& fs) { fs.GetFolder(locked)->Files(); },
      [&](FileSystem& fs) { fs.GetFile(locked + R"(\inner.txt)"); },
      [&](FileSystem& fs) { fs.GetFile(tree_.Path() + R"(\LOCKED\inner.txt)"); },
      [&](FileSystem& fs) { fs.GetFile(tree_.Path("secret.txt"))->Open(); },
  };
  auto report = RunUnprivileged([&] {
    auto fs = CreatePosixFileSystem({});
    std::string out = fs->FileExists(locked + R"(\inner.txt)") ? "exists" : "absent";
    for (const auto& action : actions) out += " " + std::to_string(FailureOf([&] { action(*fs); }));
    return out;
  });
  if (!report) GTEST_SKIP() << "cannot give up privileges here";
  EXPECT_EQ(*report, "absent 70 70 70 70");
}

TEST_F(PosixFileSystemTest, AttributesComputeOnlyTheWantedBits) {
  tree_.AddFolder("items/rofolder");
  tree_.AddFolder("items/.hiddenfolder");
  for (const char* name : {"plain", "readonly", ".dot"})
    tree_.AddFile(std::string("items/") + name);
  tree_.AddFifo("items/pipe");
  tree_.AddLink("items/link", "plain");
  tree_.SetMode("items/readonly", 0444);
  tree_.SetMode("items/rofolder", 0555);
  auto folder = fs_->GetFolder(tree_.Path("items"));
  std::map<std::string, std::function<uint16_t(uint16_t)>> listed;
  for (const auto& f : folder->Files())
    listed[f->Name()] = [&f](uint16_t w) { return f->Attributes(w); };
  for (const auto& s : folder->SubFolders())
    listed[s->Name()] = [&s](uint16_t w) { return s->Attributes(w); };
  const std::tuple<const char*, uint16_t, uint16_t> cases[] = {
      {"plain", kAllAttributes, 0},
      {"readonly", kAllAttributes, kReadOnly},
      {"readonly", kHidden | kSystem | kArchive, 0},
      {".dot", kAllAttributes, kHidden},
      {".dot", kReadOnly | kSystem, 0},
      {"pipe", kAllAttributes, kSystem},
      {"pipe", kReadOnly | kHidden, 0},
      {"link", kAllAttributes, 0},
      {"rofolder", kAllAttributes, kReadOnly},
      {".hiddenfolder", kAllAttributes, kHidden},
      {".hiddenfolder", kReadOnly, 0},
  };
  for (const auto& [name, wanted, expected] : cases) {
    SCOPED_TRACE(std::string(name) + " wanting " + std::to_string(wanted));
    std::string path = tree_.Path("items/" + std::string(name));
    EXPECT_EQ(fs_->FolderExists(path) ? fs_->GetFolder(path)->Attributes(wanted)
                                      : fs_->GetFile(path)->Attributes(wanted),
              expected);
    EXPECT_EQ(listed.at(name)(wanted), expected);
  }
}

TEST_F(PosixFileSystemTest, ListedItemsCostAStatOnlyForModeSizeOrTime) {
  for (const char* name : {"a", "b", "c"}) tree_.AddFolder(name);
  for (int i = 0; i < 4; ++i) tree_.AddFile("f" + std::to_string(i), std::string(i, 'x'));
  tree_.AddFile("a/in_a");
  auto folder = fs_->GetFolder(tree_.Path());
  const auto& files = folder->Files();
  auto listed = posix::CountedSysCalls();
  for (const auto& file : files) file->Attributes(kHidden | kSystem);
  auto cheap = posix::CountedSysCalls();
  EXPECT_EQ(cheap.stat, listed.stat);
  EXPECT_LE(cheap.statfs - listed.statfs, 1u);  // once for the folder, never per file
  uint64_t totalSize = 0;
  for (const auto& file : files) {
    file->Attributes(kReadOnly);
    totalSize += file->Size();
    file->DateLastModified();
  }
  EXPECT_EQ(totalSize, 0u + 1 + 2 + 3);
  EXPECT_EQ(posix::CountedSysCalls().stat - cheap.stat, files.size());

  // What a walker asks about each subfolder it listed, the listing answers: no stat, and the
  // attributes of the subfolder's files need no statfs of their own.
  for (const auto& sub : folder->SubFolders()) {
    std::string path = sub->Path() + "\\";
    auto before = posix::CountedSysCalls();
    EXPECT_FALSE(fs_->FileExists(path));
    EXPECT_TRUE(fs_->FolderExists(path));
    auto walked = fs_->GetFolder(path);
    EXPECT_EQ(walked->Path(), sub->Path());
    for (const auto& file : walked->Files()) EXPECT_EQ(file->Attributes(kHidden), 0);
    EXPECT_EQ(posix::CountedSysCalls().stat, before.stat);
    EXPECT_EQ(posix::CountedSysCalls().statfs, before.statfs);
  }
}

// A listed subfolder asks its parent where its attributes come from, unless it is a mount point:
// another file system may lie behind it.
TEST(WalkMemoryTest, OnlyMountPointsDecideTheirAttributeSourceThemselves) {
  testing::TempTree tree;
  tree.AddFolder("plain");
  tree.AddFolder("mounted");
  auto parent = std::make_shared<posix::FolderPlace>(tree.Root(), tree.Path());
  auto plain = std::make_shared<posix::FolderPlace>(tree.Native("plain"), tree.Path("plain"));
  auto mounted = std::make_shared<posix::FolderPlace>(tree.Native("mounted"), tree.Path("mounted"));
  posix::WalkMemory memory({tree.Native("mounted")});
  memory.Listed(parent, plain);
  memory.Listed(parent, mounted);
  parent->HasDosAttributes();
  auto before = posix::CountedSysCalls().statfs;
  plain->HasDosAttributes();
  EXPECT_EQ(posix::CountedSysCalls().statfs, before);
  mounted->HasDosAttributes();
  EXPECT_EQ(posix::CountedSysCalls().statfs, before + 1);
  ASSERT_TRUE(memory.Take(tree.Path("plain") + "\\"));
  EXPECT_FALSE(memory.Take(tree.Path("plain") + "\\")) << "handed out once";
}

TEST(DosAttributesTest, DecodesTheLittleEndianWordKeepingFourBits) {
  using namespace std::string_literals;
  const std::pair<std::string, std::optional<uint16_t>> cases[] = {
      {"\x21\x00\x00\x00"s, kReadOnly | kArchive},
      {"\xFF\xFF\xFF\xFF"s, kAllAttributes},
      {"\x10\x00\x00\x00"s, 0},  // the folder bit is not an attribute here
      {"\x00\x00\x00\x02"s, 0},  // a high byte, not the hidden bit
      {"\x02\x00\x00"s, std::nullopt},
  };
  for (const auto& [value, expected] : cases) EXPECT_EQ(DecodeDosAttributes(value), expected);
  EXPECT_TRUE(IsSmbFileSystemType(0xFE534D42));
  EXPECT_TRUE(IsSmbFileSystemType(static_cast<int32_t>(0xFF534D42)));
  EXPECT_FALSE(IsSmbFileSystemType(0xEF53));
}

TEST_F(PosixFileSystemTest, RootFoldersAreSlashAndMountPoints) {
  tree_.AddFolder("sub");
  EXPECT_TRUE(fs_->GetFolder("/")->IsRootFolder());
  EXPECT_TRUE(fs_->GetFolder(R"(\proc)")->IsRootFolder());
  EXPECT_FALSE(fs_->GetFolder(tree_.Path("sub"))->IsRootFolder());
  EXPECT_FALSE(fs_->GetFolder(tree_.Path())->SubFolders().front()->IsRootFolder());
}

TEST_F(PosixFileSystemTest, NetworkPathsGoThroughTheShareTable) {
  tree_.AddFolder("Vendor");
  tree_.AddFile("Vendor/Tool.exe", "tool");
  tree_.AddFolder("caf\xE9");
  tree_.AddFile("caf\xE9/x.txt", "x");
  ShareTable shares;
  shares.Add("Server", "Apps", tree_.Root());
  shares.AddMounts("//nas/pub " + tree_.Root() + " cifs rw 0 0\nnas:/export/tools " + tree_.Root() +
                   " nfs rw 0 0\n//nas/cafe " + tree_.Native("caf\xE9") + " smb3 rw 0 0\n");
  auto fs = CreatePosixFileSystem(std::move(shares));
  for (const char* path :
       {R"(\\server\apps\vendor\tool.exe)", R"(\\NAS\pub\Vendor\TOOL.EXE)",
        R"(\\nas\tools\vendor\tool.exe)", R"(\\nas\export\tools\Vendor\Tool.exe)"}) {
    SCOPED_TRACE(path);
    auto file = fs->GetFile(path);
    EXPECT_EQ(file->Name(), "Tool.exe");
    EXPECT_EQ(ReadAll(*file), "tool");
  }
  EXPECT_EQ(ReadAll(*fs->GetFile(R"(\\nas\cafe\X.TXT)")), "x");
  EXPECT_FALSE(fs->FileExists(R"(\\nas\other\Vendor\Tool.exe)"));

  auto share = fs->GetFolder(R"(\\SERVER\APPS\)");
  EXPECT_EQ(share->Name(), "");
  EXPECT_EQ(share->Path(), R"(\\SERVER\APPS)");
  EXPECT_TRUE(share->IsRootFolder());
  EXPECT_EQ(share->SubFolders().front()->Path(),
            R"(\\SERVER\APPS\)" + share->SubFolders().front()->Name());
  EXPECT_EQ(fs->GetFolder(R"(\\server\apps\VENDOR)")->Path(), R"(\\server\apps\Vendor)");
}

TEST_F(PosixFileSystemTest, FilesReadAtOffsetsAndTellTheirTime) {
  tree_.AddFile("data.bin", "0123456789");
  timespec times[2] = {{0, UTIME_OMIT}, {1'000'000'000, 0}};
  ASSERT_EQ(utimensat(AT_FDCWD, tree_.Native("data.bin").c_str(), times, 0), 0);
  auto file = fs_->GetFile(tree_.Path("data.bin"));
  EXPECT_EQ(file->DateLastModified(), FromTimeT(1'000'000'000));
  auto reader = file->Open();
  EXPECT_EQ(reader->Size(), 10u);
  char buffer[8] = {};
  ASSERT_EQ(reader->ReadAt(3, buffer, 4), 4u);
  EXPECT_EQ(std::string(buffer, 4), "3456");
  EXPECT_EQ(reader->ReadAt(8, buffer, 8), 2u);
  EXPECT_EQ(reader->ReadAt(10, buffer, 8), 0u);
}

TEST_F(PosixFileSystemTest, FaultInjectionFailsChosenCallsAndCountsAll) {
  tree_.AddFolder("dir/sub");
  tree_.AddFile("dir/file.txt", "f");
  using Op = FaultInjectingFileSystem::Operation;
  std::string dir = tree_.Path("dir");
  std::string file = tree_.Path("dir/file.txt");
  struct Case {
    Op operation;
    std::string ruledPath;  // spelt differently from the path the action uses
    std::function<void(FileSystem&)> action;
  };
  const Case cases[] = {
      {Op::kFileExists, LowerCase(file), [&](FileSystem& fs) { fs.FileExists(file); }},
      {Op::kFolderExists, dir + "/", [&](FileSystem& fs) { fs.FolderExists(dir); }},
      {Op::kGetFile, file, [&](FileSystem& fs) { fs.GetFile(file); }},
      {Op::kGetFolder, dir + "\\", [&](FileSystem& fs) { fs.GetFolder(dir); }},
      {Op::kListFolder, dir + R"(\SUB)",
       [&](FileSystem& fs) { fs.GetFolder(dir)->SubFolders().front()->Files(); }},
      {Op::kOpenFile, file, [&](FileSystem& fs) { fs.GetFolder(dir)->Files().front()->Open(); }},
  };
  for (const auto& c : cases) {
    SCOPED_TRACE(c.ruledPath);
    FaultInjectingFileSystem faults(*fs_);
    EXPECT_EQ(FailureOf([&] { c.action(faults); }), 0);
    faults.FailOn(c.operation, c.ruledPath, kDeviceIoError);
    EXPECT_EQ(FailureOf([&] { c.action(faults); }), kDeviceIoError);
  }

  // Calls on other paths pass through, and every call is counted.
  FaultInjectingFileSystem faults(*fs_);
  faults.FailOn(Op::kGetFile, dir + R"(\other.txt)", kFileNotFound);
  EXPECT_TRUE(faults.FileExists(file));
  EXPECT_THAT(NamesOf(faults.GetFolder(tree_.Path())->SubFolders()), ElementsAre("dir"));
  EXPECT_EQ(ReadAll(*faults.GetFile(dir + R"(\FILE.TXT)")), "f");
  const int counts[] = {1, 0, 1, 1, 1, 1};  // in the order of the operations
  for (int i = 0; i < 6; ++i) EXPECT_EQ(faults.Calls(Op(i)), counts[i]);
}

}  // namespace
}  // namespace trl::fs
