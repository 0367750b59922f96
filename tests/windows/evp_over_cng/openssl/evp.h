// The few OpenSSL EVP calls with which the tests decrypt a log line on their
// own, answered by Windows CNG: mingw has no OpenSSL. They call bcrypt
// directly and share no code with the library's cipher backend; the
// known-answer vectors and the decryption of a wine-written log by the
// `openssl` tool on Linux check both against OpenSSL itself.
#pragma once

#ifdef __cplusplus
extern "C" {
#endif

typedef struct evp_cipher_ctx_st EVP_CIPHER_CTX;
typedef struct evp_cipher_st EVP_CIPHER;
typedef struct engine_st ENGINE;

EVP_CIPHER_CTX *EVP_CIPHER_CTX_new(void);
void EVP_CIPHER_CTX_free(EVP_CIPHER_CTX *ctx);
const EVP_CIPHER *EVP_aes_256_cbc(void);

// Decryption only. Update collects the ciphertext and writes nothing; Final
// decrypts it whole and strips the padding.
int EVP_DecryptInit_ex(EVP_CIPHER_CTX *ctx, const EVP_CIPHER *cipher, ENGINE *engine,
                       const unsigned char *key, const unsigned char *iv);
int EVP_DecryptUpdate(EVP_CIPHER_CTX *ctx, unsigned char *out, int *out_size,
                      const unsigned char *in, int in_size);
int EVP_DecryptFinal_ex(EVP_CIPHER_CTX *ctx, unsigned char *out, int *out_size);

#ifdef __cplusplus
}
#endif
