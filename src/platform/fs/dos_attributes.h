#pragma once

#include <cstdint>
#include <optional>
#include <string_view>

namespace trl::fs {

// The extended attribute in which an SMB mount exposes an item's DOS attribute word.
inline constexpr const char* kDosAttributeName = "user.cifs.dosattrib";

// True for the file system types (statfs f_type) of SMB mounts, whose items carry DOS attributes.
bool IsSmbFileSystemType(int64_t type);

// The read-only, hidden, system and archive bits of a DOS attribute word as the extended
// attribute holds it (four bytes, little-endian); nothing when the value has another size.
std::optional<uint16_t> DecodeDosAttributes(std::string_view value);

}  // namespace trl::fs
