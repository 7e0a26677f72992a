#include "server/windows/com_text.h"

#include <new>

#include "platform/windows/wide_text.h"

namespace trl::server::windows {

std::string Utf8(BSTR text) {
  return text == nullptr ? std::string() : FromWide({text, SysStringLen(text)});
}

BSTR NewBstr(std::string_view text) {
  std::wstring wide = ToWide(text);
  BSTR copy = SysAllocStringLen(wide.data(), static_cast<UINT>(wide.size()));
  if (copy == nullptr) throw std::bad_alloc();
  return copy;
}

}  // namespace trl::server::windows
