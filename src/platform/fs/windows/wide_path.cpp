#include "platform/fs/windows/wide_path.h"

#include <windows.h>

#include <algorithm>

#include "platform/windows/wide_text.h"

namespace trl::fs {

std::wstring LongPath(std::string_view path) {
  std::wstring wide = ToWide(path);
  std::replace(wide.begin(), wide.end(), L'/', L'\\');
  // A bare drive ("C:") means that drive's current folder; the component always means its root.
  if (wide.size() == 2 && wide[1] == L':') wide += L'\\';
  if (wide.size() < MAX_PATH || wide.starts_with(L"\\\\?\\")) return wide;
  if (wide.starts_with(L"\\\\")) return L"\\\\?\\UNC\\" + wide.substr(2);
  return L"\\\\?\\" + wide;
}

std::wstring ShortForm(std::wstring path) {
  if (path.starts_with(L"\\\\?\\UNC\\")) return L"\\\\" + path.substr(8);
  if (path.starts_with(L"\\\\?\\")) return path.substr(4);
  return path;
}

}  // namespace trl::fs
