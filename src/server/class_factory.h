#pragma once

#include "server/identities.h"
#include "trl/server.h"

namespace trl::server {

// Creates the class factory of the class and answers its interface `iid` (with one reference).
TrlResult CreateClassFactory(const ClassIdentity& identity, const TrlGuid& iid, void** object);

}  // namespace trl::server
