#pragma once

#include <cstdint>
#include <exception>
#include <string>

namespace trl {

// The runtime failure numbers the platform layers raise; callers report them and go on.
enum FailureNumber : int32_t {
  kInvalidArgument = 5,
  kOverflow = 6,
  kOutOfMemory = 7,
  kDivisionByZero = 11,
  kTypeMismatch = 13,
  kFileNotFound = 53,
  kDeviceIoError = 57,
  kPermissionDenied = 70,
  kPathFileAccessError = 75,
  kPathNotFound = 76,
  kObjectNotSet = 91,
  kInvalidUseOfNull = 94,
  kRegExpSyntax = 5017,
};

// Base of the numbers the component raises itself (0x80040000).
inline constexpr int32_t kObjectErrorBase = -2147221504;

inline constexpr const char* kComponentName = "trlLocator";

// The one exception type of the platform layers: a numbered failure with its description and the
// name of whatever raised it.
struct Failure : std::exception {
  Failure(int32_t number, std::string description, std::string source = kComponentName);

  const char* what() const noexcept override { return description.c_str(); }

  int32_t number;
  std::string description;
  std::string source;
};

// The classic description of a runtime failure number ("Overflow", "Path not found", ...).
std::string StandardDescription(int32_t number);

[[noreturn]] void Fail(int32_t number);
[[noreturn]] void Fail(int32_t number, std::string description);

}  // namespace trl
