#include "server/bindings.h"

#include <string_view>

#include "trl/compare.h"
#include "trl/filter.h"
#include "trl/locate.h"
#include "trl/merge.h"
#include "trl/search.h"

namespace trl::server {
namespace {

using enum MemberKind;

// Start of each class, with its arguments in the order of its parameters.
std::string Start(Worker& worker, std::string_view className, Arguments& a) {
  if (className == "Search") {
    // The results are in-out: a run given none makes a new document that the caller gets back.
    return static_cast<Search&>(worker).Start(a[0].document, a[1].document, a[2].document,
                                              a[3].document);
  }
  if (className == "Compare") {
    return static_cast<Compare&>(worker).Start(a[0].document, a[1].document, a[2].document);
  }
  if (className == "Filter") {
    return static_cast<Filter&>(worker).Start(a[0].number, a[1].document);
  }
  if (className == "Merge") {
    return static_cast<Merge&>(worker).Start(a[0].document, a[1].document, a[2].document,
                                             a[3].document);
  }
  return static_cast<Locate&>(worker).Start(a[0].document, a[1].document, a[2].number,
                                            a[3].document, a[4].document);
}

}  // namespace

std::unique_ptr<Worker> CreateWorker(const ClassIdentity& identity) {
  std::string_view name = identity.name;
  if (name == "Search") return std::make_unique<Search>();
  if (name == "Compare") return std::make_unique<Compare>();
  if (name == "Filter") return std::make_unique<Filter>();
  if (name == "Merge") return std::make_unique<Merge>();
  return std::make_unique<Locate>();
}

Outcome Perform(Worker& worker, const ClassIdentity& identity, const Member& member,
                Arguments& arguments) {
  Outcome outcome;
  outcome.kind = member.result;
  std::string_view name = member.name;
  if (name == "Asynchronous") {
    if (member.kind == kPropertyPut) {
      worker.Asynchronous(arguments[0].boolean);
    } else {
      outcome.boolean = worker.Asynchronous();
    }
  } else if (name == "Status") {
    outcome.number = worker.Status();
  } else if (name == "Cancel") {
    worker.Cancel();
  } else if (name == "Start") {
    outcome.text = Start(worker, identity.name, arguments);
  } else if (name == "Mode") {
    outcome.number = static_cast<Locate&>(worker).Mode();
  } else if (member.kind == kPropertyPut) {  // LogFile
    static_cast<Locate&>(worker).LogFile(arguments[0].text);
  } else {
    outcome.text = static_cast<Locate&>(worker).LogFile();
  }
  return outcome;
}

}  // namespace trl::server
