#include "frame/general.h"

#include <cmath>

#include "frame/error_handler.h"

namespace trl {

bool AddEventsXML(xml::Document& results) {
  OnError on{kGeneralModule, "AddEventsXML"};
  Reporter* reporter = SharedReporter();
  if (reporter == nullptr) return false;

  bool attached = false;
  xml::Document events;
  on([&] {
    if (!events.LoadXml(reporter->EventsXML())) return;
    attached = true;
    xml::Node copy = events.DocumentElement().CloneNode(true);
    results.DocumentElement().AppendChild(copy);
  });
  on([&] { reporter->ClearEvents(); });
  on([&] { reporter->ResetCounts(); });
  return attached;
}

int32_t CalculateWeightMask(int32_t weight) {
  if (weight > 15) weight = 15;
  if (weight <= 0) return 0;
  return static_cast<int32_t>(std::ldexp(1.0, weight - 1));
}

}  // namespace trl
