// The sample host as a game runs it: a process of its own, the library
// loaded at run time, the launcher's arguments on its real command line.
#include "support/test_support.h"

namespace orvane::testing {
namespace {

// The worked example of a new machine; the EXIT comes from an exit handler
// that the game registered before it loaded the library, when no state of
// the library may be gone yet. Argument 0 is searched like the others, and
// UTF-8 comes back unchanged.
TEST(HostTest, AGameSessionOnANewMachine) {
  const std::string data = MakeTempDirectory();
  const ChildResult run = RunChild(ORVANE_HOST_PATH,
                                   {"C:\\--gameId--space race\\game.exe", "--library", ORVANE_LIBRARY_PATH, "uuid",
                                    "gameid", "enter", "g1", "u1", "exit-at-exit", "g1", "u1", "--",
                                    "--userUuid--j\xc3\xa9r", "--gameId--g9"},
                                   {{"XDG_DATA_HOME", data}});
  EXPECT_EQ(run.output, "oRegisterForLogs(print_message)\n"
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
                        "  [0 INFO] [OrvaneSDK] Analytics EXIT - OK\n"
                        "oAnalyticsGameExit() = 0\n");
  std::vector<std::string> types;
  for (const std::string &record : Records(data + "/Orvane/Logs/g1.log", KeyTextFor("g1")))
    types.push_back(record.substr(0, record.find(R"(","time")")));
  const std::string start = R"({"user_id":"u1","game_id":"g1","type":")";
  EXPECT_EQ(types, (std::vector<std::string>{start + "INIT", start + "ENTER", start + "EXIT"}));
  EXPECT_EQ(run.exit_code, 0);
  RemoveTree(data);
}

} // namespace
} // namespace orvane::testing
