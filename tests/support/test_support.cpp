#include "support/test_support.h"

#include "core/log_channel.h"
#include "core/storage.h"

#include <openssl/evp.h>

#include <filesystem>
#include <fstream>
#include <random>
#include <sstream>

namespace orvane::testing {

std::ostream &operator<<(std::ostream &out, const Message &message) {
  return out << "{" << message.level << ", \"" << message.text << "\"}";
}

std::vector<Message> &Captured() {
  static std::vector<Message> messages;
  return messages;
}

void ORVANE_CALL CaptureMessage(LogLevel level, const char *message) {
  Captured().push_back({static_cast<int>(level), message});
}

std::string MakeTempDirectory() {
  static std::random_device entropy;
  const std::filesystem::path base = std::filesystem::temp_directory_path();
  for (;;) {
    const std::filesystem::path candidate =
        base / ("orvane-test-" + std::to_string(entropy()) + std::to_string(entropy()));
    std::error_code error;
    if (std::filesystem::create_directory(candidate, error)) return candidate.string();
  }
}

void RemoveTree(const std::string &path) {
  std::error_code error;
  std::filesystem::permissions(path, std::filesystem::perms::owner_all,
                               std::filesystem::perm_options::add, error);
  std::filesystem::remove_all(path, error);
}

std::optional<std::string> ReadFile(const std::string &path) {
  std::ifstream in(path, std::ios::binary);
  if (!in) return std::nullopt;
  std::ostringstream bytes;
  bytes << in.rdbuf();
  return bytes.str();
}

void WriteFile(const std::string &path, std::string_view bytes) {
  std::ofstream out(path, std::ios::binary | std::ios::trunc);
  out.write(bytes.data(), static_cast<std::streamsize>(bytes.size()));
}

bool IsDirectory(const std::string &path) {
  std::error_code error;
  return std::filesystem::is_directory(path, error);
}

bool Exists(const std::string &path) {
  std::error_code error;
  return std::filesystem::exists(std::filesystem::symlink_status(path, error));
}

std::vector<std::string> SplitLines(std::string_view text) {
  std::vector<std::string> lines;
  std::size_t start = 0;
  for (;;) {
    std::size_t end = text.find('\n', start);
    if (end == std::string_view::npos) {
      lines.emplace_back(text.substr(start));
      return lines;
    }
    lines.emplace_back(text.substr(start, end - start));
    start = end + 1;
  }
}

std::vector<std::string> SplitLogLines(std::string_view text) {
  const std::string_view separator = platform::line_break();
  std::vector<std::string> lines;
  std::size_t start = 0;
  for (;;) {
    const std::size_t end = text.find(separator, start);
    if (end == std::string_view::npos) {
      lines.emplace_back(text.substr(start));
      return lines;
    }
    lines.emplace_back(text.substr(start, end - start));
    start = end + separator.size();
  }
}

std::string KeyTextFor(std::string_view key_game_id) {
  std::string key = "OrvaneLogKey-01";
  key += key_game_id.substr(0, 65);
  key.resize(80, '\0');
  return key;
}

std::optional<std::string> DecryptLine(std::string_view hex, std::string_view key_text) {
  if (hex.size() % 2 != 0 || key_text.size() != 80) return std::nullopt;
  std::string bytes;
  for (std::size_t i = 0; i < hex.size(); i += 2) {
    auto nibble = [](char c) -> int {
      if (c >= '0' && c <= '9') return c - '0';
      if (c >= 'a' && c <= 'f') return c - 'a' + 10;
      return -1;
    };
    int high = nibble(hex[i]), low = nibble(hex[i + 1]);
    if (high < 0 || low < 0) return std::nullopt;
    bytes.push_back(static_cast<char>(high * 16 + low));
  }
  const auto *key = reinterpret_cast<const unsigned char *>(key_text.data());
  std::string plain(bytes.size() + 16, '\0');
  EVP_CIPHER_CTX *ctx = EVP_CIPHER_CTX_new();
  int first = 0, second = 0;
  bool ok = EVP_DecryptInit_ex(ctx, EVP_aes_256_cbc(), nullptr, key, key + 64) == 1 &&
            EVP_DecryptUpdate(ctx, reinterpret_cast<unsigned char *>(plain.data()), &first,
                              reinterpret_cast<const unsigned char *>(bytes.data()),
                              static_cast<int>(bytes.size())) == 1 &&
            EVP_DecryptFinal_ex(ctx, reinterpret_cast<unsigned char *>(plain.data()) + first,
                                &second) == 1;
  EVP_CIPHER_CTX_free(ctx);
  if (!ok) return std::nullopt;
  plain.resize(static_cast<std::size_t>(first + second));
  return plain;
}

void SandboxTest::SetUp() {
  base_ = MakeTempDirectory();
  where_.base = base_ + "/share";
  where_.root = where_.base + "/Orvane/";
  where_.logs = where_.root + "Logs/";
  SetStorageForTesting(where_);
  platform::calls() = platform::native_calls();
  Captured().clear();
  RegisterForLogs(CaptureMessage);
  Captured().clear();
}

void SandboxTest::TearDown() {
  RegisterForLogs(nullptr);
  platform::calls() = platform::native_calls();
  RemoveTree(base_);
}

std::string SandboxTest::LogPath(std::string_view game_id) const {
  return where_.logs + std::string(game_id) + ".log";
}

} // namespace orvane::testing
