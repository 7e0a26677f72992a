#include "schema/schema.h"

#include <algorithm>
#include <array>
#include <limits>
#include <utility>

#include "platform/byte_words.h"
#include "platform/failure.h"
#include "platform/host_name.h"
#include "platform/text.h"
#include "schema/application_selection.h"

namespace trl {
namespace {

// The tag and attribute names of one level of the result tree.
struct Level {
  const char* tag;
  const char* id;
  const char* text;
  const char* name;
  bool canBeLocal;  // a new element naming this machine gets c_local "1"
};

constexpr Level kComputerLevel{"c", "c_id", "c_text", "c_name", true};
constexpr Level kDriveLevel{"m", "m_id", "m_text", "m_name", false};
constexpr Level kFolderLevel{"d", "d_id", "d_text", "d_name", false};
constexpr Level kFileLevel{"f", "f_id", "f_text", "f_name", false};

constexpr std::array<const char*, 4> kFixedLocalNames{"localhost", "127.0.0.1", "::1", "."};

// This machine's host name and its first label, lower-cased; none when it cannot be read.
std::vector<std::string> HostNames() {
  std::string host = LowerCase(HostName());
  if (host.empty()) return {};
  std::string label = host.substr(0, host.find('.'));
  if (label.empty() || label == host) return {host};
  return {host, label};
}

bool NeedsPercentEscape(unsigned char byte) {
  return byte < 0x20 || byte == 0x7F || byte == '%' || byte == '\'' || byte == '"';
}

// The p_type of a property bit.
const char* PropertyType(int16_t bit) {
  switch (bit) {
    case 1:
      return "1";
    case 2:
      return "2";
    case 4:
      return "3";
    case 8:
      return "4";
    default:
      Fail(kInvalidArgument);
  }
}

// Copies `attribute` from `from` to `to` when `from` has it.
void CopyAttribute(const xml::Node& from, xml::Node& to, const char* attribute) {
  if (auto value = from.GetAttribute(attribute)) to.SetAttribute(attribute, *value);
}

std::string PercentEscaped(std::string text) {
  static constexpr char kHex[] = "0123456789ABCDEF";
  auto plainWord = [](uint64_t word) {
    return !WordHasByteBelow(word, 0x20) && !WordHasByte(word, 0x7F) && !WordHasByte(word, '%') &&
           !WordHasByte(word, '\'') && !WordHasByte(word, '"');
  };
  if (PassingPrefix(text, plainWord,
                    [](unsigned char byte) { return !NeedsPercentEscape(byte); }) == text.size()) {
    return text;  // the common case, without a second copy
  }
  std::string encoded;
  encoded.reserve(text.size());
  for (char c : text) {
    auto byte = static_cast<unsigned char>(c);
    if (NeedsPercentEscape(byte)) {
      encoded += '%';
      encoded += kHex[byte >> 4];
      encoded += kHex[byte & 0xF];
    } else {
      encoded += c;
    }
  }
  return encoded;
}

constexpr std::string_view kExactMark = "%~";

}  // namespace

struct Schema::Impl {
  std::vector<std::string> localNames;  // lower-cased
  ApplicationSelection selection;

  // The copy last made of a fingerprint version, kept detached in the results: while neither
  // document changed underneath, the next copy of that version is a clone of it. A version's files
  // are found in many folders, and a clone costs far less than a copy attribute by attribute.
  struct VersionTemplate {
    const void* version = nullptr;
    uint64_t fingerprint = 0, fingerprintChanges = 0, results = 0;
    xml::Node copy;
  } versionTemplate;

  xml::Node* TemplateFor(const xml::Node& version, xml::Document& results) {
    VersionTemplate& t = versionTemplate;
    xml::Document& fingerprint = version.OwnerDocument();
    bool fits = t.version == version.Id() && t.fingerprint == fingerprint.Serial() &&
                t.fingerprintChanges == fingerprint.ModificationCount() &&
                t.results == results.Serial();
    return fits ? &t.copy : nullptr;
  }

  void KeepTemplate(const xml::Node& version, const xml::Node& copy) {
    xml::Document& fingerprint = version.OwnerDocument();
    versionTemplate = {version.Id(), fingerprint.Serial(), fingerprint.ModificationCount(),
                       copy.OwnerDocument().Serial(), copy.CloneNode(true)};
  }

  // The first child of `parent` on `level` named `name`, or a new one appended after the others.
  xml::Node FindOrAdd(const Level& level, std::string_view text, std::string_view name,
                      xml::Node parent, int32_t& counter) {
    xml::Document& document = parent.OwnerDocument();
    if (xml::Node found = document.FindChild(parent, level.tag, level.name, name)) return found;
    if (counter == std::numeric_limits<int32_t>::max()) Fail(kOverflow);
    int32_t id = counter + 1;
    std::string idText = std::to_string(id);
    xml::Node child =
        level.canBeLocal && IsLocal(text)
            ? parent.AppendElement(
                  level.tag,
                  {{level.id, idText}, {level.text, text}, {level.name, name}, {"c_local", "1"}})
            : parent.AppendElement(level.tag,
                                   {{level.id, idText}, {level.text, text}, {level.name, name}});
    counter = id;
    return child;
  }

