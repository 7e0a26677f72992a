// The PE version reader on any file content: it reads only within the file, gives "" or four
// 16-bit numbers, and gives the same answer when the file hands out its bytes in short reads.
#include <algorithm>
#include <charconv>
#include <cstddef>
#include <cstdint>
#include <cstring>
#include <string>
#include <string_view>

#include "fuzz_input.h"
#include "platform/fs/file_system.h"
#include "schema/pe_version.h"

namespace {

using trl::fuzz::Require;

class BytesReader : public trl::fs::FileReader {
 public:
  BytesReader(const uint8_t* data, size_t size, size_t maxRead)
      : data_(data), size_(size), maxRead_(maxRead) {}

  uint64_t Size() override { return size_; }
  size_t ReadAt(uint64_t offset, void* buffer, size_t size) override {
    if (offset >= size_) return 0;
    size_t count = std::min({size, maxRead_, static_cast<size_t>(size_ - offset)});
    std::memcpy(buffer, data_ + offset, count);
    return count;
  }

 private:
  const uint8_t* data_;
  size_t size_;
  size_t maxRead_;
};

// "a.b.c.d", each a number from 0 to 65535 without leading zeros.
bool IsFileVersion(std::string_view text) {
  for (int part = 0; part < 4; ++part) {
    if (part > 0) {
      if (text.empty() || text.front() != '.') return false;
      text.remove_prefix(1);
    }
    unsigned value = 0;
    auto [end, error] = std::from_chars(text.data(), text.data() + text.size(), value);
    size_t length = static_cast<size_t>(end - text.data());
    if (error != std::errc() || value > 0xFFFF || (length > 1 && text.front() == '0')) {
      return false;
    }
    text.remove_prefix(length);
  }
  return text.empty();
}

}  // namespace

// The first byte sets the size of the short reads; the rest is the file.
extern "C" int LLVMFuzzerTestOneInput(const uint8_t* data, size_t size) {
  if (size == 0) return 0;
  size_t shortRead = data[0] % 16 + 1;
  BytesReader whole(data + 1, size - 1, SIZE_MAX);
  std::string version = trl::ReadPeFileVersion(whole);
  Require(version.empty() || IsFileVersion(version), "not a file version");
  BytesReader piecemeal(data + 1, size - 1, shortRead);
  Require(trl::ReadPeFileVersion(piecemeal) == version, "short reads changed the version");
  return 0;
}
