#pragma once

#include <string>
#include <string_view>

namespace trl::fs {

// A native path ("C:\dir\file", "\\host\share\dir") as the wide Win32 calls take it: "/" turned
// into "\", and "\\?\" (or "\\?\UNC\") put in front when it is longer than MAX_PATH, so that
// deep folders stay reachable.
std::wstring LongPath(std::string_view path);

// A path the system gave back ("\\?\C:\dir", "\\?\UNC\host\share") in its everyday form.
std::wstring ShortForm(std::wstring path);

}  // namespace trl::fs
