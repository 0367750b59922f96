// Hostile game ids: an id that the file-name check accepts must name a file
// directly inside the logs directory, under both POSIX and Windows path
// rules, and never a Windows device.
#include "analytics/game_id.h"

#include <cstdint>
#include <cstdio>
#include <cstdlib>
#include <string>
#include <string_view>
#include <vector>

namespace {

void Fail(const char *what, std::string_view id) {
  std::fprintf(stderr, "game id property broken: %s (id of %zu bytes)\n", what, id.size());
  std::abort();
}

// Lexical normalisation with both "/" and "\" as separators: empty and "."
// parts vanish, ".." takes the previous part away (or is kept when there is
// none, which already is outside).
std::vector<std::string> Normalise(std::string_view path) {
  std::vector<std::string> parts;
  std::size_t start = 0;
  for (std::size_t i = 0; i <= path.size(); ++i) {
    if (i < path.size() && path[i] != '/' && path[i] != '\\') continue;
    const std::string_view part = path.substr(start, i - start);
    start = i + 1;
    if (part.empty() || part == ".") continue;
    if (part == ".." && !parts.empty() && parts.back() != "..") {
      parts.pop_back();
      continue;
    }
    parts.emplace_back(part);
  }
  return parts;
}

char Upper(char c) { return (c >= 'a' && c <= 'z') ? static_cast<char>(c - 'a' + 'A') : c; }

// Windows' reserved device names: the part before the first "." with
// trailing blanks dropped, compared without case; COM and LPT take a digit or
// a superscript 1, 2, 3, which narrow file names spell as one Windows-1252
// byte (B9, B2, B3) or as UTF-8 (C2 B9, C2 B2, C2 B3) by the code page.
bool IsWindowsDevice(std::string_view file_name) {
  std::string stem(file_name.substr(0, file_name.find('.')));
  while (!stem.empty() && stem.back() == ' ') stem.pop_back();
  for (char &c : stem) c = Upper(c);
  if (stem == "CON" || stem == "PRN" || stem == "AUX" || stem == "NUL") return true;
  if (stem.size() < 4 || (stem.compare(0, 3, "COM") != 0 && stem.compare(0, 3, "LPT") != 0))
    return false;
  std::string_view digit = std::string_view(stem).substr(3);
  if (digit.size() == 2 && static_cast<unsigned char>(digit[0]) == 0xc2) digit.remove_prefix(1);
  if (digit.size() != 1) return false;
  const unsigned char last = static_cast<unsigned char>(digit[0]);
  return (last >= '0' && last <= '9') || last == 0xb9 || last == 0xb2 || last == 0xb3;
}

void CheckInside(std::string_view logs_dir, std::string_view id) {
  const std::string path = std::string(logs_dir) + std::string(id) + ".log";
  const std::vector<std::string> dir = Normalise(logs_dir);
  const std::vector<std::string> file = Normalise(path);
  if (file.size() != dir.size() + 1) Fail("path leaves the logs directory", id);
  for (std::size_t i = 0; i < dir.size(); ++i)
    if (file[i] != dir[i]) Fail("path leaves the logs directory", id);
  const std::string &name = file.back();
  if (name != std::string(id) + ".log") Fail("file name differs from id + .log", id);
}

} // namespace

extern "C" int LLVMFuzzerTestOneInput(const std::uint8_t *data, std::size_t size) {
  const std::string_view id(reinterpret_cast<const char *>(data), size);
  if (!orvane::IsUsableGameId(id)) return 0;
  CheckInside("/home/player/.local/share/Orvane/Logs/", id);
  CheckInside("C:\\Orvane\\Logs\\", id);
  // A zero byte would end the C string of the path early, and a byte below
  // 0x20 or a colon (a drive or stream on Windows) does not belong in a name.
  for (char c : id)
    if (static_cast<unsigned char>(c) < 0x20 || c == ':') Fail("control byte or colon accepted", id);
  if (IsWindowsDevice(std::string(id) + ".log")) Fail("Windows device name accepted", id);
  return 0;
}
