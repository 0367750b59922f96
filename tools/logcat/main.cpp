// orvane-logcat: reads games' encrypted log files back into records, one JSON
// object per line, checks them, and follows them as games append.
#include "file_identity.h"
#include "key_discovery.h"
#include "log_sources.h"
#include "logformat/log_lines.h"
#include "open_for_reading.h"
#include "options.h"
#include "record_output.h"
#include "standard_input.h"

#include "cipher/cipher.h"
#include "logformat/event_types.h"

#include <cerrno>
#include <chrono>
#include <cstdio>
#include <cstring>
#include <deque>
#include <exception>
#include <filesystem>
#include <optional>
#include <string>
#include <string_view>
#include <system_error>
#include <thread>
#include <vector>

namespace {

using namespace orvane;
using namespace orvane::logcat;
namespace fs = std::filesystem;

struct Source {
  fs::path path;
  std::string name;      // as reports show it
  std::string file_name; // the "file" member
  bool is_stdin = false;
  fs::path folder;                  // where new candidate keys may appear; empty for stdin
  fs::file_time_type folder_time{}; // of the folder when it was last listed
  KeyCandidates keys;
  std::FILE *file = nullptr;
  std::optional<FileIdentity> identity; // of the open file
  bool done = false;                    // nothing more will be read from it
  bool said_waiting = false;            // the "does not exist yet" notice went out
  bool unreadable = false;              // could not be opened or read
  bool any_line = false;                // a line that is not empty was read: the next is not the first
  LineSplitter lines;
  std::uint64_t offset = 0;      // bytes read so far
  std::size_t shown_partial = 0; // size of an unended line already taken, or 0
  LogCounts counts;
};

struct Folder {
  fs::path path;
  bool said_waiting = false;
  bool done = false; // could not be listed
};

struct Reader {
  Options options;
  KeyPool pool;
  std::deque<Source> sources; // a deque, since following a folder adds to it
  std::vector<Folder> folders;
  LineBuffers buffers;
  EventRecord record;
  std::string json; // scratch for one record's text
  int status = 0;
};

void Raise(Reader &reader, int status) {
  if (status > reader.status) reader.status = status;
}

void Complain(const std::string &text) { std::fprintf(stderr, "orvane-logcat: %s\n", text.c_str()); }

// A file or folder that could not be read: the run fails, reading goes on.
void Fail(Reader &reader, const std::string &text) {
  Complain(text);
  Raise(reader, 2);
}

// Adds the game ids of the source's folder to its candidates. True when the
// folder changed since it was last listed and gave a new one: a process
// whose first game is new there may have written the line that no key read.
bool ListFolderKeys(Source &source) {
  if (source.folder.empty()) return false;
  std::error_code error;
  const fs::file_time_type time = fs::last_write_time(source.folder, error);
  if (error || time == source.folder_time) return false;
  source.folder_time = time;
  const std::size_t known = source.keys.game_ids.size();
  for (const std::string &id : GameIdsIn(source.folder)) AddCandidate(source.keys, id);
  return source.keys.game_ids.size() != known;
}

bool AddSource(Reader &reader, const fs::path &path) {
  for (const Source &known : reader.sources)
    if (!known.is_stdin && known.path == path) return true;
  Source &source = reader.sources.emplace_back();
  source.path = path;
  source.name = path.string();
  source.is_stdin = path == "-";
  source.file_name = source.is_stdin ? "-" : path.filename().string();
  if (!source.is_stdin) {
    if (const auto own = GameIdOfLogName(path)) AddCandidate(source.keys, *own);
    source.folder = path.has_parent_path() ? path.parent_path() : fs::path(".");
    ListFolderKeys(source);
  }
  for (const std::string &id : reader.options.key_game_ids) AddCandidate(source.keys, id);
  if (!source.keys.game_ids.empty()) {
    // The first call of a process fixes the key even when it is refused, so
    // a process whose first call had an empty game id wrote under the fixed
    // key text alone, which no log's name gives.
    AddCandidate(source.keys, "");
    return true;
  }
  Complain(source.is_stdin ? "standard input has no file name to take the game id from; give --key-game-id"
                           : source.name + ": the name does not end in .log and its folder holds no "
                                           "other log, so no key is known; give --key-game-id");
  return false;
}

// Adds the folder's *.log files that are not read yet. A folder that does
// not exist is waited for when following; one that cannot be listed fails.
void ScanFolder(Reader &reader, Folder &folder) {
  if (folder.done) return;
  std::error_code error;
  const std::vector<fs::path> files = LogFilesIn(folder.path, error);
  const bool missing = error == std::errc::no_such_file_or_directory;
  if (missing && reader.options.follow) {
    if (!folder.said_waiting) Complain(folder.path.string() + ": does not exist yet; waiting for it");
    folder.said_waiting = true;
    return;
  }
  if (error) {
    Fail(reader, folder.path.string() + ": cannot list: " + error.message() +
                     (missing ? " (no game has recorded here yet?)" : ""));
    folder.done = true;
    return;
  }
  for (const fs::path &file : files) AddSource(reader, file);
}

void ReportBadLine(Reader &reader, Source &source, std::uint64_t number, std::string_view reason) {
  ++source.counts.bad_lines;
  Raise(reader, 1);
  Complain(source.name + ":" + std::to_string(number) + ": " + std::string(reason));
}

// Reads one line. True when a key read it, whether or not the filters pass
// it. A line that no key reads is reported only when `report` is set: an
// unended line may still be growing.
bool TakeLine(Reader &reader, Source &source, std::uint64_t number, std::string_view line, std::string &out,
              bool report) {
  // Empty lines carry nothing: a writer may put a line break before a log's first line.
  if (line.empty()) return false;
  LineFault fault = ReadLine(reader.pool, source.keys, line, reader.buffers, reader.record);
  if ((fault == LineFault::kBadPadding || fault == LineFault::kNotRecord) && ListFolderKeys(source))
    fault = ReadLine(reader.pool, source.keys, line, reader.buffers, reader.record);
  if (fault != LineFault::kNone && !report) return false;
  const bool first = !source.any_line;
  source.any_line = true;
  if (fault != LineFault::kNone) {
    ReportBadLine(reader, source, number, FaultText(fault));
    return false;
  }
  // Every log the library starts begins with its INIT record.
  if (first && reader.options.check && reader.record.type != EventTypeName(EventKind::kInit)) {
    ReportBadLine(reader, source, number, "first record is not INIT");
    return true;
  }
  if (!Passes(reader.options.filter, reader.record)) return true;
  ++source.counts.records;
  AddedMembers added;
  if (reader.options.with_file) added.file = source.file_name;
  if (reader.options.show_key) added.key_game_id = source.keys.game_ids[source.keys.winner];
  const std::size_t start = out.size();
  if (AppendRecordLine(out, reader.json, reader.record, added)) ++source.counts.not_utf8;
  if (reader.options.check) out.resize(start);
  return true;
}

void Emit(std::string &out) {
  if (out.empty()) return;
  std::fwrite(out.data(), 1, out.size(), stdout);
  std::fflush(stdout);
  out.clear();
}

// Opens a file source; in follow mode a missing file is waited for.
bool Open(Reader &reader, Source &source) {
  if (source.is_stdin) {
    source.file = stdin;
    return true;
  }
  source.file = OpenForReading(source.path);
  if (source.file != nullptr) {
    source.identity = IdentityOfOpenFile(source.file);
    return true;
  }
  const int error = errno;
  if (reader.options.follow && error == ENOENT) {
    if (!source.said_waiting) Complain(source.name + ": does not exist yet; waiting for it");
    source.said_waiting = true;
    return false;
  }
  Fail(reader, source.name + ": cannot open: " + std::strerror(error));
  source.done = true;
  source.unreadable = true;
  return false;
}

// Closes a followed file so that the next poll reads it from its start.
void StartAgain(Source &source, const std::string &why) {
  Complain(source.name + ": " + why);
  std::fclose(source.file);
  source.file = nullptr;
  source.lines = {};
  source.offset = 0;
  source.shown_partial = 0;
  source.any_line = false;
}

// True when the path names another file than the open one: the log was
// moved away and started again. Until a file is there, the open one is kept.
bool WasReplaced(const Source &source) {
  const std::optional<FileIdentity> now = IdentityAtPath(source.path);
  return now && source.identity && *now != *source.identity;
}

// A followed file that became shorter than what was read has been cut:
// read it again from the start.
void NoticeTruncation(Source &source) {
  std::error_code error;
  const auto size = fs::file_size(source.path, error);
  if (!error && size < source.offset) StartAgain(source, "became shorter; reading it again from the start");
}

// Reads what the source holds now. Returns true when it read any bytes or
// starts a replaced file again.
bool ReadAvailable(Reader &reader, Source &source) {
  const bool follow = reader.options.follow && !source.is_stdin;
  if (source.done) return false;
  const bool replaced = follow && source.file != nullptr && WasReplaced(source);
  if (follow && source.file != nullptr && !replaced) NoticeTruncation(source);
  if (source.file == nullptr && !Open(reader, source)) return false;
  std::string out;
  static char buffer[1 << 16];
  bool any = false;
  for (;;) {
    const std::size_t n = std::fread(buffer, 1, sizeof buffer, source.file);
    if (n == 0) break;
    any = true;
    source.offset += n;
    FeedBytes(source.lines, std::string_view(buffer, n), [&](std::uint64_t number, std::string_view line) {
      // Taken already while it was the last, unended line.
      if (source.shown_partial != 0 && line.size() == source.shown_partial) {
        source.shown_partial = 0;
        return;
      }
      source.shown_partial = 0;
      TakeLine(reader, source, number, line, out, true);
    });
    Emit(out);
  }
  if (std::ferror(source.file)) {
    Fail(reader, source.name + ": read error: " + std::strerror(errno));
    source.done = true;
    source.unreadable = true;
  }
  std::clearerr(source.file);
  const std::string_view last = PartialLine(source.lines);
  if (source.done || !follow || replaced) {
    // Nothing more comes to this file: its unended last line is whole.
    if (last.size() != source.shown_partial)
      TakeLine(reader, source, source.lines.next_number, last, out, true);
    source.done = !replaced;
  } else if (!last.empty() && source.shown_partial == 0) {
    // The library writes no line break after the last line, so the newest
    // record has none yet. It is taken as soon as it decodes; an unended
    // line that does not decode may still be growing and waits for its end.
    if (TakeLine(reader, source, source.lines.next_number, last, out, false))
      source.shown_partial = last.size();
  }
  Emit(out);
  if (replaced) StartAgain(source, "was replaced; reading the new file from its start");
  return any || replaced;
}

// Reads a folder's *.log files where the folder stands among the arguments.
void AddFolder(Reader &reader, const fs::path &path) {
  const std::size_t before = reader.sources.size();
  Folder &folder = reader.folders.emplace_back(Folder{path});
  ScanFolder(reader, folder);
  if (reader.sources.size() == before && !folder.done && !folder.said_waiting)
    Complain(path.string() + ": holds no .log files");
}

// Turns the arguments into sources and folders; false on a usage error.
bool AddArguments(Reader &reader) {
  std::vector<std::string> paths = reader.options.paths;
  if (paths.empty() && StandardInputIsGiven()) paths.push_back("-");
  if (paths.empty()) {
    const fs::path logs = DefaultLogsFolder();
    if (logs.empty()) {
      Complain("this machine gives no place for the logs (no home folder); name a folder");
      return false;
    }
    AddFolder(reader, logs);
  }
  bool ok = true;
  for (const std::string &path : paths) {
    std::error_code error;
    const fs::file_type type = path == "-" ? fs::file_type::none : fs::status(path, error).type();
    // A missing file is waited for when following; nothing else that cannot be reached will do.
    const bool awaited = reader.options.follow && error == std::errc::no_such_file_or_directory;
    if (type == fs::file_type::directory)
      AddFolder(reader, path);
    else if (error && !awaited)
      Fail(reader, path + ": cannot open: " + error.message());
    else
      ok &= AddSource(reader, path);
  }
  return ok;
}

int Run(int argc, char **argv) {
  Reader reader;
  if (auto options = ParseOptions(argc, argv)) {
    reader.options = std::move(*options);
  } else {
    std::fputs("Try 'orvane-logcat --help'.\n", stderr);
    return 2;
  }
  if (!AddArguments(reader)) return 2;

  for (Source &source : reader.sources) {
    ReadAvailable(reader, source);
    if (reader.options.check && !source.unreadable) {
      const std::string summary = CheckSummary(source.name, source.counts);
      std::fwrite(summary.data(), 1, summary.size(), stdout);
    }
  }
  while (reader.options.follow) {
    bool any = false;
    bool open = false;
    for (Folder &folder : reader.folders) {
      ScanFolder(reader, folder);
      open |= !folder.done;
    }
    for (Source &source : reader.sources) {
      any |= ReadAvailable(reader, source);
      open |= !source.done;
    }
    if (!open) break;
    if (!any) std::this_thread::sleep_for(std::chrono::milliseconds(100));
  }
  // The files are read only: the process's end closes them.
  if (reader.pool.failed) {
    Complain(std::string("the cipher could not be prepared for some key; it needs ") +
             cipher::backend().needs);
    Raise(reader, 2);
  }
  std::fflush(stdout);
  return reader.status;
}

} // namespace

int main(int argc, char **argv) {
  // A file name the system cannot convert, or memory running out, ends the
  // run with a reason rather than an abort.
  try {
    return Run(argc, argv);
  } catch (const std::exception &error) {
    Complain(error.what());
    return 2;
  }
}
