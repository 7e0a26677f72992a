#pragma once

#include <array>
#include <cstddef>
#include <memory>

namespace trl {

// An MD5 digest computed over data given in parts, by the system's own hashing.
class Md5Digest {
 public:
  // Fails with kInvalidArgument (5) when the system offers no MD5.
  Md5Digest();
  ~Md5Digest();
  Md5Digest(const Md5Digest&) = delete;
  Md5Digest& operator=(const Md5Digest&) = delete;

  void Update(const void* data, size_t size);
  // The digest of everything given; nothing may be given afterwards.
  std::array<unsigned char, 16> Final();

 private:
  struct Impl;
  std::unique_ptr<Impl> impl_;
};

}  // namespace trl
