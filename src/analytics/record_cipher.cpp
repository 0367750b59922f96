#include "analytics/record_cipher.h"

#include "analytics/cipher.h"
#include "analytics/record_text.h"

#include <bit>
#include <cstring>
#include <mutex>
#include <vector>

namespace orvane {
namespace {

KeyBlock g_key_block;
std::once_flag g_key_taken;

// The cipher session for the key block as it stands, and the ciphertext
// buffer, reused from record to record.
struct CipherCache {
  std::mutex lock;
  cipher::Session *session = nullptr;
  const void *prepared_for = nullptr; // keyTextTaken when the session was made
  std::vector<std::uint8_t> ciphertext;
};
CipherCache g_cache;

// The two lowercase hex digits of every byte value: one lookup per byte, in
// place of formatting each byte.
struct HexPairs {
  char digits[256][2];
};
constexpr HexPairs MakeHexPairs() {
  constexpr char kDigits[] = "0123456789abcdef";
  HexPairs pairs{};
  for (int b = 0; b < 256; ++b) {
    pairs.digits[b][0] = kDigits[b >> 4];
    pairs.digits[b][1] = kDigits[b & 0x0f];
  }
  return pairs;
}
constexpr HexPairs kHexPairs = MakeHexPairs();

} // namespace

const KeyBlock &GetKeyBlock() { return g_key_block; }

void TakeKeyText(const char *game_id) {
  std::call_once(g_key_taken, [game_id] {
    std::lock_guard<std::mutex> hold(g_cache.lock);
    g_key_block.keyText = MakeKeyText(game_id ? std::string_view(game_id) : std::string_view());
    g_key_block.keyTextTaken = &g_key_block;
  });
}

void AppendHex(std::string &out, const std::uint8_t *bytes, std::size_t size) {
  const std::size_t start = out.size();
  out.resize(start + 2 * size);
  char *p = out.data() + start;
  // Eight bytes per round, read in one load, so that the stores into `out`
  // cannot make the compiler read `bytes` again.
  std::size_t i = 0;
  for (; i + 8 <= size; i += 8, p += 16) {
    std::uint64_t eight;
    std::memcpy(&eight, bytes + i, 8);
    for (int k = 0; k < 8; ++k) {
      const int shift = std::endian::native == std::endian::little ? 8 * k : 8 * (7 - k);
      const std::uint8_t byte = static_cast<std::uint8_t>(eight >> shift);
      std::memcpy(p + 2 * k, kHexPairs.digits[byte], 2);
    }
  }
  for (; i < size; ++i, p += 2) std::memcpy(p, kHexPairs.digits[bytes[i]], 2);
}

bool EncryptRecordText(std::string_view record, std::string &hex) {
  const cipher::Backend &backend = cipher::backend();
  std::lock_guard<std::mutex> hold(g_cache.lock);
  // Key and IV follow the key block: an encryption before the first event
  // uses the all-zero key text, and the session is made again once it fills.
  if (g_cache.session == nullptr || g_cache.prepared_for != g_key_block.keyTextTaken) {
    if (g_cache.session != nullptr) backend.close(g_cache.session);
    g_cache.session = backend.open(g_key_block.keyText.data() + kKeyOffset,
                                   g_key_block.keyText.data() + kIvOffset);
    g_cache.prepared_for = g_key_block.keyTextTaken;
    if (g_cache.session == nullptr) return false;
  }
  g_cache.ciphertext.resize(cipher::CiphertextSize(record.size()));
  const std::ptrdiff_t size =
      backend.encrypt(g_cache.session, reinterpret_cast<const std::uint8_t *>(record.data()),
                      record.size(), g_cache.ciphertext.data());
  if (size < 0) return false;
  AppendHex(hex, g_cache.ciphertext.data(), static_cast<std::size_t>(size));
  return true;
}

std::string EncodeEventRecord(std::string_view game_id, std::string_view user_id,
                              std::string_view type, std::string_view extra) {
  std::string hex;
  if (!EncryptRecordText(ComposeEventRecord(game_id, user_id, type, extra), hex)) hex.clear();
  return hex;
}

std::string EncodeEventRecordNoExtra(std::string_view game_id, std::string_view user_id,
                                     std::string_view type) {
  return EncodeEventRecord(game_id, user_id, type, {});
}

} // namespace orvane
