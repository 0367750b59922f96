// Hostile event texts: whatever bytes a game passes as game id, user id and extra, its record must
// decrypt under OpenSSL called directly, read back as exactly those values and be written back as the
// very text that was encrypted; a game id the library accepts must name a file inside the logs folder.
// Input: a type byte, then game id, user id and extra separated by zero bytes (the exports take C
// strings). As in a game, the first event's game id keys every record of the process.
#include "analytics/game_id.h"
#include "analytics/record_cipher.h"
#include "logformat/hex.h"
#include "logformat/record_json.h"
#include "logformat/record_text.h"
#include "logformat/timestamp.h"

#include <openssl/evp.h>

#include <algorithm>
#include <cstdio>
#include <cstdlib>
#include <ctime>

namespace {

void Fail(const char *what) {
  std::fprintf(stderr, "record property broken: %s\n", what);
  std::abort();
}

// The next value: the bytes up to the next zero byte or the end.
std::string_view TakeValue(std::string_view &rest) {
  const std::string_view value = rest.substr(0, rest.find('\0'));
  rest.remove_prefix(std::min(rest.size(), value.size() + 1));
  return value;
}

// Decrypts with a fresh EVP context of our own, not the library's backend,
// and a key text built here: "OrvaneLogKey-01", the first 65 bytes of the
// key game id, zeros to 80 bytes; key from byte 0, IV from byte 64.
bool DecryptIndependently(const std::vector<std::uint8_t> &in, std::string_view key_game_id,
                          std::string &plain) {
  std::string key = "OrvaneLogKey-01" + std::string(key_game_id.substr(0, 65));
  key.resize(80, '\0');
  const auto *k = reinterpret_cast<const unsigned char *>(key.data());
  plain.resize(in.size() + 16);
  auto *out = reinterpret_cast<unsigned char *>(plain.data());
  int first = 0, second = 0;
  EVP_CIPHER_CTX *ctx = EVP_CIPHER_CTX_new();
  const bool ok = ctx != nullptr && EVP_DecryptInit_ex(ctx, EVP_aes_256_cbc(), nullptr, k, k + 64) == 1 &&
                  EVP_DecryptUpdate(ctx, out, &first, in.data(), static_cast<int>(in.size())) == 1 &&
                  EVP_DecryptFinal_ex(ctx, out + first, &second) == 1;
  EVP_CIPHER_CTX_free(ctx);
  plain.resize(ok ? static_cast<std::size_t>(first + second) : 0);
  return ok;
}

} // namespace

extern "C" int LLVMFuzzerTestOneInput(const std::uint8_t *data, std::size_t size) {
  if (size == 0) return 0;
  static constexpr std::string_view kTypes[] = {"INIT", "ENTER", "EXIT", "SPECIAL"};
  const std::string_view type = kTypes[data[0] % 4];
  std::string_view rest(reinterpret_cast<const char *>(data) + 1, size - 1);
  const std::string_view game_id = TakeValue(rest), user_id = TakeValue(rest), extra = TakeValue(rest);
  // "<id>.log" stays one name inside the folder only without a separator; a
  // colon names a drive or a stream on Windows, a control byte no file.
  if (orvane::IsUsableGameId(game_id))
    for (const char c : game_id)
      if (c == '/' || c == '\\' || c == ':' || static_cast<unsigned char>(c) < 0x20)
        Fail("game id leaves the folder");

  static const std::string key_game_id(game_id);
  orvane::TakeKeyText(key_game_id.c_str());
  static orvane::RecordCipher cipher;
  const std::string time = orvane::FormatTimestampAt(std::time(nullptr));
  std::string record, hex, plain;
  orvane::AppendEventRecord(record, game_id, user_id, type, time, extra);
  std::vector<std::uint8_t> ciphertext;
  if (!orvane::EncryptRecordText(cipher, record, hex) || !orvane::DecodeHex(hex, ciphertext))
    Fail("no hex line");
  if (!DecryptIndependently(ciphertext, key_game_id, plain) || plain != record)
    Fail("decrypts to another text");
  const std::optional<orvane::EventRecord> parsed = orvane::ParseEventRecord(plain);
  if (parsed != orvane::EventRecord{std::string(user_id), std::string(game_id), std::string(type), time,
                                    std::string(extra)})
    Fail("values read back differ from the values passed");
  std::string written;
  orvane::AppendRecordJson(written, *parsed);
  if (written != record) Fail("record written back differs from the composed text");
  return 0;
}
