// The record text of an event, byte for byte.
#include "logformat/record_text.h"
#include "platform/platform.h"

#include <gtest/gtest.h>

#include <string>

namespace orvane {
namespace {

std::string Record(std::string_view game, std::string_view user, std::string_view type,
                   std::string_view extra, std::string_view time = "2024-05-17T08:30:00") {
  std::string out;
  AppendEventRecord(out, game, user, type, time, extra);
  return out;
}

TEST(RecordText, ExactBytes) {
  struct Case {
    const char *name;
    std::string record;
    std::string expected;
  };
  const Case cases[] = {
      {"special with extra", Record("1234", "user-42", "SPECIAL", "level=3"),
       R"({"user_id":"user-42","game_id":"1234","type":"SPECIAL","time":"2024-05-17T08:30:00","extra":"level=3"})"},
      {"enter with empty extra", Record("1234", "user-42", "ENTER", ""),
       R"({"user_id":"user-42","game_id":"1234","type":"ENTER","time":"2024-05-17T08:30:00","extra":""})"},
      {"user id first whatever the argument order", Record("user-42", "1234", "ENTER", ""),
       R"({"user_id":"1234","game_id":"user-42","type":"ENTER","time":"2024-05-17T08:30:00","extra":""})"},
      {"all values empty", Record("", "", "EXIT", ""),
       R"({"user_id":"","game_id":"","type":"EXIT","time":"2024-05-17T08:30:00","extra":""})"},
      {"UTF-8 and high bytes stand as they came", Record("j\xc3\xa9u", "\xff\x80", "SPECIAL", "\x7f~"),
       "{\"user_id\":\"\xff\x80\",\"game_id\":\"j\xc3\xa9u\",\"type\":\"SPECIAL\",\"time\":"
       "\"2024-05-17T08:30:00\",\"extra\":\"\x7f~\"}"},
  };
  for (const Case &c : cases) EXPECT_EQ(c.record, c.expected) << c.name;
  EXPECT_EQ(cases[0].record.size(), 102u);
  EXPECT_EQ(cases[1].record.size(), 93u);
  EXPECT_EQ(cases[3].record.size(), 81u); // 58 fixed bytes + type + time stamp
}

// Values are escaped where JSON forbids the raw byte inside a string, so the
// reader of the logs never loses an event to a malformed record.
TEST(RecordText, EscapesWhatJsonForbids) {
  struct Case {
    std::string value;
    std::string escaped;
  };
  const Case cases[] = {
      {"a\"b", "a\\\"b"},
      {"back\\slash", "back\\\\slash"},
      {"line\nfeed", "line\\nfeed"},
      {"\r\t\b\f", "\\r\\t\\b\\f"},
      {std::string("\x01\x1f", 2), "\\u0001\\u001f"},
      {"\x1b[0m", "\\u001b[0m"},
      {"\x20/\x7f", "\x20/\x7f"}, // space, slash and DEL stand as they are
      {"\"\"", "\\\"\\\""},
      {"", ""},
  };
  for (const Case &c : cases) {
    std::string out;
    AppendJsonEscaped(out, c.value);
    EXPECT_EQ(out, c.escaped) << c.value;
    // In every member the same rule holds.
    EXPECT_EQ(Record(c.value, "u", "SPECIAL", c.value, "T"),
              "{\"user_id\":\"u\",\"game_id\":\"" + c.escaped + "\",\"type\":\"SPECIAL\",\"time\":\"T\","
              "\"extra\":\"" + c.escaped + "\"}");
  }
}

std::int64_t FixedNow() { return 1700000000; }

TEST(RecordText, ComposeStampsTheCurrentTime) {
  platform::calls().now_seconds = FixedNow;
  EXPECT_EQ(ComposeEventRecord("g1", "u1", "INIT", ""),
            R"({"user_id":"u1","game_id":"g1","type":"INIT","time":"2023-11-14T22:13:20","extra":""})");
  platform::calls() = platform::native_calls();
}

} // namespace
} // namespace orvane
