#pragma once

#include <cstdint>
#include <string>

namespace trl {

// One recorded report, as the events list shows it.
struct Event {
  int32_t number = 0;
  std::string description;
  int32_t kind = 0;
  std::string component;
  std::string className;
  std::string procedure;
  std::string source;
  std::string time;
};

}  // namespace trl
