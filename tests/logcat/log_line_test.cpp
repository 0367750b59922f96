// One log line read with the candidate keys, the bytes of a file split into
// lines, and the record filters.
#include "key_discovery.h"
#include "log_lines.h"
#include "record_filter.h"

#include "analytics/cipher.h"

#include <gtest/gtest.h>

#include <string>
#include <vector>

namespace orvane::logcat {
namespace {

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
    const char *name;
    std::string line;
    std::vector<std::string> candidates;
    LineFault fault;
    std::size_t winner = 0;
  };
  const Case cases[] = {
      {"own key", good, {"g1", "g2"}, LineFault::kNone},
      {"another candidate's key", EncryptLine(kRecord, "g3"), {"g1", "g2", "g3"}, LineFault::kNone, 2},
      {"65 bytes make the key", EncryptLine(kRecord, long_id), {long_id.substr(0, 65) + "y"}, LineFault::kNone},
      {"no candidate's key", EncryptLine(kRecord, "g3"), {"g1", "g2"}, LineFault::kBadPadding},
      {"flipped byte", flipped, {"g1"}, LineFault::kBadPadding},
      {"a block short", good.substr(0, good.size() - 32), {"g1"}, LineFault::kBadPadding},
      {"empty", "", {"g1"}, LineFault::kNotBlocks},
      {"odd length", good.substr(1), {"g1"}, LineFault::kNotBlocks},
      {"cut inside a block", good.substr(0, good.size() - 8), {"g1"}, LineFault::kNotBlocks},
      {"non-hex", good.substr(0, 10) + "g" + good.substr(11), {"g1"}, LineFault::kNotHex},
      {"upper-case hex", good.substr(0, 10) + "A" + good.substr(11), {"g1"}, LineFault::kNotHex},
      {"decrypts to no record", EncryptLine(R"({"user_id":"u"})", "g2"), {"g1", "g2"}, LineFault::kNotRecord},
  };
  for (const Case &c : cases) {
    KeyPool pool;
    KeyCandidates keys{c.candidates};
    LineBuffers buffers;
    EventRecord record;
    EXPECT_EQ(ReadLine(pool, keys, c.line, buffers, record), c.fault) << c.name;
    if (c.fault == LineFault::kNone) {
      EXPECT_EQ(keys.winner, c.winner) << c.name;
      EXPECT_EQ(record, (EventRecord{"u1", "g1", "SPECIAL", "t", "a\"b"})) << c.name;
    }
    CloseKeyPool(pool);
  }
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
  const std::pair<const char *, int> runs[] = {{"g3", 3 + 4}, {"g2", 3 + 4}, {"g1", 2 + 4}};
  for (const auto &[key, decryptions] : runs) {
    g_decryptions = 0;
    for (int line = 0; line < 5; ++line)
      ASSERT_EQ(ReadLine(pool, keys, EncryptLine(kRecord, key), buffers, record), LineFault::kNone);
    EXPECT_EQ(g_decryptions, decryptions) << key;
    EXPECT_EQ(keys.game_ids[keys.winner], key);
  }
  CloseKeyPool(pool);
}

TEST(LogLines, SplitsHoweverReadsCutTheBytes) {
  struct Case {
    std::vector<std::string> chunks, lines;
    std::string partial;
  };
  const Case cases[] = {
      {{"ab\ncd\nef"}, {"ab", "cd"}, "ef"},       {{"ab\r\ncd\r\nef\r"}, {"ab", "cd"}, "ef"},
      {{"\r\nab\ncd"}, {"", "ab"}, "cd"},         {{"a", "b\nc", "d"}, {"ab"}, "cd"},
      {{"ab\r", "\ncd"}, {"ab"}, "cd"},           {{"a\rb\nab\r\r\n"}, {"a\rb", "ab\r"}, ""},
  };
  for (const Case &c : cases) {
    LineSplitter splitter;
    std::vector<std::string> lines;
    for (const std::string &chunk : c.chunks)
      FeedBytes(splitter, chunk, [&](std::uint64_t number, std::string_view line) {
        EXPECT_EQ(number, lines.size() + 1);
        lines.emplace_back(line);
      });
    EXPECT_EQ(lines, c.lines) << c.chunks[0];
    EXPECT_EQ(PartialLine(splitter), c.partial) << c.chunks[0];
  }
}

TEST(RecordFilter, TimeWindowAndTypes) {
  for (const char *bound : {"2024-05-17", "2024-05-17T08:30:00"}) EXPECT_TRUE(IsTimeBound(bound));
  for (const char *bound : {"2024-5-17", "2024-05-17 08:30:00", "2024-05-17T08:30", "today", ""})
    EXPECT_FALSE(IsTimeBound(bound)) << bound;
  struct Case {
    RecordFilter filter;
    bool passes; // by a SPECIAL record of 2024-05-17T08:30:00
  };
  const Case cases[] = {
      {{}, true},
      {{"2024-05-17T08:30:00", "2024-05-17T08:30:00", {}}, true},
      {{"2024-05-17", "2024-05-17", {"ENTER", "SPECIAL"}}, true},
      {{"2024-05-17T08:30:01", "", {}}, false},
      {{"2024-05-18", "", {}}, false},
      {{"", "2024-05-17T08:29:59", {}}, false},
      {{"", "2024-05-16", {}}, false},
      {{"", "", {"ENTER", "EXIT"}}, false},
  };
  const EventRecord record{"u", "g", "SPECIAL", "2024-05-17T08:30:00", ""};
  for (const Case &c : cases)
    EXPECT_EQ(Passes(c.filter, record), c.passes) << c.filter.since << " " << c.filter.until;
}

} // namespace
} // namespace orvane::logcat
