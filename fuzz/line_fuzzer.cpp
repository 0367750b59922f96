// Hostile bytes of a log through the reader's line parsing: its lines, their hex, decryption and record
// text, and the escaping of what it prints. Beside the sanitizers' faults: a record read from any text
// reads back from the text written for it, and whatever the bytes, the reader prints valid UTF-8 and
// keeps valid UTF-8 as it was.
#include "key_discovery.h"
#include "logformat/log_lines.h"
#include "valid_utf8.h"

#include <iconv.h>

#include <cstdio>
#include <cstdlib>

namespace {

using namespace orvane;
using namespace orvane::logcat;

void Check(bool holds, const char *property) {
  if (holds) return;
  std::fprintf(stderr, "line property broken: %s\n", property);
  std::abort();
}

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
  static KeyPool pool; // sessions outlive an input, as they outlive a line
  LineBuffers buffers;
  EventRecord record;
  KeyCandidates keys{{"g", ""}};
  ReadLine(pool, keys, line, buffers, record);
  std::string text;
  if (ParseEventRecord(line, record)) {
    AppendRecordJson(text, record);
    Check(ParseEventRecord(text) == record, "a record reads back from its own text");
    text.clear();
  }
  AppendValidUtf8(text, line);
  Check(IsUtf8(text) && (text == line || !IsUtf8(line)), "printed text is UTF-8 and keeps UTF-8");
}

} // namespace

extern "C" int LLVMFuzzerTestOneInput(const std::uint8_t *data, std::size_t size) {
  LineSplitter lines;
  FeedBytes(lines, std::string_view(reinterpret_cast<const char *>(data), size),
            [](std::uint64_t, std::string_view line) { CheckLine(line); });
  CheckLine(PartialLine(lines));
  return 0;
}
