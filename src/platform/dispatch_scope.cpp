#include <utility>

#include "platform/event_loop.h"

namespace trl {
namespace {

DispatchScope& Scope() {
  static DispatchScope scope;
  return scope;
}

}  // namespace

void SetDispatchScope(DispatchScope scope) { Scope() = std::move(scope); }

void RunDispatched(const std::function<void()>& run) {
  if (const DispatchScope& scope = Scope()) {
    scope(run);
  } else {
    run();
  }
}

}  // namespace trl
