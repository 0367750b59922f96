// Record texts read back, written out again, and made valid UTF-8.
#include "record_json.h"
#include "valid_utf8.h"

#include "analytics/record_text.h"

#include <gtest/gtest.h>

#include <string>

namespace orvane::logcat {
namespace {

TEST(RecordJson, ParsesRecords) {
  const std::pair<std::string, EventRecord> cases[] = {
      {R"({"user_id":"user-42","game_id":"1234","type":"SPECIAL","time":"2024-05-17T08:30:00","extra":"level=3"})",
       {"user-42", "1234", "SPECIAL", "2024-05-17T08:30:00", "level=3"}},
      {R"({"user_id":"a\"b","game_id":"c\\d","type":"T","time":"t","extra":"\b\f\n\r\t\u0001\u0000"})",
       {"a\"b", "c\\d", "T", "t", std::string("\b\f\n\r\t\x01\0", 7)}},
      {"{\"user_id\":\"\xff\x80\",\"game_id\":\"j\xc3\xa9u\",\"type\":\"T\",\"time\":\"t\",\"extra\":\"\x7f\"}",
       {"\xff\x80", "j\xc3\xa9u", "T", "t", "\x7f"}},
      {R"({"user_id":"\/","game_id":"\u00e9\u20ac","type":"\ud83d\ude00","time":"\u0041","extra":""})",
       {"/", "\xc3\xa9\xe2\x82\xac", "\xf0\x9f\x98\x80", "A", ""}},
      {" {\n \"extra\" : \"x\" ,\t\"time\":\"t\",\"type\":\"T\",\r\"game_id\":\"g\",\"user_id\":\"u\" } ",
       {"u", "g", "T", "t", "x"}},
  };
  for (const auto &[text, expected] : cases) EXPECT_EQ(ParseEventRecord(text), expected) << text;
}

TEST(RecordJson, RefusesWhatIsNoRecord) {
  const std::string head = R"({"user_id":"u","game_id":"g","type":"T","time":"t")";
  const std::string cases[] = {
      "", "{}", "[]", head + "}", head + R"(,"extra":"x")", head + R"(,"extra":"x"}})",
      head + R"(,"extra":"x"}{})", head + R"(,"extra":"x","more":"y"})", head + R"(,"user_id":"x"})",
      head + R"(,"extra":1})", head + R"(,"extra":null})", head + R"(,"Extra":"x"})",
      head + R"(,"extra":"x",})", head + R"("extra":"x"})", head + R"(,"extra":"a"b"})",
      head + ",\"extra\":\"a\nb\"}", head + R"(,"extra":"\x"})", head + R"(,"extra":"\u00g0"})",
      head + R"(,"extra":"\u00"})", head + R"(,"extra":"\ud83d"})", head + R"(,"extra":"\ude00"})",
      head + R"(,"extra":"\ud83dx"})", head + R"(,"extra":"x\)",
  };
  for (const std::string &text : cases) EXPECT_FALSE(ParseEventRecord(text).has_value()) << text;
}

// Any bytes survive the library's composition and this parser, and the
// record is written back exactly as the library composed it.
TEST(RecordJson, RoundTripsEveryByte) {
  std::string all;
  for (int c = 1; c < 256; ++c) all += static_cast<char>(c);
  const EventRecord cases[] = {{all, "g", "SPECIAL", "2024-05-17T08:30:00", all},
                               {"\"\\", "\\\"", "ENTER", "t", std::string(1, '\0')},
                               {"", "", "EXIT", "", ""}};
  for (const EventRecord &r : cases) {
    std::string composed, written;
    AppendEventRecord(composed, r.game_id, r.user_id, r.type, r.time, r.extra);
    const auto parsed = ParseEventRecord(composed);
    ASSERT_EQ(parsed, r) << composed;
    AppendRecordJson(written, *parsed);
    EXPECT_EQ(written, composed);
  }
}

TEST(ValidUtf8, EscapesExactlyTheBytesNotPartOfUtf8) {
  struct Case {
    std::string in, out;
    std::size_t escaped;
  };
  const Case cases[] = {
      {"plain \"ascii\\\" text of more than eight bytes", "plain \"ascii\\\" text of more than eight bytes", 0},
      {"\xc2\x80 \xc3\xa9 \xe2\x82\xac \xf0\x9f\x98\x80", "\xc2\x80 \xc3\xa9 \xe2\x82\xac \xf0\x9f\x98\x80", 0},
      {"\xed\x9f\xbf \xee\x80\x80 \xf0\x90\x80\x80 \xf4\x8f\xbf\xbf", "\xed\x9f\xbf \xee\x80\x80 \xf0\x90\x80\x80 \xf4\x8f\xbf\xbf", 0},
      {"\x80\xbf", R"(\u0080\u00bf)", 2},                          // continuation bytes alone
      {"\xc0\xaf\xc1\xbf", R"(\u00c0\u00af\u00c1\u00bf)", 4},      // overlong two-byte forms
      {"\xe0\x9f\xbf", R"(\u00e0\u009f\u00bf)", 3},                // overlong three-byte form
      {"\xf0\x8f\xbf\xbf", R"(\u00f0\u008f\u00bf\u00bf)", 4},      // overlong four-byte form
      {"\xed\xa0\x80", R"(\u00ed\u00a0\u0080)", 3},                // a surrogate
      {"\xf4\x90\x80\x80", R"(\u00f4\u0090\u0080\u0080)", 4},      // above U+10FFFF
      {"\xf5\xfe\xff", R"(\u00f5\u00fe\u00ff)", 3},                // never in UTF-8
      {"a\xe2\x82x\xc3", R"(a\u00e2\u0082x\u00c3)", 3},            // cut short, also at the end
      {"eight ok\xe9\xc3\xa9\xe9", "eight ok\\u00e9\xc3\xa9\\u00e9", 2},
  };
  for (const Case &c : cases) {
    std::string out = "kept";
    EXPECT_EQ(AppendValidUtf8(out, c.in), c.escaped) << c.in;
    EXPECT_EQ(out, "kept" + c.out);
  }
}

} // namespace
} // namespace orvane::logcat
