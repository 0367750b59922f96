// Splitting the bytes of a log file into lines as they arrive, however the
// reads cut them. A line ends at LF; a CR in front of the LF (the Windows
// line break) is not part of the line.
#pragma once

#include <cstdint>
#include <string>
#include <string_view>

namespace orvane {

struct LineSplitter {
  std::string partial;           // bytes of the line not yet ended
  std::uint64_t next_number = 1; // number of the line that `partial` belongs to
};

// Calls `line(number, text)` for every line that `bytes` ends, in order.
template <class OnLine>
void FeedBytes(LineSplitter &lines, std::string_view bytes, OnLine &&line) {
  for (;;) {
    const std::size_t end = bytes.find('\n');
    if (end == std::string_view::npos) {
      lines.partial.append(bytes);
      return;
    }
    std::string_view text = bytes.substr(0, end);
    if (!lines.partial.empty()) {
      lines.partial.append(text);
      text = lines.partial;
    }
    if (!text.empty() && text.back() == '\r') text.remove_suffix(1);
    line(lines.next_number++, text);
    lines.partial.clear();
    bytes.remove_prefix(end + 1);
  }
}

// The line not yet ended, without a trailing CR. The library writes no line
// break after the last line, so at the end of a file this is a whole line.
inline std::string_view PartialLine(const LineSplitter &lines) {
  std::string_view text = lines.partial;
  if (!text.empty() && text.back() == '\r') text.remove_suffix(1);
  return text;
}

} // namespace orvane
