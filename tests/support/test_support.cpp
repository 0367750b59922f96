#include "support/test_support.h"

#include "core/storage.h"

#include <filesystem>
#include <fstream>
#include <random>
#include <regex>
#include <sstream>

namespace orvane::testing {

std::vector<Message> &Captured() {
  static std::vector<Message> messages;
  return messages;
}

void ORVANE_CALL CaptureMessage(LogLevel level, const char *message) {
  Captured().push_back({static_cast<int>(level), message});
}

void ORVANE_CALL Ignore(LogLevel, const char *) {}

std::string MakeTempDirectory() {
  static std::random_device entropy;
  for (;;) {
    const auto candidate =
        std::filesystem::temp_directory_path() / ("orvane-test-" + std::to_string(entropy()));
    if (std::filesystem::create_directory(candidate)) return candidate.string();
  }
}

void RemoveTree(const std::string &path) {
  std::error_code ignored;
  std::filesystem::remove_all(path, ignored);
}

std::optional<std::string> ReadFile(const std::string &path) {
  std::ifstream in(path, std::ios::binary);
  if (!in) return std::nullopt;
  std::ostringstream bytes;
  bytes << in.rdbuf();
  return bytes.str();
}

void WriteFile(const std::string &path, std::string_view bytes) {
  std::ofstream(path, std::ios::binary).write(bytes.data(), static_cast<std::streamsize>(bytes.size()));
}

std::vector<std::string> Split(std::string_view text, std::string_view separator) {
  std::vector<std::string> parts;
  for (std::size_t start = 0;;) {
    const std::size_t end = text.find(separator, start);
    parts.emplace_back(text.substr(start, end - start));
    if (end == std::string_view::npos) return parts;
    start = end + separator.size();
  }
}

std::vector<std::string> Records(const std::string &log, const std::string &key_text) {
  static const std::regex time(R"("time":"\d{4}-\d\d-\d\dT\d\d:\d\d:\d\d")");
  std::vector<std::string> records;
  const std::string content = ReadFile(log).value_or("");
  for (const std::string &line : Split(content, platform::line_break())) {
    if (line.empty()) continue; // as the reader skips it: where no lock is, a log may start with one
    const std::optional<std::string> plain = DecryptLine(line, key_text);
    records.push_back(plain ? std::regex_replace(*plain, time, "\"time\":\"T\"") : "(undecryptable)");
  }
  return records;
}

void SandboxTest::SetUp() {
  base_ = MakeTempDirectory();
  const std::string data = base_ + "/home/share"; // two levels to make, as for a home without ~/.local
  where_ = {data, data + "/Orvane/", data + "/Orvane/Logs/"};
  SetStorageForTesting(where_);
  oRegisterForLogs(CaptureMessage);
  Captured().clear();
}

void SandboxTest::TearDown() {
  oRegisterForLogs(nullptr);
  RemoveTree(base_);
}

} // namespace orvane::testing
