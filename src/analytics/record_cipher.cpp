#include "analytics/record_cipher.h"

#include <atomic>
#include <cstring>
#include <mutex>

#if defined(__SSE2__) || defined(_M_X64)
#include <emmintrin.h>
#endif

namespace orvane {
namespace {

KeyBlock g_key_block;
std::once_flag g_key_taken;
std::atomic<bool> g_key_ready{false};

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
    g_key_block.keyText = MakeKeyText(game_id ? std::string_view(game_id) : std::string_view());
    g_key_block.keyTextTaken = &g_key_block;
    g_key_ready.store(true, std::memory_order_release);
  });
}

RecordCipher::~RecordCipher() {
  if (session != nullptr) cipher::backend().close(session);
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

bool EncryptRecordText(RecordCipher &state, std::string_view record, std::string &hex) {
  const cipher::Backend &backend = cipher::backend();
  // Key and IV follow the key block: an encryption before the first event
  // uses the all-zero key text, and the session is made again once it fills.
  // The block is read only after TakeKeyText published it (or before any
  // event, when it is all zero and stays so until then).
  const void *taken = g_key_ready.load(std::memory_order_acquire) ? g_key_block.keyTextTaken : nullptr;
  if (state.session == nullptr || state.prepared_for != taken) {
    if (state.session != nullptr) backend.close(state.session);
    state.session = backend.open(g_key_block.keyText.data() + kKeyOffset,
                                 g_key_block.keyText.data() + kIvOffset);
    state.prepared_for = taken;
    if (state.session == nullptr) return false;
  }
  state.ciphertext.resize(cipher::CiphertextSize(record.size()));
  const std::ptrdiff_t size =
      backend.encrypt(state.session, reinterpret_cast<const std::uint8_t *>(record.data()),
                      record.size(), state.ciphertext.data());
  if (size < 0) return false;
  AppendHex(hex, state.ciphertext.data(), static_cast<std::size_t>(size));
  return true;
}

} // namespace orvane
