#pragma once

#include <cstdint>
#include <exception>
#include <functional>
#include <memory>
#include <string>
#include <string_view>
#include <vector>

#include "platform/clock.h"
#include "platform/fs/file_system.h"
#include "trl/xml.h"

namespace trl {

// The schema library the stages build their result documents with: the encoding of names, the
// find-or-add of computer, drive, folder, file, application and version elements, the four file
// property readers and the application-selection test.
class Schema {
 public:
  // `localNames`: the names that mean this computer besides "localhost", "127.0.0.1", "::1" and
  // "."; by default this machine's host name (and its first label).
  Schema();
  explicit Schema(std::vector<std::string> localNames);
  ~Schema();

  // Unicode lower-case, then "%", "'", "\"" and control characters as "%XX": equal lower-cased
  // names give equal output, and every output can stand between apostrophes in a selection.
  std::string EncodeName(std::string_view text) const;
  // The encoded name of an item whose name differs from a sibling's only in letter case, so that
  // the two are told apart: EncodeName, "%~" and the text from `from` (where the sibling's name
  // begins in a path) with its case kept, escaped alike. No output of EncodeName holds "%~".
  std::string EncodeExactName(std::string_view text, size_t from = 0) const;
  // Where the case-kept part of an exact encoding of `text` begins; npos for an ordinary one.
  static size_t ExactFrom(std::string_view encoded, std::string_view text);
  // The output of EncodeName that an encoded name, exact or not, was made from.
  static std::string_view FoldedName(std::string_view encoded);

  // Find-or-add under `parent`: the first child of the level whose encoded name attribute equals
  // `name`, or a new child appended with the id (++counter) as its first attribute, then the text
  // and the encoded name. A counter at its maximum fails with kOverflow (6) and adds nothing.
  // A new computer whose text names this machine also gets c_local "1".
  xml::Node AddComputer(std::string_view text, std::string_view name, xml::Node parent,
                        int32_t& counter);
  xml::Node AddDrive(std::string_view text, std::string_view name, xml::Node computer,
                     int32_t& counter);
  xml::Node AddFolder(std::string_view text, std::string_view name, xml::Node drive,
                      int32_t& counter);
  xml::Node AddFileEntry(std::string_view text, std::string_view name, xml::Node folder,
                         int32_t& counter);

  // Property readers: 1 file version from a PE version resource ("a.b.c.d", "" for a file without
  // one), 2 size in bytes, 3 MD5 digest (lower-case hex), 4 last-write time.
  std::string ReadPropertyType1(const fs::File& file) const;
  int64_t ReadPropertyType2(const fs::File& file) const;
  std::string ReadPropertyType3(const fs::File& file) const;
  DateTime ReadPropertyType4(const fs::File& file) const;
  // Property 3 of many files, hashed together (see DigestInLanes): `next` gives the files one at a
  // time (nullptr: none waits now), and `done` is told each file's digest, or the failure reading
  // it gave, as the file ends. fs::ReadAbandoned passes out.
  using NextFile = std::function<const fs::File*()>;
  using DigestDone =
      std::function<void(const fs::File& file, std::string digest, std::exception_ptr failure)>;
  void ReadPropertyType3Together(const NextFile& next, const DigestDone& done) const;

  // Appends <p p_type="1..4" p_value="..."/> for the property bit 1, 2, 4 or 8; any other bit fails
  // with kInvalidArgument (5).
  xml::Node AddProperty(int16_t bit, std::string_view value, xml::Node file);

  // The child `a` of `folder` with the application's a_id, or a new one carrying copies of all of
  // the application's attributes (not its children).
  xml::Node AddApplication(xml::Node application, xml::Node folder);
  // The child `v` of `application` with the version's v_id, or a new copy: v_id, v_name, v_seq,
  // v_max, f_max (files below the version), f_act "0", v_act "0", one `f` per fingerprint file
  // (f_id, f_name, f_weight, f_exists "0") and deep copies of the version's `n` and `o` children.
  xml::Node AddVersion(xml::Node version, xml::Node application);

  // Whether the application takes part: an application the options list (the first `a` with its
  // a_id) is selected unless that `a` has a_selected "0"; one they do not list follows the options
  // root's a_selected, selected when it is absent.
  // Answers from an index of the options, rebuilt when the options change.
  bool IsApplicationSelected(xml::Node application, xml::Document& options);

 private:
  struct Impl;
  std::unique_ptr<Impl> impl_;
};

}  // namespace trl
