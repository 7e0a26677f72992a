#include <string>

#include "frame/error_handler.h"
#include "locate/locate_names.h"
#include "trl/locate.h"

namespace trl {
namespace {

// Search options this long are left out of the header, so that a log stays readable.
constexpr size_t kLongestSearchOptions = 9999;

size_t CharacterCount(std::string_view utf8) {
  size_t count = 0;
  for (unsigned char byte : utf8) count += (byte & 0xC0) != 0x80;
  return count;
}

std::string RootText(xml::Document& document) {
  xml::Node root = document.DocumentElement();
  return root.Xml();  // no root fails (91), and the step is reported
}

}  // namespace

std::string Locate::OptionsHeader(bool asynchronous, int16_t filterOptions,
                                  xml::Document& searchOptions, xml::Document& applicationOptions) {
  OnError on{locate::kClass, locate::kStartLabel};
  std::string header = "<options  asynchronous=\"";
  header += asynchronous ? "1" : "0";
  header += "\" filter=\"" + std::to_string(filterOptions) + "\">";

  std::string search;
  on([&] { search = RootText(searchOptions); });
  if (CharacterCount(search) <= kLongestSearchOptions) {
    header += "<options_search>" + search + "</options_search>";
  } else {
    header += "<options_search><![CDATA[Search options too long to include]]></options_search>";
  }

  std::string applications;
  on([&] { applications = RootText(applicationOptions); });
  header += "<options_applications>" + applications + "</options_applications>";
  header += "</options>";
  return header;
}

}  // namespace trl
