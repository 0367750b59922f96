// The reading library: record texts parsed and made valid UTF-8; log lines
// read with candidate keys, split from a file's bytes, and filtered.
#include "key_discovery.h"
#include "logformat/log_lines.h"
#include "record_filter.h"
#include "valid_utf8.h"

#include "cipher/cipher.h"

#include <gtest/gtest.h>

namespace orvane::logcat {
namespace {

TEST(RecordJson, ParsesRecords) {
  const std::pair<std::string, EventRecord> cases[] = {
      {R"({"user_id":"a\"b","game_id":"c\\d","type":"T","time":"t","extra":"\b\f\n\r\t\u0001\u0000"})",
       {"a\"b", "c\\d", "T", "t", std::string("\b\f\n\r\t\x01\0", 7)}}, // every escape the library writes
      {"{\"user_id\":\"\xff\x80\",\"game_id\":\"j\xc3\xa9u\",\"type\":\"T\",\"time\":\"t\",\"extra\":\"\x7f\"}",
       {"\xff\x80", "j\xc3\xa9u", "T", "t", "\x7f"}}, // raw bytes, UTF-8 or not
      {" {\"extra\" :\"\\/\\u00e9\\u20AC\",\t\"time\":\"\\ud83d\\ude00\",\"type\":\"T\",\r\n\"game_id\":\"g\",\"user_id\":\"u\"} ",
       {"u", "g", "T", "\xf0\x9f\x98\x80", "/\xc3\xa9\xe2\x82\xac"}}, // other writers' forms
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

// Each escape stands for one byte: five characters more.
TEST(ValidUtf8, EscapesExactlyTheBytesNotPartOfUtf8) {
  const std::string valid = "plain \"ascii\\\" of more than eight bytes \xc2\x80 \xc3\xa9 \xe2\x82\xac "
                            "\xf0\x9f\x98\x80 \xed\x9f\xbf \xee\x80\x80 \xf0\x90\x80\x80 \xf4\x8f\xbf\xbf";
  const std::pair<std::string, std::string> cases[] = {
      {valid, valid},
      {"\x80\xbf\xc0\xaf\xc1\xbf", R"(\u0080\u00bf\u00c0\u00af\u00c1\u00bf)"}, // alone; overlong
      {"\xe0\x9f\xbf\xf0\x8f\xbf\xbf", R"(\u00e0\u009f\u00bf\u00f0\u008f\u00bf\u00bf)"}, // overlong
      {"\xed\xa0\x80\xf4\x90\x80\x80", R"(\u00ed\u00a0\u0080\u00f4\u0090\u0080\u0080)"}, // surrogate; > U+10FFFF
      {"\xf5\xfe\xff a\xe2\x82x\xc3", R"(\u00f5\u00fe\u00ff a\u00e2\u0082x\u00c3)"}, // never UTF-8; cut short
      {"eight ok\xe9\xc3\xa9\xe9", "eight ok\\u00e9\xc3\xa9\\u00e9"},
  };
  for (const auto &[in, out] : cases) {
    std::string appended = "kept";
    EXPECT_EQ(AppendValidUtf8(appended, in), (out.size() - in.size()) / 5) << in;
    EXPECT_EQ(appended, "kept" + out);
  }
}

// Hex of `plain` under the key of `key_game_id`. The tool tests check reading
// against an independent decryption; here the library's cipher may encrypt.
std::string EncryptLine(std::string_view plain, std::string_view key_game_id) {
  LogKey key = OpenLogKey(key_game_id);
  std::vector<std::uint8_t> bytes(cipher::CiphertextSize(plain.size()));
  cipher::backend().encrypt(key.session, reinterpret_cast<const std::uint8_t *>(plain.data()),
                            plain.size(), bytes.data());
  CloseLogKey(key);
  std::string hex;
  for (std::uint8_t b : bytes) hex += {"0123456789abcdef"[b >> 4], "0123456789abcdef"[b & 15]};
  return hex;
}

const std::string kRecord = R"({"user_id":"u1","game_id":"g1","type":"SPECIAL","time":"t","extra":"a\"b"})";

