#include "record_filter.h"

#include <algorithm>

namespace orvane::logcat {

bool IsTimeBound(std::string_view text) {
  constexpr std::string_view kForm = "dddd-dd-ddTdd:dd:dd";
  if (text.size() != kForm.size() && text.size() != 10) return false;
  for (std::size_t i = 0; i < text.size(); ++i) {
    const bool digit = text[i] >= '0' && text[i] <= '9';
    if (kForm[i] == 'd' ? !digit : text[i] != kForm[i]) return false;
  }
  return true;
}

bool IsEventType(std::string_view text) {
  return text == "INIT" || text == "ENTER" || text == "EXIT" || text == "SPECIAL";
}

bool Passes(const RecordFilter &filter, const EventRecord &record) {
  const std::string_view time = record.time;
  if (!filter.since.empty() && time < filter.since) return false;
  if (!filter.until.empty() && time.substr(0, filter.until.size()) > filter.until) return false;
  return filter.types.empty() ||
         std::find(filter.types.begin(), filter.types.end(), record.type) != filter.types.end();
}

} // namespace orvane::logcat
