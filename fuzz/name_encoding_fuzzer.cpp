// The encodings of names, on any bytes: what each promises, checked through its inverse where
// one exists. A file's name goes from the disk through NameFromNative, then EncodeName or
// EncodeExactName, into selections between apostrophes.
#include <utf8proc.h>

#include <algorithm>
#include <cstddef>
#include <cstdint>
#include <string>
#include <string_view>
#include <vector>

#include "fuzz_input.h"
#include "platform/text.h"
#include "schema/schema.h"
#include "trl/xml.h"

namespace {

using trl::fuzz::Require;

int HexValue(char c) {
  if (c >= '0' && c <= '9') return c - '0';
  if (c >= 'A' && c <= 'F') return c - 'A' + 10;
  return -1;
}

// The text an escaped name was made from; checks that every "%" begins an escape, and that
// nothing that must be escaped stands bare.
std::string Unescaped(std::string_view encoded) {
  std::string text;
  for (size_t i = 0; i < encoded.size(); ++i) {
    auto byte = static_cast<unsigned char>(encoded[i]);
    Require(byte >= 0x20 && byte != 0x7F && byte != '\'' && byte != '"', "a bare byte to escape");
    if (byte != '%') {
      text += encoded[i];
      continue;
    }
    Require(
        i + 2 < encoded.size() && HexValue(encoded[i + 1]) >= 0 && HexValue(encoded[i + 2]) >= 0,
        "a \"%\" that begins no escape");
    text += static_cast<char>(HexValue(encoded[i + 1]) * 16 + HexValue(encoded[i + 2]));
    i += 2;
  }
  return text;
}

// Every character of lower-cased text is its own lower case, as the Unicode tables have it.
void CheckFolded(std::string_view lower) {
  auto* at = reinterpret_cast<const utf8proc_uint8_t*>(lower.data());
  auto* end = at + lower.size();
  while (at < end) {
    utf8proc_int32_t c = 0;
    utf8proc_ssize_t length = utf8proc_iterate(at, end - at, &c);
    if (length <= 0) {
      ++at;  // a byte that is not UTF-8, passed through
      continue;
    }
    Require(utf8proc_tolower(c) == c, "a character left with a lower case of its own");
    at += length;
  }
}

void CheckNativeNames(std::string_view bytes) {
  std::string name = trl::NameFromNative(bytes);
  Require(trl::IsValidUtf8(name) && trl::IsXmlSafe(name), "a native name XML cannot carry");
  Require(name.find('\\') == std::string::npos, "a native name with a separator");
  Require(trl::NameToNative(name) == bytes, "a native name does not come back");
}

// A name between apostrophes selects the element that carries it.
void CheckSelection(const std::string& encoded) {
  trl::xml::Document document;
  trl::xml::Node root = document.SetDocumentElement(document.CreateElement("d"));
  trl::xml::Node item = root.AppendElement("f", {{"f_name", encoded}});
  auto selected = root.SelectNodes("./f[@f_name='" + encoded + "']");
  Require(selected.size() == 1 && selected.front() == item, "the encoded name selects nothing");
}

}  // namespace

// The first byte also tells where the case-kept part of an exact name begins.
extern "C" int LLVMFuzzerTestOneInput(const uint8_t* data, size_t size) {
  static const trl::Schema schema(std::vector<std::string>{});
  std::string_view text(reinterpret_cast<const char*>(data), size);
  CheckNativeNames(text);

  std::string lower = trl::LowerCase(text);
  CheckFolded(lower);
  Require(trl::LowerCase(lower) == lower, "lower-casing twice changed the text");
  Require(trl::IsValidUtf8(lower) == trl::IsValidUtf8(text), "lower-casing changed validity");

  std::string encoded = schema.EncodeName(text);
  Require(Unescaped(encoded) == lower, "EncodeName does not decode to the lower-cased name");
  Require(schema.EncodeName(lower) == encoded, "names equal in lower case encode apart");
  Require(encoded.find("%~") == std::string::npos, "an ordinary name carries the exact mark");
  Require(trl::Schema::FoldedName(encoded) == encoded, "an ordinary name has a fold of its own");
  Require(trl::Schema::ExactFrom(encoded, text) == std::string_view::npos,
          "an ordinary name has a case-kept part");

  size_t from = size == 0 ? 0 : data[0] % (size + 2);
  size_t kept = std::min(from, text.size());
  std::string exact = schema.EncodeExactName(text, from);
  Require(trl::Schema::FoldedName(exact) == encoded, "an exact name folds to another name");
  Require(trl::Schema::ExactFrom(exact, text) == kept, "the case-kept part begins elsewhere");
  Require(Unescaped(std::string_view(exact).substr(encoded.size() + 2)) == text.substr(kept),
          "the case-kept part does not decode to the name");

  if (trl::IsXmlSafe(text)) CheckSelection(encoded);
  // Callers keep the case from a separator on, never from inside a character.
  if (trl::IsXmlSafe(text) && trl::IsValidUtf8(text.substr(kept))) CheckSelection(exact);
  return 0;
}
