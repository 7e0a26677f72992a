// Scoring one local file against a fingerprint file, and recording the find in the results.

#include "compare/compare_names.h"
#include "compare/file_facts.h"
#include "compare/fingerprint_file.h"
#include "compare/version_draft.h"
#include "frame/attributes.h"
#include "frame/error_handler.h"
#include "frame/use_object.h"
#include "frame/vocabulary.h"
#include "platform/clock.h"
#include "platform/convert.h"
#include "platform/fs/file_system.h"
#include "platform/text.h"
#include "schema/schema.h"
#include "trl/compare.h"

namespace trl {

using compare::kClass;

namespace {

// Whether the file's value of property `kind` equals the expected text, compared the way the
// kind's values compare. Only the kind asked for is read, so a file is hashed only when a property
// wants its digest.
bool PropertyAgrees(int16_t kind, const Schema& schema, const fs::File* file, LocalFileFacts& facts,
                    const std::string& expected) {
  auto local = [&](auto& learnt, auto reader) -> decltype(auto) {
    return learnt.Get([&] { return (schema.*reader)(Use(file)); });
  };
  switch (kind) {
    case 1:
      return LowerCase(local(facts.version, &Schema::ReadPropertyType1)) == LowerCase(expected);
    case 2:
      return ToInt32(static_cast<double>(local(facts.size, &Schema::ReadPropertyType2))) ==
             ToInt32(expected);
    case 3:
      return LowerCase(local(facts.digest, &Schema::ReadPropertyType3)) == LowerCase(expected);
    case 4:
      return FormatDateTime(local(facts.written, &Schema::ReadPropertyType4)) ==
             FormatDateTime(ToDateTime(expected));
    default:
      Raise(kErrUnknownPropertyType, "Unknown property type: " + std::to_string(kind), kClass,
            compare::kMatchFileLabel);
  }
}

}  // namespace

int16_t Compare::MatchFile(const std::string& path, const FingerprintFile& f) {
  OnError on{kClass, compare::kMatchFileLabel};
  int16_t mask = 0;
  auto& seen = filesSeen_[path];
  if (!seen) seen = std::make_unique<LocalFileFacts>();
  LocalFileFacts& facts = *seen;
  bool exists = false;
  if (!on([&] { exists = facts.exists.Get([&] { return Use(objFSO).FileExists(path); }); }) ||
      !exists) {
    return -1;
  }
  const fs::File* file = nullptr;
  on([&] { file = facts.file.Get([&] { return objFSO->GetFile(path); }).get(); });
  for (const FingerprintFile::Property& property : f.Properties()) {
    for (const auto& failure : property.readFailures) FingerprintFile::Replay(on, failure);
    bool agrees = false;
    on([&] {
      if (property.expectedFailure) std::rethrow_exception(property.expectedFailure);
      agrees = PropertyAgrees(property.kind, Use(objSchema), file, facts, property.expected);
    });
    if (agrees) on([&] { mask = CheckedAdd16(mask, property.bit); });
  }
  return mask;
}

bool Compare::UpdateFileDetails(xml::Node vResult, const FingerprintFile& f, int16_t mask) {
  OnError on{kClass, compare::kUpdateFileDetailsLabel};
  const FingerprintFile::Details& details = f.FindDetails();
  for (const auto& failure : details.readFailures) FingerprintFile::Replay(on, failure);
  xml::Node copy;
  on([&] {
    copy = objResultsDOM->FindChild(vResult, vocab::f, vocab::f_id, std::to_string(details.id));
  });
  bool firstFind = false;
  on([&] { firstFind = TextOf(copy, vocab::f_exists) == "0"; });
  if (!firstFind) return true;
  on([&] { copy.SetAttribute(vocab::p_max, std::to_string(details.maxMask)); });
  on([&] { copy.SetAttribute(vocab::p_act, std::to_string(mask)); });
  on([&] { copy.SetAttribute(vocab::f_exists, "1"); });
  int32_t versionScore = 0, filesFound = 0;
  on([&] { versionScore = ToInt32(TextOf(vResult, vocab::v_act)); });
  on([&] { filesFound = ToInt32(TextOf(vResult, vocab::f_act)); });
  on([&] { vResult.SetAttribute(vocab::f_act, std::to_string(CheckedAdd(filesFound, 1))); });
  if (details.maxMask == mask) {
    on([&] {
      vResult.SetAttribute(vocab::v_act, std::to_string(CheckedAdd(versionScore, details.fileBit)));
    });
  }
  return true;
}

void Compare::UpdateDraftDetails(VersionDraft& draft, const VersionFiles& files,
                                 const FingerprintFile& f, int16_t mask) {
  OnError on{kClass, compare::kUpdateFileDetailsLabel};
  const FingerprintFile::Details& details = f.FindDetails();
  for (const auto& failure : details.readFailures) FingerprintFile::Replay(on, failure);
  auto at = files.byId.find(std::to_string(details.id));
  if (at == files.byId.end()) {
    // No copy of the file holds that id: reported as the read of the missing copy is.
    on([&] { TextOf(xml::Node(), vocab::f_exists); });
    return;
  }
  size_t i = at->second;
  if (draft.found[i]) return;
  draft.found[i] = true;
  draft.maxMask[i] = details.maxMask;
  draft.mask[i] = mask;
  on([&] { draft.filesFound = CheckedAdd(draft.filesFound, 1); });
  if (details.maxMask == mask) {
    on([&] { draft.score = CheckedAdd(draft.score, details.fileBit); });
  }
}

}  // namespace trl
