// Hostile event texts: whatever bytes a game passes as game id, user id and extra, its record must
// decrypt under OpenSSL called directly, read back as exactly those values and be written back as the
// very text that was encrypted; a game id the library accepts must name a file inside the logs folder.
// Input: a type byte, then game id, user id and extra separated by zero bytes (the exports take C
// strings). As in a game, the first event's game id keys every record of the process.
#include "analytics/game_id.h"
#include "analytics/record_cipher.h"
#include "logformat/event_types.h"
#include "logformat/record_json.h"
#include "logformat/record_text.h"
#include "logformat/timestamp.h"
#include "support/decrypt_line.h"

#include <algorithm>
#include <cstdio>
#include <cstdlib>
#include <ctime>
#include <iterator>

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

} // namespace

extern "C" int LLVMFuzzerTestOneInput(const std::uint8_t *data, std::size_t size) {
  if (size == 0) return 0;
  const std::string_view type = orvane::kEventTypeNames[data[0] % std::size(orvane::kEventTypeNames)];
  std::string_view rest(reinterpret_cast<const char *>(data) + 1, size - 1);
  const std::string_view game_id = TakeValue(rest), user_id = TakeValue(rest), extra = TakeValue(rest);
  // "<id>.log" stays one name inside the folder only without a separator; a
  // colon names a drive or a stream on Windows, a control byte no file.
  if (orvane::IsUsableGameId(game_id))
    for (const char c : game_id)
      if (c == '/' || c == '\\' || c == ':' || static_cast<unsigned char>(c) < 0x20)
        Fail("game id leaves the folder");

  static const std::string key_game_id(game_id);
  const orvane::KeyText &key_text = orvane::TakeKeyText(key_game_id.c_str());
  static orvane::RecordCipher cipher;
  const std::string time = orvane::FormatTimestampAt(std::time(nullptr));
  std::string record, hex;
  orvane::AppendEventRecord(record, game_id, user_id, type, time, extra);
  if (!orvane::EncryptRecordText(cipher, key_text, record, hex)) Fail("not encrypted");
  const std::optional<std::string> plain =
      orvane::testing::DecryptLine(hex, orvane::testing::KeyTextFor(key_game_id));
  if (plain != record) Fail("decrypts to another text");
  const std::optional<orvane::EventRecord> parsed = orvane::ParseEventRecord(*plain);
  if (parsed != orvane::EventRecord{std::string(user_id), std::string(game_id), std::string(type), time,
                                    std::string(extra)})
    Fail("values read back differ from the values passed");
  std::string written;
  orvane::AppendRecordJson(written, *parsed);
  if (written != record) Fail("record written back differs from the composed text");
  return 0;
}
