// The four exported entry points of the in-process server, and the module's entry.
#include <windows.h>

#include "server/module.h"
#include "server/windows/class_factory.h"
#include "server/windows/registration.h"
#include "server/windows/type_library.h"

extern "C" {

BOOL WINAPI DllMain(HINSTANCE instance, DWORD reason, LPVOID) {
  if (reason == DLL_PROCESS_ATTACH) {
    trl::server::windows::Module(instance);
    DisableThreadLibraryCalls(instance);
  }
  return TRUE;
}

HRESULT WINAPI DllGetClassObject(REFCLSID classId, REFIID iid, void** object) {
  return trl::server::windows::GetClassObject(classId, iid, object);
}

HRESULT WINAPI DllCanUnloadNow() { return trl::server::ModuleInUse() ? S_FALSE : S_OK; }

HRESULT WINAPI DllRegisterServer() { return trl::server::windows::Register(); }

HRESULT WINAPI DllUnregisterServer() { return trl::server::windows::Unregister(); }

}  // extern "C"
