// nesting_bench TAG DEPTH
//
// Times a synchronous Compare of a fingerprint whose one application holds DEPTH elements TAG
// ("a" or "v"), each inside the one before, against local files of a single file. Such a tree is
// far deeper than a load accepts by default; it stands for the cost of nesting, which should grow
// with the depth, not with its square.
#include <chrono>
#include <cstdio>
#include <cstdlib>
#include <string>

#include "frame/error_handler.h"
#include "trl/compare.h"
#include "trl/xml.h"

namespace {

trl::xml::DocumentPtr Load(const std::string& text) {
  trl::xml::Limits limits;
  limits.depth = SIZE_MAX;
  auto document = std::make_shared<trl::xml::Document>();
  if (!document->LoadXml(text, limits)) {
    std::fprintf(stderr, "nesting_bench: generated text does not load: %s\n",
                 document->LastParseError().reason.c_str());
    std::exit(1);
  }
  return document;
}

}  // namespace

int main(int argc, char** argv) {
  if (argc != 3) {
    std::fprintf(stderr, "usage: nesting_bench TAG DEPTH\n");
    return 2;
  }
  std::string tag = argv[1];
  int depth = std::atoi(argv[2]);
  std::string fingerprint = "<trl_fingerprintdata><a a_id=\"1\">";
  for (int i = 0; i < depth; ++i) {
    fingerprint += "<" + tag + " " + tag + "_id=\"" + std::to_string(i) + "\" v_seq=\"1\">";
  }
  for (int i = 0; i < depth; ++i) fingerprint += "</" + tag + ">";
  fingerprint += "</a></trl_fingerprintdata>";
  auto localFiles = Load(
      "<trl_applicationdata><c c_id=\"1\" c_text=\"localhost\" c_name=\"localhost\" "
      "c_local=\"1\"><m m_id=\"1\" m_text=\"/tmp\" m_name=\"/tmp\"><d d_id=\"1\" d_text=\"\\x\\\" "
      "d_name=\"\\x\\\"><f f_id=\"1\" f_text=\"a\" "
      "f_name=\"a\"/></d></m></c></trl_applicationdata>");
  trl::Compare compare;
  compare.Asynchronous(false);
  auto start = std::chrono::steady_clock::now();
  compare.Start(nullptr, localFiles, Load(fingerprint));
  double took = std::chrono::duration<double>(std::chrono::steady_clock::now() - start).count();
  trl::ReleaseSharedReporter();
  std::printf("nesting_bench: %d nested %s: Compare %.3f s\n", depth, tag.c_str(), took);
  return 0;
}