  bool IsLocal(std::string_view text) const {
    std::string lower = LowerCase(text);
    return std::find(kFixedLocalNames.begin(), kFixedLocalNames.end(), lower) !=
               kFixedLocalNames.end() ||
           std::find(localNames.begin(), localNames.end(), lower) != localNames.end();
  }
};

Schema::Schema() : impl_(std::make_unique<Impl>()) { impl_->localNames = HostNames(); }

Schema::Schema(std::vector<std::string> localNames) : impl_(std::make_unique<Impl>()) {
  for (std::string& name : localNames) name = LowerCase(name);
  impl_->localNames = std::move(localNames);
}

Schema::~Schema() = default;

std::string Schema::EncodeName(std::string_view text) const {
  return PercentEscaped(LowerCase(text));
}

std::string Schema::EncodeExactName(std::string_view text, size_t from) const {
  std::string encoded = EncodeName(text);
  encoded += kExactMark;
  encoded += PercentEscaped(std::string(text.substr(std::min(from, text.size()))));
  return encoded;
}

size_t Schema::ExactFrom(std::string_view encoded, std::string_view text) {
  size_t mark = encoded.find(kExactMark);
  if (mark == std::string_view::npos) return std::string_view::npos;
  std::string_view kept = encoded.substr(mark + kExactMark.size());
  // Each "%" of the kept part begins an escape of one byte in three.
  size_t length = kept.size() - 2 * static_cast<size_t>(std::count(kept.begin(), kept.end(), '%'));
  return text.size() - std::min(length, text.size());
}

std::string_view Schema::FoldedName(std::string_view encoded) {
  return encoded.substr(0, encoded.find(kExactMark));
}

xml::Node Schema::AddComputer(std::string_view text, std::string_view name, xml::Node parent,
                              int32_t& counter) {
  return impl_->FindOrAdd(kComputerLevel, text, name, parent, counter);
}

xml::Node Schema::AddDrive(std::string_view text, std::string_view name, xml::Node computer,
                           int32_t& counter) {
  return impl_->FindOrAdd(kDriveLevel, text, name, computer, counter);
}

xml::Node Schema::AddFolder(std::string_view text, std::string_view name, xml::Node drive,
                            int32_t& counter) {
  return impl_->FindOrAdd(kFolderLevel, text, name, drive, counter);
}

xml::Node Schema::AddFileEntry(std::string_view text, std::string_view name, xml::Node folder,
                               int32_t& counter) {
  return impl_->FindOrAdd(kFileLevel, text, name, folder, counter);
}

xml::Node Schema::AddProperty(int16_t bit, std::string_view value, xml::Node file) {
  const char* type = PropertyType(bit);
  return file.AppendElement("p", {{"p_type", type}, {"p_value", value}});
}

xml::Node Schema::AddApplication(xml::Node application, xml::Node folder) {
  std::string id = application.GetAttribute("a_id").value_or("");
  xml::Document& document = folder.OwnerDocument();
  if (xml::Node found = document.FindChild(folder, "a", "a_id", id)) return found;
  xml::Node copy = document.CreateElement("a");
  for (const auto& [name, value] : application.Attributes()) copy.SetAttribute(name, value);
  return folder.AppendChild(copy);
}

xml::Node Schema::AddVersion(xml::Node version, xml::Node application) {
  std::string id = version.GetAttribute("v_id").value_or("");
  xml::Document& document = application.OwnerDocument();
  if (xml::Node found = document.FindChild(application, "v", "v_id", id)) return found;
  if (xml::Node* kept = impl_->TemplateFor(version, document)) {
    return application.AppendChild(kept->CloneNode(true));
  }

  std::vector<xml::Node> files = version.GetElementsByTagName("f");
  xml::Node copy = document.CreateElement("v");
  for (const char* attribute : {"v_id", "v_name", "v_seq", "v_max"}) {
    CopyAttribute(version, copy, attribute);
  }
  copy.SetAttribute("f_max", std::to_string(files.size()));
  copy.SetAttribute("f_act", "0");
  copy.SetAttribute("v_act", "0");
  for (const xml::Node& file : files) {
    xml::Node entry = document.CreateElement("f");
    for (const char* attribute : {"f_id", "f_name", "f_weight"}) {
      CopyAttribute(file, entry, attribute);
    }
    entry.SetAttribute("f_exists", "0");
    copy.AppendChild(entry);
  }
  for (const xml::Node& child : version.ChildNodes()) {
    if (child.Type() != xml::NodeType::kElement) continue;
    std::string tag = child.NodeName();
    // A clone keeps the fingerprint intact: a node from another document moves, not copies.
    if (tag == "n" || tag == "o") copy.AppendChild(child.CloneNode(true));
  }
  impl_->KeepTemplate(version, copy);
  return application.AppendChild(copy);
}

bool Schema::IsApplicationSelected(xml::Node application, xml::Document& options) {
  return impl_->selection.IsSelected(application.GetAttribute("a_id").value_or(""), options);
}

}  // namespace trl
