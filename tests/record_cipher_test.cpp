// Record encryption: known-answer vectors that every cipher backend must
// reproduce, sizes and padding checked by decrypting with OpenSSL directly.
#include "cipher/cipher.h"
#include "logformat/key_text.h"
#include "analytics/record_cipher.h"
#include "support/test_support.h"

#include <string>

namespace orvane::testing {
namespace {

std::string HexOf(const std::string &key_text, std::string_view record) {
  const auto *bytes = reinterpret_cast<const std::uint8_t *>(key_text.data());
  cipher::Session *session = cipher::backend().open(bytes + kKeyOffset, bytes + kIvOffset);
  if (session == nullptr) return "(open failed)";
  std::vector<std::uint8_t> out(cipher::CiphertextSize(record.size()));
  std::ptrdiff_t size = cipher::backend().encrypt(
      session, reinterpret_cast<const std::uint8_t *>(record.data()), record.size(), out.data());
  // The same session serves a second record from the same IV.
  std::ptrdiff_t again = cipher::backend().encrypt(
      session, reinterpret_cast<const std::uint8_t *>(record.data()), record.size(), out.data());
  cipher::backend().close(session);
  if (size < 0 || again != size) return "(encrypt failed)";
  std::string hex;
  AppendHex(hex, out.data(), static_cast<std::size_t>(size));
  return hex;
}

// Vectors made with the `openssl enc -aes-256-cbc` tool from the key text's
// bytes 0-31 as key and 64-79 as IV.
TEST(RecordCipher, KnownAnswers) {
  struct Case {
    std::string key_text;
    std::string record;
    std::string hex;
  };
  const Case cases[] = {
      {KeyTextFor("g1"),
       R"({"user_id":"u1","game_id":"g1","type":"ENTER","time":"2024-05-17T08:30:00","extra":""})",
       "b1659727c7a378f68090dc51236637118f565656c8d9f70e68a503fc43aaea708ae947655772e282f2132e502b85a091"
       "417bd170bbbd8bac46222e07d0e1e2973775ff64bff0330386e99052b613ad63c6951b05a386434b823a218fe0c03dd5"},
      // A 65-byte game id fills the key text: the IV is no longer zero.
      {KeyTextFor(std::string(65, 'x')),
       R"({"user_id":"user-42","game_id":"1234","type":"SPECIAL","time":"2024-05-17T08:30:00","extra":"level=3"})",
       "bffd380268c33ed3d08eb69a124d3831ff35bbae67b647d571fbdf4f32037dd98cb52a7eeffd4c226f9c751b30c0824e"
       "b96c4310f821543154b1b52d4c9dda1a930aa85471ae2992dc9aca4dd35c98d5c87377f5cd69e2d982f6af5ce4b36414"
       "5898c857f6f900202b2b18523dfe62a5"},
      // No key text taken yet: all-zero key and IV.
      {std::string(80, '\0'),
       R"({"user_id":"","game_id":"","type":"EXIT","time":"1970-01-01T00:00:00","extra":""})",
       "48516d3d66dc7cf50ad8ddb80361e2a37b5697b9e7df04e1736eff01f5bddb54bba67656403acc0bf4779f13831ded0b"
       "3d1230f8c1b02ab564e440d655ddc9deafba11472ce442180d85e78f4e179a51e8b479d3a526aea47e11d20530f516ec"},
      // A whole block of input gains a whole block of padding.
      {KeyTextFor("abcdefghijklmnopq"), "0123456789abcdef",
       "e7b8feea738abf9917e02f3660c47cda9fee3c8637a8152d07506057eb38f7ff"},
  };
  for (const Case &c : cases) EXPECT_EQ(HexOf(c.key_text, c.record), c.hex) << c.record;
}

TEST(RecordCipher, KeyTextJoinsAtMost65BytesOfTheGameId) {
  struct Case {
    std::size_t id_length;
    std::size_t zero_key_tail; // zero bytes at the end of the 32-byte key
    bool iv_zero;
  };
  const Case cases[] = {{16, 1, true}, {17, 0, true}, {49, 0, true},
                        {50, 0, false}, {65, 0, false}, {80, 0, false}};
  for (const Case &c : cases) {
    std::string id;
    for (std::size_t i = 0; i < c.id_length; ++i) id += static_cast<char>('A' + i % 26);
    const KeyText text = MakeKeyText(id);
    const std::string expected = KeyTextFor(id);
    EXPECT_EQ(std::string(text.begin(), text.end()), expected) << c.id_length;
    std::size_t tail = 0;
    while (tail < 32 && text[31 - tail] == 0) ++tail;
    EXPECT_EQ(tail, c.zero_key_tail) << c.id_length;
    bool iv_zero = true;
    for (std::size_t i = kIvOffset; i < kIvOffset + 16; ++i) iv_zero = iv_zero && text[i] == 0;
    EXPECT_EQ(iv_zero, c.iv_zero) << c.id_length;
  }
  // Bytes behind the 65th never reach the key text.
  EXPECT_EQ(MakeKeyText(std::string(65, 'a') + "b"), MakeKeyText(std::string(65, 'a') + "c"));
}

TEST(RecordCipher, HexIsTwoLowercaseDigitsPerByte) {
  const std::uint8_t bytes[] = {0, 10, 128, 255, 0x7f, 0xa5};
  std::string hex = "prefix:";
  AppendHex(hex, bytes, sizeof bytes);
  EXPECT_EQ(hex, "prefix:000a80ff7fa5");
}

// Lengths around the block size and the old 1023-byte limit, decrypted with
// OpenSSL under the process's key block.
TEST(RecordCipher, EveryLengthDecryptsWhole) {
  const std::pair<std::size_t, std::size_t> cases[] = {
      {0, 32}, {1, 32}, {15, 32}, {16, 64}, {95, 192}, {96, 224},
      {1023, 2048}, {1024, 2080}, {5000, 10016}, {65536, 131104},
  };
  const KeyBlock &block = GetKeyBlock();
  RecordCipher state;
  for (const auto &[length, hex_length] : cases) {
    std::string record(length, '\0');
    for (std::size_t i = 0; i < length; ++i) record[i] = static_cast<char>('!' + i % 90);
    std::string hex;
    ASSERT_TRUE(EncryptRecordText(state, record, hex));
    EXPECT_EQ(hex.size(), hex_length) << length;
    EXPECT_EQ(hex.find_first_not_of("0123456789abcdef"), std::string::npos);
    const std::string key(block.keyText.begin(), block.keyText.end());
    EXPECT_EQ(DecryptLine(hex, key), record) << length;
  }
}

std::ptrdiff_t FailingEncrypt(cipher::Session *, const std::uint8_t *, std::size_t, std::uint8_t *) {
  return -1;
}

TEST(RecordCipher, FailureLeavesTheOutputUnchanged) {
  RecordCipher state;
  cipher::backend().encrypt = FailingEncrypt;
  std::string hex = "kept";
  EXPECT_FALSE(EncryptRecordText(state, "{}", hex));
  EXPECT_EQ(hex, "kept");
  cipher::backend() = cipher::native_backend();
  EXPECT_TRUE(EncryptRecordText(state, "{}", hex));
}

TEST(RecordCipher, DecryptRefusesDamagedInput) {
  const std::string key_text = KeyTextFor("g1");
  const auto *key = reinterpret_cast<const std::uint8_t *>(key_text.data());
  cipher::Session *session = cipher::backend().open(key, key + kIvOffset);
  ASSERT_NE(session, nullptr);
  const std::string record = "{\"a\":1}";
  std::vector<std::uint8_t> cipher_bytes(32), plain(64);
  std::ptrdiff_t size = cipher::backend().encrypt(
      session, reinterpret_cast<const std::uint8_t *>(record.data()), record.size(), cipher_bytes.data());
  ASSERT_EQ(size, 16);
  EXPECT_EQ(cipher::backend().decrypt(session, cipher_bytes.data(), 16, plain.data()),
            static_cast<std::ptrdiff_t>(record.size()));
  EXPECT_EQ(std::string(plain.begin(), plain.begin() + 7), record);
  EXPECT_EQ(cipher::backend().decrypt(session, cipher_bytes.data(), 15, plain.data()), -1); // not a block
  EXPECT_EQ(cipher::backend().decrypt(session, cipher_bytes.data(), 0, plain.data()), -1);
  cipher_bytes[15] ^= 0x5a; // the padding byte no longer says 9
  EXPECT_EQ(cipher::backend().decrypt(session, cipher_bytes.data(), 16, plain.data()), -1);
  cipher::backend().close(session);
}

} // namespace
} // namespace orvane::testing
