#pragma once

#include <CLI/CLI.hpp>
#include <memory>
#include <string>

#include "schema/property_cache.h"

namespace trl::cli {

// Where the property cache of a command that reads files is, or that it is not used.
struct CacheOptions {
  std::string file;  // the default place when empty
  bool off = false;
};

void AddCacheOptions(CLI::App& command, CacheOptions& options);

// The cache file the options name: --cache, else $XDG_CACHE_HOME/trllocator/properties.sqlite,
// else ~/.cache/trllocator/properties.sqlite; "" for none (--no-cache, or no home to keep it in).
std::string CacheFile(const CacheOptions& options);

// The property cache in use while it lives. Its problems are warnings on standard error (not with
// `quiet`), never events of a document; with `verbose`, what it saved is told at the end.
class CacheForRun {
 public:
  CacheForRun(const CacheOptions& options, bool quiet, bool verbose);
  ~CacheForRun();
  CacheForRun(const CacheForRun&) = delete;
  CacheForRun& operator=(const CacheForRun&) = delete;

 private:
  std::unique_ptr<PropertyCache> cache_;
  bool verbose_;
};

}  // namespace trl::cli
