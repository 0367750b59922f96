#include "logformat/record_text.h"

#include "logformat/hex.h"

#include <cstdint>
#include <cstring>

namespace orvane {
namespace {

// Nonzero for the bytes that JSON forbids raw inside a string.
constexpr bool NeedsEscape(unsigned char c) { return c < 0x20 || c == '"' || c == '\\'; }

struct EscapeTable {
  bool needed[256];
};
constexpr EscapeTable MakeEscapeTable() {
  EscapeTable table{};
  for (int c = 0; c < 256; ++c) table.needed[c] = NeedsEscape(static_cast<unsigned char>(c));
  return table;
}
constexpr EscapeTable kEscape = MakeEscapeTable();

std::size_t FirstToEscapeFrom(std::string_view value, std::size_t i) {
  for (; i < value.size(); ++i)
    if (kEscape.needed[static_cast<unsigned char>(value[i])]) break;
  return i;
}

// True when one of the eight bytes is below 0x20, a quote or a backslash.
// (x - n per byte) & ~x keeps a high bit set only when some byte of x is
// below n; it can mark the wrong byte, never a word without one.
bool WordNeedsEscape(const char *eight) {
  constexpr std::uint64_t kOnes = 0x0101010101010101;
  std::uint64_t word;
  std::memcpy(&word, eight, 8);
  const std::uint64_t quote = word ^ (kOnes * '"');
  const std::uint64_t backslash = word ^ (kOnes * '\\');
  return ((((word - kOnes * 0x20) & ~word) | ((quote - kOnes) & ~quote) |
           ((backslash - kOnes) & ~backslash)) &
          (kOnes * 0x80)) != 0;
}

// Index of the first byte of `value` that needs an escape, or its size.
// Eight bytes at a time, the last word overlapping the one before: a byte by
// byte search runs only for short values and for a word that holds a byte to
// escape, which ids and time stamps almost never do.
std::size_t FirstToEscape(std::string_view value) {
  const std::size_t size = value.size();
  if (size < 8) return FirstToEscapeFrom(value, 0);
  std::size_t i = 0;
  for (; i + 8 < size; i += 8)
    if (WordNeedsEscape(value.data() + i)) return FirstToEscapeFrom(value, i);
  return WordNeedsEscape(value.data() + size - 8) ? FirstToEscapeFrom(value, i) : size;
}

// The record's five members in order; each value stands between its prefix
// and the next prefix (or the closing text).
constexpr std::string_view kMemberPrefix[] = {"{\"user_id\":\"", "\",\"game_id\":\"", "\",\"type\":\"",
                                              "\",\"time\":\"", "\",\"extra\":\""};
constexpr std::string_view kRecordEnd = "\"}";
static_assert(kMemberPrefix[0].size() + kMemberPrefix[1].size() + kMemberPrefix[2].size() +
                  kMemberPrefix[3].size() + kMemberPrefix[4].size() + kRecordEnd.size() ==
              kRecordFixedBytes);

char *Put(char *p, std::string_view text) {
  if (!text.empty()) std::memcpy(p, text.data(), text.size()); // an empty view may hold null
  return p + text.size();
}

} // namespace

void AppendJsonEscaped(std::string &out, std::string_view value) {
  std::size_t run = 0; // start of the bytes not yet copied
  for (std::size_t i = FirstToEscape(value); i < value.size(); i = run + FirstToEscape(value.substr(run))) {
    const auto c = static_cast<std::uint8_t>(value[i]);
    out.append(value.data() + run, i - run);
    run = i + 1;
    // Only `"`, `\` and bytes below 0x20 come here, so never a "/".
    if (const std::size_t k = kEscapedBytes.find(static_cast<char>(c)); k != std::string_view::npos) {
      out.append(1, '\\').append(1, kEscapeLetters[k]);
    } else {
      out += "\\u00";
      AppendHex(out, &c, 1);
    }
  }
  out.append(value.data() + run, value.size() - run);
}

std::size_t JsonEscapedSize(std::string_view value) {
  std::size_t size = value.size();
  for (std::size_t i = FirstToEscape(value); i < value.size(); i += 1 + FirstToEscape(value.substr(i + 1))) {
    const bool letter = kEscapedBytes.find(value[i]) != std::string_view::npos;
    size += letter ? 1 : 5; // "\n" for one byte, or "\u00NN"
  }
  return size;
}

void AppendEventRecord(std::string &out, std::string_view game_id, std::string_view user_id,
                       std::string_view type, std::string_view time, std::string_view extra) {
  const std::string_view values[] = {user_id, game_id, type, time, extra};
  bool plain = true;
  for (const std::string_view value : values) plain = plain && FirstToEscape(value) == value.size();
  if (!plain) {
    for (std::size_t k = 0; const std::string_view value : values) {
      out += kMemberPrefix[k++];
      AppendJsonEscaped(out, value);
    }
    out += kRecordEnd;
    return;
  }
  // Nothing to escape, the usual case: the size is known, so the text is
  // copied in place after one resize, the fixed parts with constant sizes.
  const std::size_t start = out.size();
  out.resize(start + kRecordFixedBytes + user_id.size() + game_id.size() + type.size() + time.size() +
             extra.size());
  char *p = out.data() + start;
  p = Put(Put(p, kMemberPrefix[0]), user_id);
  p = Put(Put(p, kMemberPrefix[1]), game_id);
  p = Put(Put(p, kMemberPrefix[2]), type);
  p = Put(Put(p, kMemberPrefix[3]), time);
  p = Put(Put(p, kMemberPrefix[4]), extra);
  Put(p, kRecordEnd);
}

} // namespace orvane
