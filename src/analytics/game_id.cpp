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

// Windows opens the device for these names whatever extension follows, also
// with blanks before the extension ("NUL .log"), and counts the superscript
// digits 1, 2 and 3 (0xB9, 0xB2, 0xB3 in Windows-1252, after 0xC2 in UTF-8)
// as COM and LPT port numbers.
bool IsDeviceName(std::string_view stem) {
  while (!stem.empty() && stem.back() == ' ') stem.remove_suffix(1);
  for (std::string_view name : {"CON", "PRN", "AUX", "NUL", "CONIN$", "CONOUT$"})
    if (EqualsIgnoringCase(stem, name)) return true;
  if (!EqualsIgnoringCase(stem.substr(0, 3), "COM") && !EqualsIgnoringCase(stem.substr(0, 3), "LPT"))
    return false;
  std::string_view digit = stem.substr(3);
  if (digit.size() == 2 && digit[0] == '\xc2') digit.remove_prefix(1);
  if (digit.size() != 1) return false;
  const unsigned char d = static_cast<unsigned char>(digit[0]);
  return (d >= '0' && d <= '9') || d == 0xb9 || d == 0xb2 || d == 0xb3;
}

} // namespace

bool IsUsableGameId(std::string_view game_id) {
  if (game_id.empty() || game_id == "." || game_id == "..") return false;
  for (char c : game_id) {
    if (static_cast<unsigned char>(c) < 0x20) return false;
    switch (c) {
    case '/':
    case '\\':
    case ':':
    case '*':
    case '?':
    case '"':
    case '<':
    case '>':
    case '|': return false;
    default: break;
    }
  }
  // Windows drops a trailing dot or blank, so "a." would write to "a".
  if (game_id.back() == '.' || game_id.back() == ' ') return false;
  return !IsDeviceName(game_id.substr(0, game_id.find('.')));
}

} // namespace orvane
