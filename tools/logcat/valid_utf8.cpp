#include "valid_utf8.h"

#include "logformat/hex.h"

#include <cstdint>

namespace orvane::logcat {
namespace {

bool InRange(std::string_view text, std::size_t i, unsigned low, unsigned high) {
  if (i >= text.size()) return false;
  const auto c = static_cast<unsigned char>(text[i]);
  return c >= low && c <= high;
}

// Length of the valid UTF-8 sequence that starts at `i` with a byte of 0x80
// or above, or 0. The second byte's range is what excludes overlong forms,
// surrogates and values above U+10FFFF.
std::size_t SequenceLength(std::string_view text, std::size_t i) {
  const auto lead = static_cast<unsigned char>(text[i]);
  unsigned low = 0x80;
  unsigned high = 0xbf;
  std::size_t length = 0;
  if (lead >= 0xc2 && lead <= 0xdf)
    length = 2;
  else if (lead >= 0xe0 && lead <= 0xef)
    length = 3;
  else if (lead >= 0xf0 && lead <= 0xf4)
    length = 4;
  else
    return 0;
  if (lead == 0xe0) low = 0xa0;
  if (lead == 0xed) high = 0x9f;
  if (lead == 0xf0) low = 0x90;
  if (lead == 0xf4) high = 0x8f;
  if (!InRange(text, i + 1, low, high)) return 0;
  for (std::size_t k = 2; k < length; ++k)
    if (!InRange(text, i + k, 0x80, 0xbf)) return 0;
  return length;
}

} // namespace

std::size_t AppendValidUtf8(std::string &out, std::string_view json) {
  std::size_t escaped = 0;
  std::size_t run = 0; // start of the bytes not yet copied
  std::size_t i = 0;
  while (i < json.size()) {
    const auto c = static_cast<std::uint8_t>(json[i]);
    if (c < 0x80) {
      ++i;
      continue;
    }
    if (const std::size_t length = SequenceLength(json, i)) {
      i += length;
      continue;
    }
    out.append(json, run, i - run);
    out += "\\u00";
    AppendHex(out, &c, 1);
    ++escaped;
    run = ++i;
  }
  out.append(json, run);
  return escaped;
}

} // namespace orvane::logcat
