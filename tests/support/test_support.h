// Shared helpers of the tests: a private data directory per test, captured
// host messages, file reading and an independent decryption of log lines.
#pragma once

#include "OrvaneSDK.h"
#include "platform/platform.h"

#include <gtest/gtest.h>

#include <cstdint>
#include <optional>
#include <ostream>
#include <string>
#include <string_view>
#include <vector>

namespace orvane::testing {

struct Message {
  int level;
  std::string text;
  bool operator==(const Message &) const = default;
};
std::ostream &operator<<(std::ostream &out, const Message &message);

// What the capturing callback has received since the last Clear.
std::vector<Message> &Captured();
void ORVANE_CALL CaptureMessage(LogLevel level, const char *message);

std::string MakeTempDirectory();
void RemoveTree(const std::string &path);
std::optional<std::string> ReadFile(const std::string &path);
void WriteFile(const std::string &path, std::string_view bytes);
bool IsDirectory(const std::string &path);
bool Exists(const std::string &path);

// Splits on "\n" exactly: "a\nb" gives {a, b}, "" gives {""}.
std::vector<std::string> SplitLines(std::string_view text);
// Splits a log file on this platform's line break (CR LF on Windows); a lone
// line feed stays inside its line.
std::vector<std::string> SplitLogLines(std::string_view text);

// The 80-byte key text for `key_game_id`, built here from the log format's
// rule rather than by the library: "OrvaneLogKey-01" + first 65 bytes.
std::string KeyTextFor(std::string_view key_game_id);

// Decrypts one hex line with OpenSSL directly (a fresh EVP context, not the
// library's cipher code). Empty when the line is not valid hex or the
// padding is wrong.
std::optional<std::string> DecryptLine(std::string_view hex, std::string_view key_text);

// Gives each test an empty data directory, a capturing callback, and the
// platform's own calls back afterwards.
class SandboxTest : public ::testing::Test {
protected:
  void SetUp() override;
  void TearDown() override;
  std::string LogPath(std::string_view game_id) const;

  std::string base_; // stands where the drive root or ~/.local/share would
  platform::StorageLocation where_;
};

} // namespace orvane::testing
