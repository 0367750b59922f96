#include "logformat/timestamp.h"

#include <algorithm>

namespace orvane {
namespace {

struct CalendarTime {
  std::int64_t year, month, day, hour, minute, second; // month 1 to 12
};

// a / b rounded down, for a positive `b`: instants before 1970 fall on the
// day before, not the day after.
std::int64_t FloorDiv(std::int64_t a, std::int64_t b) { return a / b - (a % b < 0); }

// Proleptic Gregorian calendar from a day count, valid for every int64 input
// that matters; unlike gmtime it cannot fail, so the text is always a date.
CalendarTime UtcCalendar(std::int64_t seconds) {
  const std::int64_t days = FloorDiv(seconds, 86400);
  const std::int64_t in_day = seconds - days * 86400;
  const std::int64_t z = days + 719468; // days since 0000-03-01
  const std::int64_t era = FloorDiv(z, 146097);
  const std::int64_t doe = z - era * 146097;
  const std::int64_t yoe = (doe - doe / 1460 + doe / 36524 - doe / 146096) / 365;
  const std::int64_t doy = doe - (365 * yoe + yoe / 4 - yoe / 100);
  const std::int64_t mp = (5 * doy + 2) / 153;
  CalendarTime t;
  t.day = doy - (153 * mp + 2) / 5 + 1;
  t.month = mp < 10 ? mp + 3 : mp - 9;
  t.year = yoe + era * 400 + (t.month <= 2);
  t.hour = in_day / 3600;
  t.minute = in_day % 3600 / 60;
  t.second = in_day % 60;
  return t;
}

// `value` in decimal, zeros in front up to `width` digits.
std::string PadNumber(std::int64_t value, int width) {
  std::string digits = std::to_string(value);
  if (static_cast<int>(digits.size()) < width) digits.insert(0, width - digits.size(), '0');
  return digits;
}

// Writes the time stamp of `seconds` into `text`, reusing its buffer (the
// year's few digits fit in a string's own storage: nothing is allocated).
void FormatTimestampInto(std::string &text, std::int64_t seconds) {
  // Keeps the year within what the calendar arithmetic handles without
  // overflow; real clocks are nowhere near either end.
  constexpr std::int64_t kLimit = INT64_C(1) << 50;
  const CalendarTime t = UtcCalendar(std::clamp(seconds, -kLimit, kLimit));
  char rest[] = "-00-00T00:00:00";
  const auto put = [&rest](int at, std::int64_t value) {
    rest[at] = static_cast<char>('0' + value / 10);
    rest[at + 1] = static_cast<char>('0' + value % 10);
  };
  put(1, t.month);
  put(4, t.day);
  put(7, t.hour);
  put(10, t.minute);
  put(13, t.second);
  // A year keeps every digit, four at least: year 10000 is not cut to 0000.
  text.assign(PadNumber(t.year, 4)).append(rest, sizeof rest - 1);
}

} // namespace

std::string FormatTimestampAt(std::int64_t seconds) {
  std::string text;
  FormatTimestampInto(text, seconds);
  return text;
}

std::string_view TimestampCache::At(std::int64_t now) {
  if (now != seconds) {
    FormatTimestampInto(text, now);
    seconds = now;
  }
  return text;
}

} // namespace orvane
