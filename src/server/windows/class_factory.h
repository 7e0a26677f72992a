#pragma once

#include <windows.h>

namespace trl::server::windows {

// A new class factory of the class `classId` names, answering `iid`.
HRESULT GetClassObject(REFCLSID classId, REFIID iid, void** object);

}  // namespace trl::server::windows
