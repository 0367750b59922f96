#include "support/decrypt_line.h"

#include "logformat/hex.h"

#include <openssl/evp.h>

#include <vector>

namespace orvane::testing {

std::optional<std::string> DecryptLine(std::string_view hex, std::string_view key_text) {
  std::vector<std::uint8_t> bytes;
  if (key_text.size() != 80 || !DecodeHex(hex, bytes)) return std::nullopt;
  const auto *key = reinterpret_cast<const unsigned char *>(key_text.data());
  std::string plain(bytes.size() + 16, '\0');
  auto *out = reinterpret_cast<unsigned char *>(plain.data());
  int first = 0, second = 0;
  EVP_CIPHER_CTX *ctx = EVP_CIPHER_CTX_new();
  const bool ok = EVP_DecryptInit_ex(ctx, EVP_aes_256_cbc(), nullptr, key, key + 64) == 1 &&
                  EVP_DecryptUpdate(ctx, out, &first, bytes.data(), static_cast<int>(bytes.size())) == 1 &&
                  EVP_DecryptFinal_ex(ctx, out + first, &second) == 1;
  EVP_CIPHER_CTX_free(ctx);
  if (!ok) return std::nullopt;
  plain.resize(static_cast<std::size_t>(first + second));
  return plain;
}

} // namespace orvane::testing
