// Hostile bytes of a log through the reader's line parsing: its lines, their hex, the record text and the
// escaping of what it prints. Beside the sanitizers' faults, an abort marks a broken promise: whatever the
// bytes, the reader prints valid UTF-8, and keeps valid UTF-8 as it was.
#include "log_line.h"
#include "logformat/log_lines.h"
#include "valid_utf8.h"

#include <iconv.h>

#include <cstdlib>

namespace {

using namespace orvane;
using namespace orvane::logcat;

// Judged by the C library's decoder, not by the reader's own rules.
bool IsUtf8(std::string_view text) {
  static const iconv_t decoder = iconv_open("UTF-32LE", "UTF-8");
  char *in = const_cast<char *>(text.data());
  std::size_t in_left = text.size();
  std::string out(4 * text.size(), '\0');
  char *next = out.data();
  std::size_t out_left = out.size();
  return iconv(decoder, &in, &in_left, &next, &out_left) != static_cast<std::size_t>(-1);
}

void CheckLine(std::string_view line) {
  LineBuffers buffers;
  TakeCiphertext(line, buffers);
  EventRecord record;
  ParseEventRecord(line, record);
  std::string text;
  AppendValidUtf8(text, line);
  if (!IsUtf8(text) || (IsUtf8(line) && text != line)) std::abort(); // printed text not UTF-8, or changed
}

} // namespace

extern "C" int LLVMFuzzerTestOneInput(const std::uint8_t *data, std::size_t size) {
  LineSplitter lines;
  FeedBytes(lines, std::string_view(reinterpret_cast<const char *>(data), size),
            [](std::uint64_t, std::string_view line) { CheckLine(line); });
  CheckLine(PartialLine(lines));
  return 0;
}
