// The hex form of a log line: two lowercase digits per ciphertext byte, high
// nibble first, no separator.
#pragma once

#include <cstddef>
#include <cstdint>
#include <string>
#include <string_view>
#include <vector>

namespace orvane {

void AppendHex(std::string &out, const std::uint8_t *bytes, std::size_t size);

// True when every character is one of 0-9 and a-f.
bool IsLowerHex(std::string_view text);

// The bytes that `hex` spells; false when it is not lowercase hex of an even
// length (`bytes` is then unspecified).
bool DecodeHex(std::string_view hex, std::vector<std::uint8_t> &bytes);

} // namespace orvane
