#pragma once

#include <gtest/gtest.h>

#include <algorithm>
#include <string>
#include <string_view>
#include <vector>

#include "frame/error_handler.h"
#include "support/documents.h"
#include "trl/filter.h"

namespace trl::testing {

// A version as a compare writes it, from "v_id v_act v_max f_act f_max"; v_name is "V" + v_id;
// `extra` attributes follow them.
inline std::string Version(std::string_view text, std::string_view children = "",
                           std::string_view extra = "") {
  auto w = Words(text);
  std::string attributes = "v_id=\"" + w[0] + "\" v_name=\"V" + w[0] + "\" v_seq=\"" + w[0] +
                           "\" v_max=\"" + w[2] + "\" v_act=\"" + w[1] + "\" f_max=\"" + w[4] +
                           "\" f_act=\"" + w[3] + "\"" + std::string(extra);
  if (children.empty()) return "<v " + attributes + "/>";
  return "<v " + attributes + ">" + std::string(children) + "</v>";
}

// An application holding `versions`, each a Version text or raw XML, separated by '|'.
inline std::string Application(std::string_view name, std::string_view versions = "") {
  std::string text = "<a a_id=\"1\" a_name=\"" + std::string(name) + "\">";
  while (!versions.empty()) {
    std::string_view v = versions.substr(0, versions.find('|'));
    text += v.front() == '<' ? std::string(v) : Version(v);
    versions.remove_prefix(std::min(versions.size(), v.size() + 1));
  }
  return text + "</a>";
}

// A matches document with the applications in one computer, drive and folder, and `outside`
// straight under the root.
inline std::string Matches(const std::vector<std::string>& applications,
                           std::string_view outside = "") {
  std::string text = "<trl_applicationdata><c c_id=\"1\"><m m_id=\"1\"><d d_id=\"1\">";
  for (const std::string& a : applications) text += a;
  return text + "</d></m></c>" + std::string(outside) + "</trl_applicationdata>";
}

class FilterTest : public ::testing::Test {
 protected:
  // Each test starts and ends with no reported events.
  void SetUp() override { ReleaseSharedReporter(); }
  void TearDown() override { ReleaseSharedReporter(); }

  // A synchronous run on the document of `matches`, which is filtered in place.
  xml::DocumentPtr Run(int16_t options, std::string_view matches) {
    auto document = Parse(matches);
    filter_.Asynchronous(false);
    std::string result = filter_.Start(options, document);
    EXPECT_EQ(result, document->DocumentElement().Xml());
    return document;
  }

  // Its teardown releases the thread's reporter, so it lives as long as the test.
  Filter filter_;
};

}  // namespace trl::testing
