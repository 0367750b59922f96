// Reading a record text back: the JSON object of one event, with its five
// string members unescaped to the bytes the game passed in.
#pragma once

#include <optional>
#include <string>
#include <string_view>

namespace orvane {

struct EventRecord {
  std::string user_id;
  std::string game_id;
  std::string type;
  std::string time;
  std::string extra;
  bool operator==(const EventRecord &) const = default;
};

// The record held by `text`: one JSON object whose members are exactly
// "user_id", "game_id", "type", "time" and "extra", each once and each a
// string, in any order, with JSON white space allowed between tokens and
// nothing after the object. Values may hold raw bytes of 0x80 and above
// that are not UTF-8 (the library stores what the game passed); a \uXXXX
// escape becomes its UTF-8 bytes, and a surrogate that is not part of a pair
// makes the text no record. Nullopt for anything else.
std::optional<EventRecord> ParseEventRecord(std::string_view text);
// The same into `record`, whose strings keep their capacity: a reader of
// many lines allocates nothing per record. Its members are unspecified
// after false.
bool ParseEventRecord(std::string_view text, EventRecord &record);

// Appends the record as the library writes it: the five members in their
// stored order, no white space, the library's own escaping. For a record
// the library wrote this reproduces the decrypted text byte for byte.
void AppendRecordJson(std::string &out, const EventRecord &record);

} // namespace orvane
