#include "findings_output.h"

#include "cyclonedx_bom.h"
#include "findings_json.h"

namespace trl::cli {

void AddFindingsFormatOptions(CLI::App& command, FindingsFormat& options,
                              const std::string& xmlMeaning) {
  command
      .add_option("--format", options.format,
                  "xml: " + xmlMeaning +
                      "; table: a summary; json: the findings and events for scripts; "
                      "cyclonedx: a CycloneDX 1.6 bill of materials")
      ->check(CLI::IsMember({"xml", "table", "json", "cyclonedx"}))
      ->capture_default_str();
  command
      .add_option("--min-score", options.minScore,
                  "Leave out applications whose score is below N% of the most their version "
                  "could score (table, json, cyclonedx)")
      ->check(CLI::Range(0, 100));
  command.add_flag("--include-unidentified", options.includeUnidentified,
                   "cyclonedx: list unidentified applications too, marked so, with their best "
                   "guess");
}

std::string RenderFindings(const FindingsFormat& options, const std::vector<Finding>& all,
                           xml::Document* results) {
  std::vector<Finding> findings;
  for (const Finding& f : all) {
    bool scored = f.verdict != "missing" && f.maxScore > 0;
    if (scored && 100 * f.score < options.minScore * f.maxScore) continue;
    findings.push_back(f);
  }
  if (options.format == "json") return FindingsJson(findings, results);
  if (options.format == "cyclonedx") return CycloneDxBom(findings, options.includeUnidentified);
  std::string table = FindingsTable(findings);
  table.pop_back();
  return table;
}

}  // namespace trl::cli
