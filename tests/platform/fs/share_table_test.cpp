#include "platform/fs/share_table.h"

#include <gtest/gtest.h>

#include <tuple>

#include "platform/failure.h"
#include "platform/text.h"
#include "support/failure_of.h"

namespace trl::fs {
namespace {

using testing::FailureOf;

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
