#include <optional>
#include <string>

#include "frame/error_handler.h"
#include "frame/use_object.h"
#include "frame/vocabulary.h"
#include "locate/locate_names.h"
#include "locate/stage.h"
#include "platform/convert.h"
#include "trl/locate.h"

namespace trl {

using locate::kClass;

void Locate::SubscribeTo(Stage& stage) {
  if (!stage.worker) return;
  stage.worker->OnStatusDocument(
      [this, &stage](const std::string& update, const xml::DocumentPtr& results, bool handedOver) {
        StatusUpdate(stage, update, results, handedOver);
      });
  stage.worker->OnProgressUpdate(
      [this, &stage](const std::string& update) { ProgressUpdate(stage, update); },
      [this] { return ProgressObserved(); });
}

void Locate::StatusUpdate(Stage& stage, const std::string& strUpdateXML,
                          const xml::DocumentPtr& stageResults, bool handedOver) {
  OnError on{kClass, stage.names.statusLabel};
  on([&] { progressDocument_->LoadXml(strUpdateXML); });
  // The stage's results are read from their text, which is this layer's own serialisation: a
  // document the stage lets go of gives the same tree kept as it is, without the text between.
  if (handedOver && stageResults) {
    *stage.results = stageResults;
  } else {
    std::string strResultsXML = stageResults ? stageResults->Xml() : std::string();
    on([&] { Use(stage.results->get()).LoadXml(strResultsXML); });
  }

  // A report that cannot be read at all reads as status 0; one whose e_status is missing or not a
  // number leaves the status as it was.
  std::optional<std::string> statusText;
  if (!on([&] {
        statusText = progressDocument_->DocumentElement().GetAttribute(vocab::e_status);
      })) {
    statusText = "0";
  }
  on([&] {
    if (!statusText) Fail(kInvalidUseOfNull);
    status_ = ToInt16(*statusText);
  });

  // A text that did not load is relayed as what it reads as: nothing.
  on([&] { RaiseStatusUpdate(progressDocument_->Xml(), *stage.results); });
  if (status_ == kStatusComplete) End(stage);
}

void Locate::ProgressUpdate(const Stage& stage, const std::string& strUpdateXML) {
  OnError{kClass, stage.names.progressLabel}([&] { RaiseProgressUpdate(strUpdateXML); });
}

void Locate::AddEvents(std::string_view stageName, xml::Document& results,
                       xml::Document& eventsDocument) {
  OnError on{kClass, "AddEvents"};
  xml::Node root = results.DocumentElement();
  if (!root) {
    on([&] {
      Raise(kErrUnableToLoadResults, "Unable to load " + std::string(stageName) + " results XML",
            kClass, "AddEvents");
    });
  }
  xml::Node list;
  on([&] { list = eventsDocument.CreateElement(stageName); });
  on([&] {
    for (xml::Node event : root.GetElementsByTagName(vocab::event)) {
      list.AppendChild(event.CloneNode(true));
    }
  });
  on([&] { eventsDocument.DocumentElement().AppendChild(list); });
}

}  // namespace trl
