// The log format, byte for byte: time stamp, record text, key text, hex.
#include "logformat/hex.h"
#include "logformat/key_text.h"
#include "logformat/log_lines.h"
#include "logformat/record_text.h"
#include "logformat/timestamp.h"
#include "support/test_support.h"

namespace orvane::testing {
namespace {

TEST(LogFormat, TimeStampOfFixedInstants) {
  // clang-format off
  const std::pair<std::int64_t, const char *> cases[] = {
      {0, "1970-01-01T00:00:00"}, {-1, "1969-12-31T23:59:59"}, {-86400, "1969-12-31T00:00:00"},
      {1709622489, "2024-03-05T07:08:09"}, {1704067200, "2024-01-01T00:00:00"},
      {951782400, "2000-02-29T00:00:00"}, {4107542400, "2100-03-01T00:00:00"},
      {1704067140, "2023-12-31T23:59:00"}, // minute 59: seconds of the hour / 60, not 61
      {951868800, "2000-03-01T00:00:00"}, {1709622000, "2024-03-05T07:00:00"}, // a 400-year era; an hour
      {253402300800, "10000-01-01T00:00:00"}}; // a fifth digit is kept, not cut
  // clang-format on
  TimestampCache cache;
  for (const auto &[seconds, text] : cases) {
    EXPECT_EQ(FormatTimestampAt(seconds), text) << seconds;
    EXPECT_EQ(cache.At(seconds), text) << "the cache follows the clock";
  }
}

// Values stand as they came, except what JSON forbids raw inside a string;
// the escape scan goes by words, so escapes sit at every place in one.
TEST(LogFormat, RecordTextWithEscapes) {
  // clang-format off
  const std::pair<std::string, std::string> cases[] = {
      {"level=3", "level=3"}, {"", ""}, {"a\"b\\c\nd\re\tf\bg\fh", "a\\\"b\\\\c\\nd\\re\\tf\\bg\\fh"},
      {std::string("\x01\x1f\x20/\x7f\xc3\xa9\xff", 8), "\\u0001\\u001f /\x7f\xc3\xa9\xff"},
      {"0123456\"", "0123456\\\""}, {"0123456\\", "0123456\\\\"}, {"ABCDEFG\x01", "ABCDEFG\\u0001"},
      {"01234567\"9", "01234567\\\"9"},
      {"01234567\"9ABCDEFGHIJ", "01234567\\\"9ABCDEFGHIJ"}, // in a middle word
      {"0123456789ABCDE\x1b", "0123456789ABCDE\\u001b"}}; // a word of digits and capitals
  // clang-format on
  for (const auto &[value, escaped] : cases) {
    std::string out = "kept:";
    AppendEventRecord(out, "1234", value, "SPECIAL", "2024-05-17T08:30:00", value);
    EXPECT_EQ(out, R"(kept:{"user_id":")" + escaped +
                       R"(","game_id":"1234","type":"SPECIAL","time":"2024-05-17T08:30:00","extra":")" +
                       escaped + "\"}");
    EXPECT_EQ(JsonEscapedSize(value), escaped.size()) << escaped;
  }
}

TEST(LogFormat, KeyTextTakesAtMost65BytesOfTheGameId) {
  for (std::size_t length : {0, 16, 17, 49, 50, 65, 80}) {
    std::string id;
    for (std::size_t i = 0; i < length; ++i) id += static_cast<char>('A' + i % 26);
    const KeyText text = MakeKeyText(id);
    EXPECT_EQ(std::string(text.begin(), text.end()), KeyTextFor(id)) << length;
  }
}

TEST(LogFormat, HexBothWays) {
  std::uint8_t bytes[20] = {0xf0, 0x0a, 0x80, 0xff}; // a 16-byte block, then bytewise
  for (int i = 4; i < 20; ++i) bytes[i] = static_cast<std::uint8_t>((i - 4) * 15);
  std::string hex = "kept:";
  AppendHex(hex, bytes, sizeof bytes);
  EXPECT_EQ(hex, "kept:f00a80ff000f1e2d3c4b5a69788796a5b4c3d2e1");
  EXPECT_EQ(hex.c_str()[hex.size()], '\0') << "nothing written past the end";
  std::vector<std::uint8_t> decoded;
  ASSERT_TRUE(DecodeHex(hex.substr(5), decoded));
  EXPECT_EQ(decoded, std::vector<std::uint8_t>(bytes, bytes + sizeof bytes));
  for (const std::string &bad : std::vector<std::string>{"0", "0g", "0A", "ab-1", std::string("0\0", 2)}) {
    EXPECT_FALSE(DecodeHex(bad, decoded)) << bad;
    EXPECT_EQ(IsLowerHex(bad), bad == "0") << bad;
  }
}

// Lines come whole however the reads cut them, without the CR of a Windows
// line break.
TEST(LogFormat, LinesCutAnywhere) {
  LineSplitter lines;
  std::vector<std::string> whole;
  for (const std::string_view read : {"a", "b\r", "\nc", "e\n\n", "d\r"})
    FeedBytes(lines, read, [&](std::uint64_t n, std::string_view text) {
      whole.push_back(std::to_string(n).append(text));
    });
  EXPECT_EQ(whole, (std::vector<std::string>{"1ab", "2ce", "3"}));
  EXPECT_EQ(PartialLine(lines), "d");
}

} // namespace
} // namespace orvane::testing
