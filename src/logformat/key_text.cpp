#include "logformat/key_text.h"

#include <algorithm>

namespace orvane {

KeyText MakeKeyText(std::string_view game_id) {
  KeyText text{};
  auto end = std::copy(kFixedKeyText.begin(), kFixedKeyText.end(), text.begin());
  game_id = game_id.substr(0, kKeyGameIdBytes);
  std::copy(game_id.begin(), game_id.end(), end);
  return text;
}

} // namespace orvane
