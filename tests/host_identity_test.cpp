// Launch identity from the sample host's real command line.
#include "support/host_runner.h"

namespace orvane::testing {
namespace {

class HostIdentityTest : public HostTest {};

TEST_F(HostIdentityTest, ValuesFromTheProcessCommandLine) {
  struct Case {
    const char *name;
    std::string arg0;
    std::vector<std::string> launcher_args;
    std::string uuid_line;
    std::string game_line;
  };
  const std::string no_uuid = "oAuthGetUserUuid() = \"\" (not found)";
  const std::string no_game = "oAuthGetGameId() = \"\" (not found)";
  const Case cases[] = {
      {"1: both", "C:\\Games\\Demo\\demo.exe", {"--userUuid--a1b2c3d4", "--gameId--demo42"},
       "oAuthGetUserUuid() = \"a1b2c3d4\"", "oAuthGetGameId() = \"demo42\""},
      {"2: game id only", "demo.exe", {"--gameId--space-race-championship"}, no_uuid,
       "oAuthGetGameId() = \"space-race-championship\""},
      {"3: bare marker", "demo.exe", {"--userUuid--", "a1b2c3d4"}, no_uuid, no_game},
      {"4: markers in one argument", "demo.exe", {"--userUuid--u7--gameId--g9"},
       "oAuthGetUserUuid() = \"u7--gameId--g9\"", "oAuthGetGameId() = \"g9\""},
      {"5: first wins", "demo.exe", {"--gameId--first", "--gameId--second"}, no_uuid,
       "oAuthGetGameId() = \"first\""},
      {"6: text before the marker", "demo.exe", {"/opt:--gameId--g9"}, no_uuid, "oAuthGetGameId() = \"g9\""},
      {"7: argument 0 first", "C:\\--gameId--x\\demo.exe", {"--gameId--g9"}, no_uuid,
       "oAuthGetGameId() = \"x\\demo.exe\""},
      {"8: case-sensitive", "demo.exe", {"--GAMEID--g9"}, no_uuid, no_game},
      {"9: spaces", "demo.exe", {"--gameId--space race"}, no_uuid, "oAuthGetGameId() = \"space race\""},
      {"UTF-8 bytes come back unchanged", "demo.exe", {"--userUuid--j\xc3\xa9r\xc3\xb4me"},
       "oAuthGetUserUuid() = \"j\xc3\xa9r\xc3\xb4me\"", no_game},
  };
  for (const Case &c : cases) {
    SCOPED_TRACE(c.name);
    std::vector<std::string> args = {"uuid", "gameid", "uuid", "--"};
    args.insert(args.end(), c.launcher_args.begin(), c.launcher_args.end());
    HostRun run = Run(args, c.arg0);
    EXPECT_EQ(run.exit_code, 0) << run.output;
    // Asked twice, the same answer: every call reads the command line afresh.
    const std::vector<std::string> lines = SplitLines(run.output);
    std::vector<std::string> results;
    for (const std::string &line : lines)
      if (line.rfind("oAuth", 0) == 0) results.push_back(line);
    EXPECT_EQ(results, (std::vector<std::string>{c.uuid_line, c.game_line, c.uuid_line}));
    const bool uuid_found = c.uuid_line != no_uuid, game_found = c.game_line != no_game;
    EXPECT_EQ(run.messages,
              (std::vector<Message>{
                  {0, "[OrvaneSDK] Logging initiated."},
                  uuid_found ? Message{0, "[OrvaneSDK] Authentication - OK"}
                             : Message{2, "[OrvaneSDK] Authentication - Failed"},
                  game_found ? Message{0, "[OrvaneSDK] Return GameID - OK"}
                             : Message{2, "[OrvaneSDK] Return GameID - Empty"},
                  uuid_found ? Message{0, "[OrvaneSDK] Authentication - OK"}
                             : Message{2, "[OrvaneSDK] Authentication - Failed"}}));
  }
}

TEST_F(HostIdentityTest, SameResultsWithoutACallback) {
  HostRun run = Run({"register-null", "uuid", "gameid", "--", "--userUuid--u1"});
  EXPECT_EQ(run.exit_code, 0);
  EXPECT_TRUE(run.messages.empty()) << run.output;
  EXPECT_NE(run.output.find("oAuthGetUserUuid() = \"u1\""), std::string::npos) << run.output;
  EXPECT_NE(run.output.find("oAuthGetGameId() = \"\" (not found)"), std::string::npos) << run.output;
}

} // namespace
} // namespace orvane::testing
