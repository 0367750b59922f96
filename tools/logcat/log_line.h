// Turning one line of a game's log file back into its record, with the
// library's own key text and cipher.
#pragma once

#include "record_json.h"

#include "analytics/cipher.h"

#include <cstdint>
#include <string>
#include <string_view>
#include <vector>

namespace orvane::logcat {

// Why a line gave no record.
enum class LineFault {
  kNone,
  kNotHex,       // a character other than 0-9 and a-f
  kNotBlocks,    // hex, but not whole 16-byte blocks (odd, short or empty)
  kBadPadding,   // does not decrypt under the key: wrong key or damaged
  kNotRecord,    // decrypts, but is not a JSON object with the five members
};

// The text that the reader prints for `fault`.
std::string_view FaultText(LineFault fault);

// A cipher session for the logs of one key game id: the library's key text
// ("OrvaneLogKey-01" and the first 65 bytes of the id) and its backend.
struct LogKey {
  cipher::Session *session = nullptr;
  std::vector<std::uint8_t> ciphertext; // buffers reused from line to line
  std::vector<std::uint8_t> plaintext;
};

// Null session when the backend failed (its reason went to standard error).
LogKey OpenLogKey(std::string_view key_game_id);
void CloseLogKey(LogKey &key);

struct DecodedLine {
  LineFault fault = LineFault::kNone;
  std::string text; // the decrypted record text, when it decrypted
  EventRecord record;
};

// Decodes one line, its line break already removed (a trailing CR is the
// caller's to strip).
DecodedLine DecodeLine(LogKey &key, std::string_view line);

} // namespace orvane::logcat
