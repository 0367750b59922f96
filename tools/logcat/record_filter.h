// Which records the reader passes on: a time window and a set of types.
#pragma once

#include "logformat/record_json.h"

#include <string>
#include <string_view>
#include <vector>

namespace orvane::logcat {

struct RecordFilter {
  std::string since;              // empty: no lower bound
  std::string until;              // empty: no upper bound
  std::vector<std::string> types; // empty: every type
};

// True for a bound in the record time's own form, YYYY-MM-DDTHH:MM:SS
// (UTC), or for a date alone, YYYY-MM-DD, that names a real day and time.
bool IsTimeBound(std::string_view text);

// False when no record time can pass both bounds: `since` after `until`.
bool WindowIsOpen(const RecordFilter &filter);

// True for the four event types the library records.
bool IsEventType(std::string_view text);

// Times compare as text, which orders the fixed-width record times in time.
// A date alone as `until` takes in that whole day.
bool Passes(const RecordFilter &filter, const EventRecord &record);

} // namespace orvane::logcat
