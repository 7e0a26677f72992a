// The library's exported entry points: the in-process server's four, and the class lookup and
// event-loop pump that a client without the platform's support needs.
#include <dlfcn.h>
#include <stdlib.h>

#include <chrono>
#include <string>

#include "platform/event_loop.h"
#include "server/class_factory.h"
#include "server/identities.h"
#include "server/module.h"
#include "server/registry.h"
#include "trl/server.h"

namespace trl::server {
namespace {

// The path of the file this code was loaded from, made absolute; "" when it cannot be told.
std::string LibraryPath() {
  Dl_info info{};
  if (dladdr(reinterpret_cast<void*>(&DllRegisterServer), &info) == 0 ||
      info.dli_fname == nullptr) {
    return "";
  }
  char* resolved = realpath(info.dli_fname, nullptr);
  if (resolved == nullptr) return "";
  std::string path = resolved;
  free(resolved);
  return path;
}

TrlResult ChangeRegistration(TrlResult (*change)(const std::string&)) {
  return Guarded([&] {
    std::string path = LibraryPath();
    return path.empty() ? TRL_SELFREG_E_CLASS : change(path);
  });
}

}  // namespace
}  // namespace trl::server

using namespace trl::server;

extern "C" {

TrlResult DllGetClassObject(const TrlGuid* clsid, const TrlGuid* iid, void** object) {
  if (object == nullptr) return TRL_E_POINTER;
  *object = nullptr;
  if (clsid == nullptr || iid == nullptr) return TRL_E_POINTER;
  const ClassIdentity* identity = FindClass(*clsid);
  if (identity == nullptr) return TRL_CLASS_E_CLASSNOTAVAILABLE;
  return Guarded([&] { return CreateClassFactory(*identity, *iid, object); });
}

TrlResult DllCanUnloadNow(void) { return ModuleInUse() ? TRL_S_FALSE : TRL_S_OK; }

TrlResult DllRegisterServer(void) { return ChangeRegistration(RegisterClasses); }

TrlResult DllUnregisterServer(void) { return ChangeRegistration(UnregisterClasses); }

TrlResult TrlClassIdFromProgId(const char* progId, TrlGuid* clsid) {
  if (progId == nullptr || clsid == nullptr) return TRL_E_POINTER;
  const ClassIdentity* identity = FindClass(progId);
  if (identity == nullptr) return TRL_E_INVALIDARG;
  *clsid = identity->classId;
  return TRL_S_OK;
}

TrlResult TrlPump(uint32_t waitMilliseconds) {
  return Guarded([&] {
    CallScope scope;
    // One pass now; then, after waiting at most the time given for the next timer, another.
    int passes = 0;
    trl::EventLoop::Current().RunUntil([&] { return ++passes > 1; },
                                       std::chrono::milliseconds(waitMilliseconds));
    return TRL_S_OK;
  });
}

}  // extern "C"
