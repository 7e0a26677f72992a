#pragma once

#include <chrono>
#include <cstdint>
#include <functional>
#include <memory>
#include <optional>
#include <string>

#include "platform/fs/file_system.h"

namespace trl {

// Property values read from files (version resources, digests) kept in an SQLite database across
// runs, so that a file nobody changed is not read again. A value is reused only for the same file
// (device and inode) with the same size, modification and change time; any doubt reads the file.
// A database that cannot be used is reported once through the warning callback and then left
// alone: every value is read from its file for the rest of the cache's life. Safe for several
// threads, and for several processes sharing one database file.
class PropertyCache {
 public:
  struct Options {
    // A file changed less than this before its read began is read and not stored: a write within
    // the same tick of the file system's clock would leave its times as they are.
    std::chrono::nanoseconds settle = std::chrono::seconds(2);
    // The longest wait for another process that is writing the database.
    std::chrono::milliseconds busyTimeout = std::chrono::seconds(5);
    // Values not used for this many days are dropped when the cache opens.
    int keepDays = 90;
    // Stores written together in one transaction.
    int batch = 256;
  };
  struct Counts {
    uint64_t reused = 0;  // values taken from the database
    uint64_t read = 0;    // files read
    uint64_t stored = 0;  // values written to the database
  };
  using Warn = std::function<void(const std::string& message)>;
  using Read = std::function<std::string(fs::FileReader& reader)>;

  // Opens the database at `path` (no link followed), creating it (0600) and its folder (0700) when
  // missing.
  PropertyCache(const std::string& path, Warn warn, Options options);
  PropertyCache(const std::string& path, Warn warn);
  // Writes what is pending.
  virtual ~PropertyCache();
  PropertyCache(const PropertyCache&) = delete;
  PropertyCache& operator=(const PropertyCache&) = delete;

  // Property `kind` of the file `reader` has open: the stored value when the file is as it was
  // when the value was stored, else `read(reader)`, stored when the file can be trusted not to
  // have changed unseen. What `read` throws passes through, and nothing is stored then.
  // Virtual, so that the property readers reach it without linking the database code, which a
  // host without a cache does not build.
  virtual std::string Value(fs::FileReader& reader, int kind, const Read& read);

  // Value in two halves, for a reader of many files at once. Stored gives the stored value, or
  // nothing and what Keep needs; Keep is told the value then read from the same open file.
  struct Lookup {
    std::optional<fs::FileIdentity> before;
    bool trusted = false;
  };
  virtual std::optional<std::string> Stored(fs::FileReader& reader, int kind, Lookup& lookup);
  virtual void Keep(fs::FileReader& reader, int kind, const Lookup& lookup,
                    const std::string& value);

  // Writes the pending stores to the database now.
  void Flush();

  Counts Counters() const;

 private:
  struct Impl;
  std::unique_ptr<Impl> impl_;
};

// The cache the schema's property readers use, none by default. The stages create their Schema
// objects themselves (and Locate creates its stages), so a cache handed through their
// constructors would widen every stage's interface for one concern of the host; the host sets
// this once around its runs instead. Not owned; clear it before the cache goes away.
void UsePropertyCache(PropertyCache* cache);
PropertyCache* PropertyCacheInUse();

}  // namespace trl
