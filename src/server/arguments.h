#pragma once

#include <cstdint>
#include <string>
#include <vector>

#include "server/identities.h"
#include "trl/server.h"
#include "trl/xml.h"

namespace trl::server {

// One argument of a call, converted to its parameter's kind.
struct Argument {
  bool present = false;  // false for an optional argument left out
  bool boolean = false;
  int16_t number = 0;
  std::string text;
  xml::DocumentPtr document;     // null for no object
  TrlDocument** slot = nullptr;  // where a document passed by reference came from
};
using Arguments = std::vector<Argument>;

// What a member gives back.
struct Outcome {
  ValueKind kind = ValueKind::kNone;
  bool boolean = false;
  int32_t number = 0;
  std::string text;
};

// The member `id` names for these dispatch flags, or null: a property is read with
// TRL_DISPATCH_PROPERTYGET, written with TRL_DISPATCH_PROPERTYPUT, a method called with
// TRL_DISPATCH_METHOD (a caller that cannot tell may give both of the first and the last).
const Member* SelectMember(const ClassIdentity& identity, TrlDispId id, uint16_t flags);

// Orders and converts `params` (last argument first, some named) into `arguments`, one per
// parameter of `member`. On failure, `argError` (when not null) receives the index of the
// argument at fault where there is one.
TrlResult ConvertArguments(const Member& member, const TrlParams& params, Arguments& arguments,
                           uint32_t* argError);

// Puts documents a call replaced back where the caller passed them by reference.
void WriteBack(const Member& member, Arguments& arguments);

// `result` of the member's kind; the caller clears it.
void WriteOutcome(const Outcome& outcome, TrlValue& result);

// Dispatch ids of a member name and its parameter names.
TrlResult IdsOfNames(const ClassIdentity& identity, const char* const* names, uint32_t count,
                     TrlDispId* ids);

}  // namespace trl::server
