// Hostile log bytes through the reader's line parsing. However the reads cut them, the same lines come out;
// a line read as hex spells its ciphertext; a record read from any text is written back as a text that reads
// as the same record; whatever the bytes, the reader prints valid UTF-8 and keeps valid UTF-8 as it was.
// Input: a byte that says where the reads cut, then the bytes of a log.
#include "key_discovery.h"
#include "logformat/hex.h"
#include "logformat/log_lines.h"
#include "valid_utf8.h"

#include <iconv.h>

#include <cstdio>
#include <cstdlib>
#include <initializer_list>
#include <string>
#include <vector>

namespace {

using namespace orvane;
using namespace orvane::logcat;

void Fail(const char *what) {
  std::fprintf(stderr, "line property broken: %s\n", what);
  std::abort();
}

// Judged by the C library's decoder, not the reader's own rules.
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
  const LineFault fault = ReadLine(pool, keys, line, buffers, record);
  if ((fault == LineFault::kNotHex) == IsLowerHex(line)) Fail("hex judged wrongly");
  std::string text;
  if (fault != LineFault::kNotHex && fault != LineFault::kNotBlocks) {
    AppendHex(text, buffers.ciphertext.data(), buffers.ciphertext.size());
    if (text != line) Fail("ciphertext does not spell the line");
  }
  if (ParseEventRecord(line, record)) {
    text.clear();
    AppendRecordJson(text, record);
    if (ParseEventRecord(text) != record) Fail("a record does not read back from its own text");
  }
  text.clear();
  AppendValidUtf8(text, line);
  if (!IsUtf8(text) || (IsUtf8(line) && text != line)) Fail("printed text not UTF-8, or UTF-8 not kept");
}

// The lines of `pieces` read one after another, the unended last one included.
std::vector<std::string> Lines(std::initializer_list<std::string_view> pieces) {
  LineSplitter splitter;
  std::vector<std::string> lines;
  for (const std::string_view piece : pieces)
    FeedBytes(splitter, piece, [&](std::uint64_t, std::string_view line) { lines.emplace_back(line); });
  lines.emplace_back(PartialLine(splitter));
  return lines;
}

} // namespace

extern "C" int LLVMFuzzerTestOneInput(const std::uint8_t *data, std::size_t size) {
  if (size == 0) return 0;
  const std::string_view bytes(reinterpret_cast<const char *>(data) + 1, size - 1);
  const std::size_t cut = data[0] % (bytes.size() + 1);
  const std::vector<std::string> lines = Lines({bytes});
  if (Lines({bytes.substr(0, cut), bytes.substr(cut)}) != lines)
    Fail("lines depend on how the reads cut them");
  for (const std::string &line : lines) CheckLine(line);
  return 0;
}
