#pragma once

#include <cstdint>
#include <string_view>

#include "frame/error_handler.h"
#include "trl/xml.h"

// What the filter reads from a version element, and the one way it relabels a version. Every
// reader fails (and its caller reports) when the value is absent, not a number or out of range.
namespace trl::filter {

// v_act / v_max.
double VersionWeight(const xml::Node& v);
// v_weight, as the walk wrote it.
double WeightOf(const xml::Node& v);
// f_max - f_act, as 32-bit numbers.
int32_t MissingFilesOf(const xml::Node& v);
// f_max.
int32_t FileCountOf(const xml::Node& v);
// Any whole-number attribute, as a 32-bit number.
int32_t Int32Of(const xml::Node& v, std::string_view attribute);

// How many versions the application holds, as a 16-bit number.
int16_t CountVersions(const xml::Node& a);

// Marks the version as not identified: v_id "-1", v_name `name`, v_seq "-1", in that order, each
// a step of its own.
void Relabel(const OnError& on, xml::Node v, std::string_view name);

}  // namespace trl::filter
