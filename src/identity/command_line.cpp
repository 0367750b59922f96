#include "identity/command_line.h"

#include "core/empty_text.h"

#include <algorithm>
#include <cstdlib>
#include <cstring>

namespace orvane {

const IdentityLookup kUserUuidLookup = {kUserUuidMarker, "[OrvaneSDK] Authentication - OK",
                                        "[OrvaneSDK] Authentication - Failed"};
const IdentityLookup kGameIdLookup = {kGameIdMarker, "[OrvaneSDK] Return GameID - OK",
                                      "[OrvaneSDK] Return GameID - Empty"};

namespace {

unsigned char Narrow(char16_t unit) { return static_cast<unsigned char>(unit & 0xff); }

// Position just behind the first occurrence of `marker` in the narrowed
// argument, or npos. Compares low bytes in place instead of narrowing every
// argument into a copy first.
std::size_t FindAfter(const std::u16string &arg, std::string_view marker) {
  if (arg.size() < marker.size()) return std::u16string::npos;
  for (std::size_t p = 0; p + marker.size() <= arg.size(); ++p) {
    std::size_t i = 0;
    while (i < marker.size() && Narrow(arg[p + i]) == static_cast<unsigned char>(marker[i])) ++i;
    if (i == marker.size()) return p + i;
  }
  return std::u16string::npos;
}

} // namespace

std::string FindValueAfterMarker(const platform::ArgumentList &args, std::string_view marker) {
  for (const std::u16string &arg : args) {
    const std::size_t start = FindAfter(arg, marker);
    if (start == std::u16string::npos) continue;
    std::string value(arg.size() - start, '\0');
    std::transform(arg.begin() + static_cast<std::ptrdiff_t>(start), arg.end(), value.begin(),
                   [](char16_t unit) { return static_cast<char>(Narrow(unit)); });
    return value;
  }
  return {};
}

char *LookUpIdentity(MessageBatch &messages, const IdentityLookup &lookup) {
  char *const empty = const_cast<char *>(kEmptyText);
  platform::ArgumentList args;
  // A command line that cannot be read (no /proc) holds no value either.
  const bool read = platform::calls().argument_list(args);
  const std::string value = read ? FindValueAfterMarker(args, lookup.marker) : std::string();
  // A value whose first byte is zero would read as empty text in a block
  // that the host must free, while an empty result must never be freed:
  // such a value counts as not found, so that the rule stays exact. A block
  // that cannot be had (memory exhausted) is reported the same way.
  char *const block =
      value.empty() || value[0] == '\0' ? nullptr : static_cast<char *>(std::malloc(value.size() + 1));
  if (block == nullptr) {
    messages.Add(LogLevel::Error, lookup.not_found);
    return empty;
  }
  // The text ends at the value's first zero byte, as a C string would.
  const std::size_t length = std::strlen(value.c_str());
  std::memcpy(block, value.data(), length);
  block[length] = '\0';
  messages.Add(LogLevel::Info, lookup.found);
  return block;
}

} // namespace orvane
