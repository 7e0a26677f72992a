#include "platform/regexp.h"

#include <fmt/format.h>

#include <array>

#define PCRE2_CODE_UNIT_WIDTH 8
#include <pcre2.h>

#include "platform/failure.h"

namespace trl {
namespace {

std::string ErrorMessage(int code) {
  std::array<PCRE2_UCHAR, 256> buffer{};
  int length = pcre2_get_error_message(code, buffer.data(), buffer.size());
  if (length < 0) return fmt::format("error {}", code);
  return std::string(reinterpret_cast<const char*>(buffer.data()), static_cast<size_t>(length));
}

}  // namespace

// The compiled form of the current pattern (null until the first Test after a change, or when
// the pattern does not compile) and the match-data block every Test reuses.
struct RegExp::Compiled {
  Compiled() : matchData(pcre2_match_data_create(1, nullptr)) {
    if (matchData == nullptr) Fail(kInvalidArgument, "Out of memory for regular expression");
  }
  ~Compiled() {
    pcre2_code_free(code);
    pcre2_match_data_free(matchData);
  }
  Compiled(const Compiled&) = delete;
  Compiled& operator=(const Compiled&) = delete;

  void Reset() {
    pcre2_code_free(code);
    code = nullptr;
    stale = true;
    error.clear();
  }

  void Compile(const std::string& pattern) {
    stale = false;
    int errorCode = 0;
    PCRE2_SIZE errorOffset = 0;
    code = pcre2_compile(reinterpret_cast<PCRE2_SPTR>(pattern.data()), pattern.size(),
                         PCRE2_UTF | PCRE2_MATCH_INVALID_UTF | PCRE2_ALT_BSUX, &errorCode,
                         &errorOffset, nullptr);
    if (code == nullptr) {
      error = fmt::format("{}: {} at offset {}", StandardDescription(kRegExpSyntax),
                          ErrorMessage(errorCode), errorOffset);
      return;
    }
    // Without JIT support pcre2_match interprets the pattern; the result is the same, only slower.
    pcre2_jit_compile(code, PCRE2_JIT_COMPLETE);
  }

  pcre2_code* code = nullptr;
  pcre2_match_data* matchData;
  bool stale = true;
  std::string error;  // why the pattern did not compile
};

RegExp::RegExp() : compiled_(std::make_unique<Compiled>()) {}

RegExp::~RegExp() = default;

void RegExp::Pattern(std::string pattern) {
  pattern_ = std::move(pattern);
  compiled_->Reset();
}

bool RegExp::Test(std::string_view text) {
  if (pattern_.empty()) return true;
  if (compiled_->stale) compiled_->Compile(pattern_);
  if (compiled_->code == nullptr) Fail(kRegExpSyntax, compiled_->error);
  // An empty view may carry no pointer at all; PCRE2 wants one.
  const char* subject = text.empty() ? "" : text.data();
  int result = pcre2_match(compiled_->code, reinterpret_cast<PCRE2_SPTR>(subject), text.size(), 0,
                           0, compiled_->matchData, nullptr);
  if (result >= 0) return true;
  if (result == PCRE2_ERROR_NOMATCH) return false;
  // Match-time limits (backtracking, depth, heap) are the only failures left.
  Fail(kInvalidArgument, fmt::format("Regular expression match failed: {}", ErrorMessage(result)));
}

}  // namespace trl
