#include "platform/host_name.h"

#include <windows.h>

#include <string>

#include "platform/windows/wide_text.h"

namespace trl {

std::string HostName() {
  DWORD size = 0;
  GetComputerNameExW(ComputerNameDnsHostname, nullptr, &size);
  if (size == 0) return "";
  std::wstring name(size, L'\0');
  if (!GetComputerNameExW(ComputerNameDnsHostname, name.data(), &size)) return "";
  name.resize(size);
  return FromWide(name);
}

}  // namespace trl
