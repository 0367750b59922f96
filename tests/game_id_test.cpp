// Which game ids may name a log file.
#include "analytics/game_id.h"

#include <gtest/gtest.h>

#include <string>

namespace orvane {
namespace {

TEST(GameId, RefusesNamesThatAreNotPlainFiles) {
  // Tables read best packed.
  // clang-format off
  const std::string refused[] = {
      "", ".", "..", "../x", "..\\..\\x", "a/b", "a\\b", "C:x", "a:b", "a*", "a?", "a\"b", "<a", "a>",
      "a|b", std::string("a\0b", 3), "a\nb", "\t", "\x1f", "a.", "a ", "...",
      "CON", "con", "Con.log", "PRN", "AUX", "NUL", "nul.txt", "COM0", "com1", "COM9.x", "LPT0", "lpt9",
      "CON.", "NUL.tar.gz", "NUL .log", "con  ", "CON .x", "LPT\xb9", "com\xc2\xb2.x", "COM\xb3",
      "CONIN$", "conout$.log",
  };
  // clang-format on
  for (const std::string &id : refused) EXPECT_FALSE(IsUsableGameId(id)) << id;
}

TEST(GameId, AcceptsOrdinaryIds) {
  // clang-format off
  const std::string accepted[] = {
      "g1", "game-1_b.v2", "Conway", "console", "CONx", "COM", "COM10", "LPT", "xCON", "NULL",
      "my game", " lead", ".hidden", "a..b", "jeu-\xc3\xa9t\xc3\xa9", "\xe4\xb8\xad\xe6\x96\x87",
      "\x7f", "a.b.c", std::string(300, 'x'), "COM\xc2\xb4", "LPT12", "CONIN", "x NUL",
  };
  // clang-format on
  for (const std::string &id : accepted) EXPECT_TRUE(IsUsableGameId(id)) << id;
}

} // namespace
} // namespace orvane
