// The launch identity: the lookup over argument lists of 16-bit units, and
// the two exports over a given list.
#include "OrvaneSDK.h"
#include "identity/command_line.h"
#include "support/test_support.h"

#include <string>

namespace orvane::testing {
namespace {

std::u16string Units(std::string_view ascii) { return std::u16string(ascii.begin(), ascii.end()); }

platform::ArgumentList List(std::initializer_list<std::u16string> args) { return args; }

TEST(CommandLine, FindsTheRestOfTheFirstArgumentWithTheMarker) {
  struct Case {
    const char *name;
    platform::ArgumentList args;
    std::string_view marker;
    std::string value;
  };
  const std::u16string exe = Units("demo.exe");
  const Case cases[] = {
      {"both markers",
       List({Units("C:\\Games\\Demo\\demo.exe"), Units("--userUuid--a1b2c3d4"), Units("--gameId--demo42")}),
       kUserUuidMarker, "a1b2c3d4"},
      {"game id",
       List({Units("C:\\Games\\Demo\\demo.exe"), Units("--userUuid--a1b2c3d4"), Units("--gameId--demo42")}),
       kGameIdMarker, "demo42"},
      {"absent marker", List({exe, Units("--gameId--space-race-championship")}), kUserUuidMarker, ""},
      {"bare marker, value in the next argument", List({exe, Units("--userUuid--"), Units("a1b2c3d4")}),
       kUserUuidMarker, ""},
      {"marker closes the argument, a later one ignored",
       List({exe, Units("--gameId--"), Units("--gameId--g9")}), kGameIdMarker, ""},
      {"another marker inside the value", List({exe, Units("--userUuid--u7--gameId--g9")}), kUserUuidMarker,
       "u7--gameId--g9"},
      {"the other marker found inside", List({exe, Units("--userUuid--u7--gameId--g9")}), kGameIdMarker,
       "g9"},
      {"lowest index wins", List({exe, Units("--gameId--first"), Units("--gameId--second")}), kGameIdMarker,
       "first"},
      {"text before the marker", List({exe, Units("/opt:--gameId--g9")}), kGameIdMarker, "g9"},
      {"argument 0 is searched first", List({Units("C:\\--gameId--x\\demo.exe"), Units("--gameId--g9")}),
       kGameIdMarker, "x\\demo.exe"},
      {"case-sensitive", List({exe, Units("--GAMEID--g9")}), kGameIdMarker, ""},
      {"spaces belong to the value", List({exe, Units("--gameId--space race")}), kGameIdMarker, "space race"},
      {"empty list", List({}), kGameIdMarker, ""},
      {"shorter than the marker", List({Units("--game")}), kGameIdMarker, ""},
      {"U+00E9 narrows to one byte", List({exe, u"--gameId--caf\u00e9"}), kGameIdMarker, "caf\xe9"},
      {"U+0141 narrows to A", List({exe, u"--gameId--\u0141x"}), kGameIdMarker, "Ax"},
      {"U+4E2D narrows to a hyphen and spells the marker", List({exe, u"\u4e2d\u4e2duserUuid\u4e2d\u4e2dx"}),
       kUserUuidMarker, "x"},
      {"a surrogate pair gives two bytes", List({exe, u"--gameId--\U0001F600"}), kGameIdMarker,
       std::string("\x3d\x00", 2)},
      {"a zero unit stays inside the value", List({exe, std::u16string(u"--gameId--a\0b", 13)}),
       kGameIdMarker, std::string("a\0b", 3)},
  };
  for (const Case &c : cases) EXPECT_EQ(FindValueAfterMarker(c.args, c.marker), c.value) << c.name;
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
    std::string uuid; // empty: the constant empty text
    std::string game_id;
    std::vector<Message> messages;
  };
  const Message uuid_ok{0, "[OrvaneSDK] Authentication - OK"},
      uuid_failed{2, "[OrvaneSDK] Authentication - Failed"};
  const Message game_ok{0, "[OrvaneSDK] Return GameID - OK"},
      game_empty{2, "[OrvaneSDK] Return GameID - Empty"};
  const std::u16string exe = Units("demo.exe");
  const Case cases[] = {
      {List({exe, Units("--userUuid--a1b2c3d4"), Units("--gameId--demo42")}),
       true,
       "a1b2c3d4",
       "demo42",
       {uuid_ok, game_ok, game_ok}},
      {List({exe, Units("--userUuid--"), Units("--gameId--")}),
       true,
       "",
       "",
       {uuid_failed, game_empty, game_empty}},
      {List({exe, Units("--gameId--z")}), false, "", "", {}}, // the split fails: no message
      {List({exe, u"--userUuid--\u0100abc", std::u16string(u"--gameId--ab\0cd", 15)}),
       true,
       "",
       "ab",
       {uuid_failed, game_ok, game_ok}}, // a value that reads empty is none; the text ends at a zero byte
  };
  for (const Case &c : cases) {
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
