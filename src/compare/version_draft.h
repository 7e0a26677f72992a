#pragma once

#include <cstdint>
#include <optional>
#include <utility>
#include <vector>

#include "trl/xml.h"

namespace trl {

// Whether a file's f_weight is above 0 as a selection ("@f_weight > 0") compares it: the text read
// as an XPath number, so an absent or non-numeric weight is not.
bool CarriesWeight(const xml::Node& f);

// The files of one fingerprint version, as every results copy of the version holds them.
class VersionFiles {
 public:
  // `files` must outlive this object.
  explicit VersionFiles(const std::vector<xml::Node>& files);

  // The first file whose f_id is written exactly as `id` is, as a find looks its copy up.
  std::optional<size_t> IndexOf(int32_t id) const;

  // CarriesWeight of file `i`, read when first asked: a copy is mostly judged incomplete by the
  // first file it lacks.
  bool Weighted(size_t i) const;

 private:
  const std::vector<xml::Node>& files_;
  // (id, position) of the files whose f_id is a number in its plain form, sorted: no other form
  // is ever looked up.
  std::vector<std::pair<int32_t, size_t>> byId_;
  mutable std::vector<int8_t> weighted_;  // -1: not read yet
};

// The scores of a fingerprint version found under one results copy of its application, kept
// aside until all the version's files are matched. A copy that lacks a weighted file would be
// taken out again when the application is pruned, so it is never made: files common to many
// applications are found in many folders, and nearly all such copies are incomplete.
struct VersionDraft {
  VersionDraft(xml::Node application, size_t files)
      : application(application), found(files), maxMask(files), mask(files) {}

  // Whether pruning would remove the copy: fewer files found than it has, and a weighted one
  // among those missing.
  bool Incomplete(const VersionFiles& files) const;

  xml::Node application;
  std::vector<bool> found;  // per file of the version, in document order
  std::vector<int16_t> maxMask, mask;
  int32_t filesFound = 0, score = 0;
};

}  // namespace trl
