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
#include <openssl/provider.h>

#include <atomic>
#include <cstdint>
#include <mutex>
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
  // OpenSSL 3 only, all four or none: the library context of our own.
  decltype(&OSSL_LIB_CTX_new) lib_ctx_new;
  decltype(&OSSL_LIB_CTX_free) lib_ctx_free;
  decltype(&OSSL_PROVIDER_load) provider_load;
  decltype(&EVP_CIPHER_fetch) cipher_fetch;
  // The cipher every context is made with, and with OpenSSL 3 the context it
  // comes from, set by InitLibCrypto.
  const EVP_CIPHER *aes;
  OSSL_LIB_CTX *context;
};

// Loads the first of `names` that exists and takes every function from it.
// False when none loads or the one that loads lacks a function.
bool LoadLibCrypto(std::span<const char *const> names, LibCrypto &functions);

// Initialises loaded functions and sets `aes`; false when any step failed,
// and then nothing of it is to be used. With OpenSSL 3 the cipher comes from
// a library context of our own with the default provider in it, which reads
// no configuration file: what the system's or the game's configuration sets
// (default properties, providers) neither decides whether records are
// written nor costs the first event its reading. OpenSSL 1.1 reads none
// unless asked to.
bool InitLibCrypto(LibCrypto &functions);

// A libcrypto loaded and initialised once for good, a failed attempt tried
// again by a later call at the earliest kRetryMilliseconds on: a load can
// fail for a passing reason (no descriptor free), and the process must not
// lose its records for that.
struct LibCryptoLoader {
  static constexpr std::int64_t kRetryMilliseconds = 1000;
  std::mutex mutex;
  std::atomic<const LibCrypto *> ready{nullptr};
  std::int64_t next_try = INT64_MIN; // under `mutex`
  LibCrypto functions{};
};
// The loader's libcrypto, or null while it has none; `now` is a steady clock
// in milliseconds.
const LibCrypto *LoadLibCryptoOnce(LibCryptoLoader &loader, std::span<const char *const> names,
                                   std::int64_t now);

// The process's libcrypto; null while the system gives none.
const LibCrypto *SystemLibCrypto();

} // namespace orvane::cipher
