// Reading record texts back: what counts as a record, and the exact values.
#include "record_json.h"

#include "analytics/record_text.h"

#include <gtest/gtest.h>

#include <string>

namespace orvane::logcat {
namespace {

TEST(RecordJson, ParsesRecords) {
  struct Case {
    const char *name;
    std::string text;
    EventRecord expected;
  };
  const Case cases[] = {
      {"as the library writes it",
       R"({"user_id":"user-42","game_id":"1234","type":"SPECIAL","time":"2024-05-17T08:30:00","extra":"level=3"})",
       {"user-42", "1234", "SPECIAL", "2024-05-17T08:30:00", "level=3"}},
      {"every escape the library writes",
       R"({"user_id":"a\"b","game_id":"c\\d","type":"T","time":"t","extra":"\b\f\n\r\t\u0001\u001f\u0000"})",
       {"a\"b", "c\\d", "T", "t", std::string("\b\f\n\r\t\x01\x1f\0", 8)}},
      {"raw bytes that are not UTF-8 stand as they are",
       "{\"user_id\":\"\xff\x80\",\"game_id\":\"j\xc3\xa9u\",\"type\":\"T\",\"time\":\"t\",\"extra\":\"\x7f\"}",
       {"\xff\x80", "j\xc3\xa9u", "T", "t", "\x7f"}},
      {"escapes other writers use",
       R"({"user_id":"\/","game_id":"\u00e9\u20ac","type":"\ud83d\ude00","time":"\u0041","extra":""})",
       {"/", "\xc3\xa9\xe2\x82\xac", "\xf0\x9f\x98\x80", "A", ""}},
      {"white space between tokens and another member order",
       " {\n \"extra\" : \"x\" ,\t\"time\":\"t\",\"type\":\"T\",\r\"game_id\":\"g\",\"user_id\":\"u\" } ",
       {"u", "g", "T", "t", "x"}},
      {"empty values", R"({"user_id":"","game_id":"","type":"","time":"","extra":""})", {}},
  };
  for (const Case &c : cases) {
    const auto record = ParseEventRecord(c.text);
    ASSERT_TRUE(record.has_value()) << c.name;
    EXPECT_EQ(*record, c.expected) << c.name;
  }
}

TEST(RecordJson, RefusesWhatIsNoRecord) {
  const std::string good = R"({"user_id":"u","game_id":"g","type":"T","time":"t","extra":"x"})";
  const std::string cases[] = {
      "",
      "{}",
      "[]",
      good.substr(0, good.size() - 1),                       // no closing brace
      good + "}",                                             // something after the object
      good + "\n{}",                                          // two objects
      R"({"user_id":"u","game_id":"g","type":"T","time":"t"})", // a member missing
      R"({"user_id":"u","game_id":"g","type":"T","time":"t","extra":"x","more":"y"})",
      R"({"user_id":"u","game_id":"g","type":"T","time":"t","user_id":"x"})", // twice
      R"({"user_id":"u","game_id":"g","type":"T","time":"t","extra":1})",     // not a string
      R"({"user_id":"u","game_id":"g","type":"T","time":"t","extra":null})",
      R"({"user_id":"u","game_id":"g","type":"T","time":"t","Extra":"x"})",   // case counts
      R"({"user_id":"u","game_id":"g","type":"T","time":"t","extra":"x",})",  // trailing comma
      R"({"user_id":"u","game_id":"g","type":"T","time":"t""extra":"x"})",    // comma missing
      R"({"user_id":"u","game_id":"g","type":"T","time":"t","extra":"a"b"})", // unescaped quote
      "{\"user_id\":\"u\",\"game_id\":\"g\",\"type\":\"T\",\"time\":\"t\",\"extra\":\"a\nb\"}",
      R"({"user_id":"u","game_id":"g","type":"T","time":"t","extra":"\x"})",  // unknown escape
      R"({"user_id":"u","game_id":"g","type":"T","time":"t","extra":"\u00g0"})",
      R"({"user_id":"u","game_id":"g","type":"T","time":"t","extra":"\u00"})",
      R"({"user_id":"u","game_id":"g","type":"T","time":"t","extra":"\ud83d"})", // lone surrogate
      R"({"user_id":"u","game_id":"g","type":"T","time":"t","extra":"\ude00"})",
      R"({"user_id":"u","game_id":"g","type":"T","time":"t","extra":"\ud83dx"})",
      R"({"user_id":"u","game_id":"g","type":"T","time":"t","extra":"x\)",
  };
  for (const std::string &text : cases) EXPECT_FALSE(ParseEventRecord(text).has_value()) << text;
}

// Every byte string survives the library's composition and this parser, and
// the record is written back exactly as the library composed it.
TEST(RecordJson, RoundTripsEveryByte) {
  std::string all;
  for (int c = 1; c < 256; ++c) all += static_cast<char>(c);
  const EventRecord cases[] = {
      {all, "g", "SPECIAL", "2024-05-17T08:30:00", all},
      {"\"\\", "\\\"", "ENTER", "t", std::string(1, '\0')},
      {"", "", "EXIT", "", ""},
  };
  for (const EventRecord &r : cases) {
    std::string composed;
    AppendEventRecord(composed, r.game_id, r.user_id, r.type, r.time, r.extra);
    const auto parsed = ParseEventRecord(composed);
    ASSERT_TRUE(parsed.has_value()) << composed;
    EXPECT_EQ(*parsed, r);
    std::string written;
    AppendRecordJson(written, *parsed);
    EXPECT_EQ(written, composed);
  }
}

} // namespace
} // namespace orvane::logcat
