#include <algorithm>
#include <array>
#include <memory>

#include "platform/failure.h"
#include "platform/fs/long_read.h"
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
  std::array<unsigned char, 16> digest = md5.Final();

  static constexpr char kHex[] = "0123456789abcdef";
  std::string text;
  text.reserve(digest.size() * 2);
  for (unsigned char byte : digest) {
    text.push_back(kHex[byte >> 4]);
    text.push_back(kHex[byte & 0xF]);
  }
  return text;
}

// `read` on the opened file, through the cache when one is in use.
std::string CachedRead(const fs::File& file, int kind, std::string (*read)(fs::FileReader&)) {
  std::unique_ptr<fs::FileReader> reader = file.Open();
  PropertyCache* cache = PropertyCacheInUse();
  return cache ? cache->Value(*reader, kind, read) : read(*reader);
}

}  // namespace

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
