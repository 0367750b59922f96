// What the reader prints: each record as one JSON line, and the sums that
// --check prints instead.
#pragma once

#include "logformat/record_json.h"

#include <cstdint>
#include <optional>
#include <string>
#include <string_view>

namespace orvane::logcat {

// Members printed after a record's own five, each only when set.
struct AddedMembers {
  std::optional<std::string_view> file;        // "file": the name of the log read
  std::optional<std::string_view> key_game_id; // "key_game_id": the game id whose key read the line
};

// Appends `record` with `added` and a line break, every byte that is not
// part of valid UTF-8 written as \u00XX; `scratch` keeps its capacity from
// record to record. True when the record itself held such bytes.
bool AppendRecordLine(std::string &out, std::string &scratch, const EventRecord &record,
                      const AddedMembers &added);

// What --check sums up for one log.
struct LogCounts {
  std::uint64_t records = 0;   // records that passed the filters
  std::uint64_t bad_lines = 0; // lines reported on standard error
  std::uint64_t not_utf8 = 0;  // records that held bytes not part of valid UTF-8
};

// "NAME: N records, M bad lines, K records with bytes not UTF-8" and a line break.
std::string CheckSummary(std::string_view name, const LogCounts &counts);

} // namespace orvane::logcat
