#include "analytics/record_text.h"

#include "analytics/timestamp.h"

namespace orvane {
namespace {

// Nonzero for the bytes that JSON forbids raw inside a string.
constexpr bool NeedsEscape(unsigned char c) { return c < 0x20 || c == '"' || c == '\\'; }

} // namespace

void AppendJsonEscaped(std::string &out, std::string_view value) {
  static constexpr char kHex[] = "0123456789abcdef";
  std::size_t run = 0; // start of the bytes not yet copied
  for (std::size_t i = 0; i < value.size(); ++i) {
    const unsigned char c = static_cast<unsigned char>(value[i]);
    if (!NeedsEscape(c)) continue;
    out.append(value.data() + run, i - run);
    run = i + 1;
    switch (c) {
    case '"': out += "\\\""; break;
    case '\\': out += "\\\\"; break;
    case '\b': out += "\\b"; break;
    case '\f': out += "\\f"; break;
    case '\n': out += "\\n"; break;
    case '\r': out += "\\r"; break;
    case '\t': out += "\\t"; break;
    default:
      out += "\\u00";
      out += kHex[c >> 4];
      out += kHex[c & 0x0f];
    }
  }
  out.append(value.data() + run, value.size() - run);
}

void AppendEventRecord(std::string &out, std::string_view game_id, std::string_view user_id,
                       std::string_view type, std::string_view time, std::string_view extra) {
  out += "{\"user_id\":\"";
  AppendJsonEscaped(out, user_id);
  out += "\",\"game_id\":\"";
  AppendJsonEscaped(out, game_id);
  out += "\",\"type\":\"";
  AppendJsonEscaped(out, type);
  out += "\",\"time\":\"";
  AppendJsonEscaped(out, time);
  out += "\",\"extra\":\"";
  AppendJsonEscaped(out, extra);
  out += "\"}";
}

std::string ComposeEventRecord(std::string_view game_id, std::string_view user_id,
                               std::string_view type, std::string_view extra) {
  std::string record;
  AppendEventRecord(record, game_id, user_id, type, FormatTimestamp(), extra);
  return record;
}

} // namespace orvane
