#include "platform/fs/posix/listing_read_ahead.h"

#include <gtest/gtest.h>

#include <array>
#include <cerrno>
#include <functional>
#include <string>
#include <vector>

#include "support/temp_tree.h"

namespace trl::fs::posix {
namespace {

using trl::testing::TempTree;

// What a listing says, in its order: "error" or the files' names, "|", the subfolders' names.
std::string Summary(const FolderListing& listing) {
  if (listing.error != 0) return "error " + std::to_string(listing.error);
  std::string text;
  for (const auto& file : listing.files) text += file->Name() + " ";
  text += "|";
  for (const auto& sub : listing.subFolders) text += " " + sub.nativeName;
  return text;
}

// Six folders a0..a5, each with five b0..b4, each with three c0..c2; every folder has two files.
// The names of the folders that walks pass over end in "1".
class ListingReadAheadTest : public ::testing::Test {
 protected:
  void SetUp() override { Fill("", 0); }
  void Fill(const std::string& folder, size_t depth) {
    tree_.AddFile(folder + "x");
    tree_.AddFile(folder + "y");
    for (int i = 0; depth < 3 && i < std::array{6, 5, 3}[depth]; ++i) {
      std::string sub = folder + char('a' + depth) + std::to_string(i) + "/";
      tree_.AddFolder(sub);
      Fill(sub, depth + 1);
    }
  }

  TempTree tree_;
};

// Whatever way a walk takes (depth first as expected, passing subtrees by, jumping elsewhere and
// back), each folder gets the listing a direct readdir gives; small limits keep the read-ahead
// stopping and starting again.
TEST_F(ListingReadAheadTest, EveryFolderGetsItsOwnListingWhateverTheWalk) {
  // A walk passes over folders named "?1" with everything below them, takes an unrelated folder
  // after every so many folders (0: never), takes each folder a second time.
  struct Case {
    const char* walk;
    bool skipOnes;
    int jumpEvery;
    bool twice;
    size_t maxFolders, maxEntries;
  } const cases[] = {{"depth first", false, 0, false, 128, 1 << 15},
                     {"depth first, small limits", false, 0, false, 2, 5},
                     {"passing subtrees by", true, 0, false, 4, 1 << 15},
                     {"jumping away and back", false, 7, false, 3, 1 << 15},
                     {"everything twice", true, 0, true, 3, 8}};
  for (const Case& c : cases) {
    SCOPED_TRACE(c.walk);
    ListingReadAhead readAhead(c.maxFolders, c.maxEntries);
    int taken = 0, visited = 0;
    std::function<void(const std::shared_ptr<FolderPlace>&)> walk =
        [&](const std::shared_ptr<FolderPlace>& folder) {
          ++visited;
          std::string expected = Summary(ListFolder(folder));
          FolderListing listing = readAhead.Take(folder);
          ASSERT_EQ(Summary(listing), expected) << folder->Native();
          if (c.twice) ASSERT_EQ(Summary(readAhead.Take(folder)), expected);
          if (c.jumpEvery != 0 && ++taken % c.jumpEvery == 0) {
            auto elsewhere = std::make_shared<FolderPlace>(tree_.Native("a2/b3"), "");
            ASSERT_EQ(Summary(readAhead.Take(elsewhere)), Summary(ListFolder(elsewhere)));
          }
          for (const auto& sub : listing.subFolders) {
            if (!(c.skipOnes && sub.nativeName.ends_with('1'))) walk(sub.place);
          }
        };
    walk(std::make_shared<FolderPlace>(tree_.Root(), tree_.Path()));
    EXPECT_EQ(visited, c.skipOnes ? 1 + 5 + 5 * 4 + 5 * 4 * 2 : 1 + 6 + 6 * 5 + 6 * 5 * 3);
  }
}

// A folder that cannot be listed gives its error, as a direct listing would.
TEST_F(ListingReadAheadTest, AFolderThatCannotBeListedGivesItsError) {
  ListingReadAhead readAhead;
  for (const auto& [name, error] : {std::pair{"", 0}, {"nowhere", ENOENT}, {"a0/x", ENOTDIR}}) {
    EXPECT_EQ(readAhead.Take(std::make_shared<FolderPlace>(tree_.Native(name), "")).error, error);
  }
}

}  // namespace
}  // namespace trl::fs::posix
