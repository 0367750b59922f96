// AES-256-CBC decryption behind the EVP calls of openssl/evp.h, on CNG.
#include <openssl/evp.h>

#include <windows.h>

#include <bcrypt.h>

#include <cstring>
#include <vector>

struct evp_cipher_ctx_st {
  unsigned char key[32];
  unsigned char iv[16];
  std::vector<unsigned char> ciphertext;
};
struct evp_cipher_st {
  int unused;
};

extern "C" {

EVP_CIPHER_CTX *EVP_CIPHER_CTX_new(void) { return new evp_cipher_ctx_st{}; }

void EVP_CIPHER_CTX_free(EVP_CIPHER_CTX *ctx) { delete ctx; }

const EVP_CIPHER *EVP_aes_256_cbc(void) {
  static const evp_cipher_st kAes256Cbc{0};
  return &kAes256Cbc;
}

int EVP_DecryptInit_ex(EVP_CIPHER_CTX *ctx, const EVP_CIPHER *cipher, ENGINE *,
                       const unsigned char *key, const unsigned char *iv) {
  if (ctx == nullptr || cipher != EVP_aes_256_cbc() || key == nullptr || iv == nullptr) return 0;
  std::memcpy(ctx->key, key, sizeof ctx->key);
  std::memcpy(ctx->iv, iv, sizeof ctx->iv);
  ctx->ciphertext.clear();
  return 1;
}

int EVP_DecryptUpdate(EVP_CIPHER_CTX *ctx, unsigned char *, int *out_size, const unsigned char *in,
                      int in_size) {
  if (in_size < 0) return 0;
  ctx->ciphertext.insert(ctx->ciphertext.end(), in, in + in_size);
  *out_size = 0;
  return 1;
}

int EVP_DecryptFinal_ex(EVP_CIPHER_CTX *ctx, unsigned char *out, int *out_size) {
  *out_size = 0;
  const std::vector<unsigned char> &in = ctx->ciphertext;
  if (in.empty() || in.size() % 16 != 0) return 0;
  static const wchar_t kCbc[] = BCRYPT_CHAIN_MODE_CBC;
  BCRYPT_ALG_HANDLE algorithm = nullptr;
  BCRYPT_KEY_HANDLE key = nullptr;
  ULONG written = 0;
  bool ok =
      BCRYPT_SUCCESS(BCryptOpenAlgorithmProvider(&algorithm, BCRYPT_AES_ALGORITHM, nullptr, 0)) &&
      BCRYPT_SUCCESS(BCryptSetProperty(algorithm, BCRYPT_CHAINING_MODE,
                                       reinterpret_cast<PUCHAR>(const_cast<wchar_t *>(kCbc)),
                                       sizeof kCbc, 0)) &&
      BCRYPT_SUCCESS(
          BCryptGenerateSymmetricKey(algorithm, &key, nullptr, 0, ctx->key, sizeof ctx->key, 0));
  // The caller's buffer holds the ciphertext size plus one block, as with
  // OpenSSL; the padding is checked and stripped by CNG.
  std::vector<unsigned char> plain(in.size());
  ok = ok && BCRYPT_SUCCESS(BCryptDecrypt(key, const_cast<PUCHAR>(in.data()),
                                          static_cast<ULONG>(in.size()), nullptr, ctx->iv,
                                          sizeof ctx->iv, plain.data(),
                                          static_cast<ULONG>(plain.size()), &written,
                                          BCRYPT_BLOCK_PADDING));
  if (key != nullptr) BCryptDestroyKey(key);
  if (algorithm != nullptr) BCryptCloseAlgorithmProvider(algorithm, 0);
  if (!ok) return 0;
  std::memcpy(out, plain.data(), written);
  *out_size = static_cast<int>(written);
  return 1;
}

} // extern "C"
