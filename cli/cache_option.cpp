#include "cache_option.h"

#include <fmt/format.h>

#include <cstdio>
#include <cstdlib>

#include "terminal_text.h"

namespace trl::cli {

void AddCacheOptions(CLI::App& command, CacheOptions& options) {
  CLI::Option* file = command.add_option(
      "--cache", options.file,
      "Keep the digests and file versions read in FILE, and reuse those of files unchanged since "
      "(default: $XDG_CACHE_HOME/trllocator/properties.sqlite or "
      "~/.cache/trllocator/properties.sqlite)");
  command.add_flag("--no-cache", options.off, "Read every file, and keep nothing read")
      ->excludes(file);
}

std::string CacheFile(const CacheOptions& options) {
  if (options.off) return "";
  if (!options.file.empty()) return options.file;
  const char* cacheHome = std::getenv("XDG_CACHE_HOME");
  if (cacheHome && cacheHome[0] == '/') {
    return std::string(cacheHome) + "/trllocator/properties.sqlite";
  }
  const char* home = std::getenv("HOME");
  if (!home || home[0] == '\0') return "";
  return std::string(home) + "/.cache/trllocator/properties.sqlite";
}

CacheForRun::CacheForRun(const CacheOptions& options, bool quiet, bool verbose)
    : verbose_(verbose) {
  std::string file = CacheFile(options);
  if (file.empty()) return;
  cache_ = std::make_unique<PropertyCache>(file, [quiet](const std::string& message) {
    if (!quiet) fmt::print(stderr, "trllocator: warning: {}\n", Printable(message));
  });
  UsePropertyCache(cache_.get());
}

CacheForRun::~CacheForRun() {
  if (!cache_) return;
  UsePropertyCache(nullptr);
  cache_->Flush();
  if (verbose_) {
    PropertyCache::Counts counts = cache_->Counters();
    fmt::print(stderr,
               "trllocator: property cache: {} values reused, {} files read, {} values stored\n",
               counts.reused, counts.read, counts.stored);
  }
}

}  // namespace trl::cli
