#include "schema/property_cache.h"

#include <fcntl.h>
#include <fmt/format.h>
#include <sqlite3.h>
#include <sys/stat.h>
#include <unistd.h>

#include <cerrno>
#include <cstring>
#include <ctime>
#include <filesystem>
#include <map>
#include <mutex>
#include <optional>
#include <stdexcept>
#include <tuple>

namespace trl {
namespace {

constexpr const char* kSchema =
    "CREATE TABLE IF NOT EXISTS property(device INTEGER NOT NULL, inode INTEGER NOT NULL, "
    "kind INTEGER NOT NULL, size INTEGER NOT NULL, modified INTEGER NOT NULL, "
    "changed INTEGER NOT NULL, value TEXT NOT NULL, used_day INTEGER NOT NULL, "
    "PRIMARY KEY(device, inode, kind)) WITHOUT ROWID;"
    "CREATE INDEX IF NOT EXISTS property_used ON property(used_day);";

// Why the database cannot be used; ends the cache's use of it.
struct DatabaseError : std::runtime_error {
  using std::runtime_error::runtime_error;
};

int64_t NowNanoseconds() {
  timespec now{};
  ::clock_gettime(CLOCK_REALTIME, &now);
  return int64_t{now.tv_sec} * 1'000'000'000 + now.tv_nsec;
}

// SQLite keeps signed 64-bit integers; device and inode numbers keep their bits.
int64_t Signed(uint64_t value) { return static_cast<int64_t>(value); }

// The folders of `path` that are missing, made for the owner only.
void MakeFolders(const std::filesystem::path& folder) {
  if (folder.empty() || std::filesystem::is_directory(folder)) return;
  MakeFolders(folder.parent_path());
  if (::mkdir(folder.c_str(), 0700) != 0 && errno != EEXIST) {
    throw DatabaseError(
        fmt::format("cannot create the folder '{}': {}", folder.string(), std::strerror(errno)));
  }
}

// Created here rather than by SQLite, so that it (and the journal files SQLite gives the same
// mode) is readable by its owner only. An existing file, a link included, is left as it is.
void MakeFile(const std::string& path) {
  int fd = ::open(path.c_str(), O_RDWR | O_CREAT | O_EXCL | O_NOFOLLOW | O_CLOEXEC, 0600);
  if (fd >= 0) {
    ::close(fd);
  } else if (errno != EEXIST) {
    throw DatabaseError(fmt::format("cannot create it: {}", std::strerror(errno)));
  }
}

}  // namespace

struct PropertyCache::Impl {
  using Key = std::tuple<uint64_t, uint64_t, int>;  // device, inode, kind
  struct Row {
    fs::FileIdentity identity;
    std::string value;
    bool fresh = false;  // a value read now, not one whose last use is brought up to date
  };

  Impl(std::string path, Warn warn, Options options)
      : path(std::move(path)),
        warn(std::move(warn)),
        options(options),
        today(static_cast<int64_t>(std::time(nullptr) / 86400)) {}

  void Check(int code) const {
    if (code != SQLITE_OK && code != SQLITE_DONE && code != SQLITE_ROW) {
      throw DatabaseError(db ? sqlite3_errmsg(db) : sqlite3_errstr(code));
    }
  }

  void Execute(const char* sql) const { Check(sqlite3_exec(db, sql, nullptr, nullptr, nullptr)); }

  sqlite3_stmt* Prepare(const char* sql) const {
    sqlite3_stmt* statement = nullptr;
    Check(sqlite3_prepare_v3(db, sql, -1, SQLITE_PREPARE_PERSISTENT, &statement, nullptr));
    return statement;
  }

  void Open() {
    MakeFolders(std::filesystem::path(path).parent_path());
    MakeFile(path);
    Check(
        sqlite3_open_v2(path.c_str(), &db, SQLITE_OPEN_READWRITE | SQLITE_OPEN_NOFOLLOW, nullptr));
    sqlite3_extended_result_codes(db, 1);
    Check(sqlite3_busy_timeout(db, static_cast<int>(options.busyTimeout.count())));
    std::string mode;
    Check(sqlite3_exec(
        db, "PRAGMA journal_mode=WAL",
        [](void* out, int, char** values, char**) {
          *static_cast<std::string*>(out) = values[0] ? values[0] : "";
          return 0;
        },
        &mode, nullptr));
    if (mode != "wal") throw DatabaseError("it cannot be shared (no write-ahead log)");
    Execute("PRAGMA synchronous=NORMAL");
    Execute(kSchema);
    Execute(
        fmt::format("DELETE FROM property WHERE used_day < {}", today - options.keepDays).c_str());
    select = Prepare(
        "SELECT size, modified, changed, value, used_day FROM property "
        "WHERE device = ? AND inode = ? AND kind = ?");
    store = Prepare("INSERT OR REPLACE INTO property VALUES(?, ?, ?, ?, ?, ?, ?, ?)");
  }

  void Close() {
    sqlite3_finalize(select);
    sqlite3_finalize(store);
    sqlite3_close_v2(db);
    select = store = nullptr;
    db = nullptr;
  }

  // Runs `step` on the database; the first failure is reported and ends the database's use.
  template <class Step>
  void Guard(Step step) {
    if (disabled) return;
    try {
      step();
    } catch (const DatabaseError& error) {
      if (db && !sqlite3_get_autocommit(db))
        sqlite3_exec(db, "ROLLBACK", nullptr, nullptr, nullptr);
      Close();
      disabled = true;
      pending.clear();
      warn(fmt::format("the property cache '{}' is not used: {}; files are read instead", path,
                       error.what()));
    }
  }

