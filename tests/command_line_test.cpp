// The identity lookup over argument lists given as 16-bit units.
#include "OrvaneSDK.h"
#include "identity/command_line.h"
#include "support/test_support.h"

#include <cstdlib>
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
      {"both markers", List({Units("C:\\Games\\Demo\\demo.exe"), Units("--userUuid--a1b2c3d4"), Units("--gameId--demo42")}),
       kUserUuidMarker, "a1b2c3d4"},
      {"game id", List({Units("C:\\Games\\Demo\\demo.exe"), Units("--userUuid--a1b2c3d4"), Units("--gameId--demo42")}),
       kGameIdMarker, "demo42"},
      {"absent marker", List({exe, Units("--gameId--space-race-championship")}), kUserUuidMarker, ""},
      {"bare marker, value in the next argument", List({exe, Units("--userUuid--"), Units("a1b2c3d4")}),
       kUserUuidMarker, ""},
      {"marker closes the argument, a later one ignored",
       List({exe, Units("--gameId--"), Units("--gameId--g9")}), kGameIdMarker, ""},
      {"another marker inside the value", List({exe, Units("--userUuid--u7--gameId--g9")}), kUserUuidMarker,
       "u7--gameId--g9"},
      {"the other marker found inside", List({exe, Units("--userUuid--u7--gameId--g9")}), kGameIdMarker, "g9"},
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
      {"U+4E2D narrows to a hyphen and spells the marker",
       List({exe, u"\u4e2d\u4e2duserUuid\u4e2d\u4e2dx"}), kUserUuidMarker, "x"},
      {"a surrogate pair gives two bytes", List({exe, u"--gameId--\U0001F600"}), kGameIdMarker,
       std::string("\x3d\x00", 2)},
      {"a zero unit stays inside the value", List({exe, std::u16string(u"--gameId--a\0b", 13)}),
       kGameIdMarker, std::string("a\0b", 3)},
  };
  for (const Case &c : cases)
    EXPECT_EQ(FindValueAfterMarker(c.args, c.marker), c.value) << c.name;
}

platform::ArgumentList g_args;
bool g_split_ok = true;
bool FakeArguments(platform::ArgumentList &args) {
  args = g_args;
  return g_split_ok;
}

class IdentityTest : public SandboxTest {
protected:
  void SetUp() override {
    SandboxTest::SetUp();
    platform::calls().argument_list = FakeArguments;
    g_split_ok = true;
  }
};

TEST_F(IdentityTest, ResultsAndMessages) {
  struct Case {
    const char *name;
    platform::ArgumentList args;
    bool split_ok;
    std::string uuid; // empty: the constant empty text
    std::string game_id;
    std::vector<Message> messages;
  };
  const Message uuid_ok{0, "[OrvaneSDK] Authentication - OK"};
  const Message uuid_failed{2, "[OrvaneSDK] Authentication - Failed"};
  const Message game_ok{0, "[OrvaneSDK] Return GameID - OK"};
  const Message game_empty{2, "[OrvaneSDK] Return GameID - Empty"};
  const std::u16string exe = Units("demo.exe");
  const Case cases[] = {
      {"both found", List({exe, Units("--userUuid--a1b2c3d4"), Units("--gameId--demo42")}), true,
       "a1b2c3d4", "demo42", {uuid_ok, game_ok}},
      {"neither found", List({exe}), true, "", "", {uuid_failed, game_empty}},
      {"empty values", List({exe, Units("--userUuid--"), Units("--gameId--")}), true, "", "",
       {uuid_failed, game_empty}},
      {"the split fails: no message", List({}), false, "", "", {}},
      {"a value that reads empty is not found", List({exe, u"--userUuid--\u0100abc", u"--gameId--\u0000x"}),
       true, "", "", {uuid_failed, game_empty}},
      {"the text ends at the first zero byte", List({exe, std::u16string(u"--gameId--ab\0cd", 15)}), true, "",
       "ab", {uuid_failed, game_ok}},
      {"one byte", List({exe, Units("--gameId--z")}), true, "", "z", {uuid_failed, game_ok}},
  };
  for (const Case &c : cases) {
    SCOPED_TRACE(c.name);
    g_args = c.args;
    g_split_ok = c.split_ok;
    Captured().clear();
    char *uuid = oAuthGetUserUuid();
    char *game = oAuthGetGameId();
    ASSERT_NE(uuid, nullptr);
    ASSERT_NE(game, nullptr);
    EXPECT_EQ(std::string(uuid), c.uuid);
    EXPECT_EQ(std::string(game), c.game_id);
    EXPECT_EQ(Captured(), c.messages);
    // Every result goes back through oFreeText, the constant empty text too.
    oFreeText(uuid);
    oFreeText(game);
  }
}

TEST_F(IdentityTest, EveryCallReturnsANewBlockAndEmptyIsOneConstant) {
  g_args = List({Units("demo.exe"), Units("--gameId--demo42")});
  char *first = oAuthGetGameId();
  char *second = oAuthGetGameId();
  EXPECT_NE(first, second);
  EXPECT_STREQ(first, "demo42");
  EXPECT_STREQ(second, "demo42");
  std::free(first);
  std::free(second);
  char *empty_a = oAuthGetUserUuid();
  g_split_ok = false;
  char *empty_b = oAuthGetUserUuid();
  EXPECT_EQ(empty_a, empty_b);
  EXPECT_EQ(empty_a[0], '\0');
  oFreeText(empty_a); // ignored, as null is: freeing the constant would crash
  oFreeText(nullptr);
}

TEST_F(IdentityTest, SameResultsWithoutACallback) {
  oRegisterForLogs(nullptr);
  g_args = List({Units("demo.exe"), Units("--userUuid--u1")});
  char *uuid = oAuthGetUserUuid();
  EXPECT_STREQ(uuid, "u1");
  std::free(uuid);
  EXPECT_STREQ(oAuthGetGameId(), "");
  EXPECT_TRUE(Captured().empty());
}

} // namespace
} // namespace orvane::testing
