#include "platform/fs/posix/posix_file_system.h"

#include <fcntl.h>
#include <gmock/gmock.h>
#include <gtest/gtest.h>
#include <sys/wait.h>
#include <unistd.h>

#include <functional>
#include <tuple>

#include "platform/failure.h"
#include "platform/fs/dos_attributes.h"
#include "platform/fs/posix/sys_calls.h"
#include "platform/fs/posix/walk_memory.h"
#include "platform/text.h"
#include "support/failure_of.h"
#include "support/temp_tree.h"

namespace trl::fs {
namespace {

using testing::FailureOf;
using ::testing::UnorderedElementsAre;
using trl::testing::TempTree;

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
  const std::tuple<const char*, const char*, const char*> cases[] = {
      {"foo", "foo", "lower"},
      {"FOO", "Foo", "upper"},  // the first in byte order
      {R"(OPT//acme\.\bin/\x\..\APP.exe)", "App.EXE", "app"},
  };
  for (const auto& [relative, name, content] : cases) {
    SCOPED_TRACE(relative);
    auto file = fs_->GetFile(tree_.Path() + "\\" + relative);
    EXPECT_EQ(file->Name(), name);
    EXPECT_EQ(ReadAll(*file), content);
  }

  // An exact hit costs one stat; a folder's listing is read once for all the misses in it.
  auto before = posix::CountedSysCalls();
  EXPECT_TRUE(fs_->FileExists(tree_.Path("Opt/Acme/Bin/App.EXE")));
  EXPECT_TRUE(fs_->FolderExists(tree_.Path() + R"(\OPT\acme\BIN)"));
  EXPECT_FALSE(fs_->FileExists(tree_.Path() + R"(\opt\acme\bin\app.com)"));
  auto after = posix::CountedSysCalls();
  EXPECT_EQ(after.opendir, before.opendir);
  EXPECT_EQ(after.stat - before.stat, 4u);  // one hit; two misses, each one failing and one found
}

TEST_F(PosixFileSystemTest, ListsSkippingFolderLinksAndDanglingLinks) {
  tree_.AddFolder("list/sub");
  tree_.AddFolder("list/other");
  for (const char* name : {"B.txt", "a.txt", ".hidden"}) tree_.AddFile(std::string("list/") + name);
  tree_.AddLink("list/loop", "..");
  tree_.AddLink("list/tofile", "a.txt");
  tree_.AddLink("list/dangling", "nowhere");
  tree_.AddFifo("list/pipe");
  auto folder = fs_->GetFolder(tree_.Path("list"));
  EXPECT_THAT(NamesOf(folder->Files()),
              UnorderedElementsAre("a.txt", "B.txt", ".hidden", "tofile", "pipe"));
  EXPECT_THAT(NamesOf(folder->SubFolders()), UnorderedElementsAre("sub", "other"));
  for (const auto& file : folder->Files())
    EXPECT_EQ(file->Path(), tree_.Path("list/" + file->Name()));
}

// Folders below a path longer than the system takes at once are listed, and their files looked
// up, read and their attributes read, like any others.
TEST_F(PosixFileSystemTest, ReachesItemsBelowPathsLongerThanPathMax) {
  const std::string name(200, 'd');
  constexpr int kDepth = 40;  // 40 folders of 201 bytes each: twice PATH_MAX
  int folder = ::open(tree_.Root().c_str(), O_RDONLY | O_DIRECTORY);
  std::string path = tree_.Path();
  for (int level = 0; level < kDepth; ++level) {
    ASSERT_EQ(::mkdirat(folder, name.c_str(), 0755), 0);
    int below = ::openat(folder, name.c_str(), O_RDONLY | O_DIRECTORY);
    ::close(folder);
    folder = below;
    int file = ::openat(folder, "f", O_CREAT | O_WRONLY, 0644);
    std::string level_text = std::to_string(level);
    ASSERT_EQ(::write(file, level_text.data(), level_text.size()), level_text.size());
    ::close(file);
    path += "\\" + name;
  }
  ::close(folder);
  std::vector<std::string> read;
  std::vector<std::string> expected;
  std::function<void(Folder&)> walk = [&](Folder& at) {
    for (const auto& file : at.Files()) {
      read.push_back(ReadAll(*file) + (file->Attributes() == 0 ? "" : " with attributes"));
    }
    for (const auto& sub : at.SubFolders()) walk(*sub);
  };
  walk(*fs_->GetFolder(tree_.Path()));
  for (int level = 0; level < kDepth; ++level) expected.push_back(std::to_string(level));
  EXPECT_EQ(read, expected);
  EXPECT_TRUE(fs_->FolderExists(path));
  EXPECT_EQ(ReadAll(*fs_->GetFile(path + "\\f")), std::to_string(kDepth - 1));
}

// What a path names decides what the lookups answer: whether a file or a folder exists (and the
// file, in one lookup), and the failure GetFile and GetFolder raise (0: none), also once the item
// is gone.
TEST_F(PosixFileSystemTest, LookupsAnswerByKindOfItem) {
  tree_.AddFolder("dir");
  tree_.AddFile("file.txt", "x");
  tree_.AddLink("tofile", "file.txt");
  tree_.AddLink("todir", "dir");
  tree_.AddLink("dangling", "nowhere");
  const std::tuple<std::string, bool, bool, int32_t, int32_t> cases[] = {
      {tree_.Path("file.txt"), true, false, 0, kPathNotFound},
      {tree_.Path("dir"), false, true, kFileNotFound, 0},
      {tree_.Path("file.txt") + "\\", false, false, kFileNotFound, kPathNotFound},
      {tree_.Path("tofile"), true, false, 0, kPathNotFound},
      {tree_.Path("todir"), false, true, kFileNotFound, 0},
      {tree_.Path("dangling"), false, false, kFileNotFound, kPathNotFound},
      {tree_.Path("file.txt") + R"(\below)", false, false, kFileNotFound, kPathNotFound},
      {R"(\\nohost\share)", false, false, kFileNotFound, kPathNotFound},
  };
  for (const auto& [path, file, folder, getFile, getFolder] : cases) {
    SCOPED_TRACE(path);
    EXPECT_EQ(fs_->FileExists(path), file);
    auto found = fs_->FileIfExists(path);
    EXPECT_EQ(found != nullptr, file);
    if (found) {
      EXPECT_EQ(ReadAll(*found), "x");
    }
    EXPECT_EQ(fs_->FolderExists(path), folder);
    EXPECT_EQ(FailureOf([&] { fs_->GetFile(path); }), getFile);
    EXPECT_EQ(FailureOf([&] { fs_->GetFolder(path); }), getFolder);
  }
  // Items that went away after they were got fail when used.
  auto dir = fs_->GetFolder(tree_.Path("dir"));
  auto file = fs_->GetFile(tree_.Path("file.txt"));
  rmdir(tree_.Native("dir").c_str());
  unlink(tree_.Native("file.txt").c_str());
  EXPECT_EQ(FailureOf([&] { dir->SubFolders(); }), kPathNotFound);
  EXPECT_EQ(FailureOf([&] { file->Open(); }), kFileNotFound);
}

// A locked folder, listed or passed through to resolve a name's case, raises 70 in a child
// process that gives up root's privileges (exit 2: it could not).
TEST_F(PosixFileSystemTest, PermissionProblemsRaise70) {
  tree_.AddFolder("locked");
  tree_.AddFile("locked/inner.txt");
  tree_.SetMode("", 0755);
  tree_.SetMode("locked", 0700);
  if (pid_t child = fork(); child == 0) {
    bool dropped = geteuid() != 0 || (setgid(65534) == 0 && setuid(65534) == 0);
    auto fs = CreatePosixFileSystem({});
    int listed = FailureOf([&] { fs->GetFolder(tree_.Path("locked"))->Files(); });
    int resolved = FailureOf([&] { fs->GetFile(tree_.Path() + R"(\LOCKED\inner.txt)"); });
    _exit(!dropped ? 2 : listed != kPermissionDenied || resolved != kPermissionDenied);
  } else {
    int status = 0;
    waitpid(child, &status, 0);
    if (WIFEXITED(status) && WEXITSTATUS(status) == 2) GTEST_SKIP() << "cannot give up privileges";
    EXPECT_TRUE(WIFEXITED(status) && WEXITSTATUS(status) == 0);
  }
}

TEST_F(PosixFileSystemTest, ListedItemsCostAStatOnlyForModeSizeOrTime) {
  for (const char* name : {"a", "b", "c"}) tree_.AddFolder(name);
  for (const char* name : {"f0", "f1", "f2", "f3"}) tree_.AddFile(name);
  tree_.AddFile("a/in_a");
  auto folder = fs_->GetFolder(tree_.Path());
  const auto& files = folder->Files();
  auto listed = posix::CountedSysCalls();
  for (const auto& file : files) file->Attributes(kHidden | kSystem);
  auto cheap = posix::CountedSysCalls();
  EXPECT_EQ(cheap.stat, listed.stat);
  EXPECT_LE(cheap.statfs - listed.statfs, 1u);  // once for the folder, never per file
  for (const auto& file : files) {
    file->Attributes(kReadOnly);
    file->Size();
    file->DateLastModified();
  }
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
  TempTree tree;
  auto place = [&](const char* name) {
    return std::make_shared<posix::FolderPlace>(tree.Native(name), tree.Path(name));
  };
  auto parent = place(""), plain = place("plain"), mounted = place("mounted");
  posix::WalkMemory memory({tree.Native("mounted")});
  memory.Listed(parent, plain);
  memory.Listed(parent, mounted);
  parent->HasDosAttributes();
  auto before = posix::CountedSysCalls().statfs;
  plain->HasDosAttributes();
  mounted->HasDosAttributes();
  EXPECT_EQ(posix::CountedSysCalls().statfs, before + 1);
}

TEST(DosAttributesTest, DecodesTheLittleEndianWordKeepingFourBits) {
  using namespace std::string_literals;
  const std::pair<std::string, std::optional<uint16_t>> cases[] = {
      {"\x21\x00\x00\x00"s, kReadOnly | kArchive},
      {"\x10\x00\x00\x00"s, 0},  // the folder bit is not an attribute here
      {"\x00\x00\x00\x02"s, 0},  // a high byte, not the hidden bit
      {"\x02\x00\x00"s, std::nullopt},
  };
  for (const auto& [value, expected] : cases) EXPECT_EQ(DecodeDosAttributes(value), expected);
  EXPECT_TRUE(IsSmbFileSystemType(0xFE534D42));
  EXPECT_TRUE(IsSmbFileSystemType(static_cast<int32_t>(0xFF534D42)));
  EXPECT_FALSE(IsSmbFileSystemType(0xEF53));
}

// Roots are "/", mount points and the folders shares lead to (how a share resolves is the share
// table's business).
TEST_F(PosixFileSystemTest, RootFoldersAreSlashMountPointsAndShares) {
  auto slash = fs_->GetFolder("/");
  EXPECT_TRUE(slash->IsRootFolder());
  EXPECT_EQ(slash->SubFolders().front()->Path(), "\\" + slash->SubFolders().front()->Name());
  EXPECT_TRUE(fs_->GetFolder(R"(\proc)")->IsRootFolder());
  tree_.AddFolder("Vendor");
  EXPECT_FALSE(fs_->GetFolder(tree_.Path())->SubFolders().front()->IsRootFolder());
  tree_.AddFile("Vendor/Tool.exe", "tool");
  ShareTable shares;
  shares.Add("Server", "Apps", tree_.Root());
  auto fs = CreatePosixFileSystem(std::move(shares));
  auto file = fs->GetFile(R"(\\server\apps\vendor\tool.exe)");
  EXPECT_EQ(file->Path(), R"(\\server\apps\vendor\Tool.exe)");
  EXPECT_EQ(ReadAll(*file), "tool");
  auto share = fs->GetFolder(R"(\\SERVER\APPS\)");
  EXPECT_EQ(share->Name(), "");
  EXPECT_EQ(share->Path(), R"(\\SERVER\APPS)");
  EXPECT_TRUE(share->IsRootFolder());
  EXPECT_EQ(share->SubFolders().front()->Path(), R"(\\SERVER\APPS\Vendor)");
}

TEST(ShareTableTest, AddMappingTakesUncEqualsDirectoryOnly) {
  const std::tuple<const char*, const char*, const char*> accepted[] = {
      {R"(\\Srv\Data=/srv/data)", R"(\\srv\DATA\Apps\x.exe)", "/srv/data/Apps/x.exe"},
      {R"(//srv/data/sub=/x)", R"(\\SRV\Data\Sub\f)", "/x/f"},
      {R"(\\srv\\data\=/dir=with=equals)", R"(\\srv\data)", "/dir=with=equals"},
  };
  for (const auto& [mapping, path, resolved] : accepted) {
    ShareTable table;
    table.AddMapping(mapping);
    EXPECT_EQ(table.Resolve(path), resolved) << mapping;
  }
  for (const char* mapping :
       {"", R"(srv\data=/x)", R"(\srv\data=/x)", R"(\\srv=/x)", R"(\\srv\=/x)", R"(\\\data=/x)",
        R"(\\srv\data)", R"(\\srv\data=)", "=/x"}) {
    ShareTable table;
    EXPECT_EQ(FailureOf([&] { table.AddMapping(mapping); }), kInvalidArgument) << mapping;
  }
}

TEST(ShareTableTest, ResolvesThroughGivenMappingsThenNetworkMounts) {
  ShareTable table;
  table.Add("files", "public", "/given/public");
  table.AddMounts(
      "/dev/sda1 / ext4 rw,relatime 0 0\n"
      "//fileserver/Public /mnt/pub cifs rw 0 0\n"
      "\\\\otherhost\\docs /mnt/docs smb3 rw 0 0\n"
      "nas:/exports/media /mnt/media nfs rw 0 0\n"
      "nas:/exports/media/photos /mnt/photos nfs4 rw 0 0\n"
      "files:/public/deep /mnt/files-deep nfs rw 0 0\n"
      "//FileServer/PUBLIC /mnt/pub-again cifs rw 0 0\n"
      "//fileserver/with\\040blank /mnt/with\\040blank cifs rw 0 0\n"
      "//ignored/share /mnt/ignored fuse.sshfs rw 0 0\n"
      "server:/ /mnt/root4 nfs4 rw 0 0\n"
      "//bytes/cafe /mnt/caf\xE9 cifs rw 0 0\n"
      "garbage\n");
  const std::pair<const char*, std::optional<std::string>> cases[] = {
      {R"(\\FILESERVER\public\Apps\x.exe)", "/mnt/pub/Apps/x.exe"},
      {R"(\\fileserver\public)", "/mnt/pub"},  // the first of two equal mounts
      {R"(\\otherhost\DOCS\a)", "/mnt/docs/a"},
      {R"(\\nas\exports\media\song.mp3)", "/mnt/media/song.mp3"},
      {R"(\\nas\media\song.mp3)", "/mnt/media/song.mp3"},
      {R"(\\nas\exports\media\photos\p.jpg)", "/mnt/photos/p.jpg"},  // the longest share wins
      {R"(\\files\public\deep\a)", "/given/public/deep/a"},          // given before a longer mount
      {R"(\\fileserver\with blank\a)", "/mnt/with blank/a"},
      {R"(\\server\anything\x)", "/mnt/root4/anything/x"},
      {R"(\\fileserver\public\a\..\b)", "/mnt/pub/b"},
      {R"(\\unknown\public)", std::nullopt},
      {R"(\\ignored\share)", std::nullopt},
      {R"(\\nas\exports)", std::nullopt},
      {R"(\local\path)", std::nullopt},
  };
  for (const auto& [path, resolved] : cases) EXPECT_EQ(table.Resolve(path), resolved) << path;
  // A mount point that is not UTF-8 comes back in the component's encoding, reversibly.
  std::string bytes = table.Resolve(R"(\\bytes\cafe\x)").value_or("");
  EXPECT_TRUE(IsValidUtf8(bytes));
  EXPECT_EQ(NameToNative(bytes), "/mnt/caf\xE9/x");
}

}  // namespace
}  // namespace trl::fs
