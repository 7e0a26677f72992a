#pragma once

#include <cstdint>

#include "trl/xml.h"

// The rules that decide which candidate versions of one application stand and how doubtful ones
// are labelled. Each acts on the application's version children as the rules before it left them,
// reports its failures under its own name and goes on; a version whose value cannot be read is
// left as it is.
namespace trl::filter {

// The removal rules act only on an application with two or more versions, and then remove every
// version that falls short of the threshold, even the last one. They answer how many versions
// they removed, or -1 when there were fewer than two.

// Removes the versions whose v_weight is more than 0.00001 below `bestWeight`.
int16_t RemoveLowestVersionWeights(xml::Node a, double bestWeight);
// Removes the versions that miss more files than `fewestMissing`.
int16_t RemoveHighestMissingFiles(xml::Node a, int32_t fewestMissing);
// Removes the versions with fewer files than `mostFiles`.
int16_t RemoveLowestFileCount(xml::Node a, int32_t mostFiles);
// Keeps the first version, relabelled "Multiple Matches" when it matched fully and "Unsupported
// Version" otherwise, with its former v_id in v_guess, beside any version already relabelled.
int16_t RemoveDuplicateMatches(xml::Node a);

// The flagging rules remove nothing and answer the number of versions.

// Relabels every partly matched version "Unsupported Version"; a version relabelled before keeps
// its v_guess.
int16_t FlagAsUnknown(xml::Node a);
// Sets the application's a_manage to "0" when a version's found files differ from its files.
int16_t FlagAsUnmanaged(xml::Node a);

}  // namespace trl::filter
