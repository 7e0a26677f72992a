#include "detached_end.h"

#include <fcntl.h>
#include <sys/prctl.h>
#include <sys/wait.h>
#include <unistd.h>

#include <cerrno>
#include <csignal>
#include <cstdio>

namespace trl::cli {
namespace {

int parentPipe = -1;     // in the child: where its exit code goes before it ends
pid_t childProcess = 0;  // in the parent

// Ctrl-C at a terminal reaches the child as well; an interrupt sent to this process alone (kill)
// is passed on, so that it means what it would mean without the child.
void PassOnInterrupt(int, siginfo_t* info, void*) {
  if (info->si_code == SI_USER || info->si_code == SI_QUEUE) ::kill(childProcess, SIGINT);
}

// Told in place of an exit code: the child ended by Ctrl-C, and the parent ends the same way.
constexpr unsigned char kEndedByInterrupt = 255;

void TellParent(int code) {
  if (parentPipe < 0) return;
  unsigned char byte = static_cast<unsigned char>(code);
  [[maybe_unused]] ssize_t written = ::write(parentPipe, &byte, 1);
}

// Ctrl-C where no command handles it ends the child as it would end any program, once the parent
// knows it need not wait.
void EndByInterrupt(int) {
  TellParent(kEndedByInterrupt);
  std::signal(SIGINT, SIG_DFL);
  std::raise(SIGINT);
}

void EndAsInterrupted() {
  std::signal(SIGINT, SIG_DFL);
  std::raise(SIGINT);
}

// The parent ends as the child did: with its code, or by the same signal.
int ChildEnding(pid_t child) {
  int status = 0;
  while (::waitpid(child, &status, 0) < 0) {
    if (errno != EINTR) return 1;
  }
  if (WIFSIGNALED(status)) {
    std::signal(WTERMSIG(status), SIG_DFL);
    std::raise(WTERMSIG(status));
  }
  return WIFEXITED(status) ? WEXITSTATUS(status) : 1;
}

}  // namespace

int RunWithDetachedEnd(const std::function<int()>& program) {
  int ends[2];
  if (::pipe2(ends, O_CLOEXEC) != 0) return program();
  pid_t parent = ::getpid();
  std::fflush(nullptr);
  pid_t child = ::fork();
  if (child < 0) {
    ::close(ends[0]);
    ::close(ends[1]);
    return program();
  }
  if (child == 0) {
    ::close(ends[0]);
    parentPipe = ends[1];
    ::prctl(PR_SET_PDEATHSIG, SIGKILL);
    if (::getppid() != parent) ::_exit(1);  // the parent ended before the setting took
    struct sigaction inherited {};
    sigaction(SIGINT, nullptr, &inherited);
    if (inherited.sa_handler == SIG_DFL) std::signal(SIGINT, EndByInterrupt);
    return program();
  }
  ::close(ends[1]);
  childProcess = child;
  struct sigaction action {};
  action.sa_sigaction = PassOnInterrupt;
  action.sa_flags = SA_SIGINFO | SA_RESTART;
  sigemptyset(&action.sa_mask);
  sigaction(SIGINT, &action, nullptr);
  unsigned char code = 0;
  ssize_t got = 0;
  do {
    got = ::read(ends[0], &code, 1);
  } while (got < 0 && errno == EINTR);
  if (got == 1) {
    if (code == kEndedByInterrupt) EndAsInterrupted();
    ::_exit(code);
  }
  return ChildEnding(child);
}

void EndNow(int code) {
  std::fflush(nullptr);
  TellParent(code);
  ::_exit(code);
}

void QuickEnd(int code) {
  if (parentPipe >= 0) EndNow(code);
}

void EndFromSignalHandler(int code) {
  TellParent(code);
  ::_exit(code);
}

}  // namespace trl::cli
