#pragma once

#include <memory>
#include <string>
#include <string_view>

namespace trl {

// A case-sensitive, unanchored regular expression (PCRE2 with JIT) holding one pattern; Test tells
// whether the pattern matches anywhere in a text. An empty pattern matches everything. Setting a
// pattern never fails: an invalid one makes every Test fail with kRegExpSyntax (5017), naming the
// problem and its offset.
class RegExp {
 public:
  RegExp();
  ~RegExp();
  RegExp(const RegExp&) = delete;
  RegExp& operator=(const RegExp&) = delete;

  const std::string& Pattern() const { return pattern_; }
  void Pattern(std::string pattern);

  bool Test(std::string_view text);

 private:
  struct Compiled;
  std::string pattern_;
  std::unique_ptr<Compiled> compiled_;
};

}  // namespace trl
