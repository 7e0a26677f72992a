#include "explanation_output.h"

#include <fmt/format.h>

#include <algorithm>
#include <nlohmann/json.hpp>

#include "terminal_text.h"

namespace trl::cli {
namespace {

using nlohmann::json;

std::string PropertyName(int type) {
  static const char* const kNames[] = {"version resource", "size", "MD5", "date"};
  return type >= 1 && type <= 4 ? kNames[type - 1] : fmt::format("type {}", type);
}

std::string VersionTitle(const VersionExplanation& version) {
  return version.name.empty()
             ? "Version id " + Printable(version.id)
             : fmt::format("Version {} (id {})", Printable(version.name), Printable(version.id));
}

std::string Verdict(const ApplicationExplanation& app) {
  if (app.verdict == "identified") {
    return fmt::format("identified as {} (version id {})", Printable(app.versionName),
                       Printable(app.versionId));
  }
  if (app.verdict == "unidentified") {
    auto left = std::count_if(app.versions.begin(), app.versions.end(),
                              [](const VersionExplanation& v) { return v.outcome == "kept"; });
    return fmt::format("unidentified, \"{}\"{}", Printable(app.versionName),
                       left > 1 ? fmt::format(": {} versions are left", left) : "");
  }
  if (app.verdict == "no match") return "no version is left";
  return "not found: no version that matched has every file that carries weight";
}

std::string Disagreement(const PropertyDisagreement& p) {
  return fmt::format(
      "{} (expected {}, {})", PropertyName(p.type), Printable(p.expected.value_or("unknown")),
      p.actual ? "found " + Printable(*p.actual) : "the value found is not recorded");
}

std::string FileLines(const VersionExplanation& version) {
  std::string lines, missing;
  for (const FileExplanation& file : version.files) {
    if (!file.found) {
      missing += fmt::format("{}{} (weight {})", missing.empty() ? "" : ", ", Printable(file.name),
                             file.weight);
    } else if (file.propertiesScored != file.propertiesMax && file.disagreed.empty()) {
      lines += fmt::format(
          "    {} scored {} of {} on its properties (give --fingerprint to name them).\n",
          Printable(file.name), file.propertiesScored, file.propertiesMax);
    } else if (file.propertiesScored != file.propertiesMax) {
      std::string list;
      for (const PropertyDisagreement& p : file.disagreed) {
        list += (list.empty() ? "" : ", ") + Disagreement(p);
      }
      lines += fmt::format("    {} disagreed on {}.\n", Printable(file.name), list);
    }
  }
  return missing.empty() ? lines : "    Missing: " + missing + ".\n" + lines;
}

std::string VersionLine(const VersionExplanation& version) {
  std::string line = "  " + VersionTitle(version);
  if (version.outcome == "removed") {
    line +=
        fmt::format(" was removed by the {} rule: {}.", version.rule, Printable(version.reason));
  } else if (version.outcome == "taken back") {
    line += fmt::format(" was taken back by the compare: {}.", Printable(version.reason));
  } else {
    line += " was kept.";
  }
  if (!version.labelRule.empty()) {
    line += fmt::format(" The {} rule labelled it \"{}\": {}.", version.labelRule,
                        Printable(version.label), Printable(version.labelReason));
  } else if (!version.label.empty()) {
    line += fmt::format(" The filter labelled it \"{}\".", Printable(version.label));
  }
  return line + fmt::format(" It scored {} of {}, with {} of {} files found.\n", version.score,
                            version.maxScore, version.filesFound, version.filesExpected);
}

json Text(const std::string& text) { return text.empty() ? json() : json(text); }

json VersionJson(const VersionExplanation& version) {
  json files = json::array();
  for (const FileExplanation& file : version.files) {
    json disagreed = json::array();
    for (const PropertyDisagreement& p : file.disagreed) {
      disagreed.push_back({{"type", p.type},
                           {"property", PropertyName(p.type)},
                           {"expected", p.expected ? json(*p.expected) : json()},
                           {"actual", p.actual ? json(*p.actual) : json()}});
    }
    files.push_back({{"id", file.id},
                     {"name", file.name},
                     {"weight", file.weight},
                     {"found", file.found},
                     {"properties", file.found ? json{{"actual", file.propertiesScored},
                                                      {"max", file.propertiesMax}}
                                               : json()},
                     {"disagreed", disagreed}});
  }
  json label = version.label.empty() ? json()
                                     : json{{"name", version.label},
                                            {"rule", Text(version.labelRule)},
                                            {"reason", Text(version.labelReason)}};
  return {{"id", version.id},
          {"name", version.name},
          {"seq", version.seq},
          {"outcome", version.outcome},
          {"rule", Text(version.rule)},
          {"reason", Text(version.reason)},
          {"label", label},
          {"weight", version.weight ? json(*version.weight) : json()},
          {"score", {{"actual", version.score}, {"max", version.maxScore}}},
          {"files_found", version.filesFound},
          {"files_expected", version.filesExpected},
          {"files", files}};
}

}  // namespace

std::string ExplanationText(const Explanation& explanation) {
  std::string text;
  if (!explanation.rulesReplayed) {
    text +=
        "The user data holds only the versions the filter left: its rules cannot be replayed "
        "from it. Give the matches of a compare (--matches) to learn which rule removed a "
        "version.\n";
  } else if (explanation.rules.empty()) {
    text += "No filter rule was applied.\n";
  } else {
    std::string rules;
    for (const std::string& rule : explanation.rules) rules += (rules.empty() ? "" : ", ") + rule;
    text += "Filter rules replayed, in the order they run: " + rules + ".\n";
  }
  for (const ApplicationExplanation& app : explanation.applications) {
    text += fmt::format("\n{} (application {}) in {} on {}: {}.", Printable(app.application),
                        Printable(app.applicationId), Printable(app.folder),
                        Printable(app.computer), Verdict(app));
    if (!app.unmanagedRule.empty()) {
      text += fmt::format(" Not manageable: the {} rule found that {}.", app.unmanagedRule,
                          Printable(app.unmanagedReason));
    } else if (!app.managed && app.verdict != "not found") {
      text += " Not manageable.";
    }
    text += "\n";
    for (const VersionExplanation& version : app.versions) {
      text += VersionLine(version) + FileLines(version);
    }
  }
  return text;
}

std::string ExplanationJson(const Explanation& explanation) {
  json applications = json::array();
  for (const ApplicationExplanation& app : explanation.applications) {
    json versions = json::array();
    for (const VersionExplanation& version : app.versions) versions.push_back(VersionJson(version));
    applications.push_back(
        {{"computer", app.computer},
         {"local", app.local},
         {"folder", app.folder},
         {"application_id", app.applicationId},
         {"application", app.application},
         {"verdict", app.verdict},
         {"version", {{"id", app.versionId}, {"name", app.versionName}, {"seq", app.versionSeq}}},
         {"managed", app.managed},
         {"unmanaged_by", Text(app.unmanagedRule)},
         {"unmanaged_reason", Text(app.unmanagedReason)},
         {"versions", versions}});
  }
  json document = {{"rules_replayed", explanation.rulesReplayed},
                   {"filter_rules", explanation.rules},
                   {"applications", applications}};
  return document.dump(2, ' ', false, json::error_handler_t::replace);
}

}  // namespace trl::cli
