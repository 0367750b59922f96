// orvane-logcat: reads games' encrypted log files back into records, one JSON
// object per line, checks them, and follows them as a game appends.
#include "log_line.h"
#include "log_lines.h"

#include <cerrno>
#include <chrono>
#include <cstdio>
#include <cstdlib>
#include <cstring>
#include <filesystem>
#include <optional>
#include <string>
#include <string_view>
#include <system_error>
#include <thread>
#include <vector>

namespace {

using namespace orvane::logcat;

constexpr std::string_view kUsage = R"(Usage: orvane-logcat [--key-game-id ID] [--check] [--follow] FILE...

Reads OrvaneSDK log files (one encrypted record per line) and writes each
record to standard output as one JSON object per line (JSON Lines), ready for
jq or any ingestion pipeline:

  {"user_id":"...","game_id":"...","type":"...","time":"...","extra":"..."}

The members come in the order the library stores them, escaped as the library
escapes them (" as \", \ as \\, bytes below 0x20 as \b \f \n \r \t or
\u00XX). Every other byte is written as it came: a game may pass text that
is not UTF-8, the library stores those bytes unchanged, and so does this
tool. A record the library wrote is printed exactly as it was encrypted.

FILE is a log file such as ~/.local/share/Orvane/Logs/GAME.log; "-" reads
standard input (and needs --key-game-id).

Options:
  --key-game-id ID  Decrypt with the key of game id ID (only its first 65
                    bytes count, as in the library). Without it, each file's
                    own game id is used: its name without ".log". A process
                    encrypts the logs of every game under the first game id
                    it saw, so a second game's log of the same process needs
                    the first game's id here.
  --check           Print no records; print "FILE: N records, M bad lines"
                    for each file instead.
  --follow          After the end of each file, keep reading lines as they
                    are appended, like tail -f, until interrupted. A file
                    that does not exist yet is waited for. Standard input is
                    read to its end and not followed.
  --help            Print this text and exit.
  --                Every later argument is a file.

Line breaks may be LF or CR LF; empty lines (a log begins with one when the
first record of a game could not be written) carry no record and are
skipped. A line that is not lowercase hex of whole 16-byte blocks, does not
decrypt (bad padding: a damaged line or the wrong key game id), or is not a
JSON object with the five members is reported on standard error as
FILE:LINE: reason, and the tool goes on with the next line.

Exit status: 0 when every line was a good record, 1 when some lines were
bad, 2 on a usage error or when a file could not be read.
)";

struct Options {
  std::optional<std::string> key_game_id;
  bool check = false;
  bool follow = false;
  std::vector<std::string> files;
};

struct Source {
  std::string name; // as given on the command line
  bool is_stdin = false;
  std::FILE *file = nullptr;
  bool done = false;            // nothing more will be read from it
  bool said_waiting = false;    // the "does not exist yet" notice went out
  bool unreadable = false;      // could not be opened or read
  LogKey key;
  LineSplitter lines;
  std::uint64_t offset = 0;     // bytes read so far
  std::size_t shown_partial = 0; // size of an unended line already printed, or 0
  std::uint64_t records = 0;
  std::uint64_t bad_lines = 0;
};

int g_status = 0;

void Raise(int status) {
  if (status > g_status) g_status = status;
}

void Complain(const std::string &text) {
  std::fprintf(stderr, "orvane-logcat: %s\n", text.c_str());
}

std::optional<Options> ParseOptions(int argc, char **argv) {
  Options options;
  bool only_files = false;
  for (int i = 1; i < argc; ++i) {
    const std::string_view arg = argv[i];
    if (only_files || arg == "-" || !arg.starts_with("-")) {
      options.files.emplace_back(arg);
    } else if (arg == "--") {
      only_files = true;
    } else if (arg == "--help") {
      std::fwrite(kUsage.data(), 1, kUsage.size(), stdout);
      std::exit(0);
    } else if (arg == "--check") {
      options.check = true;
    } else if (arg == "--follow") {
      options.follow = true;
    } else if (arg == "--key-game-id") {
      if (i + 1 == argc) {
        Complain("--key-game-id needs a game id");
        return std::nullopt;
      }
      options.key_game_id = argv[++i];
    } else if (arg.starts_with("--key-game-id=")) {
      options.key_game_id = std::string(arg.substr(std::strlen("--key-game-id=")));
    } else {
      Complain("unknown option " + std::string(arg));
      return std::nullopt;
    }
  }
  if (options.files.empty()) {
    Complain("no log file given");
    return std::nullopt;
  }
  if (options.check && options.follow) {
    Complain("--check and --follow do not go together: a followed file has no end to sum up at");
    return std::nullopt;
  }
  return options;
}

// The game id whose key a file's records are under, unless given.
std::optional<std::string> KeyGameIdOf(const Options &options, const std::string &name) {
  if (options.key_game_id) return options.key_game_id;
  if (name == "-") {
    Complain("standard input has no file name to take the game id from; give --key-game-id");
    return std::nullopt;
  }
  const std::string file = std::filesystem::path(name).filename().string();
  constexpr std::string_view kExtension = ".log";
  if (!file.ends_with(kExtension)) {
    Complain(name + ": the name does not end in .log, so it gives no game id; give --key-game-id");
    return std::nullopt;
  }
  return file.substr(0, file.size() - kExtension.size());
}

