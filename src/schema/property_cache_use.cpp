#include <atomic>

#include "schema/property_cache.h"

namespace trl {
namespace {
std::atomic<PropertyCache*> cacheInUse{nullptr};
}  // namespace

void UsePropertyCache(PropertyCache* cache) { cacheInUse.store(cache); }

PropertyCache* PropertyCacheInUse() { return cacheInUse.load(); }

}  // namespace trl
