#include "explanation.h"

#include <fmt/format.h>

#include <algorithm>
#include <cstdlib>
#include <map>
#include <unordered_map>
#include <utility>

#include "attribute_text.h"
#include "filter_replay.h"
#include "frame/vocabulary.h"
#include "native_path.h"

namespace trl::cli {
namespace {

// The applications filed under the root's computers, drives and folders, in document order. The
// filter never adds or takes out an application, so the n-th is the same one in every copy.
std::vector<xml::Node> Applications(xml::Document& document) {
  std::vector<xml::Node> applications;
  xml::Node root = document.DocumentElement();
  if (!root) return applications;
  for (xml::Node c : root.ChildElements(vocab::c)) {
    for (xml::Node m : c.ChildElements(vocab::m)) {
      for (xml::Node d : m.ChildElements(vocab::d)) {
        for (xml::Node a : d.ChildElements(vocab::a)) applications.push_back(a);
      }
    }
  }
  return applications;
}

// A version's own id: the one it had before a rule relabelled it "-1".
std::string OwnId(const xml::Node& v) {
  std::string id = AttributeText(v, vocab::v_id);
  return id == kUnidentifiedVersion ? AttributeText(v, vocab::v_guess) : id;
}

std::map<std::string, xml::Node> VersionsById(const xml::Node& a) {
  std::map<std::string, xml::Node> versions;
  for (xml::Node v : a.ChildElements(vocab::v)) versions.emplace(OwnId(v), v);
  return versions;
}

// What the fingerprint tells of the versions: their names, and each file's properties.
class FingerprintFacts {
 public:
  explicit FingerprintFacts(xml::Document* fingerprint) {
    if (fingerprint == nullptr) return;
    for (xml::Node a : fingerprint->AsNode().GetElementsByTagName(vocab::a)) {
      for (xml::Node v : a.ChildElements(vocab::v)) {
        std::string version = AttributeText(a, vocab::a_id) + "\n" + AttributeText(v, vocab::v_id);
        names_.emplace(version, AttributeText(v, vocab::v_name));
        for (xml::Node f : v.ChildElements(vocab::f)) {
          properties_.emplace(version + "\n" + AttributeText(f, vocab::f_id),
                              f.ChildElements(vocab::p));
        }
      }
    }
  }
  std::string Name(const std::string& version) const {
    auto found = names_.find(version);
    return found != names_.end() ? found->second : "";
  }
  const std::vector<xml::Node>* Properties(const std::string& file) const {
    auto found = properties_.find(file);
    return found != properties_.end() ? &found->second : nullptr;
  }

