#pragma once

#include <string>
#include <string_view>

namespace trl::cli {

// Text safe to print for a person: control characters (C0, DEL and C1, as in an ESC sequence
// planted in a name) and bytes that are not UTF-8 are shown as escapes ("\x1b") instead of being
// sent to the terminal.
std::string Printable(std::string_view text);

// How many terminal columns printable UTF-8 text takes: wide characters take two, combining
// marks none.
size_t DisplayWidth(std::string_view text);

}  // namespace trl::cli
