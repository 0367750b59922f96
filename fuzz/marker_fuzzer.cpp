// Hostile command lines: the marker lookup over any list of 16-bit
// arguments must give what a plain reference gives.
//
// Input: marker choice byte (0: user marker, 1: game-id marker, otherwise
// the next byte is a length and that many bytes are the marker), then
// arguments, each a length byte followed by that many 16-bit units, low
// byte first.
#include "identity/command_line.h"

#include <cstdint>
#include <cstdio>
#include <cstdlib>
#include <string>
#include <string_view>

namespace {

// Narrows every unit to its low byte, then finds the marker in each
// argument in order.
std::string Reference(const orvane::platform::ArgumentList &args, std::string_view marker) {
  for (const std::u16string &arg : args) {
    std::string narrow;
    for (char16_t unit : arg) narrow += static_cast<char>(unit & 0xff);
    const std::size_t at = narrow.find(marker);
    if (at != std::string::npos) return narrow.substr(at + marker.size());
  }
  return {};
}

} // namespace

extern "C" int LLVMFuzzerTestOneInput(const std::uint8_t *data, std::size_t size) {
  std::size_t at = 0;
  auto take = [&](std::uint8_t &byte) {
    if (at == size) return false;
    byte = data[at++];
    return true;
  };
  std::uint8_t choice = 0;
  if (!take(choice)) return 0;
  std::string marker;
  if (choice % 4 == 0) {
    marker = orvane::kUserUuidMarker;
  } else if (choice % 4 == 1) {
    marker = orvane::kGameIdMarker;
  } else {
    std::uint8_t length = 0, byte = 0;
    take(length);
    for (int i = 0; i < length % 24 && take(byte); ++i) marker += static_cast<char>(byte);
  }
  orvane::platform::ArgumentList args;
  std::uint8_t length = 0;
  while (take(length)) {
    std::u16string arg;
    std::uint8_t low = 0, high = 0;
    for (int i = 0; i < length && take(low) && take(high); ++i)
      arg += static_cast<char16_t>(low | (high << 8));
    args.push_back(std::move(arg));
  }
  if (orvane::FindValueAfterMarker(args, marker) != Reference(args, marker)) {
    std::fprintf(stderr, "marker lookup differs from the reference\n");
    std::abort();
  }
  return 0;
}
