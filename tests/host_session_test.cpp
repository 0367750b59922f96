// Game sessions recorded by the sample host in a process of its own, so that
// the process-wide key text starts empty in every case.
#include "support/host_runner.h"

namespace orvane::testing {
namespace {

class HostSessionTest : public HostTest {};

std::string Rec(const std::string &type, const std::string &game, const std::string &user = "u1",
                const std::string &extra = "") {
  return "{\"user_id\":\"" + user + "\",\"game_id\":\"" + game + "\",\"type\":\"" + type +
         "\",\"time\":\"T\",\"extra\":\"" + extra + "\"}";
}
Message M(int level, const std::string &text) { return {level, "[OrvaneSDK] " + text}; }

// The EXIT comes from an exit handler that the game registered before it
// loaded the library: process-wide state must still be there.
TEST_F(HostSessionTest, WorkedExampleOnANewMachine) {
  HostRun run = Run({"enter", "g1", "u1", "init", "g1", "u1", "special", "g1", "u1", "score=10", "exit-at-exit",
                     "g1", "u1"});
  EXPECT_EQ(run.exit_code, 0) << run.output;
  const std::vector<Message> expected = {
      M(0, "Logging initiated."),
      M(0, "Analytics ENTER - SDK was never initialized. Initializing the SDK."),
      M(0, "Initialize() - OK."),
      M(1, "Analytics ENTER - log was never initialized. Initialized the game log"),
      M(0, "Analytics INIT - OK"),
      M(0, "Analytics ENTER - OK"),
      M(1, "Analytics INIT - log had been already initialized."),
      M(0, "Analytics SPECIAL - OK"),
      M(0, "Analytics EXIT - OK"),
  };
  EXPECT_EQ(run.messages, expected) << run.output;
  EXPECT_EQ(Records("g1", "g1"),
            (std::vector<std::string>{Rec("INIT", "g1"), Rec("ENTER", "g1"), Rec("SPECIAL", "g1", "u1", "score=10"),
                                      Rec("EXIT", "g1")}));
  const std::string bytes = *ReadFile(LogPath("g1"));
  EXPECT_EQ(std::count(bytes.begin(), bytes.end(), '\n'), 3);
  EXPECT_EQ(bytes.find('\r'), std::string::npos);
  EXPECT_NE(bytes.back(), '\n');
  EXPECT_TRUE(IsDirectory(data_ + "/Orvane/Logs"));
}

// A process encrypts every game's log under the first game id it was given,
// also when that first call was refused.
TEST_F(HostSessionTest, KeyTextComesFromTheFirstGameIdOfTheProcess) {
  struct Case {
    const char *name;
    std::vector<std::string> calls;
    std::string key_game_id;
  };
  const Case cases[] = {
      {"two games", {"init", "alpha", "u1", "init", "beta", "u1"}, "alpha"},
      {"refused first call", {"init", "first", "", "init", "beta", "u1"}, "first"},
      {"refused empty first id", {"init", "", "u1", "init", "beta", "u1"}, ""},
      {"hostile first id", {"init", "../evil", "u1", "init", "beta", "u1"}, "../evil"},
  };
  for (const Case &c : cases) {
    SCOPED_TRACE(c.name);
    RemoveTree(data_);
    std::filesystem::create_directories(data_);
    HostRun run = Run(c.calls);
    EXPECT_EQ(Records("beta", c.key_game_id), std::vector<std::string>{Rec("INIT", "beta")}) << run.output;
  }
}

// Key and IV placement for long game ids: only the first 65 bytes count.
TEST_F(HostSessionTest, LongGameIdsKeyTheirOwnLog) {
  for (std::size_t length : {16u, 17u, 49u, 50u, 65u, 80u, 200u}) {
    std::string id;
    for (std::size_t i = 0; i < length; ++i) id += static_cast<char>('a' + i % 26);
    HostRun run = Run({"init", id, "u1"});
    ASSERT_EQ(run.exit_code, 0) << run.output;
    EXPECT_EQ(Records(id, id), std::vector<std::string>{Rec("INIT", id)}) << length;
    if (length >= 65) {
      EXPECT_EQ(Records(id, id.substr(0, 65) + "zz"), std::vector<std::string>{Rec("INIT", id)}) << length;
    }
  }
}

TEST_F(HostSessionTest, DemoSessionRecordsAGame) {
  HostRun run = Run({}, "orvane-host");
  EXPECT_EQ(run.exit_code, 0) << run.output;
  EXPECT_EQ(Records("demo-game", "demo-game"),
            (std::vector<std::string>{Rec("INIT", "demo-game", "demo-user-0001"),
                                      Rec("ENTER", "demo-game", "demo-user-0001"),
                                      Rec("SPECIAL", "demo-game", "demo-user-0001", "level=3;score=1200"),
                                      Rec("SPECIAL", "demo-game", "demo-user-0001", "boss \\\"Hydra\\\" defeated"),
                                      Rec("EXIT", "demo-game", "demo-user-0001")}));
}

} // namespace
} // namespace orvane::testing
