// Storage directories: what oInitialize creates, in which order, and what it
// reports.
#include "OrvaneSDK.h"
#include "core/storage.h"
#include "support/test_support.h"

#include <filesystem>
#include <string>
#include <vector>

namespace orvane::testing {
namespace {

class StorageTest : public SandboxTest {};

std::vector<std::string> g_created;
bool RecordingMakeDirectory(const char *path) {
  g_created.push_back(path);
  return platform::native_calls().make_directory(path);
}

enum class Start { Nothing, BaseOnly, RootOnly, Everything, FileWhereLogsGo, BaseMissing };

TEST_F(StorageTest, InitializeCreatesWhatIsMissingRootFirst) {
  struct Case {
    const char *name;
    Start start;
    std::vector<std::string> created; // relative to the base's parent
    std::vector<Message> messages;
  };
  const Message ok{0, "[OrvaneSDK] Initialize() - OK."};
  const Message failed{2, "[OrvaneSDK] Initialize() - failed."};
  const Case cases[] = {
      {"neither exists", Start::BaseOnly, {"/share/Orvane/", "/share/Orvane/Logs/"}, {ok}},
      {"root exists", Start::RootOnly, {"/share/Orvane/Logs/"}, {ok}},
      {"both exist", Start::Everything, {}, {ok}},
      {"a file stands where Logs goes", Start::FileWhereLogsGo, {"/share/Orvane/Logs/"}, {failed}},
      {"the base itself is missing", Start::BaseMissing, {"/share/Orvane/", "/share/Orvane/Logs/"}, {ok}},
  };
  for (const Case &c : cases) {
    SCOPED_TRACE(c.name);
    RemoveTree(base_);
    std::filesystem::create_directories(base_);
    if (c.start != Start::BaseMissing) std::filesystem::create_directories(where_.base);
    if (c.start == Start::RootOnly || c.start == Start::FileWhereLogsGo)
      std::filesystem::create_directories(where_.root);
    if (c.start == Start::Everything) std::filesystem::create_directories(where_.logs);
    if (c.start == Start::FileWhereLogsGo) WriteFile(where_.root + "Logs", "not a directory");

    g_created.clear();
    platform::calls().make_directory = RecordingMakeDirectory;
    Captured().clear();
    oInitialize();
    platform::calls().make_directory = platform::native_calls().make_directory;

    std::vector<std::string> created;
    for (const std::string &path : g_created) created.push_back(path.substr(base_.size()));
    EXPECT_EQ(created, c.created);
    EXPECT_EQ(Captured(), c.messages);
    EXPECT_EQ(IsDirectory(where_.logs), c.start != Start::FileWhereLogsGo);
  }
}

TEST_F(StorageTest, DirectoryExistsOnlyForDirectories) {
  std::filesystem::create_directories(where_.logs);
  WriteFile(where_.logs + "file", "x");
  struct Case {
    std::string path;
    bool expected;
  };
  const Case cases[] = {
      {where_.logs, true},                    // with the trailing separator
      {where_.logs.substr(0, where_.logs.size() - 1), true}, // without
      {where_.logs + "file", false},          // a regular file
      {where_.logs + "missing/", false},      // nothing there
      {"", false},                            // no location at all
  };
  for (const Case &c : cases) EXPECT_EQ(DirectoryExists(c.path.c_str()), c.expected) << c.path;
}

} // namespace
} // namespace orvane::testing
