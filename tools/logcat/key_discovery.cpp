#include "key_discovery.h"

#include "logformat/key_text.h"

namespace orvane::logcat {
namespace {

// Ids that agree in these bytes have the same key.
std::string_view KeyPart(std::string_view game_id) { return game_id.substr(0, kKeyGameIdBytes); }

const LogKey *PooledKey(KeyPool &pool, std::string_view game_id) {
  const std::string_view part = KeyPart(game_id);
  auto found = pool.keys.find(part);
  if (found == pool.keys.end()) {
    if (pool.keys.size() >= kPooledKeys) {
      for (auto &[known, key] : pool.keys) CloseLogKey(key);
      pool.keys.clear();
    }
    found = pool.keys.emplace(std::string(part), OpenLogKey(part)).first;
  }
  if (found->second.session != nullptr) return &found->second;
  pool.failed = true;
  return nullptr;
}

} // namespace

KeyPool::~KeyPool() {
  for (auto &[part, key] : keys) CloseLogKey(key);
}

bool AddCandidate(KeyCandidates &candidates, std::string_view game_id) {
  if (!candidates.by_key.emplace(KeyPart(game_id), candidates.game_ids.size()).second) return false;
  candidates.game_ids.emplace_back(game_id);
  return true;
}

std::size_t FindCandidate(const KeyCandidates &candidates, std::string_view game_id) {
  const auto found = candidates.by_key.find(std::string(KeyPart(game_id)));
  return found == candidates.by_key.end() ? candidates.game_ids.size() : found->second;
}

LineFault ReadLine(KeyPool &pool, KeyCandidates &candidates, std::size_t &winner, std::string_view line,
                   LineBuffers &buffers, EventRecord &record) {
  if (const LineFault fault = TakeCiphertext(line, buffers); fault != LineFault::kNone) return fault;
  LineFault worst = LineFault::kBadPadding;
  const std::size_t count = candidates.game_ids.size();
  const std::size_t folders = candidates.last_winner;
  for (std::size_t k = 0; k <= count + 1; ++k) {
    // The file's last winner, the folder's, then every candidate in order but those.
    const std::size_t index = k == 0 ? winner : k == 1 ? folders : k - 2;
    if (index >= count || (k == 1 && index == winner) || (k > 1 && (index == winner || index == folders)))
      continue;
    const LogKey *key = PooledKey(pool, candidates.game_ids[index]);
    if (key == nullptr) continue;
    const LineFault fault = DecryptRecord(*key, buffers, record);
    if (fault == LineFault::kNone) {
      winner = index;
      candidates.last_winner = index;
      return fault;
    }
    if (fault == LineFault::kNotRecord) worst = fault;
  }
  return worst;
}

} // namespace orvane::logcat
