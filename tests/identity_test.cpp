// The launch identity: the lookup over argument lists of 16-bit units, and
// the two exports over a given list.
#include "OrvaneSDK.h"
#include "identity/command_line.h"
#include "support/test_support.h"

#include <string>

namespace orvane::testing {
namespace {

std::u16string U(std::string_view ascii) { return std::u16string(ascii.begin(), ascii.end()); }

TEST(CommandLine, FindsTheRestOfTheFirstArgumentWithTheMarker) {
  const std::u16string exe = U("demo.exe");
  const std::string_view user = kUserUuidMarker, game = kGameIdMarker;
  // clang-format off
  const struct { platform::ArgumentList args; std::string_view marker; std::string value; } cases[] = {
      {{exe, U("--gameId--space-race-championship")}, user, ""}, // absent
      {{exe, U("--userUuid--"), U("a1b2c3d4")}, user, ""}, // the value is not in the next argument
      {{exe, U("--gameId--"), U("--gameId--g9")}, game, ""}, // the first one closes the search
      {{exe, U("--userUuid--u7--gameId--g9")}, user, "u7--gameId--g9"},
      {{exe, U("--userUuid--u7--gameId--g9")}, game, "g9"},
      {{exe, U("/opt:--gameId--g9")}, game, "g9"}, // text before the marker
      {{U("C:\\--gameId--x\\demo.exe"), U("--gameId--g9")}, game, "x\\demo.exe"}, // argument 0 first
      {{exe, U("--GAMEID--g9")}, game, ""}, {{exe, U("--gameId--space race")}, game, "space race"},
      {{}, game, ""}, {{U("--game")}, game, ""},
      {{exe, u"--gameId--caf\u00e9"}, game, "caf\xe9"}, // low bytes
      {{exe, u"--gameId--\u0141x"}, game, "Ax"},
      {{exe, u"\u4e2d\u4e2duserUuid\u4e2d\u4e2dx"}, user, "x"}, // U+4E2D narrows to a hyphen
      {{exe, u"--gameId--\U0001F600"}, game, std::string("\x3d\x00", 2)}, // a surrogate pair: two bytes
      {{exe, std::u16string(u"--gameId--a\0b", 13)}, game, std::string("a\0b", 3)}};
  // clang-format on
  for (const auto &c : cases)
    EXPECT_EQ(FindValueAfterMarker(c.args, c.marker), c.value)
        << c.marker << " in " << ::testing::PrintToString(c.args);
}

platform::ArgumentList g_args;
bool g_split_ok = true;
bool FakeArguments(platform::ArgumentList &args) {
  args = g_args;
  return g_split_ok;
}

// Results and messages of the two exports over a given argument list; every
// result goes back through oFreeText, the constant empty text too.
TEST_F(SandboxTest, IdentityResultsAndMessages) {
  platform::calls().argument_list = FakeArguments;
  struct Case {
    platform::ArgumentList args;
    bool split_ok;
    std::string uuid, game_id; // empty: the constant empty text
    std::vector<Message> messages;
  };
  const Message uuid_ok{0, "[OrvaneSDK] Authentication - OK"},
      uuid_failed{2, "[OrvaneSDK] Authentication - Failed"};
  const Message game_ok{0, "[OrvaneSDK] Return GameID - OK"},
      game_empty{2, "[OrvaneSDK] Return GameID - Empty"};
  const std::u16string exe = U("demo.exe");
  // clang-format off
  const Case cases[] = {
      {{exe, U("--userUuid--a1b2c3d4"), U("--gameId--demo42")}, true, "a1b2c3d4", "demo42",
       {uuid_ok, game_ok, game_ok}},
      {{exe, U("--userUuid--"), U("--gameId--")}, true, "", "", {uuid_failed, game_empty, game_empty}},
      {{exe, U("--gameId--z")}, false, "", "", {uuid_failed, game_empty, game_empty}}, // the split fails
      // a value that reads empty is none; the text ends at a zero byte
      {{exe, u"--userUuid--\u0100abc", std::u16string(u"--gameId--ab\0cd", 15)}, true, "", "ab",
       {uuid_failed, game_ok, game_ok}}};
  // clang-format on
  for (const Case &c : cases) {
    SCOPED_TRACE(::testing::PrintToString(c.args));
    g_args = c.args;
    g_split_ok = c.split_ok;
    Captured().clear();
    char *uuid = oAuthGetUserUuid(), *game = oAuthGetGameId(), *again = oAuthGetGameId();
    EXPECT_EQ(std::string(uuid), c.uuid);
    EXPECT_EQ(std::string(game), c.game_id);
    EXPECT_EQ(Captured(), c.messages);
    EXPECT_EQ(game == again, c.game_id.empty()) << "a new block for every value, one constant for none";
    for (char *result : {uuid, game, again}) oFreeText(result);
  }
  oFreeText(nullptr);
}

} // namespace
} // namespace orvane::testing
