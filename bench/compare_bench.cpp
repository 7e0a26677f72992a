// compare_bench DATA_DIR [RUNS] [OUTPUT]
//
// Times the compare stage on the data `make_compare_data` wrote to DATA_DIR: loading the two
// documents, then a synchronous Compare (best of RUNS, default 2, so the installed files are
// warm), and the heap the local-file index holds per record. OUTPUT, when given, receives the
// matches of the last run.
#include <malloc.h>

#include <chrono>
#include <cstdio>
#include <cstdlib>
#include <ctime>
#include <string>

#include "compare/local_file_index.h"
#include "compare/local_files.h"
#include "frame/error_handler.h"
#include "platform/fs/posix/posix_file_system.h"
#include "trl/compare.h"
#include "trl/xml.h"

namespace {

using Clock = std::chrono::steady_clock;

double Seconds(Clock::time_point since) {
  return std::chrono::duration<double>(Clock::now() - since).count();
}

trl::xml::DocumentPtr Load(const std::string& path) {
  auto document = std::make_shared<trl::xml::Document>();
  if (!document->Load(path)) {
    std::fprintf(stderr, "compare_bench: cannot load %s: %s\n", path.c_str(),
                 document->LastParseError().reason.c_str());
    std::exit(1);
  }
  return document;
}

size_t HeapInUse() {
  struct mallinfo2 info = mallinfo2();
  return info.uordblks + info.hblkhd;  // large blocks are mapped apart
}

}  // namespace

int main(int argc, char** argv) {
  if (argc < 2) {
    std::fprintf(stderr, "usage: compare_bench DATA_DIR [RUNS] [OUTPUT]\n");
    return 2;
  }
  std::string dir = argv[1];
  int runs = argc > 2 ? std::atoi(argv[2]) : 2;

  auto start = Clock::now();
  auto localFiles = Load(dir + "/local-files.xml");
  double loadLocal = Seconds(start);
  start = Clock::now();
  auto fingerprintText = Load(dir + "/fingerprint.xml")->Xml();
  double loadFingerprint = Seconds(start);

  size_t before = HeapInUse();
  trl::LocalFileIndex index;
  start = Clock::now();
  trl::FillLocalFileIndex(*localFiles, &index);
  double fill = Seconds(start);
  size_t indexBytes = HeapInUse() - before;

  double best = 0, bestCpu = 0;
  std::string results;
  for (int run = 0; run < runs; ++run) {
    // The run writes bit values into the fingerprint: each run gets a fresh copy.
    auto fingerprint = std::make_shared<trl::xml::Document>();
    fingerprint->LoadXml(fingerprintText);
    trl::Compare compare(trl::fs::CreatePosixFileSystem({}));
    compare.Asynchronous(false);
    start = Clock::now();
    std::clock_t cpuStart = std::clock();
    results = compare.Start(nullptr, localFiles, fingerprint);
    double took = Seconds(start);
    double cpu = static_cast<double>(std::clock() - cpuStart) / CLOCKS_PER_SEC;
    if (run == 0 || took < best) best = took;
    if (run == 0 || cpu < bestCpu) bestCpu = cpu;
    trl::ReleaseSharedReporter();
  }
  if (argc > 3) {
    std::FILE* out = std::fopen(argv[3], "w");
    if (!out || std::fwrite(results.data(), 1, results.size(), out) != results.size()) {
      std::fprintf(stderr, "compare_bench: cannot write %s\n", argv[3]);
      return 1;
    }
    std::fclose(out);
  }
  trl::xml::Document matches;
  matches.LoadXml(results);
  std::printf(
      "records %zu  index %.1f B/record (fill %.3f s)  load local %.3f s  load fingerprint %.3f "
      "s\ncompare best of %d: %.3f s (cpu %.3f s)  copies %zu  versions %zu  full versions %zu  "
      "events %zu\n",
      index.Size(), static_cast<double>(indexBytes) / static_cast<double>(index.Size()), fill,
      loadLocal, loadFingerprint, runs, best, bestCpu, matches.AsNode().CountNodes("//d/a"),
      matches.AsNode().CountNodes("//a/v"), matches.AsNode().CountNodes("//a/v[@v_act=@v_max]"),
      matches.AsNode().CountNodes("//event"));
  return 0;
}
