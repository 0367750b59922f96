#include "analytics/game_id.h"

namespace orvane {
namespace {

char Upper(char c) { return (c >= 'a' && c <= 'z') ? static_cast<char>(c - 'a' + 'A') : c; }

bool EqualsIgnoringCase(std::string_view a, std::string_view upper) {
  if (a.size() != upper.size()) return false;
  for (std::size_t i = 0; i < a.size(); ++i)
    if (Upper(a[i]) != upper[i]) return false;
  return true;
}

// Windows opens the device for these names whatever extension follows.
bool IsDeviceName(std::string_view stem) {
  for (std::string_view name : {"CON", "PRN", "AUX", "NUL"})
    if (EqualsIgnoringCase(stem, name)) return true;
  if (stem.size() == 4 && stem[3] >= '0' && stem[3] <= '9')
    return EqualsIgnoringCase(stem.substr(0, 3), "COM") || EqualsIgnoringCase(stem.substr(0, 3), "LPT");
  return false;
}

} // namespace

bool IsUsableGameId(std::string_view game_id) {
  if (game_id.empty() || game_id == "." || game_id == "..") return false;
  for (char c : game_id) {
    if (static_cast<unsigned char>(c) < 0x20) return false;
    switch (c) {
    case '/': case '\\': case ':': case '*': case '?': case '"': case '<': case '>': case '|':
      return false;
    default:
      break;
    }
  }
  // Windows drops a trailing dot or blank, so "a." would write to "a".
  if (game_id.back() == '.' || game_id.back() == ' ') return false;
  return !IsDeviceName(game_id.substr(0, game_id.find('.')));
}

} // namespace orvane
