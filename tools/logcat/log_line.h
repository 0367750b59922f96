// Turning one line of a game's log file back into its record, with the
// library's own key text and cipher.
#pragma once

#include "logformat/record_json.h"

#include <cstdint>
#include <string>
#include <string_view>
#include <vector>

namespace orvane::cipher {
struct Session;
}

namespace orvane::logcat {

// Why a line gave no record.
enum class LineFault {
  kNone,
  kNotHex,     // a character other than 0-9 and a-f
  kNotBlocks,  // hex, but not whole 16-byte blocks (odd, short or empty)
  kBadPadding, // no key tried decrypts it: damaged, or a key not among them
  kNotRecord,  // decrypts, but is not a JSON object with the five members
};

// The text that the reader prints for `fault`.
std::string_view FaultText(LineFault fault);

// A cipher session for the logs that one key game id encrypted: the
// library's key text ("OrvaneLogKey-01" and the first 65 bytes of the id).
struct LogKey {
  cipher::Session *session = nullptr;
};

// Null session when the backend failed.
LogKey OpenLogKey(std::string_view key_game_id);
void CloseLogKey(LogKey &key);

// Buffers reused from line to line, so that reading allocates nothing per
// line once they have grown.
struct LineBuffers {
  std::vector<std::uint8_t> ciphertext;
  std::vector<std::uint8_t> plaintext;
};

// Turns a line (its line break already removed) into its ciphertext bytes
// in `buffers.ciphertext`; kNotHex or kNotBlocks when it cannot be one.
LineFault TakeCiphertext(std::string_view line, LineBuffers &buffers);

// Decrypts the ciphertext in `buffers` under `key` and parses the record
// into `record`, whose strings keep their capacity from line to line.
// kNone, kBadPadding or kNotRecord.
LineFault DecryptRecord(const LogKey &key, LineBuffers &buffers, EventRecord &record);

} // namespace orvane::logcat
