#include "frame/fixes.h"

#include <cstdint>
#include <string>
#include <vector>

#include "frame/attributes.h"
#include "frame/error_handler.h"
#include "frame/general.h"
#include "frame/vocabulary.h"
#include "platform/convert.h"
#include "schema/schema.h"

namespace trl {
namespace {

// Moves a plain name written in the older form (only in `nameAttr`) to `textAttr` and encodes it.
void UpgradeName(const OnError& on, const Schema& schema, xml::Node node, std::string_view textAttr,
                 std::string_view nameAttr) {
  bool older = false;
  on([&] { older = FixNulls(node.GetAttribute(textAttr), std::string()).empty(); });
  if (!older) return;
  on([&] { node.SetAttribute(textAttr, TextOf(node, nameAttr)); });
  on([&] { node.SetAttribute(nameAttr, schema.EncodeName(TextOf(node, nameAttr))); });
}

// The ids read last: one that cannot be read keeps the value the element before it gave.
struct PlaceIds {
  std::string c, m, d, a;
};

void UpgradeComputerIn(const OnError& on, const Schema& schema, xml::Node c, PlaceIds& ids) {
  on([&] { ids.c = TextOf(c, vocab::c_id); });
  UpgradeName(on, schema, c, vocab::c_text, vocab::c_name);

  std::vector<xml::Node> drives;
  on([&] { drives = c.SelectNodes("./m"); });
  for (xml::Node m : drives) {
    on([&] { ids.m = TextOf(m, vocab::m_id); });
    UpgradeName(on, schema, m, vocab::m_text, vocab::m_name);

    std::vector<xml::Node> folders;
    on([&] { folders = m.SelectNodes("./d"); });
    for (xml::Node d : folders) {
      on([&] { ids.d = TextOf(d, vocab::d_id); });
      std::vector<xml::Node> applications;
      on([&] { applications = d.SelectNodes("./a"); });
      for (xml::Node a : applications) {
        on([&] { ids.a = TextOf(a, vocab::a_id); });
        on([&] {
          a.SetAttribute(vocab::a_guid, "c" + ids.c + "m" + ids.m + "d" + ids.d + "a" + ids.a);
        });
      }
    }
  }
}

}  // namespace

void UpgradeUserData(xml::Document& document) {
  OnError on{kFixesModule, "UpgradeUserData"};
  Schema schema;
  PlaceIds ids;
  std::vector<xml::Node> computers;
  on([&] { computers = document.DocumentElement().SelectNodes("//c"); });
  for (xml::Node c : computers) UpgradeComputerIn(on, schema, c, ids);
}

void UpgradeComputer(xml::Node computer) {
  OnError on{kFixesModule, "UpgradeUserData"};
  Schema schema;
  PlaceIds ids;
  UpgradeComputerIn(on, schema, computer, ids);
}

void UpgradeFingerprintData(xml::Document& fingerprint) {
  OnError on{kFixesModule, "UpgradeFingerprintData"};
  // A weight that cannot be read falls back to the one read before it in this call.
  int32_t fileWeight = 0;
  int32_t propertyWeight = 0;

  std::vector<xml::Node> versions;
  on([&] {
    // Every v of the document, as a selection of "//v" from the root would give.
    if (!fingerprint.DocumentElement()) Fail(kObjectNotSet);
    versions = fingerprint.AsNode().GetElementsByTagName(vocab::v);
  });
  for (xml::Node v : versions) {
    int32_t versionSum = 0;
    std::vector<xml::Node> files;
    on([&] { files = v.GetElementsByTagName(vocab::f); });
    for (xml::Node f : files) {
      on([&] { fileWeight = ToInt32(TextViewOf(f, vocab::f_weight)); });
      int32_t fileBit = CalculateWeightMask(fileWeight);
      on([&] { versionSum = CheckedAdd(versionSum, fileBit); });
      on([&] { f.SetAttribute(vocab::f_bitmask, std::to_string(fileBit)); });

      int32_t fileSum = 0;
      std::vector<xml::Node> properties;
      on([&] { properties = f.ChildElements(vocab::p); });
      for (xml::Node p : properties) {
        on([&] { propertyWeight = ToInt32(TextViewOf(p, vocab::p_weight)); });
        int32_t propertyBit = CalculateWeightMask(propertyWeight);
        on([&] { fileSum = CheckedAdd(fileSum, propertyBit); });
        on([&] { p.SetAttribute(vocab::p_bitmask, std::to_string(propertyBit)); });
      }
      on([&] { f.SetAttribute(vocab::p_max, std::to_string(fileSum)); });
    }
    on([&] { v.SetAttribute(vocab::v_max, std::to_string(versionSum)); });
  }
}

}  // namespace trl
