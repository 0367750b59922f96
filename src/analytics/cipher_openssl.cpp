// Record cipher on OpenSSL's libcrypto (EVP interface).
#include "analytics/cipher.h"

#include <openssl/err.h>
#include <openssl/evp.h>

#include <cstdio>
#include <cstring>

namespace orvane::cipher {

struct Session {
  EVP_CIPHER_CTX *encrypt = nullptr;
  EVP_CIPHER_CTX *decrypt = nullptr;
  std::uint8_t iv[kIvSize];
};

namespace {

// The key schedule is computed once per session; each record only resets the
// IV, which gives the same bytes as a fresh context.
EVP_CIPHER_CTX *NewContext(const std::uint8_t *key, const std::uint8_t *iv, int encrypt) {
  EVP_CIPHER_CTX *ctx = EVP_CIPHER_CTX_new();
  if (ctx == nullptr) return nullptr;
  if (EVP_CipherInit_ex(ctx, EVP_aes_256_cbc(), nullptr, key, iv, encrypt) != 1) {
    EVP_CIPHER_CTX_free(ctx);
    return nullptr;
  }
  return ctx;
}

void CloseOpenSsl(Session *session) {
  if (session == nullptr) return;
  EVP_CIPHER_CTX_free(session->encrypt);
  EVP_CIPHER_CTX_free(session->decrypt);
  delete session;
}

Session *OpenOpenSsl(const std::uint8_t *key, const std::uint8_t *iv) {
  auto *session = new Session;
  std::memcpy(session->iv, iv, kIvSize);
  session->encrypt = NewContext(key, iv, 1);
  session->decrypt = NewContext(key, iv, 0);
  if (session->encrypt == nullptr || session->decrypt == nullptr) {
    ERR_print_errors_fp(stderr);
    CloseOpenSsl(session);
    return nullptr;
  }
  return session;
}

std::ptrdiff_t EncryptOpenSsl(Session *session, const std::uint8_t *in, std::size_t size,
                              std::uint8_t *out) {
  EVP_CIPHER_CTX *ctx = session->encrypt;
  int first = 0, second = 0;
  if (size > static_cast<std::size_t>(INT32_MAX - 2 * kBlockSize) ||
      EVP_EncryptInit_ex(ctx, nullptr, nullptr, nullptr, session->iv) != 1 ||
      EVP_EncryptUpdate(ctx, out, &first, in, static_cast<int>(size)) != 1 ||
      EVP_EncryptFinal_ex(ctx, out + first, &second) != 1) {
    ERR_print_errors_fp(stderr);
    return -1;
  }
  return first + second;
}

std::ptrdiff_t DecryptOpenSsl(Session *session, const std::uint8_t *in, std::size_t size,
                              std::uint8_t *out) {
  EVP_CIPHER_CTX *ctx = session->decrypt;
  int first = 0, second = 0;
  if (size == 0 || size % kBlockSize != 0 || size > static_cast<std::size_t>(INT32_MAX / 2))
    return -1;
  // The padding check writes nothing past `size`: OpenSSL holds back the last
  // block until the final call.
  bool ok = EVP_DecryptInit_ex(ctx, nullptr, nullptr, nullptr, session->iv) == 1 &&
            EVP_DecryptUpdate(ctx, out, &first, in, static_cast<int>(size)) == 1 &&
            EVP_DecryptFinal_ex(ctx, out + first, &second) == 1;
  if (!ok) {
    ERR_clear_error();
    return -1;
  }
  return first + second;
}

const Backend kOpenSsl = {OpenOpenSsl, CloseOpenSsl, EncryptOpenSsl, DecryptOpenSsl};
Backend g_backend = kOpenSsl;

} // namespace

Backend &backend() { return g_backend; }
const Backend &native_backend() { return kOpenSsl; }

} // namespace orvane::cipher
