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
#include <vector>

namespace orvane::logcat {

// Cipher sessions shared by every file read, opened when first needed.
// Owns the cipher session of every key it holds, closed with the pool.
struct KeyPool {
  std::map<std::string, LogKey, std::less<>> keys; // by the bytes of the id that make the key
  bool failed = false;                             // a session could not be opened

  KeyPool() = default;
  KeyPool(const KeyPool &) = delete;
  KeyPool &operator=(const KeyPool &) = delete;
  ~KeyPool();
};

// The game ids whose keys may read one file's lines, in the order tried.
struct KeyCandidates {
  std::vector<std::string> game_ids;
  std::size_t winner = 0; // the one that read the last line read: tried first
};

// Adds `game_id` unless a candidate with the same key is there already.
void AddCandidate(KeyCandidates &candidates, std::string_view game_id);

// Reads one line with the first candidate whose key decrypts it with valid
// padding and gives a record; `candidates.winner` then names that candidate.
// Since runs of lines share a key, the last winner is tried first and a
// line costs one decryption except where a run begins. kBadPadding when no
// key decrypts it, kNotRecord when one does but the text is no record.
LineFault ReadLine(KeyPool &pool, KeyCandidates &candidates, std::string_view line, LineBuffers &buffers,
                   EventRecord &record);

} // namespace orvane::logcat