  // The stored value of the file in the state `identity` gives, if there is one.
  std::optional<std::string> Lookup(const fs::FileIdentity& identity, int kind) {
    Key key{identity.device, identity.inode, kind};
    if (auto at = pending.find(key); at != pending.end()) {
      if (at->second.identity == identity) return at->second.value;
      return std::nullopt;
    }
    std::optional<std::string> found;
    Guard([&] {
      sqlite3_reset(select);
      sqlite3_bind_int64(select, 1, Signed(identity.device));
      sqlite3_bind_int64(select, 2, Signed(identity.inode));
      sqlite3_bind_int(select, 3, kind);
      int code = sqlite3_step(select);
      Check(code);
      if (code != SQLITE_ROW) return;
      fs::FileIdentity stored{identity.device, identity.inode,
                              static_cast<uint64_t>(sqlite3_column_int64(select, 0)),
                              sqlite3_column_int64(select, 1), sqlite3_column_int64(select, 2)};
      if (stored != identity) return;
      auto text = reinterpret_cast<const char*>(sqlite3_column_text(select, 3));
      found = text ? text : "";
      if (sqlite3_column_int64(select, 4) < today) pending[key] = Row{identity, *found};
    });
    if (select) sqlite3_reset(select);
    return found;
  }

  void Store(const fs::FileIdentity& identity, int kind, std::string value) {
    if (disabled) return;
    pending[Key{identity.device, identity.inode, kind}] = Row{identity, std::move(value), true};
    if (pending.size() >= static_cast<size_t>(options.batch)) WritePending();
  }

  // One short transaction for all that is pending, so that another process sharing the database
  // waits for milliseconds, never for a whole run.
  void WritePending() {
    if (pending.empty()) return;
    uint64_t fresh = 0;
    Guard([&] {
      Execute("BEGIN IMMEDIATE");
      for (const auto& [key, row] : pending) {
        const auto& [device, inode, kind] = key;
        sqlite3_reset(store);
        sqlite3_bind_int64(store, 1, Signed(device));
        sqlite3_bind_int64(store, 2, Signed(inode));
        sqlite3_bind_int(store, 3, kind);
        sqlite3_bind_int64(store, 4, Signed(row.identity.size));
        sqlite3_bind_int64(store, 5, row.identity.modified);
        sqlite3_bind_int64(store, 6, row.identity.changed);
        sqlite3_bind_text(store, 7, row.value.data(), static_cast<int>(row.value.size()),
                          SQLITE_STATIC);
        sqlite3_bind_int64(store, 8, today);
        Check(sqlite3_step(store));
        if (row.fresh) ++fresh;
      }
      sqlite3_reset(store);
      Execute("COMMIT");
      counts.stored += fresh;
      pending.clear();
    });
  }

  const std::string path;
  const Warn warn;
  const Options options;
  const int64_t today;  // days since the epoch
  std::mutex mutex;
  sqlite3* db = nullptr;
  sqlite3_stmt* select = nullptr;
  sqlite3_stmt* store = nullptr;
  bool disabled = false;
  std::map<Key, Row> pending;
  Counts counts;
};

PropertyCache::PropertyCache(const std::string& path, Warn warn, Options options)
    : impl_(std::make_unique<Impl>(path, std::move(warn), options)) {
  impl_->Guard([this] { impl_->Open(); });
}

PropertyCache::PropertyCache(const std::string& path, Warn warn)
    : PropertyCache(path, std::move(warn), Options{}) {}

PropertyCache::~PropertyCache() {
  std::lock_guard lock(impl_->mutex);
  impl_->WritePending();
  impl_->Close();
}

std::string PropertyCache::Value(fs::FileReader& reader, int kind, const Read& read) {
  Lookup lookup;
  if (std::optional<std::string> stored = Stored(reader, kind, lookup)) return *stored;
  std::string value = read(reader);
  Keep(reader, kind, lookup, value);
  return value;
}

std::optional<std::string> PropertyCache::Stored(fs::FileReader& reader, int kind, Lookup& lookup) {
  int64_t began = NowNanoseconds();
  lookup.before = reader.Identity();
  // Times after `began - settle` are too recent to vouch for the content, or lie in the future.
  int64_t latest = began - impl_->options.settle.count();
  lookup.trusted =
      lookup.before && lookup.before->modified <= latest && lookup.before->changed <= latest;
  if (!lookup.trusted) return std::nullopt;
  std::lock_guard lock(impl_->mutex);
  std::optional<std::string> value = impl_->Lookup(*lookup.before, kind);
  if (value) ++impl_->counts.reused;
  return value;
}

void PropertyCache::Keep(fs::FileReader& reader, int kind, const Lookup& lookup,
                         const std::string& value) {
  bool unchanged = lookup.trusted && reader.Identity() == lookup.before;
  std::lock_guard lock(impl_->mutex);
  ++impl_->counts.read;
  if (unchanged) impl_->Store(*lookup.before, kind, value);
}

void PropertyCache::Flush() {
  std::lock_guard lock(impl_->mutex);
  impl_->WritePending();
}

PropertyCache::Counts PropertyCache::Counters() const {
  std::lock_guard lock(impl_->mutex);
  return impl_->counts;
}

}  // namespace trl
