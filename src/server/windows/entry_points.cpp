// The four exported entry points of the in-process server, and the module's entry.
#include <windows.h>
// A leftover of 16-bit Windows that would swallow trl::Yield.
#undef Yield

#include <functional>

#include "platform/event_loop.h"
#include "server/module.h"
#include "server/windows/class_factory.h"
#include "server/windows/registration.h"
#include "server/windows/type_library.h"

extern "C" {

BOOL WINAPI DllMain(HINSTANCE instance, DWORD reason, LPVOID) {
  if (reason == DLL_PROCESS_ATTACH) {
    trl::server::windows::Module(instance);
    DisableThreadLibraryCalls(instance);
    // Ticks arrive through the client's own message loop: a client that lets an object go inside
    // an event of a tick has it destroyed when the tick has returned, never under its run.
    trl::SetDispatchScope([](const std::function<void()>& run) {
      trl::server::CallScope scope;
      run();
    });
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
