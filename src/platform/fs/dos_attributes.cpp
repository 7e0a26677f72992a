#include "platform/fs/dos_attributes.h"

#include "platform/fs/file_system.h"

namespace trl::fs {

bool IsSmbFileSystemType(int64_t type) {
  constexpr uint32_t kCifsMagic = 0xFF534D42;
  constexpr uint32_t kSmb2Magic = 0xFE534D42;
  auto magic = static_cast<uint32_t>(type);  // f_type is signed where longs have 32 bits
  return magic == kCifsMagic || magic == kSmb2Magic;
}

std::optional<uint16_t> DecodeDosAttributes(std::string_view value) {
  if (value.size() != 4) return std::nullopt;
  uint32_t word = 0;
  for (size_t i = 0; i < 4; ++i) {
    word |= static_cast<uint32_t>(static_cast<unsigned char>(value[i])) << (8 * i);
  }
  return static_cast<uint16_t>(word & kAllAttributes);
}

}  // namespace trl::fs
