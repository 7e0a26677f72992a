#include "schema/lane_digests.h"

#include <algorithm>
#include <array>
#include <cstring>
#include <memory>

#include "platform/fs/long_read.h"
#include "schema/md5_lanes.h"

namespace trl {
namespace {

constexpr size_t kLanes = Md5Lanes::kLanes;
constexpr size_t kBlock = Md5Lanes::kBlock;
// Read per call for a lane; a chunk per lane is all the memory the hashing holds.
constexpr size_t kChunk = size_t{64} << 10;
// Compressions between asking the feed for files for idle lanes while others work.
constexpr unsigned kAskIdleEvery = 16;

// One file going through a lane: what of it was read, and the padding once its data ends.
struct Stream {
  fs::FileReader* reader = nullptr;
  uint64_t size = 0;
  uint64_t offset = 0;              // bytes read
  unsigned char* buffer = nullptr;  // kChunk bytes
  size_t begin = 0, end = 0;        // the bytes of `buffer` read and not hashed yet
  unsigned char padding[2 * kBlock];
  size_t paddingBlocks = 0, paddingTaken = 0;

  void Start(fs::FileReader& file) {
    reader = &file;
    offset = begin = end = paddingBlocks = paddingTaken = 0;
    size = file.Size();  // never past the size it had: one that grows meanwhile is not read forever
  }

  // The next block to hash; `last` tells it ends the file.
  const unsigned char* NextBlock(uint64_t& readSinceAsked, bool& last) {
    while (paddingBlocks == 0 && end - begin < kBlock) {
      size_t kept = end - begin;
      if (offset < size) {
        std::memmove(buffer, buffer + begin, kept);
        begin = 0;
        end = kept;
        size_t got =
            reader->ReadAt(offset, buffer + end,
                           static_cast<size_t>(std::min<uint64_t>(kChunk - end, size - offset)));
        if (got == 0) size = offset;  // shorter than it was: what was read is the file
        offset += got;
        end += got;
        readSinceAsked += got;
        continue;
      }
      std::memcpy(padding, buffer + begin, kept);
      begin = end;
      paddingBlocks = Md5Lanes::Padding(padding, kept, offset);
    }
    if (paddingBlocks == 0) {
      const unsigned char* block = buffer + begin;
      begin += kBlock;
      last = false;
      return block;
    }
    const unsigned char* block = padding + kBlock * paddingTaken++;
    last = paddingTaken == paddingBlocks;
    return block;
  }
};

class LaneRun {
 public:
  explicit LaneRun(DigestFeed& feed) : feed_(feed) {
    // Kept for the thread's life: fresh buffers at every run would fault in new pages each time.
    thread_local std::unique_ptr<unsigned char[]> buffers(new unsigned char[kLanes * kChunk]);
    for (size_t lane = 0; lane < kLanes; ++lane)
      streams_[lane].buffer = buffers.get() + lane * kChunk;
  }

  void Run() {
    for (size_t lane = 0; lane < kLanes; ++lane) Fill(lane);
    for (unsigned round = 1;; ++round) {
      if (round % kAskIdleEvery == 0) {
        for (size_t lane = 0; lane < kLanes; ++lane) {
          if (!streams_[lane].reader) Fill(lane);
        }
      }
      if (std::none_of(streams_.begin(), streams_.end(),
                       [](const Stream& s) { return s.reader; })) {
        return;
      }
      std::array<const unsigned char*, kLanes> blocks{};
      std::array<bool, kLanes> last{};
      for (size_t lane = 0; lane < kLanes; ++lane) blocks[lane] = NextBlock(lane, last[lane]);
      lanes_.Compress(blocks.data());
      for (size_t lane = 0; lane < kLanes; ++lane) {
        if (!blocks[lane] || !last[lane]) continue;
        fs::FileReader& reader = *streams_[lane].reader;
        streams_[lane].reader = nullptr;
        feed_.Done(reader, DigestHex(lanes_.Digest(lane)), nullptr);
        Fill(lane);
      }
      // A cancel is honoured within large files, not after them.
      if (readSinceAsked_ >= fs::kLongReadStep) {
        readSinceAsked_ = 0;
        fs::PollLongRead();
      }
    }
  }

 private:
  // Gives an idle lane the feed's next file, if it has one.
  void Fill(size_t lane) {
    while (fs::FileReader* reader = feed_.Next()) {
      try {
        streams_[lane].Start(*reader);
        lanes_.Reset(lane);
        return;
      } catch (const fs::ReadAbandoned&) {
        throw;
      } catch (...) {
        streams_[lane].reader = nullptr;
        feed_.Done(*reader, std::string(), std::current_exception());
      }
    }
  }

  // The lane's next block, or nullptr when it has no file; a file whose read fails is told so and
  // the lane goes on with the next one.
  const unsigned char* NextBlock(size_t lane, bool& last) {
    Stream& stream = streams_[lane];
    while (stream.reader) {
      try {
        return stream.NextBlock(readSinceAsked_, last);
      } catch (const fs::ReadAbandoned&) {
        throw;
      } catch (...) {
        fs::FileReader& reader = *stream.reader;
        stream.reader = nullptr;
        feed_.Done(reader, std::string(), std::current_exception());
        Fill(lane);
      }
    }
    return nullptr;
  }

  DigestFeed& feed_;
  Md5Lanes lanes_;
  std::array<Stream, kLanes> streams_;
  uint64_t readSinceAsked_ = 0;
};

}  // namespace

void DigestInLanes(DigestFeed& feed) { LaneRun(feed).Run(); }

std::string DigestHex(const std::array<unsigned char, 16>& digest) {
  static constexpr char kHex[] = "0123456789abcdef";
  std::string text;
  text.reserve(digest.size() * 2);
  for (unsigned char byte : digest) {
    text.push_back(kHex[byte >> 4]);
    text.push_back(kHex[byte & 0xF]);
  }
  return text;
}

}  // namespace trl
