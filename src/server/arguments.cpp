#include "server/arguments.h"

#include <limits>
#include <new>

#include "server/document.h"
#include "server/module.h"

namespace trl::server {
namespace {

using enum ValueKind;

// Converts one value; returns a failing result code when it does not fit `kind`.
TrlResult Convert(const TrlValue& given, ValueKind kind, Argument& argument) {
  TrlValue value = given;
  if (given.type & TRL_VT_BYREF) {
    if (given.u.documentRef == nullptr) return TRL_E_POINTER;
    value.type = given.type & ~TRL_VT_BYREF;
    switch (value.type) {
      case TRL_VT_I2:
        value.u.i2 = *given.u.i2Ref;
        break;
      case TRL_VT_I4:
        value.u.i4 = *given.u.i4Ref;
        break;
      case TRL_VT_BOOL:
        value.u.boolean = *given.u.booleanRef;
        break;
      case TRL_VT_TEXT:
        value.u.text = *given.u.textRef;
        break;
      case TRL_VT_DOCUMENT:
        value.u.document = *given.u.documentRef;
        argument.slot = given.u.documentRef;
        break;
      default:
        return TRL_DISP_E_TYPEMISMATCH;
    }
  }

  argument.present = true;
  switch (kind) {
    case kBoolean:
      if (value.type == TRL_VT_BOOL) return argument.boolean = value.u.boolean != 0, TRL_S_OK;
      if (value.type == TRL_VT_I2) return argument.boolean = value.u.i2 != 0, TRL_S_OK;
      if (value.type == TRL_VT_I4) return argument.boolean = value.u.i4 != 0, TRL_S_OK;
      break;
    case kInt16:
      if (value.type == TRL_VT_I2) return argument.number = value.u.i2, TRL_S_OK;
      if (value.type == TRL_VT_BOOL) return argument.number = value.u.boolean, TRL_S_OK;
      if (value.type == TRL_VT_I4) {
        if (value.u.i4 < std::numeric_limits<int16_t>::min() ||
            value.u.i4 > std::numeric_limits<int16_t>::max()) {
          return TRL_DISP_E_OVERFLOW;
        }
        return argument.number = static_cast<int16_t>(value.u.i4), TRL_S_OK;
      }
      break;
    case kText:
      if (value.type == TRL_VT_EMPTY) return TRL_S_OK;
      if (value.type == TRL_VT_TEXT) {
        if (value.u.text != nullptr) argument.text = value.u.text;
        return TRL_S_OK;
      }
      break;
    case kDocument:
      if (value.type == TRL_VT_EMPTY) return TRL_S_OK;
      if (value.type == TRL_VT_DOCUMENT) {
        if (value.u.document != nullptr) argument.document = value.u.document->document;
        return TRL_S_OK;
      }
      break;
    default:
      break;
  }
  return TRL_DISP_E_TYPEMISMATCH;
}

bool LeftOut(const TrlValue& value) {
  return value.type == TRL_VT_ERROR && value.u.error == TRL_DISP_E_PARAMNOTFOUND;
}

}  // namespace

const Member* SelectMember(const ClassIdentity& identity, TrlDispId id, uint16_t flags) {
  const bool put = (flags & TRL_DISPATCH_PROPERTYPUT) != 0;
  auto accepts = [&](MemberKind kind) {
    switch (kind) {
      case MemberKind::kPropertyPut:
        return put;
      case MemberKind::kPropertyGet:
        return !put && (flags & TRL_DISPATCH_PROPERTYGET) != 0;
      case MemberKind::kMethod:
        return !put && (flags & TRL_DISPATCH_METHOD) != 0;
    }
    return false;
  };
  for (const Member& member : identity.members) {
    if (member.id == id && accepts(member.kind)) return &member;
  }
  return nullptr;
}

TrlResult ConvertArguments(const Member& member, const TrlParams& params, Arguments& arguments,
                           uint32_t* argError) {
  auto fail = [&](TrlResult result, uint32_t index) {
    if (argError != nullptr) *argError = index;
    return result;
  };
  const uint32_t count = params.argCount;
  const uint32_t named = params.namedArgCount;
  if ((count > 0 && params.args == nullptr) || (named > 0 && params.namedArgs == nullptr)) {
    return TRL_E_POINTER;
  }
  if (named > count) return TRL_E_INVALIDARG;
  const size_t size = member.parameters.size();
  if (count - named > size) return TRL_DISP_E_BADPARAMCOUNT;

  // Where each parameter's value stands in params.args, or -1.
  std::vector<int64_t> at(size, -1);
  for (uint32_t i = 0; i < count - named; ++i) at[i] = count - 1 - i;
  for (uint32_t j = 0; j < named; ++j) {
    TrlDispId position = params.namedArgs[j];
    if (member.kind == MemberKind::kPropertyPut && position == TRL_DISPID_PROPERTYPUT) position = 0;
    if (position < 0 || static_cast<size_t>(position) >= size || at[position] != -1) {
      return fail(TRL_DISP_E_PARAMNOTFOUND, j);
    }
    at[position] = j;
  }

  arguments.assign(size, Argument{});
  for (size_t p = 0; p < size; ++p) {
    const Parameter& parameter = member.parameters[p];
    if (at[p] < 0 || LeftOut(params.args[at[p]])) {
      if (parameter.optional) continue;
      if (at[p] >= 0) return fail(TRL_DISP_E_PARAMNOTOPTIONAL, static_cast<uint32_t>(at[p]));
      return named > 0 ? TRL_DISP_E_PARAMNOTOPTIONAL : TRL_DISP_E_BADPARAMCOUNT;
    }
    TrlResult converted = Convert(params.args[at[p]], parameter.kind, arguments[p]);
    if (converted != TRL_S_OK) return fail(converted, static_cast<uint32_t>(at[p]));
  }
  return TRL_S_OK;
}

void WriteBack(const Member& member, Arguments& arguments) {
  for (size_t p = 0; p < arguments.size(); ++p) {
    Argument& argument = arguments[p];
    if (!member.parameters[p].byReference || argument.slot == nullptr || !argument.document) {
      continue;
    }
    TrlDocument*& held = *argument.slot;
    if (held != nullptr && held->document == argument.document) continue;
    auto* replacement = new TrlDocument(argument.document);
    TrlDocumentRelease(held);
    held = replacement;
  }
}

void WriteOutcome(const Outcome& outcome, TrlValue& result) {
  result = TrlValue{};
  switch (outcome.kind) {
    case kBoolean:
      result.type = TRL_VT_BOOL;
      result.u.boolean = outcome.boolean ? -1 : 0;
      break;
    case kInt16:
      result.type = TRL_VT_I2;
      result.u.i2 = static_cast<int16_t>(outcome.number);
      break;
    case kInt32:
      result.type = TRL_VT_I4;
      result.u.i4 = outcome.number;
      break;
    case kText:
      result.u.text = AllocText(outcome.text);
      result.type = TRL_VT_TEXT;
      break;
    default:
      break;
  }
}

TrlResult IdsOfNames(const ClassIdentity& identity, const char* const* names, uint32_t count,
                     TrlDispId* ids) {
  if (count == 0) return TRL_S_OK;
  if (names == nullptr || ids == nullptr) return TRL_E_POINTER;
  for (uint32_t i = 0; i < count; ++i) ids[i] = TRL_DISPID_UNKNOWN;
  TrlResult result = TRL_S_OK;
  for (const Member& member : identity.members) {
    if (names[0] == nullptr || !EqualIgnoringCase(member.name, names[0])) continue;
    ids[0] = member.id;
    for (uint32_t i = 1; i < count; ++i) {
      for (size_t p = 0; p < member.parameters.size(); ++p) {
        if (names[i] != nullptr && EqualIgnoringCase(member.parameters[p].name, names[i])) {
          ids[i] = static_cast<TrlDispId>(p);
        }
      }
    }
  }
  for (uint32_t i = 0; i < count; ++i) {
    if (ids[i] == TRL_DISPID_UNKNOWN) result = TRL_DISP_E_UNKNOWNNAME;
  }
  return result;
}

}  // namespace trl::server
