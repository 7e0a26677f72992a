#include "cyclonedx_bom.h"

#include <fmt/chrono.h>
#include <fmt/format.h>

#include <algorithm>
#include <ctime>
#include <nlohmann/json.hpp>
#include <random>

#include "version.h"

namespace trl::cli {
namespace {

using nlohmann::json;

std::string RandomUuid() {
  std::random_device device;
  std::mt19937_64 random(static_cast<uint64_t>(device()) << 32 | device());
  uint64_t high = random(), low = random();
  high = (high & ~uint64_t{0xF000}) | 0x4000;                // version 4
  low = (low & ~(uint64_t{3} << 62)) | (uint64_t{2} << 62);  // the RFC 4122 variant
  return fmt::format("{:08x}-{:04x}-{:04x}-{:04x}-{:012x}", high >> 32, (high >> 16) & 0xFFFF,
                     high & 0xFFFF, low >> 48, low & 0xFFFFFFFFFFFF);
}

// How the files were told apart: by name always, by the properties that agreed on some file.
json Methods(const Finding& f, double confidence) {
  json methods = json::array();
  auto add = [&](const char* technique, const char* value) {
    methods.push_back({{"technique", technique}, {"confidence", confidence}, {"value", value}});
  };
  add("filename", "file names at their places below the folder");
  if (f.propertiesMatched & 4) add("hash-comparison", "MD5 digests of the files");
  if (f.propertiesMatched & 1) add("binary-analysis", "version resources of the executables");
  if (f.propertiesMatched & 2) add("other", "file sizes");
  if (f.propertiesMatched & 8) add("other", "dates the files were last modified");
  return methods;
}

json Component(const Finding& f) {
  bool identified = f.verdict == "identified";
  double confidence = Confidence(f);
  std::string version = identified ? f.versionName : f.guessName;
  json identity = {
      {"field", "version"}, {"confidence", confidence}, {"methods", Methods(f, confidence)}};
  if (!version.empty()) identity["concludedValue"] = version;
  json component = {
      {"type", "application"},
      {"bom-ref", fmt::format("trllocator:{}:{}:{}", f.computer, f.folder, f.applicationId)},
      {"name", f.application},
      {"evidence",
       {{"identity", json::array({identity})},
        {"occurrences", json::array({{{"location", f.folder}}})}}},
      {"properties",
       json::array(
           {{{"name", "trllocator:computer"}, {"value", f.computer}},
            {{"name", "trllocator:verdict"}, {"value", f.verdict}},
            {{"name", "trllocator:score"}, {"value", fmt::format("{}/{}", f.score, f.maxScore)}},
            {{"name", "trllocator:files"},
             {"value", fmt::format("{}/{}", f.filesFound, f.filesExpected)}}})}};
  if (!version.empty()) component["version"] = version;
  if (!identified) {
    component["properties"].push_back({{"name", "trllocator:label"}, {"value", f.versionName}});
  }
  return component;
}

}  // namespace

double Confidence(const Finding& finding) {
  if (finding.maxScore <= 0) return 0;
  double share = std::clamp(
      static_cast<double>(finding.score) / static_cast<double>(finding.maxScore), 0.0, 1.0);
  return finding.verdict == "identified" ? share : share / 2;
}

std::string CycloneDxBom(const std::vector<Finding>& findings, bool includeUnidentified) {
  json components = json::array();
  for (const Finding& f : findings) {
    if (f.verdict == "missing" || (f.verdict != "identified" && !includeUnidentified)) continue;
    components.push_back(Component(f));
  }
  std::time_t now = std::time(nullptr);
  std::tm utc{};
  ::gmtime_r(&now, &utc);
  json bom = {
      {"$schema", "http://cyclonedx.org/schema/bom-1.6.schema.json"},
      {"bomFormat", "CycloneDX"},
      {"specVersion", "1.6"},
      {"serialNumber", "urn:uuid:" + RandomUuid()},
      {"version", 1},
      {"metadata",
       {{"timestamp", fmt::format("{:%Y-%m-%dT%H:%M:%SZ}", utc)},
        {"tools",
         {{"components",
           json::array(
               {{{"type", "application"}, {"name", "trlLocator"}, {"version", TRL_VERSION}}})}}}}},
      {"components", components}};
  return bom.dump(2, ' ', false, json::error_handler_t::replace);
}

}  // namespace trl::cli