 private:
  std::unordered_map<std::string, std::string> names_;
  std::unordered_map<std::string, std::vector<xml::Node>> properties_;
};

FileExplanation ExplainFile(const xml::Node& f, const std::vector<xml::Node>* properties) {
  FileExplanation file;
  file.id = AttributeText(f, vocab::f_id);
  file.name = AttributeText(f, vocab::f_name);
  file.weight = AttributeNumber(f, vocab::f_weight);
  file.found = AttributeText(f, vocab::f_exists) == "1";
  if (!file.found) return file;
  file.propertiesScored = AttributeNumber(f, vocab::p_act);
  file.propertiesMax = AttributeNumber(f, vocab::p_max);
  for (xml::Node p : f.ChildElements(vocab::p_local)) {
    file.disagreed.push_back({static_cast<int>(AttributeNumber(p, vocab::p_type)),
                              p.GetAttribute(vocab::p_expected), p.GetAttribute(vocab::p_value)});
  }
  if (!file.disagreed.empty() || properties == nullptr) return file;
  // Without the run's record, the weights tell which properties the score lacks: a property of
  // weight w counts 2^(w-1).
  for (const xml::Node& p : *properties) {
    int64_t weight = AttributeNumber(p, vocab::p_weight);
    if (weight < 1 || weight > 15 || (file.propertiesScored & (int64_t{1} << (weight - 1))) != 0) {
      continue;
    }
    file.disagreed.push_back(
        {static_cast<int>(AttributeNumber(p, vocab::p_type)), p.GetAttribute(vocab::p_value), {}});
  }
  return file;
}

VersionExplanation ExplainVersion(const std::string& applicationId, const xml::Node& v,
                                  const FingerprintFacts& fingerprint) {
  VersionExplanation version;
  version.id = OwnId(v);
  std::string key = applicationId + "\n" + version.id;
  version.name = AttributeText(v, vocab::v_name);
  version.seq = AttributeText(v, vocab::v_seq);
  if (AttributeText(v, vocab::v_id) == kUnidentifiedVersion) {
    version.label = version.name;
    version.name = fingerprint.Name(key);
  }
  version.outcome = "kept";
  if (auto weight = v.GetAttribute(vocab::v_weight)) {
    version.weight = std::strtod(weight->c_str(), nullptr);
  }
  version.score = AttributeNumber(v, vocab::v_act);
  version.maxScore = AttributeNumber(v, vocab::v_max);
  version.filesFound = AttributeNumber(v, vocab::f_act);
  version.filesExpected = AttributeNumber(v, vocab::f_max);
  for (xml::Node f : v.ChildElements(vocab::f)) {
    version.files.push_back(
        ExplainFile(f, fingerprint.Properties(key + "\n" + AttributeText(f, vocab::f_id))));
  }
  return version;
}

std::string Readable(std::string path, bool local) {
  if (local) return NativePath(path);
  std::replace(path.begin(), path.end(), '\\', '/');
  return path;
}

// The application as the last step of the filter left it: its place and its verdict.
ApplicationExplanation Describe(const xml::Node& a) {
  xml::Node d = a.ParentNode();
  xml::Node m = d.ParentNode();
  xml::Node c = m.ParentNode();
  ApplicationExplanation app;
  app.computer = AttributeText(c, vocab::c_text);
  app.local = AttributeText(c, vocab::c_local) == "1";
  app.folder =
      Readable(AttributeText(m, vocab::m_text) + AttributeText(d, vocab::d_text), app.local);
  app.applicationId = AttributeText(a, vocab::a_id);
  app.application = AttributeText(a, vocab::a_name);
  app.versionId = AttributeText(a, vocab::v_id);
  app.versionName = AttributeText(a, vocab::v_name);
  app.versionSeq = AttributeText(a, vocab::v_seq);
  app.verdict = app.versionId.empty() || app.versionId == "0" ? "no match"
                : app.versionId == kUnidentifiedVersion       ? "unidentified"
                                                              : "identified";
  app.managed = AttributeText(a, vocab::a_manage) == "1";
  return app;
}

// The thresholds the removing rules compare with, taken over every version the application had.
struct Thresholds {
  double bestWeight = 0;
  int64_t fewestMissing = -1, mostFiles = 0;
};

Thresholds ThresholdsOf(const std::vector<VersionExplanation>& versions) {
  Thresholds best;
  for (const VersionExplanation& v : versions) {
    best.bestWeight = std::max(best.bestWeight, v.weight.value_or(0));
    int64_t missing = v.filesExpected - v.filesFound;
    if (best.fewestMissing == -1 || missing < best.fewestMissing) best.fewestMissing = missing;
    best.mostFiles = std::max(best.mostFiles, v.filesExpected);
  }
  return best;
}

std::string Named(const VersionExplanation& version) {
  return version.name.empty() ? "id " + version.id : version.name;
}

std::string RemovalReason(const std::string& rule, const VersionExplanation& version,
                          const Thresholds& best, const std::string& kept) {
  if (rule == "low-weights") {
    return fmt::format("its weight {:g} is more than 0.00001 below the best, {:g}",
                       version.weight.value_or(0), best.bestWeight);
  }
  if (rule == "missing-files") {
    return fmt::format("it misses {} of its files, and a version misses only {}",
                       version.filesExpected - version.filesFound, best.fewestMissing);
  }
  if (rule == "low-file-count") {
    return fmt::format("its file count, {}, is below the most, {}", version.filesExpected,
                       best.mostFiles);
  }
  return "only the first candidate left, " + kept + ", is kept";
}

std::string LabelReason(const std::string& rule, const VersionExplanation& version) {
  std::string matched = version.score == version.maxScore ? "fully" : "only partly";
  if (rule == "duplicate-matches") {
    return "it is the first of several candidates left, and it matched " + matched;
  }
  return "it matched " + matched;
}

// Tells on `app` what the step that added `rule` changed, from the application as it was
// `before` to what it is `after`.
void TellStep(const xml::Node& before, const xml::Node& after, const std::string& rule,
              const Thresholds& best, ApplicationExplanation& app) {
  auto was = VersionsById(before), is = VersionsById(after);
  std::string kept;
  for (VersionExplanation& version : app.versions) {
    auto old = was.find(version.id), now = is.find(version.id);
    if (old == was.end() || now == is.end()) continue;
    std::string name = AttributeText(now->second, vocab::v_name);
    if (name == AttributeText(old->second, vocab::v_name)) continue;
    version.label = name;
    version.labelRule = rule;
    version.labelReason = LabelReason(rule, version);
    kept = Named(version);
  }
  for (VersionExplanation& version : app.versions) {
    if (!was.contains(version.id) || is.contains(version.id)) continue;
    version.outcome = "removed";
    version.rule = rule;
    version.reason = RemovalReason(rule, version, best, kept);
  }
  // Every run of the filter starts each application manageable, and only the last rule unmarks.
  if (AttributeText(after, vocab::a_manage) != "0") return;
  app.unmanagedRule = rule;
  for (const VersionExplanation& version : app.versions) {
    if (!is.contains(version.id) || version.filesFound == version.filesExpected) continue;
    app.unmanagedReason += app.unmanagedReason.empty() ? "" : "; ";
    app.unmanagedReason += fmt::format("version {} has {} of its {} files", Named(version),
                                       version.filesFound, version.filesExpected);
  }
}

// The versions the compare took back for lack of a weighted file, each under the application of
// its place (one is added, found nowhere else, when none is left there).
void AddTakenBack(xml::Document& matches, const FingerprintFacts& fingerprint,
                  std::map<std::string, size_t>& byPlace, Explanation& explanation) {
  xml::Node root = matches.DocumentElement();
  if (!root) return;
  for (xml::Node kept : root.ChildElements(vocab::taken_back)) {
    std::string id = AttributeText(kept, vocab::a_id);
    std::string place = AttributeText(kept, vocab::c_text) + "\n" +
                        AttributeText(kept, vocab::m_text) + "\n" +
                        AttributeText(kept, vocab::d_text) + "\n" + id;
    auto [at, added] = byPlace.try_emplace(place, explanation.applications.size());
    if (added) {
      ApplicationExplanation& app = explanation.applications.emplace_back();
      app.computer = AttributeText(kept, vocab::c_text);
      app.local = AttributeText(kept, vocab::c_local) == "1";
      app.folder = Readable(AttributeText(kept, vocab::m_text) + AttributeText(kept, vocab::d_text),
                            app.local);
      app.applicationId = id;
      app.application = AttributeText(kept, vocab::a_name);
      app.verdict = "not found";
    }
    for (xml::Node v : kept.ChildElements(vocab::v)) {
      VersionExplanation version = ExplainVersion(id, v, fingerprint);
      version.outcome = "taken back";
      version.rule = "compare";
      version.reason = "a file that carries weight is missing";
      explanation.applications[at->second].versions.push_back(std::move(version));
    }
  }
}

}  // namespace

Explanation ExplainMatches(const xml::Document& matches, int16_t filterOptions,
                           xml::Document* fingerprint) {
  FingerprintFacts facts(fingerprint);
  FilterReplay replay(matches, filterOptions);
  Explanation explanation;
  explanation.rulesReplayed = true;
  std::vector<std::vector<xml::Node>> steps;
  for (size_t step = 0; step < replay.Steps(); ++step) {
    steps.push_back(Applications(replay.After(step)));
    if (step > 0) explanation.rules.push_back(replay.Rule(step));
  }
  std::map<std::string, size_t> byPlace;
  for (size_t i = 0; i < steps.front().size(); ++i) {
    const xml::Node& weighed = steps.front()[i];
    ApplicationExplanation app = Describe(steps.back()[i]);
    for (xml::Node v : weighed.ChildElements(vocab::v)) {
      app.versions.push_back(ExplainVersion(app.applicationId, v, facts));
    }
    Thresholds best = ThresholdsOf(app.versions);
    for (size_t step = 1; step < steps.size(); ++step) {
      TellStep(steps[step - 1][i], steps[step][i], replay.Rule(step), best, app);
    }
    xml::Node d = weighed.ParentNode(), m = d.ParentNode(), c = m.ParentNode();
    byPlace.emplace(AttributeText(c, vocab::c_text) + "\n" + AttributeText(m, vocab::m_text) +
                        "\n" + AttributeText(d, vocab::d_text) + "\n" + app.applicationId,
                    explanation.applications.size());
    explanation.applications.push_back(std::move(app));
  }
  AddTakenBack(replay.After(0), facts, byPlace, explanation);
  return explanation;
}

Explanation ExplainUserData(xml::Document& userData, xml::Document* fingerprint) {
  FingerprintFacts facts(fingerprint);
  Explanation explanation;
  for (const xml::Node& a : Applications(userData)) {
    ApplicationExplanation& app = explanation.applications.emplace_back(Describe(a));
    for (xml::Node v : a.ChildElements(vocab::v)) {
      app.versions.push_back(ExplainVersion(app.applicationId, v, facts));
    }
  }
  return explanation;
}

}  // namespace trl::cli
