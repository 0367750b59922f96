// Which key reads a line. A process encrypts the logs of every game under
// the first game id it saw, so one log file can mix keys line by line, one
// run of lines per process that wrote to it.
#pragma once

#include "log_line.h"

#include <cstddef>
#include <functional>
#include <map>
#include <string>
#include <string_view>
#include <unordered_map>
#include <vector>

namespace orvane::logcat {

// Cipher sessions shared by every file read, opened when first needed.
// Owns the cipher session of every key it holds, closed with the pool. It
// holds at most kPooledKeys: past that it starts empty again, so that a
// folder of many games' logs, each read under its own key, keeps its memory.
inline constexpr std::size_t kPooledKeys = 4096;
struct KeyPool {
  std::map<std::string, LogKey, std::less<>> keys; // by the bytes of the id that make the key
  bool failed = false;                             // a session could not be opened

  KeyPool() = default;
  KeyPool(const KeyPool &) = delete;
  KeyPool &operator=(const KeyPool &) = delete;
  ~KeyPool();
};

// The game ids whose keys may read the lines of the logs of one folder, in
// the order tried, shared by those logs.
struct KeyCandidates {
  std::vector<std::string> game_ids;
  // Index in game_ids by the bytes that make the key: a folder of many logs
  // adds and finds its candidates by lookup, not by a scan.
  std::unordered_map<std::string, std::size_t> by_key;
  // The candidate that read the folder's last line read. One process writes
  // the logs of every game it records under one key, so that key is tried
  // right after the file's own: a folder of such logs costs no scan a log.
  std::size_t last_winner = 0;
};

// Adds `game_id` unless a candidate with the same key is there already;
// true when it was added.
bool AddCandidate(KeyCandidates &candidates, std::string_view game_id);
// The index of the candidate with the key of `game_id`, or the count.
std::size_t FindCandidate(const KeyCandidates &candidates, std::string_view game_id);

// Reads one line with the first candidate whose key decrypts it with valid
// padding and gives a record; `winner` then names that candidate. Since runs
// of lines share a key, the file's last winner (at first the file's own game
// id) is tried first, then the folder's, and a line costs one decryption
// except where a run begins.
// kBadPadding when no key decrypts it, kNotRecord when one does but the text
// is no record.
LineFault ReadLine(KeyPool &pool, KeyCandidates &candidates, std::size_t &winner, std::string_view line,
                   LineBuffers &buffers, EventRecord &record);

} // namespace orvane::logcat
