#pragma once

#include <cstdint>
#include <functional>
#include <string_view>

#include "trl/server.h"

namespace trl::server {

// What keeps the library loaded: objects, documents and factories alive, and the locks of
// LockServer. DllCanUnloadNow answers from these.
void ObjectCreated();
void ObjectDestroyed();
void LockModule(bool lock);
bool ModuleInUse();

// Marks a call into the component's code (a member's Invoke, a pump of the event loop) for its
// lifetime. Events reach the client only inside such calls, and a client may drop its last
// reference to an object from inside one of them; the object is then destroyed when the
// outermost call on that thread returns, never under the run that raised the event.
class CallScope {
 public:
  CallScope();
  ~CallScope();
  CallScope(const CallScope&) = delete;
  CallScope& operator=(const CallScope&) = delete;
};

// Runs `destroy` now when no call is under way on this thread, else when the outermost one ends.
void DestroyOutsideCalls(std::function<void()> destroy);

// Runs `body`, turning any exception into a result code: nothing is thrown across the ABI.
TrlResult Guarded(const std::function<TrlResult()>& body);

bool EqualIgnoringCase(std::string_view a, std::string_view b);

}  // namespace trl::server
