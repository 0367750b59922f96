// The system's libcrypto, found at the first record: a system without the
// named libraries, or with a library that lacks the cipher's functions, is a
// failure to report (the event's "Record encryption failed."), not a crash.
#include "cipher/libcrypto.h"

#include <gtest/gtest.h>

#include <vector>

namespace orvane::testing {
namespace {

TEST(LibCrypto, LoadsTheFirstThatExists) {
  const struct {
    const char *row;
    std::vector<const char *> names;
    bool loads;
  } rows[] = {
      {"neither version on the system", {"libcrypto.so.3.absent", "libcrypto.so.1.1.absent"}, false},
      {"a library without the cipher's functions", {"libc.so.6"}, false},
      {"a later name when the first is missing", {"libcrypto.so.3.absent", "libcrypto.so.3"}, true},
  };
  for (const auto &r : rows) {
    cipher::LibCrypto functions{};
    EXPECT_EQ(cipher::LoadLibCrypto(r.names, functions), r.loads) << r.row;
    if (r.loads) {
      EXPECT_NE(functions.aes_256_cbc(), nullptr) << r.row;
    }
  }
}

} // namespace
} // namespace orvane::testing
