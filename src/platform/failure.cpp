#include "platform/failure.h"

#include <utility>

namespace trl {

Failure::Failure(int32_t number, std::string description, std::string source)
    : number(number), description(std::move(description)), source(std::move(source)) {}

std::string StandardDescription(int32_t number) {
  switch (number) {
    case kInvalidArgument:
      return "Invalid procedure call or argument";
    case kOverflow:
      return "Overflow";
    case kOutOfMemory:
      return "Out of memory";
    case kDivisionByZero:
      return "Division by zero";
    case kTypeMismatch:
      return "Type mismatch";
    case kFileNotFound:
      return "File not found";
    case kDeviceIoError:
      return "Device I/O error";
    case kPermissionDenied:
      return "Permission denied";
    case kPathFileAccessError:
      return "Path/File access error";
    case kPathNotFound:
      return "Path not found";
    case kObjectNotSet:
      return "Object variable or With block variable not set";
    case kInvalidUseOfNull:
      return "Invalid use of Null";
    case kRegExpSyntax:
      return "Syntax error in regular expression";
    default:
      return "Application-defined or object-defined error";
  }
}

void Fail(int32_t number) { throw Failure(number, StandardDescription(number)); }

void Fail(int32_t number, std::string description) {
  throw Failure(number, std::move(description));
}

}  // namespace trl
