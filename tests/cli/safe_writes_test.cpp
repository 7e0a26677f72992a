#include <fcntl.h>
#include <gtest/gtest.h>
#include <sys/file.h>
#include <sys/stat.h>
#include <unistd.h>

#include <atomic>
#include <chrono>
#include <filesystem>
#include <fstream>
#include <iterator>
#include <thread>
#include <vector>

#include "atomic_file.h"
#include "chunk_writer.h"
#include "command_error.h"
#include "document_files.h"
#include "platform/failure.h"
#include "reporter/log_file.h"
#include "save_lock.h"
#include "support/temp_tree.h"

namespace trl::cli {
namespace {

class SafeWritesTest : public ::testing::Test {
 protected:
  std::string Read(std::string_view relative) const {
    std::ifstream in(tree_.Native(relative), std::ios::binary);
    return {std::istreambuf_iterator<char>(in), {}};
  }
  bool IsLink(std::string_view relative) const {
    return std::filesystem::is_symlink(tree_.Native(relative));
  }
  testing::TempTree tree_;
};

// Links planted where an output or a log goes are refused, never written through to a file; a
// link to a stream is written through (as /dev/stdout is). A file is replaced, not truncated.
TEST_F(SafeWritesTest, OutputsAndLogsDoNotFollowPlantedLinks) {
  tree_.AddFile("precious.txt", "keep");
  tree_.AddLink("report.xml", tree_.Native("precious.txt"));
  EXPECT_THROW(WriteTextOutput("<new/>", tree_.Native("report.xml")), CommandError);
  EXPECT_EQ(Read("precious.txt"), "keep");
  tree_.AddFile("old.xml", "<old/>");
  int reader = ::open(tree_.Native("old.xml").c_str(), O_RDONLY);
  WriteTextOutput("<new/>", tree_.Native("old.xml"));
  EXPECT_EQ(Read("old.xml"), "<new/>\n");
  char kept[6] = {};
  EXPECT_EQ(::read(reader, kept, sizeof kept), 6);  // the old file was not truncated in place
  ::close(reader);

  tree_.AddLink("null.xml", "/dev/null");
  WriteTextOutput("<new/>", tree_.Native("null.xml"));
  EXPECT_TRUE(IsLink("null.xml"));

  tree_.AddLink("run.log", tree_.Native("precious.txt"));
  LogFile log;
  EXPECT_THROW(log.Open(tree_.Native("run.log"), false), Failure);
  EXPECT_EQ(Read("precious.txt"), "keep");
}

TEST_F(SafeWritesTest, ASaveKeepsWhatItReplaces) {
  tree_.AddFolder("data");
  tree_.AddFile("data/user.xml", "first");
  tree_.AddFile("data/user.xml.bak", "older");
  tree_.AddLink("user.xml", tree_.Native("data/user.xml"));
  tree_.SetMode("data/user.xml", 0640);
  bool root = ::geteuid() == 0;
  if (root) ASSERT_EQ(::chown(tree_.Native("data/user.xml").c_str(), 4321, 4321), 0);
  // Left by a writer that was killed, and one still being written (its writer holds the lock).
  tree_.AddFile("data/user.xml.trl-Ab12Cd", "stray");
  tree_.AddFile("data/user.xml.trl-Xy34Zw", "live");
  int live = ::open(tree_.Native("data/user.xml.trl-Xy34Zw").c_str(), O_RDONLY);
  ASSERT_EQ(::flock(live, LOCK_EX), 0);

  ReplaceFileAtomically(tree_.Native("user.xml"), "second", {.keepBackup = true});
  ::close(live);
  // Through the link, deliberately: the link stays, the file it leads to is replaced.
  EXPECT_TRUE(IsLink("user.xml"));
  EXPECT_EQ(Read("data/user.xml"), "second\n");
  EXPECT_EQ(Read("data/user.xml.bak"), "first");
  struct stat status {};
  ASSERT_EQ(::stat(tree_.Native("data/user.xml").c_str(), &status), 0);
  EXPECT_EQ(status.st_mode & 07777, 0640u);
  if (root) EXPECT_EQ(status.st_uid, 4321u);
  EXPECT_FALSE(std::filesystem::exists(tree_.Native("data/user.xml.trl-Ab12Cd")));
  EXPECT_TRUE(std::filesystem::exists(tree_.Native("data/user.xml.trl-Xy34Zw")));
}

// A text made in pieces arrives whole and in order, whatever the pieces' sizes against the writes
// that gather them; a text whose making fails leaves the file as it was and nothing beside it.
TEST_F(SafeWritesTest, ATextInPiecesReplacesAFileWhole) {
  constexpr size_t kMiB = 1 << 20;
  const std::vector<size_t> cases[] = {
      {}, {5, 7, 11}, {kMiB - 3, 2, 1, 4}, {3, kMiB, 5}, {kMiB + 1, 2 * kMiB + 7, 9},
  };
  for (const auto& sizes : cases) {
    std::string expected;
    std::vector<std::string> pieces;
    for (size_t size : sizes) {
      std::string piece(size, '\0');
      for (size_t i = 0; i < size; ++i)
        piece[i] = static_cast<char>('a' + (expected.size() + i) % 23);
      expected += piece;
      pieces.push_back(std::move(piece));
    }
    ReplaceFileAtomically(tree_.Native("out.xml"),
                          [&](const auto& put) {
                            for (const std::string& piece : pieces) put(piece);
                          },
                          {});
    ASSERT_EQ(Read("out.xml"), expected + "\n") << sizes.size() << " pieces";
  }
  tree_.AddFile("kept.xml", "old");
  EXPECT_THROW(ReplaceFileAtomically(tree_.Native("kept.xml"),
                                     [](const auto& put) {
                                       put("<partial");
                                       throw Failure(kOutOfMemory, "out of memory");
                                     },
                                     {}),
               Failure);
  EXPECT_EQ(Read("kept.xml"), "old");
  for (const auto& entry : std::filesystem::directory_iterator(tree_.Native(""))) {
    EXPECT_EQ(entry.path().string().find(".trl-"), std::string::npos) << entry.path();
  }
}

// Chunks handed to the writing thread arrive in order, however the pieces fall against them; a
// failed write is told at the end.
TEST_F(SafeWritesTest, ChunksArriveInOrderAndAFailureIsTold) {
  for (size_t chunkSize : {1, 7, 64, 1 << 16}) {
    tree_.AddFile("chunks.txt", "");
    int fd = ::open(tree_.Native("chunks.txt").c_str(), O_WRONLY | O_TRUNC);
    ASSERT_GE(fd, 0);
    std::string expected;
    {
      ChunkWriter writer(fd, chunkSize);
      for (size_t size = 0; size < 300; size += 13) {
        std::string piece(size, static_cast<char>('a' + size % 26));
        writer.Put(piece);
        expected += piece;
      }
      EXPECT_TRUE(writer.Finish());
    }
    ::close(fd);
    EXPECT_EQ(Read("chunks.txt"), expected) << chunkSize;
  }
  int full = ::open("/dev/full", O_WRONLY);
  ASSERT_GE(full, 0);
  ChunkWriter writer(full, 4);
  writer.Put("more than a chunk");
  writer.Put("and more");
  EXPECT_FALSE(writer.Finish());
  EXPECT_EQ(errno, ENOSPC);
  ::close(full);
}

// A second save of the same file waits until the first has replaced it.
TEST_F(SafeWritesTest, SavesOfOneFileTakeTurns) {
  tree_.AddFile("user.xml", "first");
  std::atomic<bool> secondHasIt = false;
  std::thread second;
  {
    SaveLock first(tree_.Native("user.xml"));
    ::testing::internal::CaptureStderr();
    second = std::thread([&] {
      SaveLock lock(tree_.Native("user.xml"));
      secondHasIt = true;
    });
    std::this_thread::sleep_for(std::chrono::milliseconds(200));
    EXPECT_FALSE(secondHasIt);
  }
  second.join();
  EXPECT_TRUE(secondHasIt);
  EXPECT_EQ(
      ::testing::internal::GetCapturedStderr(),
      "trllocator: waiting for another run that is saving '" + tree_.Native("user.xml") + "'\n");
  tree_.AddLink("other.xml.lock", tree_.Native("user.xml"));
  EXPECT_THROW(SaveLock(tree_.Native("other.xml")), CommandError);
}

}  // namespace
}  // namespace trl::cli
