#include "server/module.h"

#include <algorithm>
#include <atomic>
#include <new>
#include <vector>

namespace trl::server {
namespace {

std::atomic<int64_t> objectsAlive{0};
std::atomic<int64_t> locks{0};

thread_local int callDepth = 0;
thread_local std::vector<std::function<void()>> destroyLater;

char Lower(char c) { return c >= 'A' && c <= 'Z' ? static_cast<char>(c - 'A' + 'a') : c; }

}  // namespace

void ObjectCreated() { ++objectsAlive; }

void ObjectDestroyed() { --objectsAlive; }

void LockModule(bool lock) {
  if (lock) {
    ++locks;
    return;
  }
  // An unlock without a lock changes nothing.
  int64_t held = locks.load();
  while (held > 0 && !locks.compare_exchange_weak(held, held - 1)) {
  }
}

bool ModuleInUse() { return objectsAlive > 0 || locks > 0; }

CallScope::CallScope() { ++callDepth; }

CallScope::~CallScope() {
  if (--callDepth > 0) return;
  // A destruction may not raise events, but keep the depth up while they run all the same.
  ++callDepth;
  while (!destroyLater.empty()) {
    auto destroy = std::move(destroyLater.back());
    destroyLater.pop_back();
    destroy();
  }
  --callDepth;
}

void DestroyOutsideCalls(std::function<void()> destroy) {
  if (callDepth == 0) {
    destroy();
  } else {
    destroyLater.push_back(std::move(destroy));
  }
}

TrlResult Guarded(const std::function<TrlResult()>& body) {
  try {
    return body();
  } catch (const std::bad_alloc&) {
    return TRL_E_OUTOFMEMORY;
  } catch (...) {
    return TRL_E_FAIL;
  }
}

bool EqualIgnoringCase(std::string_view a, std::string_view b) {
  return std::ranges::equal(a, b, [](char x, char y) { return Lower(x) == Lower(y); });
}

}  // namespace trl::server
