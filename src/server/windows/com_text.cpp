#include "server/windows/com_text.h"

#include <new>

namespace trl::server::windows {

std::string Utf8(const wchar_t* text, size_t length) {
  if (length == 0) return {};
  int size =
      WideCharToMultiByte(CP_UTF8, 0, text, static_cast<int>(length), nullptr, 0, nullptr, nullptr);
  std::string utf8(static_cast<size_t>(size), '\0');
  WideCharToMultiByte(CP_UTF8, 0, text, static_cast<int>(length), utf8.data(), size, nullptr,
                      nullptr);
  return utf8;
}

std::string Utf8(BSTR text) {
  return text == nullptr ? std::string() : Utf8(text, SysStringLen(text));
}

std::wstring Wide(std::string_view text) {
  if (text.empty()) return {};
  int size =
      MultiByteToWideChar(CP_UTF8, 0, text.data(), static_cast<int>(text.size()), nullptr, 0);
  std::wstring wide(static_cast<size_t>(size), L'\0');
  MultiByteToWideChar(CP_UTF8, 0, text.data(), static_cast<int>(text.size()), wide.data(), size);
  return wide;
}

BSTR NewBstr(std::string_view text) {
  std::wstring wide = Wide(text);
  BSTR copy = SysAllocStringLen(wide.data(), static_cast<UINT>(wide.size()));
  if (copy == nullptr) throw std::bad_alloc();
  return copy;
}

}  // namespace trl::server::windows
