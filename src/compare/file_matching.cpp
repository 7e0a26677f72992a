// Scoring one local file against a fingerprint file, and recording the find in the results.

#include <optional>

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

// Whether the file's value of the property equals the expected one, compared the way the kind's
// values compare. Only the kind asked for is read, so a file is hashed only when a property wants
// its digest; the local value is read before the expected one, and an unknown kind reads neither.
// `readValue` gives the value of kind 1 or 3.
template <class ReadValue>
bool PropertyAgrees(const FingerprintFile::Property& property, const Schema& schema,
                    const fs::File* file, LocalFileFacts& facts, ReadValue&& readValue) {
  auto local = [&](auto& learnt, auto form) -> decltype(auto) {
    return learnt.Get([&] { return form(Use(file)); });
  };
  auto expected = [&]() -> const FingerprintFile::Property& {
    if (property.expectedFailure) std::rethrow_exception(property.expectedFailure);
    if (property.conversionFailure) std::rethrow_exception(property.conversionFailure);
    return property;
  };
  switch (property.kind) {
    case 1: {
      const std::string& version =
          local(facts.version, [&](const fs::File& f) { return LowerCase(readValue(f, 1)); });
      return version == expected().expectedText;
    }
    case 2: {
      int32_t size = local(facts.size, [&](const fs::File& f) {
        return ToInt32(static_cast<double>(schema.ReadPropertyType2(f)));
      });
      return size == expected().expectedNumber;
    }
    case 3: {
      const std::string& digest =
          local(facts.digest, [&](const fs::File& f) { return LowerCase(readValue(f, 3)); });
      return digest == expected().expectedText;
    }
    case 4: {
      const std::string& written = local(facts.written, [&](const fs::File& f) {
        return FormatDateTime(schema.ReadPropertyType4(f));
      });
      return written == expected().expectedText;
    }
    default:
      Raise(kErrUnknownPropertyType, "Unknown property type: " + std::to_string(property.kind),
            kClass, compare::kMatchFileLabel);
  }
}

// The file's value of a property of this kind as it was compared, when it was read.
std::optional<std::string> LocalValue(int16_t kind, const LocalFileFacts& facts) {
  auto text = [](const std::string* value) {
    return value ? std::optional<std::string>(*value) : std::nullopt;
  };
  switch (kind) {
    case 1:
      return text(facts.version.Known());
    case 2:
      return facts.size.Known() ? std::optional(std::to_string(*facts.size.Known())) : std::nullopt;
    case 3:
      return text(facts.digest.Known());
    case 4:
      return text(facts.written.Known());
    default:
      return std::nullopt;
  }
}

std::optional<std::string> ExpectedValue(const FingerprintFile::Property& property) {
  if (property.expectedFailure || property.conversionFailure) return std::nullopt;
  return property.kind == 2 ? std::to_string(property.expectedNumber) : property.expectedText;
}

}  // namespace

int16_t Compare::MatchFile(const std::string& path, const FingerprintFile& f) {
  OnError on{kClass, compare::kMatchFileLabel};
  int16_t mask = 0;
  disagreements_.clear();
  auto& seen = filesSeen_[path];
  if (!seen) seen = std::make_unique<LocalFileFacts>();
  LocalFileFacts& facts = *seen;
  std::optional<ReportSubject> subject(std::in_place, path);
  bool exists = false;
  if (!on([&] { exists = facts.exists.Get([&] { return Use(objFSO).FileExists(path); }); }) ||
      !exists) {
    return -1;
  }
  const fs::File* file = nullptr;
  on([&] { file = facts.file.Get([&] { return objFSO->GetFile(path); }).get(); });
  for (const FingerprintFile::Property& property : f.Properties()) {
    // A fingerprint that could not be read is not about the local file.
    subject.reset();
    for (const auto& failure : property.readFailures) FingerprintFile::Replay(on, failure);
    subject.emplace(path);
    bool agrees = false;
    on([&] {
      agrees = PropertyAgrees(
          property, Use(objSchema), file, facts,
          [&](const fs::File& f, int16_t kind) { return ReadLocalValue(facts, f, kind); });
    });
    if (agrees) on([&] { mask = CheckedAdd16(mask, property.bit); });
    // A property without weight does not count, so it explains nothing.
    if (explaining_ && !agrees && property.bit != 0) {
      disagreements_.push_back(
          {property.kind, ExpectedValue(property), LocalValue(property.kind, facts)});
    }
  }
  return mask;
}

void Compare::KeepDisagreements(xml::Node copy) const {
  for (const Disagreement& disagreement : disagreements_) {
    xml::Node p =
        copy.AppendElement(vocab::p_local, {{vocab::p_type, std::to_string(disagreement.kind)}});
    if (disagreement.expected) p.SetAttribute(vocab::p_expected, *disagreement.expected);
    if (disagreement.local) p.SetAttribute(vocab::p_value, *disagreement.local);
  }
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
  if (explaining_) on([&] { KeepDisagreements(copy); });
  int32_t versionScore = 0, filesFound = 0;
  on([&] { versionScore = ToInt32(TextViewOf(vResult, vocab::v_act)); });
  on([&] { filesFound = ToInt32(TextViewOf(vResult, vocab::f_act)); });
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
  std::optional<size_t> at = files.IndexOf(details.id);
  if (!at) {
    // No copy of the file holds that id: reported as the read of the missing copy is.
    on([&] { TextOf(xml::Node(), vocab::f_exists); });
    return;
  }
  size_t i = *at;
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
