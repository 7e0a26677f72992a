#include "schema/md5_lanes.h"

#include <cstring>
#include <vector>

namespace trl {
namespace {

using Lanes = uint32_t[Md5Lanes::kLanes];
// One value per lane; the compiler spreads it over the widest registers the target has.
using Vector = uint32_t __attribute__((vector_size(4 * Md5Lanes::kLanes)));

#define TRL_ROTATE(x, s) (((x) << (s)) | ((x) >> (32 - (s))))
#define TRL_STEP(f, a, b, c, d, word, constant, s) \
  a += f(b, c, d) + m[word] + (constant##u);       \
  a = b + TRL_ROTATE(a, s)
#define TRL_F(b, c, d) ((d) ^ ((b) & ((c) ^ (d))))
#define TRL_G(b, c, d) ((c) ^ ((d) & ((b) ^ (c))))
#define TRL_H(b, c, d) ((b) ^ (c) ^ (d))
#define TRL_I(b, c, d) ((c) ^ ((b) | ~(d)))

// The 64 steps over one block of every lane.
__attribute__((always_inline)) inline void CompressBody(Lanes* state, const Lanes* words) {
  Vector m[16];
  std::memcpy(m, words, sizeof m);
  Vector a0, b0, c0, d0;
  std::memcpy(&a0, state[0], sizeof a0);
  std::memcpy(&b0, state[1], sizeof b0);
  std::memcpy(&c0, state[2], sizeof c0);
  std::memcpy(&d0, state[3], sizeof d0);
  Vector a = a0, b = b0, c = c0, d = d0;

  TRL_STEP(TRL_F, a, b, c, d, 0, 0xd76aa478, 7);
  TRL_STEP(TRL_F, d, a, b, c, 1, 0xe8c7b756, 12);
  TRL_STEP(TRL_F, c, d, a, b, 2, 0x242070db, 17);
  TRL_STEP(TRL_F, b, c, d, a, 3, 0xc1bdceee, 22);
  TRL_STEP(TRL_F, a, b, c, d, 4, 0xf57c0faf, 7);
  TRL_STEP(TRL_F, d, a, b, c, 5, 0x4787c62a, 12);
  TRL_STEP(TRL_F, c, d, a, b, 6, 0xa8304613, 17);
  TRL_STEP(TRL_F, b, c, d, a, 7, 0xfd469501, 22);
  TRL_STEP(TRL_F, a, b, c, d, 8, 0x698098d8, 7);
  TRL_STEP(TRL_F, d, a, b, c, 9, 0x8b44f7af, 12);
  TRL_STEP(TRL_F, c, d, a, b, 10, 0xffff5bb1, 17);
  TRL_STEP(TRL_F, b, c, d, a, 11, 0x895cd7be, 22);
  TRL_STEP(TRL_F, a, b, c, d, 12, 0x6b901122, 7);
  TRL_STEP(TRL_F, d, a, b, c, 13, 0xfd987193, 12);
  TRL_STEP(TRL_F, c, d, a, b, 14, 0xa679438e, 17);
  TRL_STEP(TRL_F, b, c, d, a, 15, 0x49b40821, 22);

  TRL_STEP(TRL_G, a, b, c, d, 1, 0xf61e2562, 5);
  TRL_STEP(TRL_G, d, a, b, c, 6, 0xc040b340, 9);
  TRL_STEP(TRL_G, c, d, a, b, 11, 0x265e5a51, 14);
  TRL_STEP(TRL_G, b, c, d, a, 0, 0xe9b6c7aa, 20);
  TRL_STEP(TRL_G, a, b, c, d, 5, 0xd62f105d, 5);
  TRL_STEP(TRL_G, d, a, b, c, 10, 0x02441453, 9);
  TRL_STEP(TRL_G, c, d, a, b, 15, 0xd8a1e681, 14);
  TRL_STEP(TRL_G, b, c, d, a, 4, 0xe7d3fbc8, 20);
  TRL_STEP(TRL_G, a, b, c, d, 9, 0x21e1cde6, 5);
  TRL_STEP(TRL_G, d, a, b, c, 14, 0xc33707d6, 9);
  TRL_STEP(TRL_G, c, d, a, b, 3, 0xf4d50d87, 14);
  TRL_STEP(TRL_G, b, c, d, a, 8, 0x455a14ed, 20);
  TRL_STEP(TRL_G, a, b, c, d, 13, 0xa9e3e905, 5);
  TRL_STEP(TRL_G, d, a, b, c, 2, 0xfcefa3f8, 9);
  TRL_STEP(TRL_G, c, d, a, b, 7, 0x676f02d9, 14);
  TRL_STEP(TRL_G, b, c, d, a, 12, 0x8d2a4c8a, 20);

  TRL_STEP(TRL_H, a, b, c, d, 5, 0xfffa3942, 4);
  TRL_STEP(TRL_H, d, a, b, c, 8, 0x8771f681, 11);
  TRL_STEP(TRL_H, c, d, a, b, 11, 0x6d9d6122, 16);
  TRL_STEP(TRL_H, b, c, d, a, 14, 0xfde5380c, 23);
  TRL_STEP(TRL_H, a, b, c, d, 1, 0xa4beea44, 4);
  TRL_STEP(TRL_H, d, a, b, c, 4, 0x4bdecfa9, 11);
  TRL_STEP(TRL_H, c, d, a, b, 7, 0xf6bb4b60, 16);
  TRL_STEP(TRL_H, b, c, d, a, 10, 0xbebfbc70, 23);
  TRL_STEP(TRL_H, a, b, c, d, 13, 0x289b7ec6, 4);
  TRL_STEP(TRL_H, d, a, b, c, 0, 0xeaa127fa, 11);
  TRL_STEP(TRL_H, c, d, a, b, 3, 0xd4ef3085, 16);
  TRL_STEP(TRL_H, b, c, d, a, 6, 0x04881d05, 23);
  TRL_STEP(TRL_H, a, b, c, d, 9, 0xd9d4d039, 4);
  TRL_STEP(TRL_H, d, a, b, c, 12, 0xe6db99e5, 11);
  TRL_STEP(TRL_H, c, d, a, b, 15, 0x1fa27cf8, 16);
  TRL_STEP(TRL_H, b, c, d, a, 2, 0xc4ac5665, 23);

  TRL_STEP(TRL_I, a, b, c, d, 0, 0xf4292244, 6);
  TRL_STEP(TRL_I, d, a, b, c, 7, 0x432aff97, 10);
  TRL_STEP(TRL_I, c, d, a, b, 14, 0xab9423a7, 15);
  TRL_STEP(TRL_I, b, c, d, a, 5, 0xfc93a039, 21);
  TRL_STEP(TRL_I, a, b, c, d, 12, 0x655b59c3, 6);
  TRL_STEP(TRL_I, d, a, b, c, 3, 0x8f0ccc92, 10);
  TRL_STEP(TRL_I, c, d, a, b, 10, 0xffeff47d, 15);
  TRL_STEP(TRL_I, b, c, d, a, 1, 0x85845dd1, 21);
  TRL_STEP(TRL_I, a, b, c, d, 8, 0x6fa87e4f, 6);
  TRL_STEP(TRL_I, d, a, b, c, 15, 0xfe2ce6e0, 10);
  TRL_STEP(TRL_I, c, d, a, b, 6, 0xa3014314, 15);
  TRL_STEP(TRL_I, b, c, d, a, 13, 0x4e0811a1, 21);
  TRL_STEP(TRL_I, a, b, c, d, 4, 0xf7537e82, 6);
  TRL_STEP(TRL_I, d, a, b, c, 11, 0xbd3af235, 10);
  TRL_STEP(TRL_I, c, d, a, b, 2, 0x2ad7d2bb, 15);
  TRL_STEP(TRL_I, b, c, d, a, 9, 0xeb86d391, 21);

  a += a0;
  b += b0;
  c += c0;
  d += d0;
  std::memcpy(state[0], &a, sizeof a);
  std::memcpy(state[1], &b, sizeof b);
  std::memcpy(state[2], &c, sizeof c);
  std::memcpy(state[3], &d, sizeof d);
}

#undef TRL_ROTATE
#undef TRL_STEP
#undef TRL_F
#undef TRL_G
#undef TRL_H
#undef TRL_I

void CompressPortable(Lanes* state, const Lanes* words) { CompressBody(state, words); }

// Wider registers where the processor has them. Not on Windows, whose compiler here does not
// align the stack for the wide registers it would spill.
#if (defined(__x86_64__) || defined(__i386__)) && !defined(_WIN32)
__attribute__((target("avx2"))) void CompressAvx2(Lanes* state, const Lanes* words) {
  CompressBody(state, words);
}

__attribute__((target("avx512f"))) void CompressAvx512(Lanes* state, const Lanes* words) {
  CompressBody(state, words);
}

const std::vector<Md5Lanes::Kind>& Kinds() {
  static const std::vector<Md5Lanes::Kind> kinds = [] {
    std::vector<Md5Lanes::Kind> found;
    __builtin_cpu_init();
    if (__builtin_cpu_supports("avx512f")) found.push_back({"avx512f", CompressAvx512});
    if (__builtin_cpu_supports("avx2")) found.push_back({"avx2", CompressAvx2});
    found.push_back({"portable", CompressPortable});
    return found;
  }();
  return kinds;
}
#else
const std::vector<Md5Lanes::Kind>& Kinds() {
  static const std::vector<Md5Lanes::Kind> kinds{{"portable", CompressPortable}};
  return kinds;
}
#endif

uint32_t LoadLittleEndian(const unsigned char* bytes) {
  return uint32_t{bytes[0]} | uint32_t{bytes[1]} << 8 | uint32_t{bytes[2]} << 16 |
         uint32_t{bytes[3]} << 24;
}

}  // namespace

const std::vector<Md5Lanes::Kind>& Md5Lanes::Available() { return Kinds(); }

Md5Lanes::Md5Lanes(const Kind& kind) : compress_(kind.compress) {
  for (size_t lane = 0; lane < kLanes; ++lane) Reset(lane);
}

void Md5Lanes::Reset(size_t lane) {
  state_[0][lane] = 0x67452301;
  state_[1][lane] = 0xefcdab89;
  state_[2][lane] = 0x98badcfe;
  state_[3][lane] = 0x10325476;
}

void Md5Lanes::Compress(const unsigned char* const blocks[kLanes]) {
  for (size_t lane = 0; lane < kLanes; ++lane) {
    const unsigned char* block = blocks[lane];
    // An idle lane hashes the words it had: its state is of no use until its next Reset.
    if (!block) continue;
    for (size_t word = 0; word < 16; ++word)
      words_[word][lane] = LoadLittleEndian(block + 4 * word);
  }
  compress_(state_, words_);
}

std::array<unsigned char, 16> Md5Lanes::Digest(size_t lane) const {
  std::array<unsigned char, 16> digest{};
  for (size_t word = 0; word < 4; ++word) {
    uint32_t value = state_[word][lane];
    for (size_t byte = 0; byte < 4; ++byte) digest[4 * word + byte] = (value >> (8 * byte)) & 0xFF;
  }
  return digest;
}

size_t Md5Lanes::Padding(unsigned char (&out)[2 * kBlock], size_t tail, uint64_t length) {
  size_t blocks = tail < kBlock - 8 ? 1 : 2;
  out[tail] = 0x80;
  std::memset(out + tail + 1, 0, blocks * kBlock - tail - 1);
  uint64_t bits = length * 8;
  for (size_t byte = 0; byte < 8; ++byte) {
    out[blocks * kBlock - 8 + byte] = static_cast<unsigned char>(bits >> (8 * byte));
  }
  return blocks;
}

}  // namespace trl
