#include "log_line.h"

#include "analytics/cipher.h"
#include "analytics/key_text.h"

#include <array>

namespace orvane::logcat {
namespace {

// Each byte's value as a lowercase hex digit, or -1: one lookup per
// character, since reading a folder is mostly turning hex into bytes.
constexpr std::array<std::int8_t, 256> kHexValue = [] {
  std::array<std::int8_t, 256> value{};
  value.fill(-1);
  for (int c = 0; c < 16; ++c)
    value[static_cast<unsigned char>("0123456789abcdef"[c])] = static_cast<std::int8_t>(c);
  return value;
}();

bool AllHex(std::string_view line) {
  for (char c : line)
    if (kHexValue[static_cast<unsigned char>(c)] < 0) return false;
  return true;
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
  if (line.empty() || line.size() % (2 * cipher::kBlockSize) != 0)
    return AllHex(line) ? LineFault::kNotBlocks : LineFault::kNotHex;
  const std::size_t size = line.size() / 2;
  buffers.ciphertext.resize(size);
  for (std::size_t i = 0; i < size; ++i) {
    const int high = kHexValue[static_cast<unsigned char>(line[2 * i])];
    const int low = kHexValue[static_cast<unsigned char>(line[2 * i + 1])];
    if ((high | low) < 0) return LineFault::kNotHex;
    buffers.ciphertext[i] = static_cast<std::uint8_t>(high << 4 | low);
  }
  return LineFault::kNone;
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
