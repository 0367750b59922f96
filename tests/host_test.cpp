// The sample host as a game runs it: a process of its own, the library
// loaded at run time, the launcher's arguments on its real command line.
#include "support/test_support.h"

namespace orvane::testing {
namespace {

// A session on a new machine; the EXIT comes from an exit handler that the
// game registered before it loaded the library, when no state of the library
// may be gone yet. Argument 0 is searched like the others, and UTF-8 comes
// back unchanged. (The messages' order is the recorder's tests' concern.)
TEST(HostTest, AGameSessionOnANewMachine) {
  const std::string data = MakeTempDirectory();
  const ChildResult run = RunChild(ORVANE_HOST_PATH,
                                   {"C:\\--gameId--space race\\game.exe", "--library", ORVANE_LIBRARY_PATH,
                                    "uuid", "gameid", "enter", "g1", "u1", "exit-at-exit", "g1", "u1", "--",
                                    "--userUuid--j\xc3\xa9r", "--gameId--g9"},
                                   {{"XDG_DATA_HOME", data}});
  EXPECT_EQ(run.exit_code, 0);
  EXPECT_NE(run.output.find("oAuthGetUserUuid() = \"j\xc3\xa9r\"\n"), std::string::npos) << run.output;
  EXPECT_NE(run.output.find("oAuthGetGameId() = \"space race\\game.exe\"\n"), std::string::npos);
  const std::vector<std::string> records = Records(data + "/Orvane/Logs/g1.log", KeyTextFor("g1"));
  ASSERT_EQ(records.size(), 3u) << "INIT, ENTER, EXIT";
  EXPECT_NE(records[2].find(R"("type":"EXIT")"), std::string::npos) << records[2];
  RemoveTree(data);
}

} // namespace
} // namespace orvane::testing
