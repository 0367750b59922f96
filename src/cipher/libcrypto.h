// The libcrypto functions the OpenSSL backend calls, taken from the system's
// libcrypto at the first record instead of being linked: OpenSSL 3
// (libcrypto.so.3) where the player has it, else OpenSSL 1.1
// (libcrypto.so.1.1), whose signatures of these functions are the same. The
// system's copy keeps getting its security updates, and a system with
// neither still loads the library; only its records then fail.
#pragma once

#include <openssl/crypto.h>
#include <openssl/err.h>
#include <openssl/evp.h>

#include <span>

namespace orvane::cipher {

struct LibCrypto {
  decltype(&OPENSSL_init_crypto) init_crypto;
  decltype(&EVP_aes_256_cbc) aes_256_cbc;
  decltype(&EVP_CIPHER_CTX_new) ctx_new;
  decltype(&EVP_CIPHER_CTX_free) ctx_free;
  decltype(&EVP_CipherInit_ex) cipher_init;
  decltype(&EVP_EncryptInit_ex) encrypt_init;
  decltype(&EVP_EncryptUpdate) encrypt_update;
  decltype(&EVP_DecryptInit_ex) decrypt_init;
  decltype(&EVP_DecryptUpdate) decrypt_update;
  decltype(&EVP_DecryptFinal_ex) decrypt_final;
  decltype(&ERR_clear_error) clear_error;
};

// Loads the first of `names` that exists and takes every function from it.
// False when none loads or the one that loads lacks a function.
bool LoadLibCrypto(std::span<const char *const> names, LibCrypto &functions);

// The process's libcrypto, loaded and initialised by the first call of any
// thread; null when the system has neither version.
const LibCrypto *SystemLibCrypto();

} // namespace orvane::cipher
