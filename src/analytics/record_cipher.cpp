#include "analytics/record_cipher.h"

#include "analytics/cipher.h"
#include "analytics/record_text.h"

#include <atomic>
#include <cstring>
#include <mutex>
#include <vector>

#if defined(__SSE2__) || defined(_M_X64)
#include <emmintrin.h>
#endif

namespace orvane {
namespace {

KeyBlock g_key_block;
std::once_flag g_key_taken;
std::atomic<bool> g_key_ready{false};

// The cipher session for the key block as it stands, and the ciphertext
// buffer, reused from record to record.
struct CipherCache {
  std::mutex lock;
  cipher::Session *session = nullptr;
  const void *prepared_for = nullptr; // keyTextTaken when the session was made
  std::vector<std::uint8_t> ciphertext;
};
CipherCache g_cache;

constexpr char HexDigit(std::uint8_t nibble) {
  return static_cast<char>(nibble + (nibble > 9 ? 'a' - 10 : '0'));
}

#if defined(__SSE2__) || defined(_M_X64)
// 16 bytes to 32 digits in a handful of instructions: both nibbles of every
// byte become digits side by side, then interleave high digit first.
void HexBlock(char *out, const std::uint8_t *bytes) {
  const __m128i in = _mm_loadu_si128(reinterpret_cast<const __m128i *>(bytes));
  const __m128i nibble = _mm_set1_epi8(0x0f);
  const auto digits = [](__m128i n) {
    const __m128i letter = _mm_cmpgt_epi8(n, _mm_set1_epi8(9)); // nibbles are 0..15
    return _mm_add_epi8(_mm_add_epi8(n, _mm_set1_epi8('0')),
                        _mm_and_si128(letter, _mm_set1_epi8('a' - '0' - 10)));
  };
  const __m128i high = digits(_mm_and_si128(_mm_srli_epi16(in, 4), nibble));
  const __m128i low = digits(_mm_and_si128(in, nibble));
  _mm_storeu_si128(reinterpret_cast<__m128i *>(out), _mm_unpacklo_epi8(high, low));
  _mm_storeu_si128(reinterpret_cast<__m128i *>(out + 16), _mm_unpackhi_epi8(high, low));
}
#else
void HexBlock(char *out, const std::uint8_t *bytes) {
  for (int k = 0; k < 16; ++k) {
    out[2 * k] = HexDigit(static_cast<std::uint8_t>(bytes[k] >> 4));
    out[2 * k + 1] = HexDigit(static_cast<std::uint8_t>(bytes[k] & 0x0f));
  }
}
#endif

} // namespace

const KeyBlock &GetKeyBlock() { return g_key_block; }

void TakeKeyText(const char *game_id) {
  // Every event passes here; after the first, one load decides.
  if (g_key_ready.load(std::memory_order_acquire)) return;
  std::call_once(g_key_taken, [game_id] {
    std::lock_guard<std::mutex> hold(g_cache.lock);
    g_key_block.keyText = MakeKeyText(game_id ? std::string_view(game_id) : std::string_view());
    g_key_block.keyTextTaken = &g_key_block;
    g_key_ready.store(true, std::memory_order_release);
  });
}

void AppendHex(std::string &out, const std::uint8_t *bytes, std::size_t size) {
  const std::size_t start = out.size();
  out.resize(start + 2 * size);
  char *p = out.data() + start;
  // Ciphertext always comes in whole 16-byte blocks; other sizes end bytewise.
  std::size_t i = 0;
  for (; i + 16 <= size; i += 16, p += 32) HexBlock(p, bytes + i);
  for (; i < size; ++i) {
    *p++ = HexDigit(static_cast<std::uint8_t>(bytes[i] >> 4));
    *p++ = HexDigit(static_cast<std::uint8_t>(bytes[i] & 0x0f));
  }
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


} // namespace orvane
