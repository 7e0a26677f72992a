#include "schema/property_cache.h"

#include <fcntl.h>
#include <gtest/gtest.h>
#include <sqlite3.h>
#include <sys/stat.h>

#include <chrono>
#include <filesystem>
#include <functional>
#include <optional>
#include <string>
#include <thread>
#include <tuple>
#include <utility>
#include <vector>

#include "platform/failure.h"
#include "platform/fs/posix/posix_file_system.h"
#include "schema/schema.h"
#include "support/failure_of.h"
#include "support/temp_tree.h"

namespace trl {
namespace {

using Identity = fs::FileIdentity;
using testing::FailureOf;
using namespace std::chrono_literals;

// A reader that reads nothing and tells the identity it is given.
struct FakeReader : fs::FileReader {
  std::optional<fs::FileIdentity> identity;
  uint64_t Size() override { return 0; }
  size_t ReadAt(uint64_t, void*, size_t) override { return 0; }
  std::optional<fs::FileIdentity> Identity() override { return identity; }
};

int64_t SecondsFromNow(int64_t seconds) {
  auto now = std::chrono::system_clock::now().time_since_epoch();
  return std::chrono::duration_cast<std::chrono::nanoseconds>(now + std::chrono::seconds(seconds))
      .count();
}

class PropertyCacheTest : public ::testing::Test {
 protected:
  std::unique_ptr<PropertyCache> Open(PropertyCache::Options options = {.settle = 0ns}) {
    options.busyTimeout = 500ms;
    return std::make_unique<PropertyCache>(
        path_, [this](const std::string& message) { warnings_.push_back(message); }, options);
  }

  // The value the cache gives for a file with `identity` whose content reads as `content`;
  // `duringRead` can change the file while it is read.
  static std::string Get(PropertyCache& cache, std::optional<Identity> identity,
                         std::string content,
                         const std::function<void(FakeReader&)>& duringRead = {}) {
    FakeReader reader;
    reader.identity = identity;
    return cache.Value(reader, 3, [&](fs::FileReader&) {
      if (duringRead) duringRead(reader);
      return content;
    });
  }

