#include "cipher/libcrypto.h"

#include "platform/shared_library.h"

#include <chrono>

namespace orvane::cipher {
namespace {

template <typename Function>
bool Take(void *library, const char *name, Function &function) {
  function = reinterpret_cast<Function>(platform::FindSymbol(library, name));
  return function != nullptr;
}

} // namespace

bool LoadLibCrypto(std::span<const char *const> names, LibCrypto &f) {
  void *lib = platform::OpenSystemLibrary(names);
  if (lib == nullptr) return false;
  const bool version3 = Take(lib, "OSSL_LIB_CTX_new", f.lib_ctx_new) &&
                        Take(lib, "OSSL_LIB_CTX_free", f.lib_ctx_free) &&
                        Take(lib, "OSSL_PROVIDER_load", f.provider_load) &&
                        Take(lib, "EVP_CIPHER_fetch", f.cipher_fetch);
  if (!version3) f.lib_ctx_new = nullptr;
  return Take(lib, "OPENSSL_init_crypto", f.init_crypto) && Take(lib, "EVP_aes_256_cbc", f.aes_256_cbc) &&
         Take(lib, "EVP_CIPHER_CTX_new", f.ctx_new) && Take(lib, "EVP_CIPHER_CTX_free", f.ctx_free) &&
         Take(lib, "EVP_CipherInit_ex", f.cipher_init) && Take(lib, "EVP_EncryptInit_ex", f.encrypt_init) &&
         Take(lib, "EVP_EncryptUpdate", f.encrypt_update) &&
         Take(lib, "EVP_DecryptInit_ex", f.decrypt_init) &&
         Take(lib, "EVP_DecryptUpdate", f.decrypt_update) &&
         Take(lib, "EVP_DecryptFinal_ex", f.decrypt_final) && Take(lib, "ERR_clear_error", f.clear_error);
}

bool InitLibCrypto(LibCrypto &f) {
  // OpenSSL's own exit-time clean-up would free its state while a game's
  // exit handlers or other threads may still record; the process's end
  // frees it. An initialisation that failed (memory exhausted) leaves state
  // that must not be used.
  if (f.init_crypto(OPENSSL_INIT_NO_ATEXIT, nullptr) != 1) return false;
  if (f.lib_ctx_new == nullptr) {
    f.aes = f.aes_256_cbc();
    return f.aes != nullptr;
  }
  // The context holds the provider and the cipher fetched from it; freeing
  // it after a failure frees most of that (the provider's few hundred bytes
  // stay, at most once a second).
  f.context = f.lib_ctx_new();
  f.aes = f.context != nullptr && f.provider_load(f.context, "default") != nullptr
              ? f.cipher_fetch(f.context, "AES-256-CBC", nullptr)
              : nullptr;
  if (f.aes != nullptr) return true;
  f.lib_ctx_free(f.context);
  f.context = nullptr;
  f.clear_error();
  return false;
}

const LibCrypto *LoadLibCryptoOnce(LibCryptoLoader &loader, std::span<const char *const> names,
                                   std::int64_t now) {
  if (const LibCrypto *ready = loader.ready.load(std::memory_order_acquire)) return ready;
  const std::lock_guard<std::mutex> hold(loader.mutex);
  if (const LibCrypto *ready = loader.ready.load(std::memory_order_relaxed)) return ready;
  if (now < loader.next_try) return nullptr;
  loader.next_try = now + LibCryptoLoader::kRetryMilliseconds;
  if (!LoadLibCrypto(names, loader.functions) || !InitLibCrypto(loader.functions)) return nullptr;
  loader.ready.store(&loader.functions, std::memory_order_release);
  return &loader.functions;
}

const LibCrypto *SystemLibCrypto() {
  // Constant-initialised apart from its mutex, and never destroyed: records
  // may come from the game's exit handlers.
  static LibCryptoLoader *const loader = new LibCryptoLoader;
  static constexpr const char *kNames[] = {"libcrypto.so.3", "libcrypto.so.1.1"};
  const auto now = std::chrono::steady_clock::now().time_since_epoch();
  return LoadLibCryptoOnce(*loader, kNames, std::chrono::duration_cast<std::chrono::milliseconds>(now).count());
}

} // namespace orvane::cipher
