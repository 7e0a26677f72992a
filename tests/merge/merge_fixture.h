#pragma once

#include <gtest/gtest.h>

#include <string>
#include <string_view>
#include <vector>

#include "support/documents.h"
#include "trl/merge.h"
#include "trl/xml.h"

namespace trl::testing {

// One place of a results document: computer, drive and folder holding `applications` (XML text).
inline std::string Place(std::string_view computer, std::string_view drive, std::string_view folder,
                         std::string_view applications, std::string_view ids = "1 1 1") {
  auto id = Words(ids);
  return "<c c_id='" + id[0] + "' c_text='" + std::string(computer) + "' c_name='" +
         Lower(std::string(computer)) + "'><m m_id='" + id[1] + "' m_text='" + std::string(drive) +
         "' m_name='" + Lower(std::string(drive)) + "'><d d_id='" + id[2] + "' d_text='" +
         std::string(folder) + "' d_name='" + Lower(std::string(folder)) + "'>" +
         std::string(applications) + "</d></m></c>";
}

// An application with one version.
inline std::string Application(std::string_view id) {
  return "<a a_id='" + std::string(id) + "' a_name='App" + std::string(id) +
         "' v_id='1'><v v_id='1'/></a>";
}

inline std::string Results(std::string_view body, std::string_view rootAttributes = "") {
  return "<trl_applicationdata " + std::string(rootAttributes) + ">" + std::string(body) +
         "</trl_applicationdata>";
}

// A managed application of the search options at a place.
inline std::string Managed(std::string_view computer, std::string_view drive,
                           std::string_view folder, std::string_view id,
                           std::string_view manage = "1") {
  return "<c c_name='" + std::string(computer) + "'><m m_name='" + std::string(drive) +
         "'><d d_name='" + std::string(folder) + "'><a a_id='" + std::string(id) + "' a_manage='" +
         std::string(manage) + "'/></d></m></c>";
}

// The tree of computers, drives, folders and applications by id, as "c1(m1(d1(a7 a8)))", and
// the missing list as "missing(7 8)".
inline std::string Shape(const xml::Node& node) {
  std::string out;
  for (const xml::Node& child : node.ChildNodes()) {
    if (child.Type() != xml::NodeType::kElement) continue;
    std::string tag = child.NodeName();
    std::string text = tag == "a_missing" ? "missing" : tag;
    if (node.NodeName() == "a_missing") {
      text = child.GetAttribute("a_id").value_or("?");
    } else if (tag.size() == 1 && std::string_view("cmda").find(tag) != std::string_view::npos) {
      text += child.GetAttribute(tag + "_id").value_or("?");
    }
    if (tag != "a") text += "(" + Shape(child) + ")";
    out += (out.empty() ? "" : " ") + text;
  }
  return out;
}

// What a synchronous merge answered and reported; the events are taken while the worker lives,
// since its teardown releases the thread's reporter.
struct MergeRun {
  std::string text;
  std::vector<ReportedEvent> events;
};

inline MergeRun MergeNow(const xml::DocumentPtr& searchOptions,
                         const xml::DocumentPtr& applicationOptions,
                         const xml::DocumentPtr& oldResults, const xml::DocumentPtr& newResults) {
  Merge merge;
  merge.Asynchronous(false);
  MergeRun run{merge.Start(searchOptions, applicationOptions, oldResults, newResults), {}};
  run.events = TakeReportedEvents();
  return run;
}

}  // namespace trl::testing
