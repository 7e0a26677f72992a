// merge_bench N [RUNS]
//
// Times a synchronous merge of new results into user data of N applications each (best of RUNS,
// default 3). The user data spreads the applications ten to a folder, fifty folders to a drive,
// two drives to a computer; one in ten is managed in the search options. The new results hold
// the same places: 60% of the applications found again with the same version, 15% with another
// version, 5% moved to another folder, 20% gone, and N/10 new ones.
#include <chrono>
#include <cstdio>
#include <cstdlib>
#include <ctime>
#include <string>

#include "bench/rng.h"
#include "frame/error_handler.h"
#include "trl/merge.h"
#include "trl/xml.h"

namespace {

using Clock = std::chrono::steady_clock;

constexpr int kPerFolder = 10;
constexpr int kFoldersPerDrive = 50;
constexpr int kDrivesPerComputer = 2;

struct Texts {
  std::string searchOptions, userData, newResults;
};

std::string Open(int folder) {
  int driveNumber = folder / kFoldersPerDrive;
  int computer = driveNumber / kDrivesPerComputer;
  std::string text;
  if (folder % (kFoldersPerDrive * kDrivesPerComputer) == 0) {
    if (folder > 0) text += "</m></c>";
    text += "<c c_id='" + std::to_string(computer + 1) + "' c_text='Host" +
            std::to_string(computer) + "' c_name='host" + std::to_string(computer) + "'>";
  }
  if (folder % kFoldersPerDrive == 0) {
    if (folder % (kFoldersPerDrive * kDrivesPerComputer) != 0) text += "</m>";
    std::string drive = std::string(1, 'c' + driveNumber % kDrivesPerComputer) + ":";
    text += "<m m_id='" + std::to_string(driveNumber + 1) + "' m_text='" + drive + "' m_name='" +
            drive + "'>";
  }
  return text + "<d d_id='" + std::to_string(folder + 1) + "' d_text='\\App" +
         std::to_string(folder) + "\\' d_name='\\app" + std::to_string(folder) + "\\'>";
}

std::string Application(int id, int version, bool history) {
  std::string text = "<a a_id='" + std::to_string(id) + "' a_name='Application " +
                     std::to_string(id) + "' v_id='" + std::to_string(version) + "'><v v_id='" +
                     std::to_string(version) + "' v_name='" + std::to_string(version) +
                     ".0' v_seq='1'><f f_id='1' f_name='app.exe' f_exists='1'/></v>";
  if (history) text += "<v_history><v v_id='1' v_update_q='1'/></v_history>";
  return text + "</a>";
}

Texts Generate(int n) {
  trl::bench::Rng rng(20240601);
  Texts texts;
  int folders = (n + kPerFolder - 1) / kPerFolder;
  std::string options = "<options>";
  std::string old = "<trl_applicationdata>";
  std::string fresh = "<trl_applicationdata>";
  int nextId = n;
  for (int folder = 0; folder < folders; ++folder) {
    old += Open(folder);
    fresh += Open(folder);
    int drive = folder / kFoldersPerDrive;
    std::string place = "<c c_name='host" + std::to_string(drive / kDrivesPerComputer) +
                        "'><m m_name='" + std::string(1, 'c' + drive % kDrivesPerComputer) +
                        ":'><d d_name='\\app" + std::to_string(folder) + "\\'>";
    std::string managed;
    std::string moved;
    for (int i = 0; i < kPerFolder; ++i) {
      int id = folder * kPerFolder + i;
      if (id >= n) break;
      int version = 2 + static_cast<int>(rng.Below(5));
      old += Application(id, version, rng.Chance(30));
      if (id % 10 == 0) managed += "<a a_id='" + std::to_string(id) + "' a_manage='1'/>";
      size_t fate = rng.Below(100);
      if (fate < 60) {
        fresh += Application(id, version, false);
      } else if (fate < 75) {
        fresh += Application(id, rng.Chance(30) ? -1 : version + 1, false);
      } else if (fate < 80) {
        moved += Application(id, version, false);
      }
      if (i == 0) fresh += Application(nextId++, 1, false);  // new
    }
    old += "</d>";
    fresh += "</d>";
    if (!managed.empty()) options += place + managed + "</d></m></c>";
    if (!moved.empty()) {
      // Moved: a folder of their own beside the old one.
      fresh += "<d d_id='0' d_text='\\Moved" + std::to_string(folder) + "\\' d_name='\\moved" +
               std::to_string(folder) + "\\'>" + moved + "</d>";
    }
  }
  old += "</m></c></trl_applicationdata>";
  fresh += "</m></c></trl_applicationdata>";
  texts.searchOptions = options + "</options>";
  texts.userData = std::move(old);
  texts.newResults = std::move(fresh);
  return texts;
}

trl::xml::DocumentPtr Load(const std::string& text) {
  auto document = std::make_shared<trl::xml::Document>();
  if (!document->LoadXml(text)) {
    std::fprintf(stderr, "merge_bench: generated text does not load: %s\n",
                 document->LastParseError().reason.c_str());
    std::exit(1);
  }
  return document;
}

}  // namespace

int main(int argc, char** argv) {
  if (argc < 2) {
    std::fprintf(stderr, "usage: merge_bench N [RUNS]\n");
    return 2;
  }
  int n = std::atoi(argv[1]);
  int runs = argc > 2 ? std::atoi(argv[2]) : 3;
  Texts texts = Generate(n);

  double best = 0, bestCpu = 0;
  size_t merged = 0, missing = 0;
  for (int run = 0; run < runs; ++run) {
    auto searchOptions = Load(texts.searchOptions);
    auto userData = Load(texts.userData);
    auto newResults = Load(texts.newResults);
    trl::Merge merge;
    merge.Asynchronous(false);
    auto start = Clock::now();
    std::clock_t cpuStart = std::clock();
    std::string text = merge.Start(searchOptions, nullptr, userData, newResults);
    double took = std::chrono::duration<double>(Clock::now() - start).count();
    double cpu = static_cast<double>(std::clock() - cpuStart) / CLOCKS_PER_SEC;
    if (run == 0 || took < best) best = took;
    if (run == 0 || cpu < bestCpu) bestCpu = cpu;
    merged = userData->AsNode().CountNodes("//d/a");
    missing = userData->AsNode().CountNodes("/*/a_missing/a");
    trl::ReleaseSharedReporter();
  }
  std::printf(
      "merge_bench: N=%d, %zu applications after the merge, %zu missing: best %.3f s "
      "(CPU %.3f s)\n",
      n, merged, missing, best, bestCpu);
  return 0;
}
