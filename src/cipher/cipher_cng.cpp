// Record cipher on Windows CNG (bcrypt.dll): part of every Windows system,
// so a game ships nothing beside the DLL for it.
#include "cipher/cipher.h"

#define WIN32_LEAN_AND_MEAN
#ifndef NOMINMAX // libstdc++ on mingw defines it already
#define NOMINMAX
#endif
#include <windows.h>

#include <bcrypt.h>

#include <climits>
#include <cstring>

namespace orvane::cipher {

// CNG documents no key handle as safe for simultaneous use by several
// threads (BCryptEncrypt, learn.microsoft.com: the key object carries the
// chaining state between calls), so a session, with its own algorithm and
// key handles, serves one thread at a time: every recording takes its own.
struct Session {
  BCRYPT_ALG_HANDLE algorithm = nullptr;
  BCRYPT_KEY_HANDLE key = nullptr;
  std::uint8_t iv[kIvSize];
};

namespace {

bool Succeeded(NTSTATUS status) { return BCRYPT_SUCCESS(status); }

void CloseCng(Session *session) {
  if (session == nullptr) return;
  if (session->key != nullptr) ::BCryptDestroyKey(session->key);
  if (session->algorithm != nullptr) ::BCryptCloseAlgorithmProvider(session->algorithm, 0);
  delete session;
}

// The key schedule is made once per session; every record starts again from
// the session's IV.
Session *OpenCng(const std::uint8_t *key, const std::uint8_t *iv) {
  auto *session = new Session;
  std::memcpy(session->iv, iv, kIvSize);
  static const wchar_t kCbc[] = BCRYPT_CHAIN_MODE_CBC;
  const bool ok =
      Succeeded(::BCryptOpenAlgorithmProvider(&session->algorithm, BCRYPT_AES_ALGORITHM, nullptr, 0)) &&
      Succeeded(::BCryptSetProperty(session->algorithm, BCRYPT_CHAINING_MODE,
                                    reinterpret_cast<PUCHAR>(const_cast<wchar_t *>(kCbc)), sizeof kCbc, 0)) &&
      Succeeded(::BCryptGenerateSymmetricKey(session->algorithm, &session->key, nullptr, 0,
                                             const_cast<PUCHAR>(key), kKeySize, 0));
  if (!ok) {
    CloseCng(session);
    return nullptr;
  }
  return session;
}

std::ptrdiff_t EncryptCng(Session *session, const std::uint8_t *in, std::size_t size, std::uint8_t *out) {
  if (size > static_cast<std::size_t>(LONG_MAX) - 2 * kBlockSize) return -1;
  // CNG leaves the last ciphertext block in the IV buffer; a copy keeps every
  // record starting from the same IV.
  std::uint8_t iv[kIvSize];
  std::memcpy(iv, session->iv, kIvSize);
  static std::uint8_t nothing = 0; // an empty record still has a valid address
  const ULONG room = static_cast<ULONG>(CiphertextSize(size));
  ULONG written = 0;
  if (!Succeeded(::BCryptEncrypt(session->key, const_cast<PUCHAR>(size ? in : &nothing),
                                 static_cast<ULONG>(size), nullptr, iv, kIvSize, out, room, &written,
                                 BCRYPT_BLOCK_PADDING)))
    return -1;
  return static_cast<std::ptrdiff_t>(written);
}

std::ptrdiff_t DecryptCng(Session *session, const std::uint8_t *in, std::size_t size, std::uint8_t *out) {
  if (size == 0 || size % kBlockSize != 0 || size > static_cast<std::size_t>(LONG_MAX / 2)) return -1;
  std::uint8_t iv[kIvSize];
  std::memcpy(iv, session->iv, kIvSize);
  ULONG written = 0;
  if (!Succeeded(::BCryptDecrypt(session->key, const_cast<PUCHAR>(in), static_cast<ULONG>(size), nullptr, iv,
                                 kIvSize, out, static_cast<ULONG>(size + kBlockSize), &written,
                                 BCRYPT_BLOCK_PADDING)))
    return -1;
  return static_cast<std::ptrdiff_t>(written);
}

const Backend kCng = {
    .name = "cng",
    .needs = "bcrypt.dll with AES-CBC",
    .open = OpenCng,
    .close = CloseCng,
    .encrypt = EncryptCng,
    .decrypt = DecryptCng,
};
Backend g_backend = kCng;

} // namespace

Backend &backend() { return g_backend; }
const Backend &native_backend() { return kCng; }

} // namespace orvane::cipher
