// The event types a record may have: the names the library writes into the
// "type" member and readers filter on.
#pragma once

#include <cstddef>
#include <string_view>

namespace orvane {

enum class EventKind { kInit, kEnter, kExit, kSpecial };

// Indexed by EventKind.
inline constexpr std::string_view kEventTypeNames[] = {"INIT", "ENTER", "EXIT", "SPECIAL"};

constexpr std::string_view EventTypeName(EventKind kind) {
  return kEventTypeNames[static_cast<std::size_t>(kind)];
}

} // namespace orvane
