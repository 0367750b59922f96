// Hostile bytes of a log through the reader's line parsing: its lines, their hex, the record text and the
// escaping of what it prints. Beside the sanitizers' faults, an abort marks a broken promise: whatever the
// bytes, the reader prints valid UTF-8, and keeps valid UTF-8 as it was.
#include "line_reader.h"
#include "log_line.h"
#include "valid_utf8.h"

#include <iconv.h>

#include <algorithm>
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

// The first byte cuts the rest into reads; the limit is small, so that long
// lines and their skipping come up. No line handed on is over the limit, and
// lines and long lines are numbered one after another.
extern "C" int LLVMFuzzerTestOneInput(const std::uint8_t *data, std::size_t size) {
  if (size == 0) return 0;
  const std::size_t cut = data[0] % 64 + 1;
  std::string_view bytes(reinterpret_cast<const char *>(data + 1), size - 1);
  LineReader reader{{}, 40};
  std::uint64_t next = 1;
  const auto line = [&](std::uint64_t number, std::string_view text) {
    if (number != next++ || text.size() > reader.limit) std::abort();
    CheckLine(text);
  };
  const auto too_long = [&](std::uint64_t number) {
    if (number != next++) std::abort();
  };
  for (; !bytes.empty(); bytes.remove_prefix(std::min(cut, bytes.size())))
    FeedLines(reader, bytes.substr(0, cut), line, too_long);
  if (reader.lines.partial.size() > reader.limit) std::abort();
  CheckLine(PartialLine(reader.lines));
  return 0;
}
