#pragma once

#include <functional>

namespace trl::cli {

// Runs `program` in a child process and returns its exit code. The child may tell its code
// before it ends (EndNow): the parent then returns it at once and leaves the child to give back
// its memory unseen, which for a run of millions of files takes longer than stopping the run.
// The child ends with the parent. Where no child can be made, `program` runs here.
int RunWithDetachedEnd(const std::function<int()>& program);

// Ends the process with `code`, its output flushed; the parent of a detached end returns the code
// without waiting for the memory to be given back.
[[noreturn]] void EndNow(int code);

// EndNow, in a child of RunWithDetachedEnd; elsewhere (tests that drive the commands in their own
// process) it returns, so that the caller returns the code.
void QuickEnd(int code);

// Only what is safe in a signal handler: tells the parent the code, then ends the process.
[[noreturn]] void EndFromSignalHandler(int code);

}  // namespace trl::cli
