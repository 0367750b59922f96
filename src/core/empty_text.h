#pragma once

namespace orvane {

// The library's one constant empty text, returned where a text result has no
// value. It lives in read-only data: never free()d or written; oFreeText
// ignores it.
inline constexpr char kEmptyText[1] = "";

} // namespace orvane