TEST(LogLine, ReadWithTheFirstCandidateThatGivesARecord) {
  const std::string good = EncryptLine(kRecord, "g1"), long_id(70, 'x');
  std::string flipped = good; // the padding byte of the last block flips
  flipped[good.size() - 34] = flipped[good.size() - 34] == '0' ? '8' : '0';
  struct Case {
    std::string line;
    std::vector<std::string> candidates;
    LineFault fault;
    std::size_t winner = 0;
  };
  const Case cases[] = {
      {good, {"g1", "g2"}, LineFault::kNone},
      {EncryptLine(kRecord, "g3"), {"g1", "g2", "g3"}, LineFault::kNone, 2},
      {EncryptLine(kRecord, long_id), {long_id.substr(0, 65) + "y"}, LineFault::kNone}, // 65 bytes count
      {EncryptLine(kRecord, "g3"), {"g1", "g2"}, LineFault::kBadPadding},
      {flipped, {"g1"}, LineFault::kBadPadding},
      {EncryptLine(R"({"user_id":"u"})", "g2"), {"g1", "g2"}, LineFault::kNotRecord},
      {good.substr(0, good.size() - 8), {"g1"}, LineFault::kNotBlocks},
      {good.substr(0, 10) + "g" + good.substr(11), {"g1"}, LineFault::kNotHex},
      {good.substr(0, 10) + "A" + good.substr(11), {"g1"}, LineFault::kNotHex},
  };
  KeyPool pool;
  LineBuffers buffers;
  for (const Case &c : cases) {
    KeyCandidates keys{c.candidates};
    EventRecord record;
    EXPECT_EQ(ReadLine(pool, keys, c.line, buffers, record), c.fault) << c.line;
    if (c.fault != LineFault::kNone) continue;
    EXPECT_EQ(std::pair(keys.winner, record), std::pair(c.winner, EventRecord{"u1", "g1", "SPECIAL", "t", "a\"b"}));
  }
  CloseKeyPool(pool);
}

int g_decryptions = 0;
std::ptrdiff_t CountingDecrypt(cipher::Session *s, const std::uint8_t *in, std::size_t n, std::uint8_t *out) {
  ++g_decryptions;
  return cipher::native_backend().decrypt(s, in, n, out);
}

// Runs of lines share a key: only the line that starts a run tries others.
TEST(LogLine, ARunOfLinesCostsOneDecryptionEach) {
  struct Restore {
    ~Restore() { cipher::backend() = cipher::native_backend(); }
  } restore;
  cipher::backend().decrypt = CountingDecrypt;
  KeyPool pool;
  KeyCandidates keys;
  for (const char *id : {"g1", "g2", "g1", "g3"}) AddCandidate(keys, id);
  EXPECT_EQ(keys.game_ids, (std::vector<std::string>{"g1", "g2", "g3"}));
  LineBuffers buffers;
  EventRecord record;
  for (const auto &[key, decryptions] : {std::pair{"g3", 3 + 4}, {"g2", 3 + 4}, {"g1", 2 + 4}}) {
    g_decryptions = 0;
    for (int line = 0; line < 5; ++line)
      ASSERT_EQ(ReadLine(pool, keys, EncryptLine(kRecord, key), buffers, record), LineFault::kNone);
    EXPECT_EQ(g_decryptions, decryptions) << key;
  }
  CloseKeyPool(pool);
}

TEST(LogLines, SplitsLfAndCrLfHoweverReadsCutTheBytes) {
  const std::pair<std::vector<std::string>, std::string> cases[] = {
      {{"\r\nab\ncd\r\ne", "f\r"}, "|ab|cd|ef"}, {{"a\rb\r", "\nc\r\r\n"}, "a\rb|c\r|"}};
  for (const auto &[chunks, lines] : cases) {
    LineSplitter splitter;
    std::string seen;
    for (const std::string &chunk : chunks)
      FeedBytes(splitter, chunk, [&](std::uint64_t, std::string_view line) { (seen += line) += "|"; });
    EXPECT_EQ(seen + std::string(PartialLine(splitter)), lines);
    EXPECT_EQ(splitter.next_number, 1 + std::count(lines.begin(), lines.end(), '|'));
  }
}

TEST(RecordFilter, TimeWindowAndTypes) {
  EXPECT_TRUE(IsTimeBound("2024-05-17") && IsTimeBound("2024-05-17T08:30:00"));
  EXPECT_FALSE(IsTimeBound("2024-5-17") || IsTimeBound("2024-05-17 08:30:00") || IsTimeBound("2024-05-17T08"));
  const std::pair<RecordFilter, bool> cases[] = { // for a SPECIAL record of 2024-05-17T08:30:00
      {{}, true}, {{"2024-05-17T08:30:00", "2024-05-17T08:30:00", {}}, true},
      {{"2024-05-17", "2024-05-17", {"ENTER", "SPECIAL"}}, true}, {{"2024-05-17T08:30:01", "", {}}, false},
      {{"", "2024-05-17T08:29:59", {}}, false}, {{"", "2024-05-16", {}}, false}, {{"", "", {"EXIT"}}, false}};
  for (const auto &[filter, passes] : cases)
    EXPECT_EQ(Passes(filter, {"u", "g", "SPECIAL", "2024-05-17T08:30:00", ""}), passes) << filter.since;
}

} // namespace
} // namespace orvane::logcat
