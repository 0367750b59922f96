// The sample host as a game runs it: a process of its own, the library
// loaded at run time, the launcher's arguments on its real command line.
#include "support/test_support.h"

namespace orvane::testing {
namespace {

class HostTest : public ::testing::Test {
protected:
  void SetUp() override { data_ = MakeTempDirectory(); }
  void TearDown() override { RemoveTree(data_); }
  ChildResult Run(std::vector<std::string> args, const std::string &arg0 = "orvane-host") {
    args.insert(args.begin(), {arg0, "--library", ORVANE_LIBRARY_PATH});
    return RunChild(ORVANE_HOST_PATH, args, {{"XDG_DATA_HOME", data_}});
  }
  std::vector<std::string> Log(const std::string &game, const std::string &key_game) {
    return Records(data_ + "/Orvane/Logs/" + game + ".log", KeyTextFor(key_game));
  }
  std::string data_;
};

std::string Rec(const std::string &type, const std::string &game, const std::string &extra = "") {
  return "{\"user_id\":\"u1\",\"game_id\":\"" + game + "\",\"type\":\"" + type +
         "\",\"time\":\"T\",\"extra\":\"" + extra + "\"}";
}

// The worked example of a new machine; the EXIT comes from an exit handler
// that the game registered before it loaded the library, when no state of
// the library may be gone yet. Argument 0 is searched like the others, and
// UTF-8 comes back unchanged.
TEST_F(HostTest, AGameSessionOnANewMachine) {
  const ChildResult run =
      Run({"uuid", "gameid", "enter", "g1", "u1", "init", "g1", "u1", "special", "g1", "u1", "score=10",
           "exit-at-exit", "g1", "u1", "--", "--userUuid--j\xc3\xa9r", "--gameId--g9"},
          "C:\\--gameId--space race\\game.exe");
  EXPECT_EQ(run.exit_code, 0) << run.output;
  EXPECT_EQ(
      run.output,
      "oRegisterForLogs(print_message)\n"
      "  [0 INFO] [OrvaneSDK] Logging initiated.\n"
      "  [0 INFO] [OrvaneSDK] Authentication - OK\n"
      "oAuthGetUserUuid() = \"j\xc3\xa9r\"\n"
      "  [0 INFO] [OrvaneSDK] Return GameID - OK\n"
      "oAuthGetGameId() = \"space race\\game.exe\"\n"
      "  [0 INFO] [OrvaneSDK] Analytics ENTER - SDK was never initialized. Initializing the SDK.\n"
      "  [0 INFO] [OrvaneSDK] Initialize() - OK.\n"
      "  [1 WARNING] [OrvaneSDK] Analytics ENTER - log was never initialized. Initialized the game log\n"
      "  [0 INFO] [OrvaneSDK] Analytics INIT - OK\n"
      "  [0 INFO] [OrvaneSDK] Analytics ENTER - OK\n"
      "oAnalyticsGameEnter() = 0\n"
      "  [1 WARNING] [OrvaneSDK] Analytics INIT - log had been already initialized.\n"
      "oAnalyticsInit() = 0\n"
      "  [0 INFO] [OrvaneSDK] Analytics SPECIAL - OK\n"
      "oAnalyticsSpecial() = 0\n"
      "  [0 INFO] [OrvaneSDK] Analytics EXIT - OK\n"
      "oAnalyticsGameExit() = 0\n");
  EXPECT_EQ(Log("g1", "g1"), (std::vector<std::string>{Rec("INIT", "g1"), Rec("ENTER", "g1"),
                                                       Rec("SPECIAL", "g1", "score=10"), Rec("EXIT", "g1")}));
}

// A process encrypts every game's log under the first game id it was given,
// also when that first call was refused.
TEST_F(HostTest, KeyTextComesFromTheFirstGameIdOfTheProcess) {
  const std::pair<std::vector<std::string>, std::string> cases[] = {
      {{"init", "alpha", "u1", "init", "beta", "u1"}, "alpha"},
      {{"init", "first", "", "init", "beta", "u1"}, "first"},
      {{"init", "../evil", "u1", "init", "beta", "u1"}, "../evil"}};
  for (const auto &[calls, key_game] : cases) {
    RemoveTree(data_ + "/Orvane");
    EXPECT_EQ(Run(calls).exit_code, key_game == "alpha" ? 0 : 1);
    EXPECT_EQ(Log("beta", key_game), std::vector<std::string>{Rec("INIT", "beta")}) << key_game;
  }
}

} // namespace
} // namespace orvane::testing
