#include "record_filter.h"

#include "logformat/event_types.h"

#include <algorithm>
#include <iterator>

namespace orvane::logcat {
namespace {

// The number that the `digits` digits at `at` spell (the caller checked they are digits).
int Number(std::string_view text, std::size_t at, std::size_t digits) {
  int value = 0;
  for (const char c : text.substr(at, digits)) value = value * 10 + (c - '0');
  return value;
}

int DaysInMonth(int year, int month) {
  if (month == 2) return (year % 4 == 0 && year % 100 != 0) || year % 400 == 0 ? 29 : 28;
  return month == 4 || month == 6 || month == 9 || month == 11 ? 30 : 31;
}

} // namespace

bool IsTimeBound(std::string_view text) {
  constexpr std::string_view kForm = "dddd-dd-ddTdd:dd:dd";
  constexpr std::size_t kDate = 10;
  if (text.size() != kForm.size() && text.size() != kDate) return false;
  for (std::size_t i = 0; i < text.size(); ++i) {
    const bool digit = text[i] >= '0' && text[i] <= '9';
    if (kForm[i] == 'd' ? !digit : text[i] != kForm[i]) return false;
  }
  const int month = Number(text, 5, 2);
  const int day = Number(text, 8, 2);
  if (month < 1 || month > 12 || day < 1 || day > DaysInMonth(Number(text, 0, 4), month)) return false;
  return text.size() == kDate ||
         (Number(text, 11, 2) < 24 && Number(text, 14, 2) < 60 && Number(text, 17, 2) < 60);
}

bool WindowIsOpen(const RecordFilter &filter) {
  // As in Passes: a date alone as `until` takes in that whole day. An empty
  // bound compares as the earliest or, cut to nothing, as equal.
  return std::string_view(filter.since).substr(0, filter.until.size()) <= filter.until;
}

bool IsEventType(std::string_view text) {
  return std::find(std::begin(kEventTypeNames), std::end(kEventTypeNames), text) != std::end(kEventTypeNames);
}

bool Passes(const RecordFilter &filter, const EventRecord &record) {
  const std::string_view time = record.time;
  if (!filter.since.empty() && time < filter.since) return false;
  if (!filter.until.empty() && time.substr(0, filter.until.size()) > filter.until) return false;
  return filter.types.empty() ||
         std::find(filter.types.begin(), filter.types.end(), record.type) != filter.types.end();
}

} // namespace orvane::logcat
