#include <openssl/evp.h>

#include <algorithm>

#include "platform/failure.h"
#include "schema/md5_digest.h"

namespace trl {

struct Md5Digest::Impl {
  std::unique_ptr<EVP_MD_CTX, decltype(&EVP_MD_CTX_free)> context{EVP_MD_CTX_new(),
                                                                  &EVP_MD_CTX_free};
};

Md5Digest::Md5Digest() : impl_(std::make_unique<Impl>()) {
  if (!impl_->context || EVP_DigestInit_ex(impl_->context.get(), EVP_md5(), nullptr) != 1) {
    Fail(kInvalidArgument, "MD5 digest unavailable");
  }
}

Md5Digest::~Md5Digest() = default;

void Md5Digest::Update(const void* data, size_t size) {
  EVP_DigestUpdate(impl_->context.get(), data, size);
}

std::array<unsigned char, 16> Md5Digest::Final() {
  std::array<unsigned char, EVP_MAX_MD_SIZE> digest{};
  unsigned int length = 0;
  EVP_DigestFinal_ex(impl_->context.get(), digest.data(), &length);
  std::array<unsigned char, 16> md5{};
  std::copy_n(digest.begin(), std::min<size_t>(length, md5.size()), md5.begin());
  return md5;
}

}  // namespace trl