  testing::TempTree tree_;
  std::string path_ = tree_.Native("cache/properties.sqlite");
  std::vector<std::string> warnings_;
  const Identity old_{1, 2, 3, SecondsFromNow(-60), SecondsFromNow(-60)};
};

TEST_F(PropertyCacheTest, AValueIsReusedOnlyForTheSameFileInTheSameState) {
  const std::tuple<const char*, std::function<void(Identity&)>, bool> cases[] = {
      {"nothing", [](Identity&) {}, true},
      {"size", [](Identity& id) { ++id.size; }, false},
      {"modification time", [](Identity& id) { ++id.modified; }, false},
      {"change time", [](Identity& id) { ++id.changed; }, false},
      {"inode", [](Identity& id) { ++id.inode; }, false},
      {"device", [](Identity& id) { ++id.device; }, false},
  };
  auto cache = Open();
  using std::filesystem::perms;
  EXPECT_EQ(std::filesystem::status(path_).permissions(), perms::owner_read | perms::owner_write);
  EXPECT_EQ(std::filesystem::status(tree_.Native("cache")).permissions(), perms::owner_all);
  for (const auto& [changed, change, reused] : cases) {
    Get(*cache, old_, "stored");
    Identity now = old_;
    change(now);
    EXPECT_EQ(Get(*cache, now, "read"), reused ? "stored" : "read") << changed;
  }
}

TEST_F(PropertyCacheTest, AFileInDoubtIsReadEveryTimeAndNothingIsStored) {
  Identity future = old_, changedLater = old_, recent = old_, touched = old_;
  future.modified = SecondsFromNow(3600);
  changedLater.changed = SecondsFromNow(3600);
  recent.changed = SecondsFromNow(-1);
  touched.modified = SecondsFromNow(-1);
  auto grow = [](FakeReader& reader) { ++reader.identity->size; };
  const std::tuple<const char*, std::optional<Identity>, std::function<void(FakeReader&)>,
                   PropertyCache::Options>
      cases[] = {
          {"no identity", std::nullopt, {}, {.settle = 0ns}},
          {"modified in the future", future, {}, {.settle = 0ns}},
          {"changed in the future", changedLater, {}, {.settle = 0ns}},
          {"changed while read", old_, grow, {.settle = 0ns}},
          {"changed a second ago", recent, {}, {}},
          {"modified a second ago", touched, {}, {}},
      };
  for (const auto& [doubt, identity, duringRead, options] : cases) {
    auto cache = Open(options);
    std::string first = Get(*cache, identity, "a", duringRead);
    EXPECT_EQ(first + Get(*cache, identity, "b", duringRead), "ab") << doubt;
  }
  EXPECT_EQ(warnings_, std::vector<std::string>());
}

TEST_F(PropertyCacheTest, ASecondRunReadsOnlyWhatChanged) {
  tree_.AddFile("a", "first");
  tree_.AddFile("b", "other");
  auto fileSystem = fs::CreatePosixFileSystem({});
  Schema schema;
  // "a" alone, "b" with the files hashed together.
  auto digests = [&] {
    auto a = fileSystem->GetFile(tree_.Path("a"));
    auto b = fileSystem->GetFile(tree_.Path("b"));
    std::string text = schema.ReadPropertyType3(*a) + " ";
    const fs::File* next = b.get();
    schema.ReadPropertyType3Together(
        [&] { return std::exchange(next, nullptr); },
        [&](const fs::File&, std::string digest, std::exception_ptr) { text += digest; });
    return text;
  };
  auto run = [&] {
    auto cache = Open();
    UsePropertyCache(cache.get());
    std::string text = digests();
    UsePropertyCache(nullptr);
    cache->Flush();
    PropertyCache::Counts counts = cache->Counters();
    return std::make_tuple(counts.reused, counts.read, counts.stored, text);
  };
  const std::string before = digests();
  EXPECT_EQ(run(), std::make_tuple(0u, 2u, 2u, before));
  EXPECT_EQ(run(), std::make_tuple(2u, 0u, 0u, before));

  // Same inode, size and modification time: only the change time tells.
  struct stat status {};
  ASSERT_EQ(::stat(tree_.Native("a").c_str(), &status), 0);
  std::this_thread::sleep_for(50ms);  // past the file system's timestamp tick
  tree_.AddFile("a", "fresh");
  const timespec times[] = {status.st_atim, status.st_mtim};
  ASSERT_EQ(::utimensat(AT_FDCWD, tree_.Native("a").c_str(), times, 0), 0);
  const std::string after = digests();
  ASSERT_NE(after, before);
  EXPECT_EQ(run(), std::make_tuple(1u, 1u, 1u, after));
  EXPECT_EQ(warnings_, std::vector<std::string>());
}

// Another connection holding the database's write lock for as long as it lives.
struct LockHolder {
  explicit LockHolder(const std::string& path) {
    sqlite3_open(path.c_str(), &db);
    sqlite3_exec(db, "PRAGMA journal_mode=WAL; BEGIN EXCLUSIVE", nullptr, nullptr, nullptr);
  }
  ~LockHolder() { sqlite3_close_v2(db); }
  sqlite3* db = nullptr;
};

// A value that cannot be stored fails its file's read, hashed alone or with others, rather than
// leaving the thread that hashed it.
TEST_F(PropertyCacheTest, AStoreThatFailsFailsTheRead) {
  struct Refusing : PropertyCache {
    using PropertyCache::PropertyCache;
    void Keep(fs::FileReader&, int, const Lookup&, const std::string&) override {
      Fail(kOutOfMemory);
    }
  };
  tree_.AddFile("a", "first");
  auto file = fs::CreatePosixFileSystem({})->GetFile(tree_.Path("a"));
  Refusing cache(path_, [](const std::string&) {});
  UsePropertyCache(&cache);
  Schema schema;
  const fs::File* next = file.get();
  int32_t together = 0;
  schema.ReadPropertyType3Together([&] { return std::exchange(next, nullptr); },
                                   [&](const fs::File&, std::string, std::exception_ptr failure) {
                                     if (failure)
                                       together =
                                           FailureOf([&] { std::rethrow_exception(failure); });
                                   });
  int32_t alone = FailureOf([&] { schema.ReadPropertyType3(*file); });
  UsePropertyCache(nullptr);
  EXPECT_EQ(together, kOutOfMemory);
  EXPECT_EQ(alone, kOutOfMemory);
}

TEST_F(PropertyCacheTest, AnUnusableDatabaseIsReportedOnceAndFilesAreRead) {
  const std::pair<const char*, std::function<std::shared_ptr<void>()>> cases[] = {
      {"not a database",
       [&] {
         tree_.AddFile("cache/properties.sqlite", std::string(4096, '\x5a'));
         return nullptr;
       }},
      {"locked", [&] { return std::make_shared<LockHolder>(path_); }},
      {"a link", [&] {
         tree_.AddFile("target");
         tree_.AddLink("cache/properties.sqlite", tree_.Native("target"));
         return nullptr;
       }}};
  for (const auto& [problem, make] : cases) {
    SCOPED_TRACE(problem);
    tree_.AddFolder("cache");
    auto holder = make();
    auto cache = Open();
    for (const char* content : {"a", "b", "c"}) EXPECT_EQ(Get(*cache, old_, content), content);
    cache->Flush();
    EXPECT_EQ(cache->Counters().read, 3u);
    ASSERT_EQ(warnings_.size(), 1u);
    EXPECT_NE(warnings_[0].find(path_), std::string::npos) << warnings_[0];
    warnings_.clear();
    cache.reset();
    holder.reset();
    std::filesystem::remove_all(tree_.Native("cache"));
  }
  EXPECT_EQ(std::filesystem::file_size(tree_.Native("target")), 0u);  // not made a database
}

TEST_F(PropertyCacheTest, CachesSharingAFileStoreAtOnce) {
  constexpr int kFiles = 300;
  auto first = Open({.settle = 0ns, .batch = 1});
  auto second = Open({.settle = 0ns, .batch = 2});
  std::vector<std::thread> threads;
  for (int t = 0; t < 4; ++t) {
    threads.emplace_back([&, t] {
      PropertyCache& cache = t % 2 ? *first : *second;
      for (int i = t; i < kFiles; i += 4)
        Get(cache, Identity{9, uint64_t(i), 1, 0, 0}, "v" + std::to_string(i));
    });
  }
  for (auto& thread : threads) thread.join();
  first.reset();
  second.reset();
  auto cache = Open();
  for (int i = 0; i < kFiles; ++i) {
    EXPECT_EQ(Get(*cache, Identity{9, uint64_t(i), 1, 0, 0}, "?"), "v" + std::to_string(i));
  }
  EXPECT_EQ(cache->Counters().reused, uint64_t{kFiles});
  EXPECT_EQ(warnings_, std::vector<std::string>());
}

TEST_F(PropertyCacheTest, ValuesUnusedForLongAreDroppedAndUseKeepsThem) {
  auto age = [&](int days) {
    sqlite3* db = nullptr;
    sqlite3_open(path_.c_str(), &db);
    std::string sql = "UPDATE property SET used_day = used_day - " + std::to_string(days);
    EXPECT_EQ(sqlite3_exec(db, sql.c_str(), nullptr, nullptr, nullptr), SQLITE_OK);
    sqlite3_close(db);
  };
  auto reused = [&] {
    auto cache = Open();
    Get(*cache, old_, "v");
    return cache->Counters().reused == 1;
  };
  EXPECT_FALSE(reused());
  age(80);
  EXPECT_TRUE(reused());  // and its last use is today again
  age(80);
  EXPECT_TRUE(reused());
  age(91);
  EXPECT_FALSE(reused());
}

}  // namespace
}  // namespace trl
