// Decoding one log line, with lines made by OpenSSL directly rather than by
// the library, and splitting the bytes of a file into lines.
#include "log_line.h"
#include "log_lines.h"

#include "support/test_support.h"

#include <openssl/evp.h>

#include <gtest/gtest.h>

#include <string>
#include <vector>

namespace orvane::logcat {
namespace {

// Hex of `plain` encrypted under the key text of `key_game_id`, from a fresh
// EVP context.
std::string EncryptLine(std::string_view plain, std::string_view key_game_id) {
  const std::string key = orvane::testing::KeyTextFor(key_game_id);
  const auto *k = reinterpret_cast<const unsigned char *>(key.data());
  std::vector<unsigned char> out(plain.size() + 16);
  int first = 0, second = 0;
  EVP_CIPHER_CTX *ctx = EVP_CIPHER_CTX_new();
  EVP_EncryptInit_ex(ctx, EVP_aes_256_cbc(), nullptr, k, k + 64);
  EVP_EncryptUpdate(ctx, out.data(), &first, reinterpret_cast<const unsigned char *>(plain.data()),
                    static_cast<int>(plain.size()));
  EVP_EncryptFinal_ex(ctx, out.data() + first, &second);
  EVP_CIPHER_CTX_free(ctx);
  std::string hex;
  static constexpr char kDigits[] = "0123456789abcdef";
  for (int i = 0; i < first + second; ++i) {
    hex += kDigits[out[i] >> 4];
    hex += kDigits[out[i] & 15];
  }
  return hex;
}

const std::string kRecord =
    R"({"user_id":"u1","game_id":"g1","type":"SPECIAL","time":"2024-05-17T08:30:00","extra":"a\"b\\c\nd"})";

TEST(LogLine, DecodesOrNamesTheFault) {
  const std::string good = EncryptLine(kRecord, "g1");
  std::string flipped = good; // last byte of the next-to-last block: the padding byte flips
  flipped[good.size() - 34] = flipped[good.size() - 34] == '0' ? '8' : '0';
  std::string upper = good;
  upper[0] = 'A';
  const std::string long_id(70, 'x');
  struct Case {
    const char *name;
    std::string line;
    std::string key_game_id;
    LineFault fault;
  };
  const Case cases[] = {
      {"good", good, "g1", LineFault::kNone},
      {"only the first 65 bytes of the key game id count", EncryptLine(kRecord, long_id),
       long_id.substr(0, 65) + "different tail", LineFault::kNone},
      {"empty", "", "g1", LineFault::kNotBlocks},
      {"odd length", good.substr(0, good.size() - 1), "g1", LineFault::kNotBlocks},
      {"truncated inside a block", good.substr(0, good.size() - 8), "g1", LineFault::kNotBlocks},
      {"a block short", good.substr(0, good.size() - 32), "g1", LineFault::kBadPadding},
      {"non-hex character", good.substr(0, 10) + "g" + good.substr(11), "g1", LineFault::kNotHex},
      {"upper-case hex", upper, "g1", LineFault::kNotHex},
      {"blank inside", good.substr(0, 10) + " " + good.substr(11), "g1", LineFault::kNotHex},
      {"flipped byte", flipped, "g1", LineFault::kBadPadding},
      {"another game's key", good, "g2", LineFault::kBadPadding},
      {"not a record", EncryptLine("not json", "g1"), "g1", LineFault::kNotRecord},
      {"a record with a member missing", EncryptLine(R"({"user_id":"u"})", "g1"), "g1",
       LineFault::kNotRecord},
  };
  for (const Case &c : cases) {
    LogKey key = OpenLogKey(c.key_game_id);
    ASSERT_NE(key.session, nullptr);
    const DecodedLine decoded = DecodeLine(key, c.line);
    EXPECT_EQ(decoded.fault, c.fault) << c.name;
    if (c.fault == LineFault::kNone) {
      EXPECT_EQ(decoded.text, kRecord) << c.name;
      EXPECT_EQ(decoded.record, (EventRecord{"u1", "g1", "SPECIAL", "2024-05-17T08:30:00", "a\"b\\c\nd"}))
          << c.name;
    }
    CloseLogKey(key);
  }
}

TEST(LogLines, SplitsHoweverReadsCutTheBytes) {
  struct Case {
    const char *name;
    std::vector<std::string> chunks;
    std::vector<std::string> lines; // ended lines, numbered from 1
    std::string partial;
  };
  const Case cases[] = {
      {"LF", {"ab\ncd\nef"}, {"ab", "cd"}, "ef"},
      {"CR LF", {"ab\r\ncd\r\nef"}, {"ab", "cd"}, "ef"},
      {"leading line break", {"\nab\ncd"}, {"", "ab"}, "cd"},
      {"leading CR LF", {"\r\nab"}, {""}, "ab"},
      {"cut inside a line", {"a", "b\nc", "d"}, {"ab"}, "cd"},
      {"cut between CR and LF", {"ab\r", "\ncd"}, {"ab"}, "cd"},
      {"CR alone stays", {"a\rb\n"}, {"a\rb"}, ""},
      {"only the CR before LF goes", {"ab\r\r\n"}, {"ab\r"}, ""},
      {"ends with a line break", {"ab\n"}, {"ab"}, ""},
  };
  for (const Case &c : cases) {
    LineSplitter splitter;
    std::vector<std::string> lines;
    for (const std::string &chunk : c.chunks)
      FeedBytes(splitter, chunk, [&](std::uint64_t number, std::string_view line) {
        EXPECT_EQ(number, lines.size() + 1) << c.name;
        lines.emplace_back(line);
      });
    EXPECT_EQ(lines, c.lines) << c.name;
    EXPECT_EQ(PartialLine(splitter), c.partial) << c.name;
  }
}

TEST(LogLines, PartialLineDropsATrailingCr) {
  LineSplitter splitter;
  FeedBytes(splitter, "ab\r", [](std::uint64_t, std::string_view) { FAIL(); });
  EXPECT_EQ(PartialLine(splitter), "ab");
}

} // namespace
} // namespace orvane::logcat
