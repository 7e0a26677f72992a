#pragma once

#include "platform/failure.h"

namespace trl {

// The object behind `pointer`. A call on no object fails with kObjectNotSet (91), as it would on
// the platform, so that a service that could not be created is reported where it is used.
template <class Pointer>
auto& Use(const Pointer& pointer) {
  if (!pointer) Fail(kObjectNotSet);
  return *pointer;
}

}  // namespace trl
