// Record encryption: a record text becomes the lowercase hex text of its
// AES-256-CBC ciphertext under the process's key text.
#pragma once

#include "cipher/cipher.h"
#include "logformat/key_text.h"

#include <string>
#include <string_view>
#include <vector>

namespace orvane {

// The process's key block: the first call fixes the key text from its game id
// (null counts as empty), whatever that call's outcome; every later call
// returns the same text, whatever it passes. Safe from several threads.
const KeyText &TakeKeyText(const char *game_id);

// One caller's cipher state: a backend session for the key text it was first
// used with, and the ciphertext buffer, both reused from record to record.
// Never shared between threads at the same time.
struct RecordCipher {
  cipher::Session *session = nullptr;
  std::vector<std::uint8_t> ciphertext;

  RecordCipher() = default;
  RecordCipher(const RecordCipher &) = delete;
  RecordCipher &operator=(const RecordCipher &) = delete;
  ~RecordCipher();
};

// Appends the hex text of `record` encrypted under `key_text` to `hex`; a
// state keeps the key text of its first success. False when the cipher
// failed: `hex` is unchanged.
bool EncryptRecordText(RecordCipher &state, const KeyText &key_text, std::string_view record,
                       std::string &hex);

} // namespace orvane
