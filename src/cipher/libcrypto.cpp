#include "cipher/libcrypto.h"

#include "platform/shared_library.h"

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
  return lib != nullptr && Take(lib, "OPENSSL_init_crypto", f.init_crypto) &&
         Take(lib, "EVP_aes_256_cbc", f.aes_256_cbc) && Take(lib, "EVP_CIPHER_CTX_new", f.ctx_new) &&
         Take(lib, "EVP_CIPHER_CTX_free", f.ctx_free) && Take(lib, "EVP_CipherInit_ex", f.cipher_init) &&
         Take(lib, "EVP_EncryptInit_ex", f.encrypt_init) &&
         Take(lib, "EVP_EncryptUpdate", f.encrypt_update) &&
         Take(lib, "EVP_DecryptInit_ex", f.decrypt_init) &&
         Take(lib, "EVP_DecryptUpdate", f.decrypt_update) &&
         Take(lib, "EVP_DecryptFinal_ex", f.decrypt_final) && Take(lib, "ERR_clear_error", f.clear_error);
}

const LibCrypto *SystemLibCrypto() {
  // A function-local static: other threads wait while the first one loads,
  // and nothing is registered for the exit (the table is plain data).
  static LibCrypto functions;
  static const bool loaded = [] {
    static constexpr const char *kNames[] = {"libcrypto.so.3", "libcrypto.so.1.1"};
    // OpenSSL's own exit-time clean-up would free its state while a game's
    // exit handlers or other threads may still record; the process's end
    // frees it.
    return LoadLibCrypto(kNames, functions) && functions.init_crypto(OPENSSL_INIT_NO_ATEXIT, nullptr) == 1;
  }();
  return loaded ? &functions : nullptr;
}

} // namespace orvane::cipher
