// The time stamp of a record: UTC, to the second, as YYYY-MM-DDTHH:MM:SS.
#pragma once

#include <cstdint>
#include <string>
#include <string_view>

namespace orvane {

// The time stamp text of the instant `seconds` after 1970-01-01T00:00:00 UTC.
std::string FormatTimestampAt(std::int64_t seconds);

// The time stamp of `seconds` without formatting more than once a second:
// events come many times a second and the text changes once.
struct TimestampCache {
  std::int64_t seconds = INT64_MIN;
  std::string text;
  std::string_view At(std::int64_t now);
};

} // namespace orvane
