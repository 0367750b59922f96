#include "log_line.h"

#include "analytics/cipher.h"
#include "analytics/key_text.h"

namespace orvane::logcat {
namespace {

int LowerHexValue(char c) {
  if (c >= '0' && c <= '9') return c - '0';
  if (c >= 'a' && c <= 'f') return c - 'a' + 10;
  return -1;
}

} // namespace

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
  for (char c : line)
    if (LowerHexValue(c) < 0) return LineFault::kNotHex;
  if (line.empty() || line.size() % (2 * cipher::kBlockSize) != 0) return LineFault::kNotBlocks;
  const std::size_t size = line.size() / 2;
  buffers.ciphertext.resize(size);
  for (std::size_t i = 0; i < size; ++i)
    buffers.ciphertext[i] =
        static_cast<std::uint8_t>(LowerHexValue(line[2 * i]) * 16 + LowerHexValue(line[2 * i + 1]));
  return LineFault::kNone;
}

LineFault DecryptRecord(const LogKey &key, LineBuffers &buffers, EventRecord &record) {
  const std::size_t size = buffers.ciphertext.size();
  buffers.plaintext.resize(size + cipher::kBlockSize);
  const std::ptrdiff_t plain =
      cipher::backend().decrypt(key.session, buffers.ciphertext.data(), size, buffers.plaintext.data());
  if (plain < 0) return LineFault::kBadPadding;
  buffers.text.assign(reinterpret_cast<const char *>(buffers.plaintext.data()),
                      static_cast<std::size_t>(plain));
  auto parsed = ParseEventRecord(buffers.text);
  if (!parsed) return LineFault::kNotRecord;
  record = std::move(*parsed);
  return LineFault::kNone;
}

} // namespace orvane::logcat
