// Hostile event texts: whatever bytes a game passes as game id, user id and
// extra, its record must decrypt, read back as exactly those values and be
// written back as the very text that was encrypted.
//
// Input: type selector byte, then game id, user id and extra separated by
// zero bytes (the exports take C strings, so no value can hold one).
#include "logformat/key_text.h"
#include "analytics/record_cipher.h"
#include "logformat/record_text.h"
#include "logformat/timestamp.h"
#include "logformat/record_json.h"

#include <openssl/evp.h>

#include <array>
#include <cstdint>
#include <cstdio>
#include <cstdlib>
#include <cstring>
#include <ctime>
#include <string>
#include <string_view>
#include <vector>

namespace {

void Fail(const char *what) {
  std::fprintf(stderr, "record property broken: %s\n", what);
  std::abort();
}

// The key text by the log format's rule, built here rather than by the
// library: the fixed text, the first 65 bytes of the game id, zeros behind.
std::array<std::uint8_t, 80> ExpectedKeyText(std::string_view game_id) {
  std::array<std::uint8_t, 80> text{};
  const std::string joined = "OrvaneLogKey-01" + std::string(game_id.substr(0, 65));
  std::memcpy(text.data(), joined.data(), joined.size());
  return text;
}

int HexDigit(char c) {
  if (c >= '0' && c <= '9') return c - '0';
  if (c >= 'a' && c <= 'f') return c - 'a' + 10;
  return -1;
}

// Decrypts with a fresh EVP context of our own, not the library's backend.
bool DecryptIndependently(std::string_view hex, const std::uint8_t *key_text, std::string &plain) {
  if (hex.size() % 32 != 0 || hex.empty()) return false;
  std::vector<unsigned char> bytes(hex.size() / 2);
  for (std::size_t i = 0; i < bytes.size(); ++i) {
    const int high = HexDigit(hex[2 * i]), low = HexDigit(hex[2 * i + 1]);
    if (high < 0 || low < 0) return false;
    bytes[i] = static_cast<unsigned char>(high * 16 + low);
  }
  std::vector<unsigned char> out(bytes.size() + 16);
  int first = 0, second = 0;
  EVP_CIPHER_CTX *ctx = EVP_CIPHER_CTX_new();
  const bool ok =
      ctx != nullptr &&
      EVP_DecryptInit_ex(ctx, EVP_aes_256_cbc(), nullptr, key_text, key_text + 64) == 1 &&
      EVP_DecryptUpdate(ctx, out.data(), &first, bytes.data(), static_cast<int>(bytes.size())) == 1 &&
      EVP_DecryptFinal_ex(ctx, out.data() + first, &second) == 1;
  EVP_CIPHER_CTX_free(ctx);
  if (!ok) return false;
  plain.assign(reinterpret_cast<const char *>(out.data()), static_cast<std::size_t>(first + second));
  return true;
}

// The next value: bytes up to the next zero byte or the end.
std::string_view TakeValue(std::string_view &rest) {
  const std::size_t end = rest.find('\0');
  const std::string_view value = rest.substr(0, end);
  rest.remove_prefix(end == std::string_view::npos ? rest.size() : end + 1);
  return value;
}

} // namespace

extern "C" int LLVMFuzzerTestOneInput(const std::uint8_t *data, std::size_t size) {
  if (size == 0) return 0;
  static constexpr std::string_view kTypes[] = {"INIT", "ENTER", "EXIT", "SPECIAL"};
  const std::string_view type = kTypes[data[0] % 4];
  std::string_view rest(reinterpret_cast<const char *>(data) + 1, size - 1);
  const std::string_view game_id = TakeValue(rest);
  const std::string_view user_id = TakeValue(rest);
  const std::string_view extra = TakeValue(rest); // bytes after a third zero are left out

  // The key text of any game id, as the library makes it.
  const orvane::KeyText made = orvane::MakeKeyText(game_id);
  if (made != ExpectedKeyText(game_id)) Fail("key text of the game id");

  // The process key is taken once, from the first game id, as in a game.
  const std::string game_id_text(game_id);
  orvane::TakeKeyText(game_id_text.c_str());
  const orvane::KeyBlock &block = orvane::GetKeyBlock();
  if (block.keyTextTaken == nullptr) Fail("key text taken");

  const std::string time = orvane::FormatTimestampAt(std::time(nullptr));
  std::string record;
  orvane::AppendEventRecord(record, game_id, user_id, type, time, extra);
  static orvane::RecordCipher cipher;
  std::string hex;
  if (!orvane::EncryptRecordText(cipher, record, hex)) Fail("encryption failed");
  if (hex.size() != 2 * ((record.size() / 16 + 1) * 16)) Fail("hex length");

  std::string plain;
  if (!DecryptIndependently(hex, block.keyText.data(), plain)) Fail("independent decryption");
  if (plain != record) Fail("decrypted text differs from the record");

  const auto parsed = orvane::ParseEventRecord(plain);
  if (!parsed) Fail("record is not a JSON object with the five members");
  if (parsed->game_id != game_id || parsed->user_id != user_id || parsed->type != type ||
      parsed->time != time || parsed->extra != extra)
    Fail("values read back differ from the values passed");
  // Written back, the record is exactly the text the library composed.
  std::string written;
  orvane::AppendRecordJson(written, *parsed);
  if (written != record) Fail("record written back differs from the composed text");
  return 0;
}
