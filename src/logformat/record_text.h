// The record text of one event: a JSON object with five string members,
// "user_id", "game_id", "type", "time" and "extra", in that order, with no
// white space and no line end.
#pragma once

#include <cstddef>
#include <string>
#include <string_view>

namespace orvane {

// Bytes of a record that are not values: member names, quotes, separators.
inline constexpr std::size_t kRecordFixedBytes = 58;

// The escapes JSON spells with a letter, both ways: a backslash and
// kEscapeLetters[k] stand for kEscapedBytes[k]. The library never writes "\/",
// which readers of JSON take for "/".
inline constexpr std::string_view kEscapedBytes = "\"\\\b\f\n\r\t/";
inline constexpr std::string_view kEscapeLetters = "\"\\bfnrt/";

// Appends `value` as the inside of a JSON string: `"` and `\` are escaped and
// bytes below 0x20 take their JSON escape; every other byte stands as it came.
void AppendJsonEscaped(std::string &out, std::string_view value);
// The size that AppendJsonEscaped gives `value`, counted without building it.
std::size_t JsonEscapedSize(std::string_view value);

// Appends the record text of one event stamped with `time`.
void AppendEventRecord(std::string &out, std::string_view game_id, std::string_view user_id,
                       std::string_view type, std::string_view time, std::string_view extra);

} // namespace orvane
