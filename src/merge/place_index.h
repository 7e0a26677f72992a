#pragma once

#include <cstddef>
#include <optional>
#include <string>
#include <unordered_map>
#include <vector>

#include "trl/xml.h"

namespace trl::merge {

// The applications of a results document by their place, the encoded names of their computer,
// drive and folder and their a_id text: the answers of the selection
// "//c[@c_name='C']/m[@m_name='M']/d[@d_name='D']/a[@a_id='A']" from the document's root. The
// folders are indexed by one walk and the applications through the document's own child index,
// so that looking up many places never scans the whole document again.
class PlaceIndex {
 public:
  explicit PlaceIndex(xml::Document& document);

  // The first application at the place in document order, or no object. Fails as the selection
  // would: kObjectNotSet (91) without a root element. Names holding an apostrophe change the
  // selection's meaning, and a place named by more than one folder needs the document's order
  // across folders: both are answered by the selection itself.
  xml::Node Find(const std::string& computer, const std::string& drive, const std::string& folder,
                 const std::string& id);
  // Call before `node` leaves the tree: the folders and computers in or below it are forgotten.
  void Removing(const xml::Node& node);
  // Call once `node` has joined the tree: the folders and computers in or below it are known.
  void Added(const xml::Node& node);

  // How many computers the document holds ("//c" counted), counted on first use.
  size_t Computers();

 private:
  // The place key of a folder, or nothing when no place selection meets its applications.
  static std::optional<std::string> KeyOf(const xml::Node& folder);

  xml::Document& document_;
  std::unordered_map<std::string, std::vector<xml::Node>> folders_;
  std::optional<size_t> computers_;
};

}  // namespace trl::merge
