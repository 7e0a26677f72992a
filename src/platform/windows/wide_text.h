#pragma once

#include <string>
#include <string_view>

namespace trl {

// UTF-8 <-> UTF-16, the Win32 API's own encoding.
std::wstring ToWide(std::string_view text);
std::string FromWide(std::wstring_view text);

}  // namespace trl
