#pragma once

#include "server/identities.h"
#include "trl/server.h"

namespace trl::server {

// Creates an object of the class, with a new worker, and answers its interface `iid` (with one
// reference) in `object`.
TrlResult CreateServerObject(const ClassIdentity& identity, const TrlGuid& iid, void** object);

}  // namespace trl::server
