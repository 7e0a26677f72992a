#include "findings_table.h"

#include <fmt/format.h>

#include <algorithm>
#include <array>
#include <functional>
#include <set>
#include <tuple>
#include <unordered_map>

#include "attribute_text.h"
#include "frame/vocabulary.h"
#include "native_path.h"
#include "terminal_text.h"

namespace trl::cli {
namespace {

// Folders are kept with "\" separators; a person on this system reads "/", and on this computer
// the folder's names as the disk spells them.
std::string Readable(std::string path, bool local) {
  if (local) return NativePath(path);
  std::replace(path.begin(), path.end(), '\\', '/');
  return path;
}

// Calls `visit` with the computer, drive, folder and application of every application filed in
// the inventory's tree (the missing list is not part of it).
void ForEachApplication(
    xml::Document& document,
    const std::function<void(xml::Node c, xml::Node m, xml::Node d, xml::Node a)>& visit) {
  xml::Node root = document.DocumentElement();
  if (!root) return;
  for (xml::Node c : root.ChildElements(vocab::c)) {
    for (xml::Node m : c.ChildElements(vocab::m)) {
      for (xml::Node d : m.ChildElements(vocab::d)) {
        for (xml::Node a : d.ChildElements(vocab::a)) visit(c, m, d, a);
      }
    }
  }
}

std::string Key(const xml::Node& c, const xml::Node& m, const xml::Node& d, const xml::Node& a) {
  return fmt::format("{}\n{}\n{}\n{}", AttributeText(c, vocab::c_name),
                     AttributeText(m, vocab::m_name), AttributeText(d, vocab::d_name),
                     AttributeText(a, vocab::a_id));
}

// The computer (its c_id) a missing-list entry went missing from, as its place key a_guid
// ("c3m1d7a2") names it, when `computers` has it; "" (any computer) otherwise.
std::string MissingFrom(const xml::Node& a, const std::set<std::string>& computers) {
  std::string key = AttributeText(a, vocab::a_guid);
  size_t drive = key.find('m');
  if (!key.starts_with('c') || drive == std::string::npos) return "";
  std::string computer = key.substr(1, drive - 1);
  return computers.count(computer) != 0 ? computer : "";
}

size_t MissingCount(xml::Document& document) {
  xml::Node root = document.DocumentElement();
  if (!root) return 0;
  size_t count = 0;
  for (xml::Node list : root.ChildElements(vocab::a_missing_list)) {
    count += list.ChildElements(vocab::a).size();
  }
  return count;
}

// What the fingerprint tells of the versions: their names, for naming best guesses, and the
// types of each file's properties by the bit of its weight, for telling which kinds of evidence
// agreed. The files of a version are looked at only when a finding asks for them: a fingerprint
// holds many more versions than one inventory decides.
class VersionNames {
 public:
  explicit VersionNames(xml::Document& fingerprint) {
    for (xml::Node a : fingerprint.AsNode().GetElementsByTagName(vocab::a)) {
      std::string application = AttributeText(a, vocab::a_id);
      for (xml::Node v : a.ChildElements(vocab::v)) {
        Version& version = versions_[application + "\n" + AttributeText(v, vocab::v_id)];
        if (version.elements.empty()) version.name = AttributeText(v, vocab::v_name);
        version.elements.push_back(v);
      }
    }
  }
  std::string Of(const std::string& application, const std::string& version) const {
    auto found = versions_.find(application + "\n" + version);
    return found != versions_.end() ? found->second.name : "version id " + version;
  }
  // The property types (bit 1 for type 1, up to bit 8 for type 4) whose weight bits `mask` holds,
  // of the file `file` of the version: every version element of that id tells its part.
  unsigned TypesAgreed(const std::string& version, const std::string& file, unsigned mask) {
    auto found = versions_.find(version);
    if (found == versions_.end()) return 0;
    Version& known = found->second;
    if (!known.filesRead) ReadFiles(known);
    auto types = known.types.find(file);
    unsigned agreed = 0;
    if (types == known.types.end()) return agreed;
    for (const auto& [bit, type] : types->second) agreed |= (mask & bit) != 0 ? type : 0;
    return agreed;
  }

 private:
  struct Version {
    std::string name;  // of the first element with the id
    std::vector<xml::Node> elements;
    bool filesRead = false;
    std::unordered_map<std::string, std::vector<std::pair<unsigned, unsigned>>> types;  // by f_id
  };

  static void ReadFiles(Version& version) {
    for (xml::Node v : version.elements) {
      for (xml::Node f : v.ChildElements(vocab::f)) {
        auto& types = version.types[AttributeText(f, vocab::f_id)];
        for (xml::Node p : f.ChildElements(vocab::p)) {
          int64_t weight = AttributeNumber(p, vocab::p_weight),
                  type = AttributeNumber(p, vocab::p_type);
          if (weight >= 1 && weight <= 15 && type >= 1 && type <= 4) {
            types.emplace_back(unsigned{1} << (weight - 1), unsigned{1} << (type - 1));
          }
        }
      }
    }
    version.filesRead = true;
  }

