// The EVP calls with which the tests decrypt log lines themselves, answered by
// CNG (mingw has no OpenSSL), sharing no code with the library's cipher.
// Update decrypts a whole line, padding stripped; Final adds nothing.
#pragma once
extern "C" {
struct EVP_CIPHER_CTX;
EVP_CIPHER_CTX *EVP_CIPHER_CTX_new();
void EVP_CIPHER_CTX_free(EVP_CIPHER_CTX *ctx);
const void *EVP_aes_256_cbc();
int EVP_DecryptInit_ex(EVP_CIPHER_CTX *ctx, const void *, void *, const unsigned char *key,
                       const unsigned char *iv);
int EVP_DecryptUpdate(EVP_CIPHER_CTX *ctx, unsigned char *out, int *out_size, const unsigned char *in,
                      int in_size);
int EVP_DecryptFinal_ex(EVP_CIPHER_CTX *, unsigned char *, int *out_size);
}
