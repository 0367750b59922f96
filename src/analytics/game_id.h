// The game id names its log file, so it has to be a plain file name on every
// platform: nothing that leaves the logs directory, names a Windows device or
// that Windows would silently change.
#pragma once

#include <string_view>

namespace orvane {

// False for "." and "..", a byte below 0x20 or one of / \ : * ? " < > |, a
// last character "." or " ", and a part before the first "." that is a
// Windows device name (CON, PRN, AUX, NUL, CONIN$, CONOUT$, COM0-9, LPT0-9,
// also with superscript digits or blanks behind, any case).
bool IsUsableGameId(std::string_view game_id);

} // namespace orvane
