#include "logformat/hex.h"

#include <array>

#if defined(__SSE2__) || defined(_M_X64)
#include <emmintrin.h>
#endif

namespace orvane {
namespace {

constexpr char HexDigit(std::uint8_t nibble) {
  return static_cast<char>(nibble + (nibble > 9 ? 'a' - 10 : '0'));
}

// Both digits of each byte, high nibble first.
void HexBytes(char *out, const std::uint8_t *bytes, std::size_t size) {
  for (std::size_t i = 0; i < size; ++i) {
    *out++ = HexDigit(static_cast<std::uint8_t>(bytes[i] >> 4));
    *out++ = HexDigit(static_cast<std::uint8_t>(bytes[i] & 0x0f));
  }
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
void HexBlock(char *out, const std::uint8_t *bytes) { HexBytes(out, bytes, 16); }
#endif

// Each byte's value as a lowercase hex digit, or -1: one lookup per
// character, since reading a folder is mostly turning hex into bytes.
constexpr std::array<std::int8_t, 256> kHexValue = [] {
  std::array<std::int8_t, 256> value{};
  value.fill(-1);
  for (int c = 0; c < 16; ++c)
    value[static_cast<unsigned char>("0123456789abcdef"[c])] = static_cast<std::int8_t>(c);
  return value;
}();

} // namespace

void AppendHex(std::string &out, const std::uint8_t *bytes, std::size_t size) {
  const std::size_t start = out.size();
  out.resize(start + 2 * size);
  char *p = out.data() + start;
  // Ciphertext always comes in whole 16-byte blocks; other sizes end bytewise.
  std::size_t i = 0;
  for (; i + 16 <= size; i += 16, p += 32) HexBlock(p, bytes + i);
  HexBytes(p, bytes + i, size - i);
}

bool IsLowerHex(std::string_view text) {
  for (const char c : text)
    if (kHexValue[static_cast<unsigned char>(c)] < 0) return false;
  return true;
}

bool DecodeHex(std::string_view hex, std::vector<std::uint8_t> &bytes) {
  if (hex.size() % 2 != 0) return false;
  bytes.resize(hex.size() / 2);
  for (std::size_t i = 0; i < bytes.size(); ++i) {
    const int high = kHexValue[static_cast<unsigned char>(hex[2 * i])];
    const int low = kHexValue[static_cast<unsigned char>(hex[2 * i + 1])];
    if ((high | low) < 0) return false;
    bytes[i] = static_cast<std::uint8_t>(high << 4 | low);
  }
  return true;
}

} // namespace orvane
