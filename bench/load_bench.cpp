// load_bench [RUNS] FILE...
//
// Times loading each XML document (best of RUNS, default 5): from its file, as every command reads
// its input documents, and from text in memory, as the stages hand results on. Prints the rates;
// make_compare_data writes suitably large documents.
#include <chrono>
#include <cstdio>
#include <cstdlib>
#include <fstream>
#include <functional>
#include <sstream>
#include <string>

#include "trl/xml.h"

namespace {

// The best time of `runs` loads by `load` into a new document each; exits when one fails.
double Best(int runs, const char* path, const std::function<bool(trl::xml::Document&)>& load) {
  double best = 0;
  for (int run = 0; run < runs; ++run) {
    trl::xml::Document document;
    auto start = std::chrono::steady_clock::now();
    bool loaded = load(document);
    double took = std::chrono::duration<double>(std::chrono::steady_clock::now() - start).count();
    if (!loaded) {
      std::fprintf(stderr, "load_bench: %s does not load: %s\n", path,
                   document.LastParseError().reason.c_str());
      std::exit(1);
    }
    if (run == 0 || took < best) best = took;
  }
  return best;
}

}  // namespace

int main(int argc, char** argv) {
  int first = 1;
  int runs = 5;
  if (argc > 2 && std::atoi(argv[1]) > 0) {
    runs = std::atoi(argv[1]);
    first = 2;
  }
  if (first >= argc) {
    std::fprintf(stderr, "usage: load_bench [RUNS] FILE...\n");
    return 2;
  }
  for (int i = first; i < argc; ++i) {
    std::ifstream in(argv[i], std::ios::binary);
    std::ostringstream read;
    read << in.rdbuf();
    std::string text = std::move(read).str();
    if (!in) {
      std::fprintf(stderr, "load_bench: cannot read %s\n", argv[i]);
      return 1;
    }
    double fromFile = Best(runs, argv[i], [&](auto& document) { return document.Load(argv[i]); });
    double fromText = Best(runs, argv[i], [&](auto& document) { return document.LoadXml(text); });
    double megabytes = static_cast<double>(text.size()) / (1 << 20);
    std::printf(
        "%s: %.1f MiB, best of %d: from the file %.3f s (%.0f MiB/s), from text %.3f s "
        "(%.0f MiB/s)\n",
        argv[i], megabytes, runs, fromFile, megabytes / fromFile, fromText, megabytes / fromText);
  }
  return 0;
}
