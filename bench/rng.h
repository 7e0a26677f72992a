#pragma once

#include <array>
#include <cstddef>
#include <cstdint>
#include <string_view>

namespace trl::bench {

// Own generator and draws rather than <random> distributions, whose output differs between
// standard libraries: generated data must be the same wherever it is built.
class Rng {
 public:
  explicit Rng(uint64_t start) : state_(start) {}

  uint64_t Next() {  // splitmix64
    uint64_t z = (state_ += 0x9E3779B97F4A7C15ULL);
    z = (z ^ (z >> 30)) * 0xBF58476D1CE4E5B9ULL;
    z = (z ^ (z >> 27)) * 0x94D049BB133111EBULL;
    return z ^ (z >> 31);
  }
  size_t Below(size_t n) { return static_cast<size_t>(Next() % n); }
  bool Chance(int percent) { return Below(100) < static_cast<size_t>(percent); }
  double Unit() { return static_cast<double>((Next() >> 11) + 1) * 0x1.0p-53; }  // (0, 1]

  template <size_t N>
  std::string_view Pick(const std::array<std::string_view, N>& words) {
    return words[Below(N)];
  }

 private:
  uint64_t state_;
};

}  // namespace trl::bench
