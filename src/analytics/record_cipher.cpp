#include "analytics/record_cipher.h"

#include "logformat/hex.h"

#include <atomic>
#include <cstring>

namespace orvane {
namespace {

KeyBlock g_key_block;
std::atomic<bool> g_key_ready{false};

} // namespace

const KeyBlock &GetKeyBlock() { return g_key_block; }

void TakeKeyText(const char *game_id) {
  // Every event passes here; after the first, one load decides.
  if (g_key_ready.load(std::memory_order_acquire)) return;
  // The first caller runs it while the others wait, as with std::call_once,
  // whose pthread_once has glibc 2.34's version, which older systems refuse.
  static const bool taken = [game_id] {
    g_key_block.keyText = MakeKeyText(game_id ? std::string_view(game_id) : std::string_view());
    g_key_block.keyTextTaken = &g_key_block;
    g_key_ready.store(true, std::memory_order_release);
    return true;
  }();
  (void)taken;
}

RecordCipher::~RecordCipher() {
  if (session != nullptr) cipher::backend().close(session);
}

bool EncryptRecordText(RecordCipher &state, std::string_view record, std::string &hex) {
  const cipher::Backend &backend = cipher::backend();
  // Key and IV follow the key block: an encryption before the first event
  // uses the all-zero key text, and the session is made again once it fills.
  // The block is read only after TakeKeyText published it (or before any
  // event, when it is all zero and stays so until then).
  const void *taken = g_key_ready.load(std::memory_order_acquire) ? g_key_block.keyTextTaken : nullptr;
  if (state.session == nullptr || state.prepared_for != taken) {
    if (state.session != nullptr) backend.close(state.session);
    state.session =
        backend.open(g_key_block.keyText.data() + kKeyOffset, g_key_block.keyText.data() + kIvOffset);
    state.prepared_for = taken;
    if (state.session == nullptr) return false;
  }
  state.ciphertext.resize(cipher::CiphertextSize(record.size()));
  const std::ptrdiff_t size =
      backend.encrypt(state.session, reinterpret_cast<const std::uint8_t *>(record.data()), record.size(),
                      state.ciphertext.data());
  if (size < 0) return false;
  AppendHex(hex, state.ciphertext.data(), static_cast<std::size_t>(size));
  return true;
}

} // namespace orvane
