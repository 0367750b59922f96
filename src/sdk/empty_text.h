#pragma once

namespace orvane {

// The library's one constant empty text, returned where a text result has no
// value. It lives in read-only data: hosts must never free or write it.
inline constexpr char kEmptyText[1] = "";

} // namespace orvane
