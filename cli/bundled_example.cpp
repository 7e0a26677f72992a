#include "bundled_example.h"

#include <system_error>

namespace trl::cli {

std::filesystem::path BundledExampleFolder() {
  std::error_code error;
  std::filesystem::path program = std::filesystem::read_symlink("/proc/self/exe", error);
  std::filesystem::path installed =
      (program.parent_path() / TRL_EXAMPLES_FROM_PROGRAM).lexically_normal();
  if (!error && std::filesystem::is_directory(installed, error)) return installed;
  std::filesystem::path source = TRL_SOURCE_EXAMPLES;
  return std::filesystem::is_directory(source, error) ? source : installed;
}

}  // namespace trl::cli
