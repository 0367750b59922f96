// orvane-bench-logcat: how orvane-logcat scales with the folder it reads.
// Writes folders of 1,000, 10,000 and 100,000 small logs and a folder of one
// large log under a private temp directory, reads each with the program
// (output to the null device, at most 256 descriptors, as a back end's job
// may have), and prints records per second and peak memory side by side,
// with the fall of records per second from the smallest folder to the
// largest.
//
//   orvane-bench-logcat PATH-OF-ORVANE-LOGCAT [ROUNDS]
#include "cipher/cipher.h"
#include "logformat/hex.h"
#include "logformat/key_text.h"

#include <algorithm>
#include <chrono>
#include <cstdio>
#include <cstdlib>
#include <filesystem>
#include <fstream>
#include <string>
#include <string_view>
#include <vector>

#include <fcntl.h>
#include <sys/resource.h>
#include <sys/wait.h>
#include <unistd.h>

namespace {

using namespace orvane;
namespace fs = std::filesystem;

constexpr int kRecordsPerSmallLog = 10;
constexpr int kRecordsOfLargeLog = 500000;
// Every tenth log was written by a process whose first game was g0, as a
// launcher's process that recorded several games does.
constexpr int kForeignEvery = 10;

struct Writer {
  std::vector<std::uint8_t> ciphertext;
};

std::string GameName(int g) {
  char name[16];
  std::snprintf(name, sizeof name, "g%d", g);
  return name;
}

// One line of the library's form: the record text's AES-256-CBC under the
// key of the session, in lowercase hex, after a line break but for the first.
void AppendLine(Writer &writer, cipher::Session *session, const std::string &game, const char *type, int n,
                std::string &out) {
  char record[256];
  const int length = std::snprintf(record, sizeof record,
                                   R"({"user_id":"user-%d","game_id":"%s","type":"%s",)"
                                   R"("time":"2026-12-07T00:00:00","extra":"level=%d;score=1200"})",
                                   n % 97, game.c_str(), type, n);
  const std::string_view text(record, static_cast<std::size_t>(length));
  writer.ciphertext.resize(cipher::CiphertextSize(text.size()));
  const std::ptrdiff_t size = cipher::backend().encrypt(
      session, reinterpret_cast<const std::uint8_t *>(text.data()), text.size(), writer.ciphertext.data());
  if (!out.empty()) out += '\n';
  AppendHex(out, writer.ciphertext.data(), static_cast<std::size_t>(size));
}

cipher::Session *SessionFor(const std::string &key_game_id) {
  const KeyText text = MakeKeyText(key_game_id);
  return cipher::backend().open(text.data() + kKeyOffset, text.data() + kIvOffset);
}

void WriteLog(const fs::path &path, Writer &writer, const std::string &game, int records) {
  const std::string key_game =
      game != "g0" && std::hash<std::string>{}(game) % kForeignEvery == 0 ? "g0" : game;
  cipher::Session *session = SessionFor(key_game);
  std::string out;
  for (int n = 0; n < records; ++n) AppendLine(writer, session, game, n == 0 ? "INIT" : "SPECIAL", n, out);
  cipher::backend().close(session);
  std::ofstream(path, std::ios::binary) << out;
}

struct Reading {
  double seconds = 0;
  long peak_kib = 0;
  int status = -1;
};

// One run of the program over `folder`, timed from fork to exit.
Reading Read(const char *program, const fs::path &folder) {
  const auto start = std::chrono::steady_clock::now();
  const pid_t child = fork();
  if (child == 0) {
    const int null = open("/dev/null", O_WRONLY);
    dup2(null, 1);
    const rlimit descriptors{256, 256};
    setrlimit(RLIMIT_NOFILE, &descriptors);
    execl(program, program, folder.c_str(), static_cast<char *>(nullptr));
    _exit(127);
  }
  int status = 0;
  rusage usage{};
  wait4(child, &status, 0, &usage);
  Reading reading;
  reading.seconds = std::chrono::duration<double>(std::chrono::steady_clock::now() - start).count();
  reading.peak_kib = usage.ru_maxrss;
  reading.status = WIFEXITED(status) ? WEXITSTATUS(status) : -1;
  return reading;
}

} // namespace

int main(int argc, char **argv) {
  if (argc < 2) {
    std::fprintf(stderr, "usage: orvane-bench-logcat PATH-OF-ORVANE-LOGCAT [ROUNDS]\n");
    return 2;
  }
  const int rounds = argc > 2 ? std::max(1, std::atoi(argv[2])) : 3;
  char base_name[] = "/tmp/orvane-bench-logcat-XXXXXX";
  const fs::path base = mkdtemp(base_name);
  struct Folder {
    std::string name;
    int logs, records;
  };
  const Folder folders[] = {{"1,000 logs", 1000, kRecordsPerSmallLog},
                            {"10,000 logs", 10000, kRecordsPerSmallLog},
                            {"100,000 logs", 100000, kRecordsPerSmallLog},
                            {"1 large log", 1, kRecordsOfLargeLog}};
  Writer writer;
  std::vector<double> rates;
  std::printf("%-14s %10s %14s %14s\n", "folder", "records", "records/s", "peak memory");
  bool ok = true;
  for (const Folder &folder : folders) {
    const fs::path path = base / std::to_string(folder.logs);
    fs::create_directory(path);
    for (int g = 0; g < folder.logs; ++g)
      WriteLog(path / (GameName(g) + ".log"), writer, GameName(g), folder.records);
    // The best of the rounds: the least disturbed by the other jobs of the machine.
    Reading best{1e9, 0, 0};
    for (int round = 0; round < rounds; ++round) {
      const Reading reading = Read(argv[1], path);
      ok &= reading.status == 0;
      best.seconds = std::min(best.seconds, reading.seconds);
      best.peak_kib = std::max(best.peak_kib, reading.peak_kib);
    }
    const double records = static_cast<double>(folder.logs) * folder.records;
    rates.push_back(records / best.seconds);
    std::printf("%-14s %10.0f %14.0f %11.1f MiB\n", folder.name.c_str(), records, rates.back(),
                static_cast<double>(best.peak_kib) / 1024);
    fs::remove_all(path);
  }
  fs::remove_all(base);
  std::printf("records/s from 1,000 to 100,000 logs: %+.1f %%\n", 100 * (rates[2] / rates[0] - 1));
  if (!ok) std::fprintf(stderr, "orvane-bench-logcat: a run did not exit 0\n");
  return ok ? 0 : 1;
}
