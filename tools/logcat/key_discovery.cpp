#include "key_discovery.h"

#include "logformat/key_text.h"

namespace orvane::logcat {
namespace {

// Ids that agree in these bytes have the same key.
std::string_view KeyPart(std::string_view game_id) { return game_id.substr(0, kKeyGameIdBytes); }

const LogKey *PooledKey(KeyPool &pool, std::string_view game_id) {
  const std::string_view part = KeyPart(game_id);
  auto found = pool.keys.find(part);
  if (found == pool.keys.end()) found = pool.keys.emplace(std::string(part), OpenLogKey(part)).first;
  if (found->second.session != nullptr) return &found->second;
  pool.failed = true;
  return nullptr;
}

} // namespace

KeyPool::~KeyPool() {
  for (auto &[part, key] : keys) CloseLogKey(key);
}

void AddCandidate(KeyCandidates &candidates, std::string_view game_id) {
  for (const std::string &known : candidates.game_ids)
    if (KeyPart(known) == KeyPart(game_id)) return;
  candidates.game_ids.emplace_back(game_id);
}

LineFault ReadLine(KeyPool &pool, KeyCandidates &candidates, std::string_view line, LineBuffers &buffers,
                   EventRecord &record) {
  if (const LineFault fault = TakeCiphertext(line, buffers); fault != LineFault::kNone) return fault;
  LineFault worst = LineFault::kBadPadding;
  const std::size_t count = candidates.game_ids.size();
  for (std::size_t k = 0; k <= count; ++k) {
    // k = 0 is the last winner; then every candidate in order but that one.
    const std::size_t index = k == 0 ? candidates.winner : k - 1;
    if (index >= count || (k != 0 && index == candidates.winner)) continue;
    const LogKey *key = PooledKey(pool, candidates.game_ids[index]);
    if (key == nullptr) continue;
    const LineFault fault = DecryptRecord(*key, buffers, record);
    if (fault == LineFault::kNone) {
      candidates.winner = index;
      return fault;
    }
    if (fault == LineFault::kNotRecord) worst = fault;
  }
  return worst;
}

} // namespace orvane::logcat
