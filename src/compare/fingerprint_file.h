#pragma once

#include <cstdint>
#include <exception>
#include <optional>
#include <string>
#include <vector>

#include "compare/folder_fit.h"
#include "trl/xml.h"

namespace trl {

// A fingerprint file as the tests of its local candidates read it: where it expects to lie, its
// properties, and what a find records. Each is read once, when first needed, since a file with a
// common name has many candidates; each value that could not be read is reported again wherever a
// fresh read would report it (Replay), and the value before it stands in, as it would.
class FingerprintFile {
 public:
  // One property, read in order: its kind, its weight and the bit value of that weight (each
  // keeping the property before's value when it cannot be read), then the expected value, in the
  // form its kind compares: lower case (kinds 1 and 3), a 32-bit number (2), a formatted time (4).
  struct Property {
    std::vector<std::exception_ptr> readFailures;
    int16_t kind = 0;
    int16_t bit = 0;
    std::exception_ptr expectedFailure;    // the value could not be read
    std::exception_ptr conversionFailure;  // nor put in the form its kind compares
    std::string expectedText;
    int32_t expectedNumber = 0;
  };
  // What a find records: the file's f_id, p_max and f_bitmask (0 when unreadable).
  struct Details {
    std::vector<std::exception_ptr> readFailures;
    int32_t id = 0;
    int16_t maxMask = 0;
    int16_t fileBit = 0;
  };

  explicit FingerprintFile(const xml::Node& f) : f_(f), fit_(f) {}

  const xml::Node& Element() const { return f_; }
  const FolderFit& Fit() const { return fit_; }
  // Read when first asked for: most candidates of a common name lie in folders that do not fit.
  const std::vector<Property>& Properties() const;
  const Details& FindDetails() const;

  // Raises `failure` inside `on`, which reports it as the read that failed would have been.
  template <class Handler>
  static void Replay(const Handler& on, const std::exception_ptr& failure) {
    if (failure) on([&] { std::rethrow_exception(failure); });
  }

 private:
  xml::Node f_;
  FolderFit fit_;
  mutable std::optional<std::vector<Property>> properties_;
  mutable std::optional<Details> details_;
};

}  // namespace trl
