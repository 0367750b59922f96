// The record cipher: known answers that every backend must give, and every
// length decrypted by the independent oracle.
#include "analytics/record_cipher.h"
#include "logformat/hex.h"
#include "support/test_support.h"

namespace orvane::testing {
namespace {

// Vectors made with the `openssl enc -aes-256-cbc` tool from the key text's
// bytes 0-31 as key and 64-79 as IV; a session decrypts each back.
TEST(Cipher, KnownAnswers) {
  const struct {
    std::string key_text, record, hex;
  } vectors[] = {
      {KeyTextFor("g1"),
       R"({"user_id":"u1","game_id":"g1","type":"ENTER","time":"2024-05-17T08:30:00","extra":""})",
       "b1659727c7a378f68090dc51236637118f565656c8d9f70e68a503fc43aaea708ae947655772e282f2132e502b85a091"
       "417bd170bbbd8bac46222e07d0e1e2973775ff64bff0330386e99052b613ad63c6951b05a386434b823a218fe0c03dd5"},
      {KeyTextFor("abcdefghijklmnopq"), "0123456789abcdef", // a whole block of padding
       "e7b8feea738abf9917e02f3660c47cda9fee3c8637a8152d07506057eb38f7ff"},
  };
  for (const auto &v : vectors) {
    const auto *key = reinterpret_cast<const std::uint8_t *>(v.key_text.data());
    cipher::Session *session = cipher::backend().open(key + kKeyOffset, key + kIvOffset);
    ASSERT_NE(session, nullptr);
    std::vector<std::uint8_t> out(cipher::CiphertextSize(v.record.size())), plain(out.size() + 16);
    const std::ptrdiff_t size = cipher::backend().encrypt(
        session, reinterpret_cast<const std::uint8_t *>(v.record.data()), v.record.size(), out.data());
    std::string hex;
    AppendHex(hex, out.data(), static_cast<std::size_t>(size));
    EXPECT_EQ(hex, v.hex) << v.record;
    EXPECT_EQ(cipher::backend().decrypt(session, out.data(), out.size(), plain.data()),
              static_cast<std::ptrdiff_t>(v.record.size()));
    EXPECT_EQ(std::string(plain.begin(), plain.begin() + static_cast<long>(v.record.size())), v.record);
    EXPECT_EQ(cipher::backend().decrypt(session, out.data(), out.size() - 1, plain.data()), -1)
        << "not blocks";
    out.back() ^= 0x5a; // the padding no longer reads right
    EXPECT_EQ(cipher::backend().decrypt(session, out.data(), out.size(), plain.data()), -1);
    cipher::backend().close(session);
  }
}

// Lengths around the block size, the old 1023-byte limit and far past it, one
// session encrypting each record from the same IV, however many came before.
TEST(Cipher, EveryLengthDecryptsWhole) {
  const KeyText &key_text = TakeKeyText("g1");
  RecordCipher state;
  for (std::size_t length : {0, 1, 15, 16, 95, 96, 1023, 1024, 65536}) {
    std::string record(length, '\0'), hex;
    for (std::size_t i = 0; i < length; ++i) record[i] = static_cast<char>('!' + i % 90);
    ASSERT_TRUE(EncryptRecordText(state, key_text, record, hex));
    EXPECT_EQ(DecryptLine(hex, KeyTextFor("g1")), record) << length;
  }
  // A failure writes nothing; a session that could not be made is made again for the next record.
  RecordCipher fresh;
  std::string hex = "kept";
  {
    const CallsGuard restore;
    cipher::backend().open = [](const std::uint8_t *, const std::uint8_t *) -> cipher::Session * {
      return nullptr;
    };
    EXPECT_FALSE(EncryptRecordText(fresh, key_text, "{}", hex));
  }
  EXPECT_EQ(hex, "kept");
  EXPECT_TRUE(EncryptRecordText(fresh, key_text, "{}", hex));
  EXPECT_EQ(DecryptLine(hex.substr(4), KeyTextFor("g1")), "{}");
}

} // namespace
} // namespace orvane::testing
