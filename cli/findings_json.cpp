#include "findings_json.h"

#include <nlohmann/json.hpp>

#include "attribute_text.h"
#include "frame/vocabulary.h"
#include "reporter/reporter.h"

namespace trl::cli {
namespace {

using nlohmann::json;

json OrNull(const std::string& text) { return text.empty() ? json() : json(text); }

json ApplicationJson(const Finding& f) {
  json version = {{"id", f.versionId}, {"name", f.versionName}, {"seq", f.versionSeq}};
  json guess = f.guessId.empty() ? json() : json{{"id", f.guessId}, {"name", f.guessName}};
  return {{"computer", f.computer},
          {"local", f.local},
          {"folder", f.folder},
          {"application_id", f.applicationId},
          {"application", f.application},
          {"verdict", f.verdict},
          {"version", version},
          {"best_guess", guess},
          {"score", {{"actual", f.score}, {"max", f.maxScore}}},
          {"files", {{"found", f.filesFound}, {"expected", f.filesExpected}}},
          {"managed", f.managed},
          {"change", OrNull(f.changeKind)},
          {"changed_from", OrNull(f.changedFrom)},
          {"still_on_missing_list", f.stillMissing}};
}

std::string KindName(const std::string& kind) {
  if (kind == std::to_string(Reporter::kFailure)) return "failure";
  if (kind == std::to_string(Reporter::kWarning)) return "warning";
  return "information";
}

}  // namespace

std::string FindingsJson(const std::vector<Finding>& findings, xml::Document* results) {
  json applications = json::array();
  for (const Finding& finding : findings) applications.push_back(ApplicationJson(finding));
  json events = json::array();
  if (results != nullptr) {
    for (const xml::Node& e : results->AsNode().SelectNodes("/*/events/event")) {
      auto text = [&](std::string_view name) { return AttributeText(e, name); };
      events.push_back({{"number", AttributeNumber(e, "number")},
                        {"kind", KindName(text("kind"))},
                        {"source", text("source")},
                        {"class", text("class")},
                        {"procedure", text("procedure")},
                        {"text", text("description")},
                        {"time", text("time")}});
    }
  }
  json document = {{"applications", applications}, {"events", events}};
  // Names from the disk need not be UTF-8: such bytes become U+FFFD rather than invalid JSON.
  return document.dump(2, ' ', false, json::error_handler_t::replace);
}

}  // namespace trl::cli
