#include "platform/event_loop.h"

#include <windows.h>
// A leftover of 16-bit Windows that would swallow EventLoop::Yield.
#undef Yield

#include <algorithm>
#include <deque>
#include <string>
#include <unordered_map>
#include <unordered_set>
#include <utility>
#include <vector>

#include "platform/failure.h"

// The loop is the thread's message queue: a COM client's thread pumps it, and ticks and posted
// calls must arrive through whatever pumps it, the client's own loop included. One hidden
// message-only window per thread receives them.
namespace trl {
namespace {

constexpr UINT kRunPosted = WM_APP + 1;  // posted calls wait
constexpr UINT kPassEnd = WM_APP + 2;    // wParam: the pass of Yield that posted it
constexpr int kMostInputPerPass = 256;

// The window class of the loop windows, registered once per module. The name holds the
// procedure's address: a module unloaded and loaded again elsewhere registers a class of its own
// instead of finding one whose procedure is gone.
const wchar_t* LoopWindowClass(WNDPROC procedure) {
  static const std::wstring name = [procedure] {
    std::wstring text =
        L"trlLocatorEventLoop" + std::to_wstring(reinterpret_cast<uintptr_t>(procedure));
    HMODULE module = nullptr;
    GetModuleHandleExW(
        GET_MODULE_HANDLE_EX_FLAG_FROM_ADDRESS | GET_MODULE_HANDLE_EX_FLAG_UNCHANGED_REFCOUNT,
        reinterpret_cast<LPCWSTR>(procedure), &module);
    WNDCLASSEXW windowClass{};
    windowClass.cbSize = sizeof windowClass;
    windowClass.lpfnWndProc = procedure;
    windowClass.hInstance = module;
    windowClass.lpszClassName = text.c_str();
    if (RegisterClassExW(&windowClass) == 0 && GetLastError() != ERROR_CLASS_ALREADY_EXISTS) {
      Fail(kDeviceIoError, "Cannot register the event loop's window class");
    }
    return text;
  }();
  return name.c_str();
}

// Milliseconds for a wait, rounded up so that a wait never ends just before a deadline and spins.
DWORD WaitMilliseconds(std::chrono::steady_clock::duration wait) {
  if (wait <= std::chrono::steady_clock::duration::zero()) return 0;
  auto milliseconds = std::chrono::ceil<std::chrono::milliseconds>(wait).count();
  return static_cast<DWORD>(std::min<decltype(milliseconds)>(milliseconds, INFINITE - 1));
}

}  // namespace

struct EventLoop::State {
  State()
      : wakeEvent(CreateEventW(nullptr, FALSE, FALSE, nullptr)),
        window(CreateWindowExW(0, LoopWindowClass(&WindowProc), L"", 0, 0, 0, 0, 0, HWND_MESSAGE,
                               nullptr, nullptr, nullptr)) {
    if (wakeEvent == nullptr || window == nullptr) {
      Fail(kDeviceIoError, "Cannot create the event loop's window");
    }
    SetWindowLongPtrW(window, GWLP_USERDATA, reinterpret_cast<LONG_PTR>(this));
  }
  ~State() {
    for (const auto& [id, timer] : timers) KillTimer(window, id);
    SetWindowLongPtrW(window, GWLP_USERDATA, 0);
    DestroyWindow(window);
    CloseHandle(wakeEvent);
  }
  State(const State&) = delete;
  State& operator=(const State&) = delete;

  // Arms `timer` on the system's timer; returns its new id (ids are never reused, so a tick
  // already queued for an old id finds nothing).
  uint64_t Add(Timer* timer, uint32_t interval) {
    uint64_t id = ++lastTimerId;
    if (SetTimer(window, static_cast<UINT_PTR>(id), interval, nullptr) == 0) {
      Fail(kDeviceIoError, "Cannot set the event loop's timer");
    }
    timers.emplace(id, timer);
    return id;
  }

  void Remove(uint64_t id) {
    if (timers.erase(id) > 0) KillTimer(window, static_cast<UINT_PTR>(id));
  }

  void Tick(uint64_t id) {
    auto found = timers.find(id);
    if (found == timers.end()) return;
    auto tick = found->second->tick_;  // a copy: the handler may destroy its timer
    if (tick) RunDispatched(tick);
  }

  // Runs the calls posted before this moment; those they post wait for their own message.
  void RunPosted() {
    runPostedQueued = false;
    uint64_t lastCall = lastPosted;
    // Calls are taken off the queue before they run, so a nested pass never runs one twice.
    while (!posted.empty() && posted.front().sequence <= lastCall) {
      auto call = std::move(posted.front().run);
      posted.pop_front();
      RunDispatched(call);
    }
  }

  static LRESULT CALLBACK WindowProc(HWND window, UINT message, WPARAM wParam, LPARAM lParam) {
    auto* state = reinterpret_cast<State*>(GetWindowLongPtrW(window, GWLP_USERDATA));
    if (state != nullptr) {
      switch (message) {
        case WM_TIMER:
          state->Tick(static_cast<uint64_t>(wParam));
          return 0;
        case kRunPosted:
          state->RunPosted();
          return 0;
        case kPassEnd:
          return 0;  // a pass's end met by some other pump
      }
    }
    return DefWindowProcW(window, message, wParam, lParam);
  }

