#pragma once

#include <cstdint>
#include <span>
#include <string_view>

#include "trl/server.h"

namespace trl::server {

// The component's identities as its clients and the type library know them: the one place the
// server reads class identifiers, interface identifiers, programmatic names, member slots and
// dispatch ids from.

enum class ValueKind : uint8_t { kNone, kBoolean, kInt16, kInt32, kText, kDocument };
enum class MemberKind : uint8_t { kPropertyGet, kPropertyPut, kMethod };

struct Parameter {
  std::string_view name;
  ValueKind kind;
  bool optional = false;
  bool byReference = false;  // an in-out document the call may replace
};

struct Member {
  int slot;  // in the default interface, after the dispatch interface's own
  std::string_view name;
  MemberKind kind;
  TrlDispId id;
  ValueKind result;  // kNone for puts and for Cancel
  std::span<const Parameter> parameters;
};

struct Event {
  std::string_view name;
  TrlDispId id;
  std::span<const Parameter> parameters;
};

struct ClassIdentity {
  std::string_view name;
  std::string_view progId;
  TrlGuid classId;
  std::string_view defaultInterface;  // hidden and dual
  TrlGuid defaultInterfaceId;
  std::string_view eventInterface;  // hidden and dispatch-only
  TrlGuid eventInterfaceId;
  std::span<const Member> members;  // in slot order
};

struct TypeLibrary {
  std::string_view name;
  TrlGuid id;
  uint16_t majorVersion;
  uint16_t minorVersion;
  uint32_t lcid;
  std::string_view helpText;
};

// Identities of other libraries that the component's interfaces name.
struct ForeignIdentities {
  TrlGuid documentInterface;  // the type of every document parameter
  TrlGuid schemaTypeLibrary;  // where Locate's Mode and Status take their types from
  TrlGuid modeEnumeration;
  TrlGuid statusEnumeration;
  TrlGuid timerClass;  // the ticker of an asynchronous Start
  TrlGuid timerInterface;
};

const TypeLibrary& ComponentTypeLibrary();
const ForeignIdentities& Foreign();
// In the order of the type library's class table.
std::span<const ClassIdentity> Classes();
// The events of every class's event interface.
std::span<const Event> Events();

const ClassIdentity* FindClass(const TrlGuid& classId);
// Programmatic names match regardless of case, as registry keys do.
const ClassIdentity* FindClass(std::string_view progId);

}  // namespace trl::server
