// What the tests share: a private data directory per test, the host's
// messages, files, a guard for swapped calls, the log's records through the
// independent decryption, and a child process.
#pragma once

#include "OrvaneSDK.h"
#include "cipher/cipher.h"
#include "logformat/key_text.h"
#include "platform/platform.h"
#include "support/decrypt_line.h"

#include <gtest/gtest.h>

#include <optional>
#include <string>
#include <string_view>
#include <utility>
#include <vector>

namespace orvane::testing {

using Message = std::pair<int, std::string>; // a level, 0 Info to 2 Error, and its text
std::vector<Message> &Captured();
void ORVANE_CALL CaptureMessage(LogLevel level, const char *message);

std::string MakeTempDirectory();
void RemoveTree(const std::string &path);
std::optional<std::string> ReadFile(const std::string &path);
void WriteFile(const std::string &path, std::string_view bytes);
// "a\nb" gives {a, b}; "" gives {""}.
std::vector<std::string> Split(std::string_view text, std::string_view separator);

// The lines of a log (platform line breaks), each decrypted with its time
// stamp replaced by "T", or "(undecryptable)"; empty lines skipped.
std::vector<std::string> Records(const std::string &log, const std::string &key_text);

// Gives back the platform table and the cipher backend as they were, so
// that no fake outlives its test, a failed ASSERT included.
struct CallsGuard {
  platform::Calls calls = platform::calls();
  cipher::Backend backend = cipher::backend();
  ~CallsGuard() {
    platform::calls() = calls;
    cipher::backend() = backend;
  }
};

// The platform's own calls, whatever fake the table holds.
inline const platform::Calls &os = platform::native_calls();
void ORVANE_CALL Ignore(LogLevel level, const char *message);

// An empty data directory and a capturing callback for each test.
class SandboxTest : public ::testing::Test {
protected:
  void SetUp() override;
  void TearDown() override;
  std::string LogPath(std::string_view game_id) const { return where_.logs + std::string(game_id) + ".log"; }

  CallsGuard guard_;
  std::string base_; // a fresh folder; the data directory is made two levels below it
  platform::StorageLocation where_;
};

struct ChildResult {
  int exit_code = -1; // -1 when it did not run or exit normally
  std::string output; // standard output and error, interleaved
};
// Runs `program` with `args` (args[0] is the child's argument 0) and the
// environment plus `env`; kills it after `timeout_seconds`.
ChildResult RunChild(const std::string &program, const std::vector<std::string> &args,
                     const std::vector<std::pair<std::string, std::string>> &env = {},
                     int timeout_seconds = 30);

} // namespace orvane::testing
