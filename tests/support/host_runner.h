// Runs the sample host in a child process with its own empty data directory.
#pragma once

#include "support/child_process.h"
#include "support/test_support.h"

#include <filesystem>

#include <string>
#include <vector>

namespace orvane::testing {

struct HostRun {
  int exit_code;
  std::string output;
  std::vector<Message> messages; // what the host's callback printed, in order
};

class HostTest : public ::testing::Test {
protected:
  void SetUp() override { data_ = MakeTempDirectory(); }
  void TearDown() override { RemoveTree(data_); }
  // Runs orvane-host with `args` (argument 0 is added unless given).
  HostRun Run(const std::vector<std::string> &args, const std::string &arg0 = "orvane-host");
  std::string LogPath(const std::string &game_id) const {
    return data_ + "/Orvane/Logs/" + game_id + ".log";
  }
  // Records of a log, decrypted with the key text of `key_game_id`.
  std::vector<std::string> Records(const std::string &game_id, const std::string &key_game_id);

  std::string data_;
};

} // namespace orvane::testing
