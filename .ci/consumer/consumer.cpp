// A client of libtrllocator that uses only its installed headers: it makes a folder holding one
// file, describes the file in a fingerprint, runs a synchronous Locate over the folder and checks
// that the merged user data identifies the application there. Exit 0 when it does.

#include <trl/locate.h>
#include <trl/xml.h>
#include <unistd.h>

#include <algorithm>
#include <cstdio>
#include <filesystem>
#include <fstream>
#include <memory>
#include <string>

namespace {

trl::xml::DocumentPtr Parsed(const std::string& text) {
  auto document = std::make_shared<trl::xml::Document>();
  if (!document->LoadXml(text)) std::fprintf(stderr, "consumer: cannot parse %s\n", text.c_str());
  return document;
}

}  // namespace

int main() {
  namespace fs = std::filesystem;
  fs::path folder = fs::temp_directory_path() / ("trllocator-consumer-" + std::to_string(getpid()));
  fs::create_directories(folder);
  std::ofstream(folder / "tool.bin") << "consumer";
  // Search options name folders with "\" separators, ending with one.
  std::string place = folder.string() + "/";
  std::replace(place.begin(), place.end(), '/', '\\');

  auto searchOptions = Parsed(
      "<trl_searchoptions><c c_id='1' c_text='localhost' c_name='localhost' c_local='1'>"
      "<m m_id='1' m_text='' m_name='' m_type='3'><d d_id='1' d_text='" +
      place +
      "' d_search='1' d_search_recurse='True' d_search_d_attributes='35'"
      " d_search_f_attributes='35' d_search_f_properties='0'><d_search_mask/></d></m></c>"
      "</trl_searchoptions>");
  auto fingerprint = Parsed(
      "<trl_fingerprint><a a_id='1' a_name='Tool'><v v_id='7' v_name='7.0' v_seq='7'>"
      "<f f_id='1' f_name='tool.bin' f_relpath='' f_weight='1'>"
      "<p p_type='2' p_weight='1' p_value='8'/></f></v></a></trl_fingerprint>");

  trl::Locate locate;
  locate.Asynchronous(false);
  std::string results = locate.Start(searchOptions, nullptr, 63, fingerprint);
  fs::remove_all(folder);

  trl::xml::Document merged;
  trl::xml::Node found;
  if (merged.LoadXml(results)) {
    found = merged.AsNode().SelectSingleNode("/*/c/m/d[@d_text='" + place +
                                             "']/a[@a_name='Tool' and @v_name='7.0']");
  }
  if (locate.Status() != trl::kStatusComplete || found.IsNull()) {
    std::fprintf(stderr, "consumer: Tool 7.0 was not identified in %s:\n%s\n", place.c_str(),
                 results.c_str());
    return 1;
  }
  std::printf("consumer: Tool 7.0 identified in %s\n", place.c_str());
  return 0;
}
