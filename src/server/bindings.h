#pragma once

#include <memory>

#include "server/arguments.h"
#include "server/identities.h"
#include "trl/worker.h"

namespace trl::server {

// A new worker of the class.
std::unique_ptr<Worker> CreateWorker(const ClassIdentity& identity);

// Carries out `member` of the class on `worker` with converted arguments.
Outcome Perform(Worker& worker, const ClassIdentity& identity, const Member& member,
                Arguments& arguments);

}  // namespace trl::server
