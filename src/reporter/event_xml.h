#pragma once

#include <deque>
#include <string>

#include "reporter/event.h"

namespace trl {

// Serialises recorded events as "<events><event .../>...</events>" ("<events/>" when there are
// none). The text is always well formed and every value reads back as it was recorded, except that
// bytes that are not UTF-8 and characters XML cannot carry come back as U+FFFD.
std::string EventsToXml(const std::deque<Event>& events);

}  // namespace trl