  struct Call {
    uint64_t sequence;
    std::function<void()> run;
  };
  std::deque<Call> posted;
  uint64_t lastPosted = 0;
  bool runPostedQueued = false;

  std::unordered_map<uint64_t, Timer*> timers;
  uint64_t lastTimerId = 0;
  uint64_t lastPass = 0;
  std::vector<uint64_t> openPasses;  // passes of Yield under way, outermost first

  HANDLE wakeEvent;
  HWND window;
};

Timer::Timer(std::function<void()> tick) : tick_(std::move(tick)) {}

Timer::~Timer() { Disarm(); }

void Timer::Enabled(bool enabled) {
  if (enabled == enabled_) return;
  enabled_ = enabled;
  if (enabled_ && interval_ > 0) {
    Arm();
  } else {
    Disarm();
  }
}

void Timer::Interval(uint32_t milliseconds) {
  interval_ = milliseconds;
  Disarm();
  if (enabled_ && interval_ > 0) Arm();
}

void Timer::Arm() { id_ = EventLoop::Current().state_->Add(this, interval_); }

void Timer::Disarm() {
  if (id_ == 0) return;
  EventLoop::Current().state_->Remove(id_);
  id_ = 0;
}

EventLoop& EventLoop::Current() {
  thread_local EventLoop loop;
  return loop;
}

EventLoop::EventLoop() : state_(new State) {}

EventLoop::~EventLoop() {
  // Timers that outlive the loop (thread teardown) must not reach back into it.
  for (auto& [id, timer] : state_->timers) timer->id_ = 0;
  delete state_;
}

void EventLoop::Post(std::function<void()> call) {
  if (!call) Fail(kInvalidArgument);
  state_->posted.push_back({++state_->lastPosted, std::move(call)});
  if (!state_->runPostedQueued) {
    state_->runPostedQueued = PostMessageW(state_->window, kRunPosted, 0, 0) != 0;
  }
}

void EventLoop::Yield() {
  State& state = *state_;
  // The queue up to a mark posted now: what the handlers post lands behind the mark and waits
  // for the next pass. A nested pass passes the mark of a pass still open on behind its own.
  uint64_t pass = ++state.lastPass;
  state.openPasses.push_back(pass);
  struct Close {
    State& state;
    ~Close() { state.openPasses.pop_back(); }
  } close{state};
  PostMessageW(state.window, kPassEnd, static_cast<WPARAM>(pass), 0);
  MSG message;
  while (PeekMessageW(&message, nullptr, 0, 0, PM_REMOVE)) {
    if (message.message == WM_QUIT) {
      PostQuitMessage(static_cast<int>(message.wParam));  // the client's own loop must see it
      return;
    }
    if (message.hwnd == state.window && message.message == kPassEnd) {
      if (message.wParam == pass) break;
      if (std::find(state.openPasses.begin(), state.openPasses.end(), message.wParam) !=
          state.openPasses.end()) {
        PostMessageW(state.window, kPassEnd, message.wParam, 0);
      }
      continue;
    }
    TranslateMessage(&message);
    DispatchMessageW(&message);
  }
  // Input and painting come after posted messages: a client's Cancel button is clicked here. A
  // window that never validates would repaint forever, hence the bound.
  for (int left = kMostInputPerPass;
       left > 0 && PeekMessageW(&message, nullptr, 0, 0, PM_REMOVE | PM_QS_INPUT | PM_QS_PAINT);
       --left) {
    TranslateMessage(&message);
    DispatchMessageW(&message);
  }
  // The system makes timer messages only while no posted message waits: the due ones are fetched
  // on their own, each timer once.
  std::unordered_set<WPARAM> ticked;
  while (PeekMessageW(&message, state.window, WM_TIMER, WM_TIMER, PM_REMOVE)) {
    if (!ticked.insert(message.wParam).second) break;
    DispatchMessageW(&message);
  }
}

bool EventLoop::RunUntil(const std::function<bool()>& done, std::chrono::milliseconds timeout) {
  using Clock = std::chrono::steady_clock;
  Clock::time_point start = Clock::now();
  Clock::time_point limit = timeout >= std::chrono::duration_cast<std::chrono::milliseconds>(
                                           Clock::time_point::max() - start)
                                ? Clock::time_point::max()
                                : start + timeout;
  for (;;) {
    Yield();
    if (done()) return true;
    Clock::time_point now = Clock::now();
    if (now >= limit) return false;
    DWORD wait = limit == Clock::time_point::max() ? INFINITE : WaitMilliseconds(limit - now);
    if (!state_->posted.empty()) wait = 0;
    // Messages already queued count too, not only those that arrive during the wait.
    MsgWaitForMultipleObjectsEx(1, &state_->wakeEvent, wait, QS_ALLINPUT, MWMO_INPUTAVAILABLE);
  }
}

void EventLoop::Wake() { SetEvent(state_->wakeEvent); }

void Yield() { EventLoop::Current().Yield(); }

}  // namespace trl
