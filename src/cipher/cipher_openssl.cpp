// Record cipher on OpenSSL's libcrypto (EVP interface), the system's own
// copy found at the first record (cipher/libcrypto.h). Failures are returned,
// never printed: the host callback is the library's only voice.
#include "cipher/cipher.h"
#include "cipher/libcrypto.h"

#include <cstring>

namespace orvane::cipher {

struct Session {
  const LibCrypto *crypto = nullptr;
  EVP_CIPHER_CTX *encrypt = nullptr;
  EVP_CIPHER_CTX *decrypt = nullptr; // made by the first decryption: only a reader needs one
  std::uint8_t key[kKeySize];
  std::uint8_t iv[kIvSize];
  // The block that the encrypt context chains its next block with: the IV
  // while nothing was encrypted, then the last ciphertext block.
  std::uint8_t chain[kIvSize];
};

namespace {

// The key schedule is computed once per session, and the cipher is fetched
// once with it.
EVP_CIPHER_CTX *NewContext(const LibCrypto &crypto, const std::uint8_t *key, const std::uint8_t *iv,
                           int encrypt) {
  EVP_CIPHER_CTX *ctx = crypto.ctx_new();
  if (ctx == nullptr) return nullptr;
  if (crypto.cipher_init(ctx, crypto.aes, nullptr, key, iv, encrypt) != 1) {
    crypto.ctx_free(ctx);
    return nullptr;
  }
  return ctx;
}

void CloseOpenSsl(Session *session) {
  if (session == nullptr) return;
  session->crypto->ctx_free(session->encrypt);
  session->crypto->ctx_free(session->decrypt);
  delete session;
}

Session *OpenOpenSsl(const std::uint8_t *key, const std::uint8_t *iv) {
  const LibCrypto *crypto = SystemLibCrypto();
  if (crypto == nullptr) return nullptr; // neither OpenSSL 3 nor 1.1 on this system
  auto *session = new Session;
  session->crypto = crypto;
  std::memcpy(session->key, key, kKeySize);
  std::memcpy(session->iv, iv, kIvSize);
  std::memcpy(session->chain, iv, kIvSize);
  // Records are padded here and the encryption is never finished, so the
  // context only ever sees whole blocks and its own padding never applies.
  session->encrypt = NewContext(*crypto, key, iv, 1);
  if (session->encrypt == nullptr) {
    crypto->clear_error();
    CloseOpenSsl(session);
    return nullptr;
  }
  return session;
}

// Every record starts from the session's IV. Setting the IV again costs more
// than the record's own blocks, so the context instead runs on as one CBC
// stream, and the record's first block is masked with IV xor the stream's
// last block: CBC then encrypts IV xor block, exactly as a fresh context
// would. The padded record is built in `out` and encrypted in place, which
// the EVP interface allows.
std::ptrdiff_t EncryptOpenSsl(Session *session, const std::uint8_t *in, std::size_t size, std::uint8_t *out) {
  EVP_CIPHER_CTX *ctx = session->encrypt;
  if (size > static_cast<std::size_t>(INT32_MAX - 2 * kBlockSize)) return -1;
  const std::size_t total = CiphertextSize(size);
  if (size != 0) std::memmove(out, in, size);
  // PKCS#7: every padding byte holds the padding length.
  std::memset(out + size, static_cast<int>(total - size), total - size);
  for (std::size_t i = 0; i < kBlockSize; ++i) out[i] ^= session->iv[i] ^ session->chain[i];
  int written = 0;
  const LibCrypto &crypto = *session->crypto;
  if (crypto.encrypt_update(ctx, out, &written, out, static_cast<int>(total)) != 1 ||
      written != static_cast<int>(total)) {
    crypto.clear_error();
    // The stream's state is unknown now: it starts again from the IV.
    crypto.encrypt_init(ctx, nullptr, nullptr, nullptr, session->iv);
    std::memcpy(session->chain, session->iv, kIvSize);
    return -1;
  }
  std::memcpy(session->chain, out + total - kBlockSize, kBlockSize);
  return written;
}

std::ptrdiff_t DecryptOpenSsl(Session *session, const std::uint8_t *in, std::size_t size, std::uint8_t *out) {
  if (size > static_cast<std::size_t>(INT32_MAX / 2)) return -1;
  const LibCrypto &crypto = *session->crypto;
  if (session->decrypt == nullptr) session->decrypt = NewContext(crypto, session->key, session->iv, 0);
  EVP_CIPHER_CTX *ctx = session->decrypt;
  if (ctx == nullptr) {
    crypto.clear_error();
    return -1;
  }
  int first = 0;
  int second = 0;
  // The final call refuses empty input, a partial block and bad padding, and
  // nothing is written past `size`: OpenSSL holds back the last block until then.
  bool ok = crypto.decrypt_init(ctx, nullptr, nullptr, nullptr, session->iv) == 1 &&
            crypto.decrypt_update(ctx, out, &first, in, static_cast<int>(size)) == 1 &&
            crypto.decrypt_final(ctx, out + first, &second) == 1;
  if (!ok) {
    crypto.clear_error();
    return -1;
  }
  return first + second;
}

constexpr char kNeeds[] = "OpenSSL's libcrypto.so.3 or libcrypto.so.1.1";
const Backend kOpenSsl = {
    .name = "openssl",
    .needs = kNeeds,
    .open = OpenOpenSsl,
    .close = CloseOpenSsl,
    .encrypt = EncryptOpenSsl,
    .decrypt = DecryptOpenSsl,
};
Backend g_backend = kOpenSsl;

} // namespace

Backend &backend() { return g_backend; }
const Backend &native_backend() { return kOpenSsl; }

} // namespace orvane::cipher
