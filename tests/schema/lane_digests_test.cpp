#include "schema/lane_digests.h"

#include <gtest/gtest.h>

#include <cstring>
#include <map>
#include <memory>
#include <random>
#include <string>
#include <vector>

#include "platform/failure.h"
#include "schema/md5_digest.h"
#include "schema/md5_lanes.h"
#include "schema/schema.h"
#include "support/memory_file.h"

namespace trl {
namespace {

using testing::MemoryFile;

// Lengths around every place where the padding or a read changes its course.
std::vector<size_t> Lengths() {
  std::vector<size_t> lengths;
  for (size_t n = 0; n <= 200; ++n) lengths.push_back(n);
  for (size_t n : {size_t{65535}, size_t{65536}, size_t{65537}, size_t{65536 + 55},
                   size_t{65536 + 56}, size_t{300000}}) {
    lengths.push_back(n);
  }
  return lengths;
}

// Bytes that differ from one file to the next and along each file.
std::string Bytes(size_t length, size_t file) {
  std::string bytes(length, '\0');
  std::minstd_rand next(static_cast<uint32_t>(file) + 1);
  for (char& byte : bytes) byte = static_cast<char>(next());
  return bytes;
}

// Each instruction set the processor has gives the system's digests, lanes ending at different
// blocks, one or two blocks of padding.
TEST(LaneDigestsTest, EveryKindOfLanesGivesTheSystemsDigest) {
  for (const Md5Lanes::Kind& kind : Md5Lanes::Available()) {
    Md5Lanes lanes(kind);
    for (size_t first = 0; first < 130; first += Md5Lanes::kLanes) {
      std::string contents[Md5Lanes::kLanes];
      unsigned char padded[Md5Lanes::kLanes][4 * Md5Lanes::kBlock];
      size_t blocks[Md5Lanes::kLanes];
      for (size_t lane = 0; lane < Md5Lanes::kLanes; ++lane) {
        std::string& content = contents[lane] = Bytes(first + lane, lane);
        size_t whole = content.size() / Md5Lanes::kBlock * Md5Lanes::kBlock;
        std::memcpy(padded[lane], content.data(), content.size());
        unsigned char tail[2 * Md5Lanes::kBlock];
        std::memcpy(tail, content.data() + whole, content.size() - whole);
        blocks[lane] = whole / Md5Lanes::kBlock +
                       Md5Lanes::Padding(tail, content.size() - whole, content.size());
        std::memcpy(padded[lane] + whole, tail, sizeof tail);
        lanes.Reset(lane);
      }
      for (size_t block = 0; block < 3; ++block) {
        const unsigned char* given[Md5Lanes::kLanes];
        for (size_t lane = 0; lane < Md5Lanes::kLanes; ++lane) {
          given[lane] = block < blocks[lane] ? padded[lane] + block * Md5Lanes::kBlock : nullptr;
        }
        lanes.Compress(given);
        // A lane that has ended idles from the next block on: its digest is taken now.
        for (size_t lane = 0; lane < Md5Lanes::kLanes; ++lane) {
          if (block + 1 != blocks[lane]) continue;
          Md5Digest alone;
          alone.Update(contents[lane].data(), contents[lane].size());
          EXPECT_EQ(DigestHex(lanes.Digest(lane)), DigestHex(alone.Final()))
              << kind.name << " " << contents[lane].size();
        }
      }
    }
  }
}

// Every file is hashed together with the others and compared with the system's digest of it,
// read alone; the feed runs dry now and then, as a queue of planned reads does, and some files
// cannot be read at all or from some point on.
TEST(LaneDigestsTest, EveryFileGetsTheDigestItHasAloneOrItsFailure) {
  std::vector<std::unique_ptr<MemoryFile>> files;
  for (size_t length : Lengths()) {
    files.push_back(std::make_unique<MemoryFile>("f", Bytes(length, files.size())));
    if (files.size() % 3 == 0) files.back()->SetMaxRead(4093);  // short reads are continued
  }
  for (size_t at : {size_t{5}, size_t{77}, size_t{206}}) {
    files[at]->FailReadsFrom(at == 206 ? 70000 : 0, kDeviceIoError);
  }
  Schema schema;
  std::map<const fs::File*, std::string> expected;
  for (const auto& file : files) {
    try {
      expected[file.get()] = schema.ReadPropertyType3(*file);
    } catch (const Failure& failure) {
      expected[file.get()] = "failed " + std::to_string(failure.number);
    }
  }

  std::map<const fs::File*, std::string> got;
  size_t given = 0;
  size_t asked = 0;
  auto next = [&]() -> const fs::File* {
    if (given == files.size() || ++asked % 23 == 0) return nullptr;
    return files[given++].get();
  };
  auto done = [&](const fs::File& file, std::string digest, std::exception_ptr failure) {
    if (failure) {
      try {
        std::rethrow_exception(failure);
      } catch (const Failure& error) {
        digest = "failed " + std::to_string(error.number);
      }
    }
    EXPECT_TRUE(got.emplace(&file, digest).second) << "told twice";
  };
  for (int runs = 0; given < files.size() && runs < 1000; ++runs) {
    schema.ReadPropertyType3Together(next, done);
  }
  EXPECT_EQ(got, expected);
  EXPECT_EQ(expected[files[206].get()], "failed " + std::to_string(kDeviceIoError));
}

}  // namespace
}  // namespace trl
