#pragma once

#include <cstdint>
#include <cstring>
#include <string_view>

namespace trl {

// Tests on eight bytes of text at once, as one word: names are scanned byte by byte by the
// million, and mostly pass. Each test tells exactly whether any byte of the word is what it names
// (a borrow only spreads upwards from a byte that is).
constexpr uint64_t kEachByte = 0x0101010101010101;
constexpr uint64_t kHighBits = 0x8080808080808080;

inline uint64_t WordAt(const char* at) {
  uint64_t word;
  std::memcpy(&word, at, sizeof word);
  return word;
}

inline bool WordHasNonAscii(uint64_t word) { return (word & kHighBits) != 0; }

// Whether a byte of the word is below `limit` (at most 0x80).
inline bool WordHasByteBelow(uint64_t word, unsigned char limit) {
  return ((word - kEachByte * limit) & ~word & kHighBits) != 0;
}

inline bool WordHasByte(uint64_t word, unsigned char value) {
  return WordHasByteBelow(word ^ (kEachByte * value), 1);
}

// The length of the leading run of `text` whose bytes all pass `keep`, taken a word at a time
// while whole words pass `keepWord` (which must pass a word only when `keep` passes each byte).
template <class KeepWord, class Keep>
size_t PassingPrefix(std::string_view text, KeepWord keepWord, Keep keep) {
  size_t i = 0;
  while (i + sizeof(uint64_t) <= text.size() && keepWord(WordAt(text.data() + i))) {
    i += sizeof(uint64_t);
  }
  while (i < text.size() && keep(static_cast<unsigned char>(text[i]))) ++i;
  return i;
}

}  // namespace trl
