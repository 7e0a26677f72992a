#pragma once

#include <windows.h>

#include <oleauto.h>

#include <string>
#include <string_view>

namespace trl::server::windows {

// UTF-8, the component's text, from the platform's string; a null string is "".
std::string Utf8(BSTR text);
// A new string for the client; throws bad_alloc when there is no memory for it.
BSTR NewBstr(std::string_view text);

// A string the caller owns, freed at the end of its scope.
class Bstr {
 public:
  explicit Bstr(std::string_view text) : text_(NewBstr(text)) {}
  Bstr() = default;
  ~Bstr() { SysFreeString(text_); }
  Bstr(const Bstr&) = delete;
  Bstr& operator=(const Bstr&) = delete;

  BSTR get() const { return text_; }
  BSTR* out() {
    SysFreeString(text_);
    text_ = nullptr;
    return &text_;
  }

 private:
  BSTR text_ = nullptr;
};

}  // namespace trl::server::windows
