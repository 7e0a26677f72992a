#pragma once

#include <array>
#include <cstddef>
#include <cstdint>
#include <vector>

namespace trl {

// MD5 of up to kLanes messages at once, one lane of the processor's vector unit per message. The
// system's hashing takes one message at a time, where each step waits for the one before it; the
// lanes fill those waits with other files' steps, so many files hash at the cost of a few.
class Md5Lanes {
 public:
  static constexpr size_t kLanes = 16;
  static constexpr size_t kBlock = 64;

  // A way of running the lanes: the instruction set it uses.
  struct Kind {
    const char* name;
    void (*compress)(uint32_t (*state)[kLanes], const uint32_t (*words)[kLanes]);
  };
  // Those this processor runs, widest first.
  static const std::vector<Kind>& Available();

  explicit Md5Lanes(const Kind& kind = Available().front());

  // Lane `lane` begins a new message.
  void Reset(size_t lane);
  // Adds the next 64-byte block of each lane's message, `blocks[lane]`. A lane given nullptr is
  // idle: its state means nothing until its next Reset.
  void Compress(const unsigned char* const blocks[kLanes]);
  // The digest of the blocks given to `lane` since its Reset; they include the message's padding
  // (see Padding).
  std::array<unsigned char, 16> Digest(size_t lane) const;

  // Writes the padding that ends a message of `length` bytes whose last `tail` bytes (fewer than
  // a block) are at the start of `out`, and returns the blocks `out` then holds (1 or 2).
  static size_t Padding(unsigned char (&out)[2 * kBlock], size_t tail, uint64_t length);

 private:
  decltype(Kind::compress) compress_;
  alignas(64) uint32_t state_[4][kLanes];
  alignas(64) uint32_t words_[16][kLanes] = {};  // the block being added, word by word
};

}  // namespace trl
