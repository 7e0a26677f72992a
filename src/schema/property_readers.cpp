#include <algorithm>
#include <array>
#include <memory>
#include <optional>
#include <vector>

#include "platform/failure.h"
#include "platform/fs/long_read.h"
#include "schema/lane_digests.h"
#include "schema/md5_digest.h"
#include "schema/pe_version.h"
#include "schema/property_cache.h"
#include "schema/schema.h"

namespace trl {
namespace {

constexpr size_t kDigestChunk = size_t{256} << 10;

// The MD5 digest of everything the reader gives, in lower-case hex.
std::string Md5Hex(fs::FileReader& reader) {
  Md5Digest md5;
  // One buffer per thread for every file it hashes: a fresh one per file would fault in new pages
  // each time. Never past the size the file had when opened: one that grows meanwhile is not read
  // forever.
  thread_local std::unique_ptr<unsigned char[]> buffer(new unsigned char[kDigestChunk]);
  uint64_t size = reader.Size();
  uint64_t offset = 0;
  uint64_t nextPoll = fs::kLongReadStep;
  while (offset < size) {
    if (offset >= nextPoll) {
      fs::PollLongRead();  // a cancel is honoured within a large file, not after it
      nextPoll += fs::kLongReadStep;
    }
    size_t got = reader.ReadAt(
        offset, buffer.get(), static_cast<size_t>(std::min<uint64_t>(kDigestChunk, size - offset)));
    if (got == 0) break;
    md5.Update(buffer.get(), got);
    offset += got;
  }
  return DigestHex(md5.Final());
}

// `read` on the opened file, through the cache when one is in use.
std::string CachedRead(const fs::File& file, int kind, std::string (*read)(fs::FileReader&)) {
  std::unique_ptr<fs::FileReader> reader = file.Open();
  PropertyCache* cache = PropertyCacheInUse();
  return cache ? cache->Value(*reader, kind, read) : read(*reader);
}

// Opens the files `next` gives and hashes those the cache has no value for in lanes; every file
// ends in `done`.
class TogetherFeed : public DigestFeed {
 public:
  TogetherFeed(const Schema::NextFile& next, const Schema::DigestDone& done)
      : next_(next), done_(done) {}

  fs::FileReader* Next() override {
    while (const fs::File* file = next_()) {
      try {
        Open open{file, file->Open(), {}};
        if (cache_) {
          if (std::optional<std::string> stored = cache_->Stored(*open.reader, 3, open.lookup)) {
            done_(*file, std::move(*stored), nullptr);
            continue;
          }
        }
        open_.push_back(std::move(open));
        return open_.back().reader.get();
      } catch (const fs::ReadAbandoned&) {
        throw;
      } catch (...) {
        done_(*file, std::string(), std::current_exception());
      }
    }
    return nullptr;
  }

  void Done(fs::FileReader& reader, std::string digest, std::exception_ptr failure) override {
    auto open = std::find_if(open_.begin(), open_.end(),
                             [&](const Open& o) { return o.reader.get() == &reader; });
    Open ended = std::move(*open);
    open_.erase(open);
    if (!failure && cache_) {
      try {
        cache_->Keep(reader, 3, ended.lookup, digest);
      } catch (...) {
        // As for a file read alone: what fails while its value is stored fails its read.
        failure = std::current_exception();
        digest.clear();
      }
    }
    done_(*ended.file, std::move(digest), failure);
  }

 private:
  struct Open {
    const fs::File* file;
    std::unique_ptr<fs::FileReader> reader;
    PropertyCache::Lookup lookup;
  };
  const Schema::NextFile& next_;
  const Schema::DigestDone& done_;
  PropertyCache* cache_ = PropertyCacheInUse();
  std::vector<Open> open_;  // one per busy lane
};

}  // namespace

void Schema::ReadPropertyType3Together(const NextFile& next, const DigestDone& done) const {
  TogetherFeed feed(next, done);
  DigestInLanes(feed);
}

std::string Schema::ReadPropertyType1(const fs::File& file) const {
  return CachedRead(file, 1, ReadPeFileVersion);
}

int64_t Schema::ReadPropertyType2(const fs::File& file) const {
  return static_cast<int64_t>(file.Size());
}

std::string Schema::ReadPropertyType3(const fs::File& file) const {
  return CachedRead(file, 3, Md5Hex);
}

DateTime Schema::ReadPropertyType4(const fs::File& file) const { return file.DateLastModified(); }

}  // namespace trl
