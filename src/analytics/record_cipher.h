// Record encryption: a record text becomes the lowercase hex text of its
// AES-256-CBC ciphertext under the process's key block.
#pragma once

#include "cipher/cipher.h"
#include "logformat/key_text.h"

#include <string>
#include <string_view>
#include <vector>

namespace orvane {

// The process-wide key text. It starts all zero; the first event of the
// process fills it from its game id, and nothing changes it after that.
struct KeyBlock {
  KeyText keyText{};
  const void *keyTextTaken = nullptr; // non-null once keyText is filled
};

// The process's key block, created on first use and never released.
const KeyBlock &GetKeyBlock();

// Fills the key block from `game_id` (null counts as empty) the first time it
// is called in the process; every later call leaves it unchanged. Safe to call
// from several threads.
void TakeKeyText(const char *game_id);

// One caller's cipher state: a backend session for the key block as it stood
// when the session was made, and the ciphertext buffer, both reused from
// record to record. Never shared between threads at the same time.
struct RecordCipher {
  cipher::Session *session = nullptr;
  const void *prepared_for = nullptr; // keyTextTaken when the session was made
  std::vector<std::uint8_t> ciphertext;

  RecordCipher() = default;
  RecordCipher(const RecordCipher &) = delete;
  RecordCipher &operator=(const RecordCipher &) = delete;
  ~RecordCipher();
};

// Appends the hex text of the encrypted `record` to `hex`. False when the
// cipher failed: the reason went to standard error and `hex` is unchanged.
bool EncryptRecordText(RecordCipher &state, std::string_view record, std::string &hex);

} // namespace orvane
