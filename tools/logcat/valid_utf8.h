// Making a JSON line valid UTF-8 whatever bytes a game stored in it.
#pragma once

#include <cstddef>
#include <string>
#include <string_view>

namespace orvane::logcat {

// Appends `json`, writing every byte that is not part of a valid UTF-8
// sequence as the escape \u00XX, the byte's Latin-1 reading; valid UTF-8
// (overlong forms, surrogates and code points above U+10FFFF are not) is
// copied unchanged. Correct for any JSON text whose structure is ASCII, since
// such bytes can then only stand inside a string. Returns how many bytes
// were escaped.
//
// The mapping is reversible: the escapes \u0080 to \u00ff never stand for
// anything else in the output, because a record's valid UTF-8 is written raw.
std::size_t AppendValidUtf8(std::string &out, std::string_view json);

} // namespace orvane::logcat
