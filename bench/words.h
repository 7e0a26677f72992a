#pragma once

#include <array>
#include <cctype>
#include <string>
#include <string_view>

namespace trl::bench {

// Words the generators build file and product names from: plain dictionary words, so no name
// points anywhere real.
constexpr std::array<std::string_view, 36> kStemWords = {
    "App",    "Core",   "Setup",  "Update", "Helper", "Service", "Agent",  "Config", "Render",
    "Media",  "Audio",  "Video",  "Net",    "Crypto", "Font",    "Image",  "Print",  "Sync",
    "Launch", "Host",   "Shell",  "Util",   "Data",   "Report",  "Viewer", "Editor", "Codec",
    "Driver", "Plugin", "Script", "Theme",  "Cache",  "Log",     "Index",  "Parser", "Install"};

// ASCII case changes; generated names are ASCII.
inline std::string Lower(std::string_view s) {
  std::string out(s);
  for (char& c : out) c = static_cast<char>(std::tolower(static_cast<unsigned char>(c)));
  return out;
}

inline std::string Upper(std::string_view s) {
  std::string out(s);
  for (char& c : out) c = static_cast<char>(std::toupper(static_cast<unsigned char>(c)));
  return out;
}

}  // namespace trl::bench
