#include <windows.h>

#include "schema/md5_digest.h"
// windows.h first: bcrypt.h needs its types.
#include <bcrypt.h>

#include <algorithm>

#include "platform/failure.h"

namespace trl {

struct Md5Digest::Impl {
  BCRYPT_ALG_HANDLE algorithm = nullptr;
  BCRYPT_HASH_HANDLE hash = nullptr;

  ~Impl() {
    if (hash != nullptr) BCryptDestroyHash(hash);
    if (algorithm != nullptr) BCryptCloseAlgorithmProvider(algorithm, 0);
  }
};

Md5Digest::Md5Digest() : impl_(std::make_unique<Impl>()) {
  if (!BCRYPT_SUCCESS(
          BCryptOpenAlgorithmProvider(&impl_->algorithm, BCRYPT_MD5_ALGORITHM, nullptr, 0)) ||
      !BCRYPT_SUCCESS(
          BCryptCreateHash(impl_->algorithm, &impl_->hash, nullptr, 0, nullptr, 0, 0))) {
    Fail(kInvalidArgument, "MD5 digest unavailable");
  }
}

Md5Digest::~Md5Digest() = default;

void Md5Digest::Update(const void* data, size_t size) {
  // BCryptHashData takes at most 4 GiB a call.
  auto* bytes = static_cast<UCHAR*>(const_cast<void*>(data));
  while (size > 0) {
    ULONG part = static_cast<ULONG>(std::min<size_t>(size, ULONG{1} << 30));
    BCryptHashData(impl_->hash, bytes, part, 0);
    bytes += part;
    size -= part;
  }
}

std::array<unsigned char, 16> Md5Digest::Final() {
  std::array<unsigned char, 16> md5{};
  BCryptFinishHash(impl_->hash, md5.data(), static_cast<ULONG>(md5.size()), 0);
  return md5;
}

}  // namespace trl