void TakeLine(Source &source, const Options &options, std::uint64_t number, std::string_view line,
              std::string &out) {
  if (line.empty()) return;
  const DecodedLine decoded = DecodeLine(source.key, line);
  if (decoded.fault != LineFault::kNone) {
    ++source.bad_lines;
    Raise(1);
    Complain(source.name + ":" + std::to_string(number) + ": " + std::string(FaultText(decoded.fault)));
    return;
  }
  ++source.records;
  if (options.check) return;
  AppendRecordJson(out, decoded.record);
  out += '\n';
}

void Emit(std::string &out) {
  if (out.empty()) return;
  std::fwrite(out.data(), 1, out.size(), stdout);
  std::fflush(stdout);
  out.clear();
}

// Opens a file source; in follow mode a missing file is waited for.
bool Open(Source &source, const Options &options) {
  if (source.is_stdin) {
    source.file = stdin;
    return true;
  }
  source.file = std::fopen(source.name.c_str(), "rb");
  if (source.file != nullptr) return true;
  const int error = errno;
  if (options.follow && error == ENOENT) {
    if (!source.said_waiting) Complain(source.name + ": does not exist yet; waiting for it");
    source.said_waiting = true;
    return false;
  }
  Complain(source.name + ": cannot open: " + std::strerror(error));
  Raise(2);
  source.done = true;
  source.unreadable = true;
  return false;
}

// A followed file that became shorter than what was read has been replaced
// or cut: read it again from the start.
void NoticeTruncation(Source &source) {
  std::error_code error;
  const auto size = std::filesystem::file_size(source.name, error);
  if (error || size >= source.offset) return;
  Complain(source.name + ": became shorter; reading it again from the start");
  std::fclose(source.file);
  source.file = nullptr;
  source.lines = {};
  source.offset = 0;
  source.shown_partial = 0;
}

// Reads what the source holds now. Returns true when it read any bytes.
bool ReadAvailable(Source &source, const Options &options) {
  if (source.done) return false;
  if (source.file != nullptr && options.follow && !source.is_stdin) NoticeTruncation(source);
  if (source.file == nullptr && !Open(source, options)) return false;
  std::string out;
  char buffer[1 << 16];
  bool any = false;
  for (;;) {
    const std::size_t n = std::fread(buffer, 1, sizeof buffer, source.file);
    if (n == 0) break;
    any = true;
    source.offset += n;
    FeedBytes(source.lines, std::string_view(buffer, n),
              [&](std::uint64_t number, std::string_view line) {
                // Printed already while it was the last, unended line.
                if (source.shown_partial != 0 && line.size() == source.shown_partial) {
                  source.shown_partial = 0;
                  return;
                }
                source.shown_partial = 0;
                TakeLine(source, options, number, line, out);
              });
    Emit(out);
  }
  if (std::ferror(source.file)) {
    Complain(source.name + ": read error: " + std::strerror(errno));
    Raise(2);
    source.done = true;
    source.unreadable = true;
  }
  std::clearerr(source.file);
  const std::string_view last = PartialLine(source.lines);
  const bool at_end = source.done || !options.follow || source.is_stdin;
  if (at_end) {
    TakeLine(source, options, source.lines.next_number, last, out);
    source.done = true;
  } else if (!last.empty() && source.shown_partial == 0) {
    // The library writes no line break after the last line, so the newest
    // record has none yet. It is printed as soon as it decodes; an unended
    // line that does not decode may still be growing and waits for its end.
    const DecodedLine decoded = DecodeLine(source.key, last);
    if (decoded.fault == LineFault::kNone) {
      ++source.records;
      AppendRecordJson(out, decoded.record);
      out += '\n';
      source.shown_partial = last.size();
    }
  }
  Emit(out);
  return any;
}

} // namespace

int main(int argc, char **argv) {
  const std::optional<Options> options = ParseOptions(argc, argv);
  if (!options) {
    std::fputs("Try 'orvane-logcat --help'.\n", stderr);
    return 2;
  }

  std::vector<Source> sources(options->files.size());
  for (std::size_t i = 0; i < sources.size(); ++i) {
    Source &source = sources[i];
    source.name = options->files[i];
    source.is_stdin = source.name == "-";
    const std::optional<std::string> key_game_id = KeyGameIdOf(*options, source.name);
    if (!key_game_id) return 2;
    source.key = OpenLogKey(*key_game_id);
    if (source.key.session == nullptr) {
      Complain("the cipher could not be prepared");
      return 2;
    }
  }

  for (Source &source : sources) {
    ReadAvailable(source, *options);
    if (options->check && !source.unreadable)
      std::printf("%s: %llu records, %llu bad lines\n", source.name.c_str(),
                  static_cast<unsigned long long>(source.records),
                  static_cast<unsigned long long>(source.bad_lines));
  }
  if (options->follow) {
    for (;;) {
      bool any = false, open = false;
      for (Source &source : sources) {
        any |= ReadAvailable(source, *options);
        open |= !source.done;
      }
      if (!open) break;
      if (!any) std::this_thread::sleep_for(std::chrono::milliseconds(100));
    }
  }
  for (Source &source : sources) {
    if (source.file != nullptr && !source.is_stdin) std::fclose(source.file);
    CloseLogKey(source.key);
  }
  std::fflush(stdout);
  return g_status;
}
