#pragma once

#include <cstdint>
#include <string>
#include <string_view>

#include "trl/server.h"

namespace trl::server {

namespace guid_detail {

constexpr uint32_t Hex(std::string_view text, size_t from, size_t digits) {
  uint32_t value = 0;
  for (size_t i = from; i < from + digits; ++i) {
    char c = text[i];
    uint32_t digit = c >= '0' && c <= '9'   ? c - '0'
                     : c >= 'A' && c <= 'F' ? c - 'A' + 10
                     : c >= 'a' && c <= 'f' ? c - 'a' + 10
                                            : throw "not a hexadecimal digit";
    value = value * 16 + digit;
  }
  return value;
}

}  // namespace guid_detail

// An identifier from its text without braces, "XXXXXXXX-XXXX-XXXX-XXXX-XXXXXXXXXXXX", checked
// while compiling.
consteval TrlGuid Guid(std::string_view text) {
  if (text.size() != 36 || text[8] != '-' || text[13] != '-' || text[18] != '-' ||
      text[23] != '-') {
    throw "not an identifier";
  }
  TrlGuid guid{guid_detail::Hex(text, 0, 8),
               static_cast<uint16_t>(guid_detail::Hex(text, 9, 4)),
               static_cast<uint16_t>(guid_detail::Hex(text, 14, 4)),
               {}};
  guid.data4[0] = static_cast<uint8_t>(guid_detail::Hex(text, 19, 2));
  guid.data4[1] = static_cast<uint8_t>(guid_detail::Hex(text, 21, 2));
  for (size_t i = 0; i < 6; ++i)
    guid.data4[2 + i] = static_cast<uint8_t>(guid_detail::Hex(text, 24 + 2 * i, 2));
  return guid;
}

bool SameGuid(const TrlGuid& a, const TrlGuid& b);

// "{XXXXXXXX-XXXX-XXXX-XXXX-XXXXXXXXXXXX}", upper case, as registries write it.
std::string GuidText(const TrlGuid& guid);

}  // namespace trl::server
