#pragma once

#include <string>
#include <vector>

#include "compare/local_file_index.h"
#include "frame/attributes.h"
#include "frame/use_object.h"
#include "frame/vocabulary.h"
#include "platform/failure.h"
#include "platform/text.h"
#include "trl/xml.h"

namespace trl {

// Adds the drives of a local-files document to `index` in document order (every `m` of every
// `c`, with its links), each step run through `on`, which reports a failure or passes it on, and
// hands each drive's `m` to `folders` once it is added. A value that cannot be read keeps what
// the element before gave.
template <class Steps, class Folders>
void WalkDrives(xml::Document& localFiles, LocalFileIndex* index, const Steps& on,
                const Folders& folders) {
  std::vector<xml::Node> computers;
  on([&] {
    if (!localFiles.DocumentElement()) Fail(kObjectNotSet);
    computers = localFiles.AsNode().GetElementsByTagName(vocab::c);
  });
  std::string machine, encodedMachine, drive, encodedDrive;
  for (const xml::Node& c : computers) {
    on([&] { machine = TextOf(c, vocab::c_text); });
    on([&] { encodedMachine = TextOf(c, vocab::c_name); });
    bool local = c.GetAttribute(vocab::c_local) == "1";
    for (const xml::Node& m : c.ChildElements(vocab::m)) {
      on([&] { drive = TextOf(m, vocab::m_text); });
      on([&] { encodedDrive = TextOf(m, vocab::m_name); });
      on([&] { Use(index).AddDrive(machine, encodedMachine, local, drive, encodedDrive); });
      for (const xml::Node& l : m.ChildElements(vocab::l)) {
        auto text = l.GetAttribute(vocab::l_text);
        auto target = l.GetAttribute(vocab::l_target);
        if (index != nullptr && text && target)
          index->AddLink(LowerCase(*text), LowerCase(*target));
      }
      folders(m);
    }
  }
}

}  // namespace trl
