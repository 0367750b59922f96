// The tests' own decryption on Windows, where mingw has no OpenSSL: CNG
// called here directly, sharing no code with the library's CNG backend.
#include "support/decrypt_line.h"

#include "logformat/hex.h"

#include <windows.h> // before bcrypt.h, which needs its types

#include <bcrypt.h>
#include <vector>

namespace orvane::testing {

std::optional<std::string> DecryptLine(std::string_view hex, std::string_view key_text) {
  std::vector<std::uint8_t> bytes;
  if (key_text.size() != 80 || !DecodeHex(hex, bytes)) return std::nullopt;
  std::string plain(bytes.size(), '\0'), key(key_text.substr(0, 32)), iv(key_text.substr(64, 16));
  BCRYPT_ALG_HANDLE aes = nullptr;
  BCRYPT_KEY_HANDLE handle = nullptr;
  ULONG size = 0;
  const bool ok =
      BCRYPT_SUCCESS(BCryptOpenAlgorithmProvider(&aes, BCRYPT_AES_ALGORITHM, nullptr, 0)) &&
      BCRYPT_SUCCESS(BCryptSetProperty(aes, BCRYPT_CHAINING_MODE, (PUCHAR)BCRYPT_CHAIN_MODE_CBC,
                                       sizeof BCRYPT_CHAIN_MODE_CBC, 0)) &&
      BCRYPT_SUCCESS(BCryptGenerateSymmetricKey(aes, &handle, nullptr, 0, (PUCHAR)key.data(), 32, 0)) &&
      BCRYPT_SUCCESS(BCryptDecrypt(handle, bytes.data(), static_cast<ULONG>(bytes.size()), nullptr,
                                   (PUCHAR)iv.data(), 16, (PUCHAR)plain.data(),
                                   static_cast<ULONG>(plain.size()), &size, BCRYPT_BLOCK_PADDING));
  if (handle != nullptr) BCryptDestroyKey(handle);
  if (aes != nullptr) BCryptCloseAlgorithmProvider(aes, 0);
  if (!ok) return std::nullopt;
  plain.resize(size);
  return plain;
}

} // namespace orvane::testing
