// The record cipher: AES-256-CBC with PKCS#7 padding, one record at a time,
// every record from the same IV. This folder owns the cipher interface and
// its backends; the build picks one by name (OpenSSL or Windows CNG), and
// both give the same bytes.
#pragma once

#include <cstddef>
#include <cstdint>

namespace orvane::cipher {

inline constexpr std::size_t kKeySize = 32;
inline constexpr std::size_t kIvSize = 16;
inline constexpr std::size_t kBlockSize = 16;

// Ciphertext size of a record of `size` bytes: padding always adds 1 to 16.
constexpr std::size_t CiphertextSize(std::size_t size) { return (size / kBlockSize + 1) * kBlockSize; }

// Backend state prepared for one key and IV.
struct Session;

struct Backend {
  const char *name;  // "openssl", "cng": what the build chose, for reports
  const char *needs; // what it needs of the system, for a reader's failure report
  // Null on failure. No backend prints anything: a failure reaches the game
  // through the recorder's message to the host callback.
  Session *(*open)(const std::uint8_t *key, const std::uint8_t *iv);
  void (*close)(Session *session);
  // Encrypts `size` bytes into `out` (room for CiphertextSize(size) bytes).
  // Returns the bytes written, or -1.
  std::ptrdiff_t (*encrypt)(Session *session, const std::uint8_t *in, std::size_t size, std::uint8_t *out);
  // Decrypts whole blocks into `out` (room for `size` + 16 bytes) and strips the
  // padding. Returns the plaintext size, or -1 for a wrong length or bad
  // padding.
  std::ptrdiff_t (*decrypt)(Session *session, const std::uint8_t *in, std::size_t size, std::uint8_t *out);
};

// The live table; tests replace entries to make the cipher fail.
Backend &backend();
const Backend &native_backend();

} // namespace orvane::cipher
