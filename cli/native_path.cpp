#include "native_path.h"

#include <filesystem>
#include <system_error>

#include "platform/text.h"

namespace trl::cli {
namespace {

// The name in `folder` spelt as `name` is, or else the first that differs only in case, or else
// `name` itself.
std::string OnDisk(const std::filesystem::path& folder, const std::string& name) {
  std::error_code error;
  if (std::filesystem::exists(folder / name, error)) return name;
  std::string lowered = LowerCase(name);
  for (const auto& entry : std::filesystem::directory_iterator(folder, error)) {
    std::string found = entry.path().filename().native();
    if (LowerCase(found) == lowered) return found;
  }
  return name;
}

}  // namespace

std::string NativePath(std::string_view componentPath) {
  std::filesystem::path path = "/";
  std::string text;
  for (size_t at = 0; at < componentPath.size();) {
    size_t end = std::min(componentPath.find('\\', at), componentPath.size());
    if (end > at) {
      std::string name = OnDisk(path, NameToNative(componentPath.substr(at, end - at)));
      path /= name;
      text += '/' + name;
    }
    at = end + 1;
  }
  if (componentPath.ends_with('\\') || text.empty()) text += '/';
  return text;
}

}  // namespace trl::cli
