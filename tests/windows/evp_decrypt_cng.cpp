// AES-256-CBC decryption behind the EVP calls of openssl/evp.h, on CNG.
#include <openssl/evp.h>
#include <windows.h> // before bcrypt.h, which needs its types

#include <bcrypt.h>
#include <cstring>

struct EVP_CIPHER_CTX {
  unsigned char key[32], iv[16];
};
EVP_CIPHER_CTX *EVP_CIPHER_CTX_new() { return new EVP_CIPHER_CTX{}; }
void EVP_CIPHER_CTX_free(EVP_CIPHER_CTX *ctx) { delete ctx; }
const void *EVP_aes_256_cbc() { return nullptr; }
int EVP_DecryptFinal_ex(EVP_CIPHER_CTX *, unsigned char *, int *out_size) {
  *out_size = 0;
  return 1;
}
int EVP_DecryptInit_ex(EVP_CIPHER_CTX *ctx, const void *, void *, const unsigned char *key,
                       const unsigned char *iv) {
  std::memcpy(ctx->key, key, sizeof ctx->key);
  std::memcpy(ctx->iv, iv, sizeof ctx->iv);
  return 1;
}

int EVP_DecryptUpdate(EVP_CIPHER_CTX *ctx, unsigned char *out, int *out_size, const unsigned char *in,
                      int in_size) {
  BCRYPT_ALG_HANDLE aes = nullptr;
  BCRYPT_KEY_HANDLE key = nullptr;
  ULONG written = 0;
  const bool ok =
      BCRYPT_SUCCESS(BCryptOpenAlgorithmProvider(&aes, BCRYPT_AES_ALGORITHM, nullptr, 0)) &&
      BCRYPT_SUCCESS(BCryptSetProperty(aes, BCRYPT_CHAINING_MODE, (PUCHAR)BCRYPT_CHAIN_MODE_CBC,
                                       sizeof BCRYPT_CHAIN_MODE_CBC, 0)) &&
      BCRYPT_SUCCESS(BCryptGenerateSymmetricKey(aes, &key, nullptr, 0, ctx->key, sizeof ctx->key, 0)) &&
      BCRYPT_SUCCESS(BCryptDecrypt(key, const_cast<PUCHAR>(in), in_size, nullptr, ctx->iv, sizeof ctx->iv,
                                   out, in_size, &written, BCRYPT_BLOCK_PADDING));
  if (key != nullptr) BCryptDestroyKey(key);
  if (aes != nullptr) BCryptCloseAlgorithmProvider(aes, 0);
  *out_size = static_cast<int>(written);
  return ok;
}
