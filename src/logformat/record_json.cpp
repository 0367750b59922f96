#include "logformat/record_json.h"

#include "logformat/record_text.h"

#include <array>
#include <cstdint>

namespace orvane {
namespace {

struct Cursor {
  std::string_view text;
  std::size_t at = 0;

  bool AtEnd() const { return at >= text.size(); }
  char Peek() const { return text[at]; }
  void SkipSpace() {
    while (!AtEnd() && (Peek() == ' ' || Peek() == '\t' || Peek() == '\n' || Peek() == '\r')) ++at;
  }
  bool Take(char c) {
    if (AtEnd() || Peek() != c) return false;
    ++at;
    return true;
  }
};

int HexValue(char c) {
  if (c >= '0' && c <= '9') return c - '0';
  if (c >= 'a' && c <= 'f') return c - 'a' + 10;
  if (c >= 'A' && c <= 'F') return c - 'A' + 10;
  return -1;
}

std::optional<std::uint32_t> ReadHex4(Cursor &in) {
  if (in.text.size() - in.at < 4) return std::nullopt;
  std::uint32_t value = 0;
  for (int i = 0; i < 4; ++i) {
    const int digit = HexValue(in.text[in.at + i]);
    if (digit < 0) return std::nullopt;
    value = value * 16 + static_cast<std::uint32_t>(digit);
  }
  in.at += 4;
  return value;
}

void AppendUtf8(std::string &out, std::uint32_t code) {
  if (code < 0x80) {
    out += static_cast<char>(code);
  } else if (code < 0x800) {
    out += static_cast<char>(0xc0 | (code >> 6));
    out += static_cast<char>(0x80 | (code & 0x3f));
  } else if (code < 0x10000) {
    out += static_cast<char>(0xe0 | (code >> 12));
    out += static_cast<char>(0x80 | ((code >> 6) & 0x3f));
    out += static_cast<char>(0x80 | (code & 0x3f));
  } else {
    out += static_cast<char>(0xf0 | (code >> 18));
    out += static_cast<char>(0x80 | ((code >> 12) & 0x3f));
    out += static_cast<char>(0x80 | ((code >> 6) & 0x3f));
    out += static_cast<char>(0x80 | (code & 0x3f));
  }
}

// The code point of a \u escape whose "\u" has been taken, joining a
// surrogate pair into one.
std::optional<std::uint32_t> ReadUnicodeEscape(Cursor &in) {
  const auto first = ReadHex4(in);
  if (!first) return std::nullopt;
  if (*first >= 0xdc00 && *first <= 0xdfff) return std::nullopt;
  if (*first < 0xd800 || *first > 0xdbff) return first;
  if (!in.Take('\\') || !in.Take('u')) return std::nullopt;
  const auto second = ReadHex4(in);
  if (!second || *second < 0xdc00 || *second > 0xdfff) return std::nullopt;
  return 0x10000 + ((*first - 0xd800) << 10) + (*second - 0xdc00);
}

// True for a byte that a JSON string may hold as it is.
bool StandsForItself(char c) { return c != '"' && c != '\\' && static_cast<unsigned char>(c) >= 0x20; }

// A JSON string, unescaped into `value`. Raw bytes of 0x80 and above pass
// as they are, valid UTF-8 or not: that is how the library stores a game's
// bytes. Runs without an escape are copied in one piece.
bool ReadString(Cursor &in, std::string &value) {
  value.clear();
  if (!in.Take('"')) return false;
  for (;;) {
    const std::size_t run = in.at;
    while (!in.AtEnd() && StandsForItself(in.Peek())) ++in.at;
    value.append(in.text, run, in.at - run);
    if (in.AtEnd()) return false;
    const char c = in.text[in.at++];
    if (c == '"') return true;
    if (c != '\\' || in.AtEnd()) return false; // a control byte, or an escape cut off
    const char letter = in.text[in.at++];
    if (const std::size_t k = kEscapeLetters.find(letter); k != std::string_view::npos) {
      value += kEscapedBytes[k];
    } else {
      const auto code = letter == 'u' ? ReadUnicodeEscape(in) : std::nullopt;
      if (!code) return false;
      AppendUtf8(value, *code);
    }
  }
}

std::string *MemberFor(EventRecord &record, std::string_view name) {
  if (name == "user_id") return &record.user_id;
  if (name == "game_id") return &record.game_id;
  if (name == "type") return &record.type;
  if (name == "time") return &record.time;
  if (name == "extra") return &record.extra;
  return nullptr;
}

} // namespace

bool ParseEventRecord(std::string_view text, EventRecord &record) {
  Cursor in{text};
  std::array<const std::string *, 5> seen{};
  std::size_t count = 0;
  std::string name;
  in.SkipSpace();
  if (!in.Take('{')) return false;
  for (;;) {
    in.SkipSpace();
    if (!ReadString(in, name)) return false;
    std::string *member = MemberFor(record, name);
    if (member == nullptr) return false;
    for (std::size_t i = 0; i < count; ++i)
      if (seen[i] == member) return false;
    seen[count++] = member;
    in.SkipSpace();
    if (!in.Take(':')) return false;
    in.SkipSpace();
    if (!ReadString(in, *member)) return false;
    in.SkipSpace();
    if (in.Take('}')) break;
    if (count == seen.size() || !in.Take(',')) return false;
  }
  in.SkipSpace();
  return in.AtEnd() && count == seen.size();
}

std::optional<EventRecord> ParseEventRecord(std::string_view text) {
  EventRecord record;
  if (!ParseEventRecord(text, record)) return std::nullopt;
  return record;
}

void AppendRecordJson(std::string &out, const EventRecord &record) {
  AppendEventRecord(out, record.game_id, record.user_id, record.type, record.time, record.extra);
}

} // namespace orvane
