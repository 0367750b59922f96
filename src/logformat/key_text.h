// The key text from which a log's AES key and IV are taken. The library and
// orvane-logcat both use this one definition.
#pragma once

#include <array>
#include <cstddef>
#include <cstdint>
#include <string_view>

namespace orvane {

// The fixed first 15 characters of every key text.
inline constexpr std::string_view kFixedKeyText = "OrvaneLogKey-01";
static_assert(kFixedKeyText.size() == 15);

inline constexpr std::size_t kKeyTextSize = 80;
// Only this much of the game id joins the key text, so that it fills the 80
// bytes at most.
inline constexpr std::size_t kKeyGameIdBytes = kKeyTextSize - kFixedKeyText.size();
// Where the cipher takes its key and IV from; bytes 32 to 63 take no part.
inline constexpr std::size_t kKeyOffset = 0;
inline constexpr std::size_t kIvOffset = 64;

using KeyText = std::array<std::uint8_t, kKeyTextSize>;

// The fixed text followed by the first 65 bytes of `game_id`, zero behind.
KeyText MakeKeyText(std::string_view game_id);

} // namespace orvane
