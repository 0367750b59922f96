#include "log_line.h"

#include "cipher/cipher.h"
#include "logformat/hex.h"
#include "logformat/key_text.h"

namespace orvane::logcat {

std::string_view FaultText(LineFault fault) {
  switch (fault) {
  case LineFault::kNone: return "good record";
  case LineFault::kNotHex: return "not lowercase hex";
  case LineFault::kNotBlocks: return "not whole 16-byte blocks of hex";
  case LineFault::kBadPadding:
    return "does not decrypt under any key tried (a damaged line, or written by a process whose "
           "first game id is not among them: name it with --key-game-id)";
  case LineFault::kNotRecord: return "decrypts, but is not a JSON object with the five record members";
  }
  return "unknown fault";
}

LogKey OpenLogKey(std::string_view key_game_id) {
  const KeyText text = MakeKeyText(key_game_id);
  return {cipher::backend().open(text.data() + kKeyOffset, text.data() + kIvOffset)};
}

void CloseLogKey(LogKey &key) {
  if (key.session != nullptr) cipher::backend().close(key.session);
  key.session = nullptr;
}

LineFault TakeCiphertext(std::string_view line, LineBuffers &buffers) {
  if (line.empty() || line.size() % (2 * cipher::kBlockSize) != 0)
    return IsLowerHex(line) ? LineFault::kNotBlocks : LineFault::kNotHex;
  return DecodeHex(line, buffers.ciphertext) ? LineFault::kNone : LineFault::kNotHex;
}

LineFault DecryptRecord(const LogKey &key, LineBuffers &buffers, EventRecord &record) {
  const std::size_t size = buffers.ciphertext.size();
  buffers.plaintext.resize(size + cipher::kBlockSize);
  const std::ptrdiff_t plain =
      cipher::backend().decrypt(key.session, buffers.ciphertext.data(), size, buffers.plaintext.data());
  if (plain < 0) return LineFault::kBadPadding;
  const std::string_view text(reinterpret_cast<const char *>(buffers.plaintext.data()),
                              static_cast<std::size_t>(plain));
  return ParseEventRecord(text, record) ? LineFault::kNone : LineFault::kNotRecord;
}

} // namespace orvane::logcat
