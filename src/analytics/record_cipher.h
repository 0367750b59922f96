// Record encryption: a record text becomes the lowercase hex text of its
// AES-256-CBC ciphertext under the process's key block.
#pragma once

#include "analytics/key_text.h"

#include <string>
#include <string_view>

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

// Appends the hex text of the encrypted `record` to `hex`. False when the
// cipher failed: the reason went to standard error and `hex` is unchanged.
// Safe to call from several threads.
bool EncryptRecordText(std::string_view record, std::string &hex);

// Appends two lowercase hex digits per byte.
void AppendHex(std::string &out, const std::uint8_t *bytes, std::size_t size);

// The hex line of one event stamped now; an empty text when the cipher failed.
// The event path composes into its own buffers instead; this serves callers
// that want one line.
std::string EncodeEventRecord(std::string_view game_id, std::string_view user_id,
                              std::string_view type, std::string_view extra);

} // namespace orvane
