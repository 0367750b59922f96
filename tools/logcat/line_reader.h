// A log's bytes as lines with their length bounded: a line longer than any
// the library writes (a zero-filled tail after a crash, a file that is no
// log) is reported where it starts and skipped to its end, never held.
#pragma once

#include "logformat/log_lines.h"

#include <cstddef>
#include <cstdint>
#include <string>
#include <string_view>

namespace orvane::logcat {

// The library refuses a line over 64 MiB of hex; one byte more is the CR of
// a Windows line break.
inline constexpr std::size_t kLongestLine = (std::size_t{64} << 20) + 1;

struct LineReader {
  LineSplitter lines;
  std::size_t limit = kLongestLine; // bytes a line may hold before its LF
  bool skipping = false;            // inside a line that grew past the limit
};

// Calls `line(number, text)` for each line that `bytes` ends, and
// `too_long(number)` once for a line as soon as it grows past the limit; the
// rest of that line is dropped up to its end.
template <class OnLine, class OnTooLong>
void FeedLines(LineReader &reader, std::string_view bytes, OnLine &&line, OnTooLong &&too_long) {
  while (!bytes.empty()) {
    if (!reader.skipping && reader.lines.partial.size() + bytes.size() <= reader.limit) {
      FeedBytes(reader.lines, bytes, line); // no line here can grow past the limit
      return;
    }
    const std::size_t end = bytes.find('\n');
    const std::size_t size = end == std::string_view::npos ? bytes.size() : end;
    if (!reader.skipping && reader.lines.partial.size() + size > reader.limit) {
      too_long(reader.lines.next_number);
      reader.lines.partial = std::string(); // its memory given back
      reader.skipping = true;
    }
    if (end == std::string_view::npos) {
      if (!reader.skipping) reader.lines.partial.append(bytes);
      return;
    }
    if (reader.skipping) {
      reader.skipping = false;
      ++reader.lines.next_number;
    } else {
      FeedBytes(reader.lines, bytes.substr(0, end + 1), line);
    }
    bytes.remove_prefix(end + 1);
  }
}

} // namespace orvane::logcat
