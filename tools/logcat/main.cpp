// orvane-logcat: reads games' encrypted log files back into records, one JSON
// object per line, checks them, and follows them as games append.
#include "file_identity.h"
#include "key_discovery.h"
#include "line_reader.h"
#include "log_sources.h"
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
#include <map>
#include <new>
#include <optional>
#include <set>
#include <string>
#include <string_view>
#include <system_error>
#include <thread>
#include <utility>
#include <vector>

namespace {

using namespace orvane;
using namespace orvane::logcat;
namespace fs = std::filesystem;

// The key candidates of the logs of one folder: its logs' game ids, then
// each --key-game-id, then the empty game id (the first call of a process
// fixes the key even when it is refused, so a process whose first call had
// an empty game id wrote under the fixed key text alone, which no log's name
// gives), then ids of logs that appear later.
struct FolderKeys {
  fs::path folder;                  // empty for standard input
  fs::file_time_type folder_time{}; // of the folder when it was last listed
  std::uint64_t listed_in = 0;      // the pass that listed it last
  bool named = false;               // some game id comes from a log's name or --key-game-id
  KeyCandidates keys;
};

struct Source {
  fs::path path;
  std::string name; // as reports show it
  bool is_stdin = false;
  FolderKeys *keys = nullptr;
  std::size_t winner = 0; // the candidate that read the last line: tried first
  std::FILE *file = nullptr;
  std::optional<FileIdentity> identity; // of the file last opened
  bool done = false;                    // nothing more will be read from it
  bool said_waiting = false;            // the "does not exist yet" notice went out
  bool unreadable = false;              // could not be opened or read
  bool any_line = false;                // a line that is not empty was read: the next is not the first
  LineReader lines;
  std::uint64_t offset = 0;      // bytes read so far
  std::size_t shown_partial = 0; // size of an unended line already taken, or 0
  LogCounts counts;
};

struct Folder {
  fs::path path;
  bool said_waiting = false;
  bool done = false; // could not be listed
};

// Followed logs kept open between polls; the others are closed after each
// read and found again by path and identity, so that descriptors stay
// bounded whatever the folders hold.
constexpr std::size_t kOpenWhileFollowing = 64;

struct Reader {
  Options options;
  KeyPool pool;
  std::deque<Source> sources; // a deque, since following a folder adds to it
  std::vector<Folder> folders;
  std::map<std::string, FolderKeys> folder_keys;                 // by the folder's path in normal form
  std::set<std::string> known_paths;                             // in normal form
  std::set<std::pair<std::uint64_t, std::uint64_t>> known_files; // identities: each read once
  std::size_t open_files = 0;
  std::uint64_t pass = 1; // one pass over every source; a folder is listed once a pass
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

void AddLogIds(FolderKeys &keys, const std::vector<fs::path> &files) {
  for (const fs::path &file : files) {
    AddCandidate(keys.keys, *GameIdOfLogName(file));
    keys.named = true;
  }
}

// Lists the folder for new game ids, at most once a pass and only when the
// folder changed. True when it gave a new one: a process whose first game
// is new there may have written the line that no key read.
bool ListFolderKeys(Reader &reader, FolderKeys &keys) {
  if (keys.folder.empty() || keys.listed_in == reader.pass) return false;
  keys.listed_in = reader.pass;
  std::error_code error;
  const fs::file_time_type time = fs::last_write_time(keys.folder, error);
  if (error || time == keys.folder_time) return false;
  keys.folder_time = time;
  const std::size_t known = keys.keys.game_ids.size();
  AddLogIds(keys, LogFilesIn(keys.folder, error));
  return keys.keys.game_ids.size() != known;
}

FolderKeys &KeysOf(Reader &reader, const fs::path &folder) {
  const auto [found, added] = reader.folder_keys.try_emplace((folder / "").lexically_normal().string());
  FolderKeys &keys = found->second;
  if (!added) return keys;
  keys.folder = folder;
  ListFolderKeys(reader, keys);
  for (const std::string &id : reader.options.key_game_ids) AddCandidate(keys.keys, id);
  keys.named |= !reader.options.key_game_ids.empty();
  AddCandidate(keys.keys, "");
  return keys;
}

// False for a log already taken, under this spelling of its path or another
// one that reaches the same file.
bool FirstSighting(Reader &reader, const fs::path &path) {
  if (!reader.known_paths.insert(path.lexically_normal().string()).second) return false;
  const std::optional<FileIdentity> identity = IdentityAtPath(path);
  return !identity || reader.known_files.emplace(identity->volume, identity->index).second;
}

bool AddSource(Reader &reader, const fs::path &path) {
  const bool is_stdin = path == "-";
  if (!is_stdin && !FirstSighting(reader, path)) return true;
  const std::optional<std::string> own = is_stdin ? std::nullopt : GameIdOfLogName(path);
  FolderKeys &keys =
      is_stdin ? KeysOf(reader, {}) : KeysOf(reader, path.has_parent_path() ? path.parent_path() : ".");
  if (own) AddCandidate(keys.keys, *own);
  if (!own && !keys.named) {
    Complain(is_stdin ? "standard input has no file name to take the game id from; give --key-game-id"
                      : path.string() + ": the name does not end in .log and its folder holds no "
                                        "other log, so no key is known; give --key-game-id");
    return false;
  }
  Source &source = reader.sources.emplace_back();
  source.path = path;
  source.name = path.string();
  source.is_stdin = is_stdin;
  source.keys = &keys;
  source.winner = own ? FindCandidate(keys.keys, *own) : 0;
  return true;
}

// Adds the folder's *.log files that are not read yet; returns how many it
// holds. A folder that does not exist is waited for when following; one that
// cannot be listed fails.
std::size_t ScanFolder(Reader &reader, Folder &folder) {
  if (folder.done) return 0;
  std::error_code error;
  const std::vector<fs::path> files = LogFilesIn(folder.path, error);
  const bool missing = error == std::errc::no_such_file_or_directory;
  if (missing && reader.options.follow) {
    if (!folder.said_waiting) Complain(folder.path.string() + ": does not exist yet; waiting for it");
    folder.said_waiting = true;
    return 0;
  }
  if (error) {
    Fail(reader, folder.path.string() + ": cannot list: " + error.message() +
                     (missing ? " (no game has recorded here yet?)" : ""));
    folder.done = true;
    return 0;
  }
  AddLogIds(KeysOf(reader, folder.path), files);
  for (const fs::path &file : files)
    if (!reader.known_paths.contains(file.lexically_normal().string())) AddSource(reader, file);
  return files.size();
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
  KeyCandidates &keys = source.keys->keys;
  LineFault fault = ReadLine(reader.pool, keys, source.winner, line, reader.buffers, reader.record);
  if ((fault == LineFault::kBadPadding || fault == LineFault::kNotRecord) &&
      ListFolderKeys(reader, *source.keys))
    fault = ReadLine(reader.pool, keys, source.winner, line, reader.buffers, reader.record);
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
  const std::string file_name = source.is_stdin ? "-" : source.path.filename().string();
  if (reader.options.with_file) added.file = file_name;
  if (reader.options.show_key) added.key_game_id = keys.game_ids[source.winner];
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

void Close(Reader &reader, Source &source) {
  if (source.file == nullptr || source.is_stdin) return;
  std::fclose(source.file);
  source.file = nullptr;
  --reader.open_files;
}

void GiveUp(Reader &reader, Source &source, const std::string &why) {
  Fail(reader, source.name + ": " + why);
  Close(reader, source);
  source.done = true;
  source.unreadable = true;
}

// Opens a file source where it was left; in follow mode a missing file is
// waited for. Only a regular file is read.
bool Open(Reader &reader, Source &source) {
  if (source.is_stdin) {
    source.file = stdin;
    return true;
  }
  const OpenedFile opened = OpenForReading(source.path);
  if (opened.kind != nullptr) {
    GiveUp(reader, source, std::string("is ") + opened.kind + ", not a regular file; not read");
    return false;
  }
  if (opened.file == nullptr) {
    if (reader.options.follow && opened.error == ENOENT) {
      if (!source.said_waiting) Complain(source.name + ": does not exist yet; waiting for it");
      source.said_waiting = true;
      return false;
    }
    GiveUp(reader, source, std::string("cannot open: ") + std::strerror(opened.error));
    return false;
  }
  source.file = opened.file;
  ++reader.open_files;
  const std::optional<FileIdentity> identity = IdentityOfOpenFile(source.file);
  if (source.offset != 0 && (identity != source.identity || !SeekTo(source.file, source.offset))) {
    Close(reader, source); // replaced between the look at its path and the open: the next poll sees it
    return false;
  }
  source.identity = identity;
  return true;
}

// Reads the followed file again from its start at the next poll.
void StartAgain(Reader &reader, Source &source, const std::string &why) {
  Complain(source.name + ": " + why);
  Close(reader, source);
  source.lines = {};
  source.offset = 0;
  source.shown_partial = 0;
  source.any_line = false;
  source.identity.reset();
}

// What a followed file's path shows before it is read: a file cut shorter
// than what was read is read again from its start; another file there
// than the one read is read from its start once the old one is read to its
// end (a closed one has no end to read). Until a file is there, the last is
// kept. False when a closed file has nothing new to read.
bool LookAtPath(Reader &reader, Source &source, bool &replaced) {
  const std::optional<FileIdentity> now = IdentityAtPath(source.path);
  replaced = now && source.identity && *now != *source.identity;
  if (replaced && source.file == nullptr) {
    StartAgain(reader, source, "was replaced; reading the new file from its start");
    replaced = false;
    return true;
  }
  if (replaced || !now) return source.file != nullptr || !source.identity; // never opened: waited for
  std::error_code error;
  const auto size = fs::file_size(source.path, error);
  if (!error && size < source.offset) {
    StartAgain(reader, source, "became shorter; reading it again from the start");
    return true;
  }
  return source.file != nullptr || source.identity == std::nullopt || (!error && size > source.offset);
}

// Feeds the stream's bytes to the end of what it holds now; true when any came.
bool ReadToEnd(Reader &reader, Source &source, std::string &out) {
  static char buffer[1 << 16];
  bool any = false;
  for (;;) {
    const std::size_t n = std::fread(buffer, 1, sizeof buffer, source.file);
    if (n == 0) break;
    any = true;
    source.offset += n;
    const auto take = [&](std::uint64_t number, std::string_view line) {
      // Taken already while it was the last, unended line.
      if (std::exchange(source.shown_partial, 0) != line.size() || line.empty())
        TakeLine(reader, source, number, line, out, true);
    };
    const auto too_long = [&](std::uint64_t number) {
      source.shown_partial = 0;
      ReportBadLine(reader, source, number, "longer than any line the library writes; skipped to its end");
    };
    FeedLines(source.lines, std::string_view(buffer, n), take, too_long);
    Emit(out);
  }
  if (std::ferror(source.file))
    GiveUp(reader, source, std::string("read error: ") + std::strerror(errno));
  else
    std::clearerr(source.file);
  return any;
}

// The last line of a file that nothing more is read from. The library puts
// no line break after its last line, and a writer may be putting it there
// right now: while no key reads it and a writer holds the log's lock, the
// append is waited for (its lock is held at most as long as a write takes)
// and what it added read. A line that does not read with no writer at work
// is what a writer that died left: torn, and reported.
void TakeLastLine(Reader &reader, Source &source, std::string &out) {
  constexpr int kRounds = 2000; // of 1 ms: beyond the second that a writer waits for a lock
  for (int round = 0; !source.is_stdin && !source.unreadable; ++round) {
    const std::string_view last = PartialLine(source.lines.lines);
    if (last.empty() || last.size() == source.shown_partial) return;
    if (TakeLine(reader, source, source.lines.lines.next_number, last, out, false)) return;
    if (!WriterIsAppending(source.file)) break;
    if (round == kRounds) {
      Complain(source.name + ":" + std::to_string(source.lines.lines.next_number) +
               ": still being written; left out");
      return;
    }
    std::this_thread::sleep_for(std::chrono::milliseconds(1));
    ReadToEnd(reader, source, out);
  }
  const std::string_view last = PartialLine(source.lines.lines);
  if (!source.unreadable && last.size() != source.shown_partial)
    TakeLine(reader, source, source.lines.lines.next_number, last, out, true);
}

// A followed file's unended last line: the newest record has no line break
// yet. It is taken as soon as it decodes; one that does not decode may
// still be growing and waits for its end.
void TakePartialLine(Reader &reader, Source &source, std::string &out) {
  const std::string_view last = PartialLine(source.lines.lines);
  if (!last.empty() && source.shown_partial == 0 &&
      TakeLine(reader, source, source.lines.lines.next_number, last, out, false))
    source.shown_partial = last.size();
}

// Reads what the source holds now. Returns true when it read any bytes or
// starts a replaced file again. A file is open only while it is read, but
// for the first followed ones.
bool ReadAvailable(Reader &reader, Source &source) {
  const bool follow = reader.options.follow && !source.is_stdin;
  bool replaced = false;
  if (source.done || (follow && !LookAtPath(reader, source, replaced))) return false;
  if (source.file == nullptr && !Open(reader, source)) return false;
  std::string out;
  bool any = false;
  try {
    any = ReadToEnd(reader, source, out);
    if (!follow || replaced)
      TakeLastLine(reader, source, out);
    else if (!source.unreadable)
      TakePartialLine(reader, source, out);
  } catch (const std::bad_alloc &) {
    out.clear();
    GiveUp(reader, source, "out of memory; the rest of this file is not read");
  }
  Emit(out);
  if (replaced) StartAgain(reader, source, "was replaced; reading the new file from its start");
  if (!follow) {
    source.done = true;
    source.lines = {};
  }
  if (source.done || reader.open_files > kOpenWhileFollowing) Close(reader, source);
  return any || replaced;
}

// Reads a folder's *.log files where the folder stands among the arguments.
void AddFolder(Reader &reader, const fs::path &path) {
  Folder &folder = reader.folders.emplace_back(Folder{path});
  if (ScanFolder(reader, folder) == 0 && !folder.done && !folder.said_waiting)
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
    ++reader.pass;
    if (!open) break;
    if (!any) std::this_thread::sleep_for(std::chrono::milliseconds(100));
  }
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
