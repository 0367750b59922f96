// The one independent decryption of log lines, shared by the tests and the
// fuzzer: the key text is built here and the line decrypted by OpenSSL's EVP
// calls (by CNG on Windows), never by the library's cipher code.
#pragma once

#include <optional>
#include <string>
#include <string_view>

namespace orvane::testing {

// "OrvaneLogKey-01", the first 65 bytes of `game_id`, zeros to 80 bytes.
inline std::string KeyTextFor(std::string_view game_id) {
  std::string key = "OrvaneLogKey-01";
  key.append(game_id.substr(0, 65)).resize(80, '\0');
  return key;
}
// AES-256-CBC with key bytes 0-31 and IV bytes 64-79 of `key_text`; nullopt
// when `hex` is not lowercase hex or does not decrypt with valid padding.
std::optional<std::string> DecryptLine(std::string_view hex, std::string_view key_text);

} // namespace orvane::testing
