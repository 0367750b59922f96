#include "log_line.h"

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
  case LineFault::kBadPadding: return "does not decrypt (bad padding: damaged line or wrong key game id)";
  case LineFault::kNotRecord: return "decrypts, but is not a JSON object with the five record members";
  }
  return "unknown fault";
}

LogKey OpenLogKey(std::string_view key_game_id) {
  const KeyText text = MakeKeyText(key_game_id);
  LogKey key;
  key.session = cipher::backend().open(text.data() + kKeyOffset, text.data() + kIvOffset);
  return key;
}

void CloseLogKey(LogKey &key) {
  if (key.session != nullptr) cipher::backend().close(key.session);
  key.session = nullptr;
}

DecodedLine DecodeLine(LogKey &key, std::string_view line) {
  DecodedLine decoded;
  for (char c : line) {
    if (LowerHexValue(c) < 0) {
      decoded.fault = LineFault::kNotHex;
      return decoded;
    }
  }
  if (line.empty() || line.size() % (2 * cipher::kBlockSize) != 0) {
    decoded.fault = LineFault::kNotBlocks;
    return decoded;
  }
  const std::size_t size = line.size() / 2;
  key.ciphertext.resize(size);
  for (std::size_t i = 0; i < size; ++i)
    key.ciphertext[i] =
        static_cast<std::uint8_t>(LowerHexValue(line[2 * i]) * 16 + LowerHexValue(line[2 * i + 1]));
  key.plaintext.resize(size + cipher::kBlockSize);
  const std::ptrdiff_t plain =
      cipher::backend().decrypt(key.session, key.ciphertext.data(), size, key.plaintext.data());
  if (plain < 0) {
    decoded.fault = LineFault::kBadPadding;
    return decoded;
  }
  decoded.text.assign(reinterpret_cast<const char *>(key.plaintext.data()),
                      static_cast<std::size_t>(plain));
  auto record = ParseEventRecord(decoded.text);
  if (!record) {
    decoded.fault = LineFault::kNotRecord;
    return decoded;
  }
  decoded.record = std::move(*record);
  return decoded;
}

} // namespace orvane::logcat
