#include "analytics/record_cipher.h"

#include "logformat/hex.h"

namespace orvane {

const KeyText &TakeKeyText(const char *game_id) {
  // Initialised once, by whichever thread comes first; later events pay one
  // load of the guard.
  static const KeyText key_text = MakeKeyText(game_id ? std::string_view(game_id) : std::string_view());
  return key_text;
}

RecordCipher::~RecordCipher() {
  if (session != nullptr) cipher::backend().close(session);
}

bool EncryptRecordText(RecordCipher &state, const KeyText &key_text, std::string_view record,
                       std::string &hex) {
  const cipher::Backend &backend = cipher::backend();
  if (state.session == nullptr) {
    state.session = backend.open(key_text.data() + kKeyOffset, key_text.data() + kIvOffset);
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