  std::unordered_map<std::string, Version> versions_;  // by a_id, "\n", v_id
};

std::string VersionText(const xml::Node& a, const VersionNames& names) {
  std::string id = AttributeText(a, vocab::v_id);
  if (id == "0") return "no version matched";
  if (id != kUnidentifiedVersion) return AttributeText(a, vocab::v_name);
  std::string guess;
  for (xml::Node v : a.ChildElements(vocab::v)) {
    guess = AttributeText(v, vocab::v_guess);
    if (!guess.empty()) break;
  }
  if (guess.empty()) return "unidentified";
  return "unidentified (best guess " + names.Of(AttributeText(a, vocab::a_id), guess) + ")";
}

// Fills the parts of `finding` that `a` (an application of the merged user data) tells: the
// verdict, the version or best guess, and the score of the version that decided it.
void Describe(const xml::Node& a, VersionNames& names, Finding& finding) {
  finding.managed = AttributeText(a, vocab::a_manage) == "1";
  std::string id = AttributeText(a, vocab::v_id);
  // As the filter wrote them: "-1" with "Multiple Matches" or "Unsupported Version" when several
  // versions were left.
  finding.versionId = id;
  finding.versionName = AttributeText(a, vocab::v_name);
  finding.versionSeq = AttributeText(a, vocab::v_seq);
  xml::Node decided;
  if (id != kUnidentifiedVersion && id != "0") {
    finding.verdict = "identified";
    for (xml::Node v : a.ChildElements(vocab::v)) {
      if (AttributeText(v, vocab::v_id) == id) decided = v;
    }
  } else {
    finding.verdict = id == "0" ? "no match" : "unidentified";
    for (xml::Node v : a.ChildElements(vocab::v)) {
      if (finding.guessId.empty()) finding.guessId = AttributeText(v, vocab::v_guess);
    }
    if (!finding.guessId.empty()) {
      finding.guessName = names.Of(AttributeText(a, vocab::a_id), finding.guessId);
    }
    // The version that came closest stands for the score: the guess when it is among them.
    double best = -1;
    for (xml::Node v : a.ChildElements(vocab::v)) {
      double most = static_cast<double>(std::max<int64_t>(AttributeNumber(v, vocab::v_max), 1));
      double share = static_cast<double>(AttributeNumber(v, vocab::v_act)) / most;
      if (AttributeText(v, vocab::v_id) == finding.guessId) share += 2;
      if (share > best) best = share, decided = v;
    }
  }
  if (!decided) return;
  finding.score = AttributeNumber(decided, vocab::v_act);
  finding.maxScore = AttributeNumber(decided, vocab::v_max);
  finding.filesFound = AttributeNumber(decided, vocab::f_act);
  finding.filesExpected = AttributeNumber(decided, vocab::f_max);
  // A relabelled version keeps its own id as its guess.
  std::string versionId = AttributeText(decided, vocab::v_id);
  if (versionId == kUnidentifiedVersion) versionId = AttributeText(decided, vocab::v_guess);
  std::string version = AttributeText(a, vocab::a_id) + "\n" + versionId;
  for (xml::Node f : decided.ChildElements(vocab::f)) {
    finding.propertiesMatched |=
        names.TypesAgreed(version, AttributeText(f, vocab::f_id),
                          static_cast<unsigned>(AttributeNumber(f, vocab::p_act)));
  }
}

}  // namespace

Inventory::Inventory(xml::Document& userData) : missing_(MissingCount(userData)) {
  ForEachApplication(userData, [&](xml::Node c, xml::Node m, xml::Node d, xml::Node a) {
    entries_.emplace(
        Key(c, m, d, a),
        Entry{AttributeText(c, vocab::c_text),
              Readable(AttributeText(m, vocab::m_text) + AttributeText(d, vocab::d_text),
                       AttributeText(c, vocab::c_local) == "1"),
              AttributeText(a, vocab::a_name), AttributeText(a, vocab::v_id),
              AttributeText(a, vocab::v_name), AttributeText(a, vocab::a_id),
              AttributeText(c, vocab::c_id), AttributeText(c, vocab::c_local) == "1"});
  });
}

std::vector<Finding> Inventory::Changes(xml::Document& merged, xml::Document& fingerprint) const {
  VersionNames names(fingerprint);
  std::vector<Finding> findings;
  std::vector<std::string> computerIds;  // of each finding's computer
  std::set<std::string> present;
  ForEachApplication(merged, [&](xml::Node c, xml::Node m, xml::Node d, xml::Node a) {
    std::string key = Key(c, m, d, a);
    present.insert(key);
    Finding finding{AttributeText(c, vocab::c_text),
                    Readable(AttributeText(m, vocab::m_text) + AttributeText(d, vocab::d_text),
                             AttributeText(c, vocab::c_local) == "1"),
                    AttributeText(a, vocab::a_name),
                    VersionText(a, names),
                    "",
                    AttributeText(a, vocab::a_id)};
    finding.local = AttributeText(c, vocab::c_local) == "1";
    Describe(a, names, finding);
    auto before = entries_.find(key);
    std::string id = AttributeText(a, vocab::v_id);
    if (before == entries_.end()) {
      finding.changeKind = finding.change = "new";
    } else if (before->second.versionId != id) {
      finding.changeKind = id == kUnidentifiedVersion ? "no longer identified" : "updated";
      finding.changedFrom = before->second.versionName;
      finding.change =
          (id == kUnidentifiedVersion ? "no longer identified, was " : "updated from ") +
          before->second.versionName;
    }
    findings.push_back(std::move(finding));
    computerIds.push_back(AttributeText(c, vocab::c_id));
  });

  // Applications this run moved to the missing list are no longer in the tree; those an earlier
  // run moved there stay listed (the list keeps its entries) even when found again. An entry
  // names the computer it went missing from by its place key: one of many computers does not
  // stand for the same application on another.
  std::set<std::string> computers;
  for (const auto& [key, entry] : entries_) computers.insert(entry.computerId);
  std::multiset<std::pair<std::string, std::string>> gone;
  std::set<std::pair<std::string, std::string>> listed;
  xml::Node root = merged.DocumentElement();
  size_t seen = 0;
  if (root) {
    for (xml::Node c : root.ChildElements(vocab::c))
      computers.insert(AttributeText(c, vocab::c_id));
    for (xml::Node list : root.ChildElements(vocab::a_missing_list)) {
      for (xml::Node a : list.ChildElements(vocab::a)) {
        std::pair<std::string, std::string> what{MissingFrom(a, computers),
                                                 AttributeText(a, vocab::a_id)};
        if (seen++ >= missing_) {
          gone.insert(what);
        } else {
          listed.insert(what);
        }
      }
    }
  }
  for (size_t i = 0; i < findings.size(); ++i) {
    Finding& finding = findings[i];
    if (listed.count({computerIds[i], finding.applicationId}) == 0 &&
        listed.count({"", finding.applicationId}) == 0) {
      continue;
    }
    finding.stillMissing = true;
    finding.change += finding.change.empty() ? "" : "; ";
    finding.change += "still on the missing list";
  }
  for (const auto& [key, entry] : entries_) {
    if (present.count(key) != 0) continue;
    auto match = gone.find({entry.computerId, entry.applicationId});
    if (match == gone.end()) match = gone.find({"", entry.applicationId});
    if (match == gone.end()) continue;
    gone.erase(match);
    Finding finding{entry.computer,    entry.folder, entry.application,
                    entry.versionName, "missing",    entry.applicationId};
    finding.verdict = finding.changeKind = "missing";
    finding.versionId = entry.versionId;
    finding.versionName = entry.versionName;
    finding.local = entry.local;
    findings.push_back(std::move(finding));
  }

  std::sort(findings.begin(), findings.end(), [](const Finding& x, const Finding& y) {
    return std::tie(x.computer, x.folder, x.application) <
           std::tie(y.computer, y.folder, y.application);
  });
  return findings;
}

std::string ScoreText(const Finding& finding) {
  if (finding.verdict == "missing" || finding.maxScore <= 0) return "-";
  return fmt::format("{}%", 100 * std::max<int64_t>(finding.score, 0) / finding.maxScore);
}

std::string FindingsTable(const std::vector<Finding>& found) {
  constexpr size_t kColumns = 6;
  using Row = std::array<std::string, kColumns>;
  // What the documents and the disk hold may carry control characters: shown as escapes.
  std::vector<Row> rows{{"COMPUTER", "FOLDER", "APPLICATION", "VERSION", "SCORE", "CHANGE"}};
  size_t changed = 0;
  for (const Finding& f : found) {
    rows.push_back({Printable(f.computer), Printable(f.folder), Printable(f.application),
                    Printable(f.version), ScoreText(f), Printable(f.change)});
    changed += !f.change.empty();
  }
  std::array<size_t, kColumns> width{};
  for (const Row& row : rows) {
    for (size_t i = 0; i < kColumns; ++i) width[i] = std::max(width[i], DisplayWidth(row[i]));
  }
  std::string table;
  for (const Row& row : rows) {
    std::string text;
    for (size_t i = 0; i < kColumns; ++i) {
      text += row[i];
      if (i + 1 < kColumns) text.append(width[i] - DisplayWidth(row[i]) + 2, ' ');
    }
    while (!text.empty() && text.back() == ' ') text.pop_back();
    table += text + "\n";
  }
  table += fmt::format("{} application{} listed, {} changed since the last run\n", found.size(),
                       found.size() == 1 ? "" : "s", changed);
  return table;
}

}  // namespace trl::cli
