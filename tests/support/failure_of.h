#pragma once

#include <cstdint>
#include <functional>

#include "platform/failure.h"

namespace trl::testing {

// The number of the Failure `action` throws, 0 when it succeeds.
inline int32_t FailureOf(const std::function<void()>& action) {
  try {
    action();
  } catch (const Failure& failure) {
    return failure.number;
  }
  return 0;
}

}  // namespace trl::testing
