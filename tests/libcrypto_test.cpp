// The system's libcrypto, found at the first record: a system without the
// named libraries, or with a library that lacks the cipher's functions, is a
// failure to report (the event's "Record encryption failed."), not a crash;
// a failure is tried again later, and the system's configuration decides
// nothing.
#include "cipher/libcrypto.h"
#include "support/test_support.h"

#include <cstdlib>
#include <vector>

namespace orvane::testing {
namespace {

const std::vector<const char *> kAbsent = {"libcrypto.so.3.absent", "libcrypto.so.1.1.absent"};
const std::vector<const char *> kPresent = {"libcrypto.so.3.absent", "libcrypto.so.3"};

TEST(LibCrypto, LoadsTheFirstThatExists) {
  const struct {
    const char *row;
    std::vector<const char *> names;
    bool loads;
  } rows[] = {
      {"neither version on the system", kAbsent, false},
      {"a library without the cipher's functions", {"libc.so.6"}, false},
      {"a later name when the first is missing", kPresent, true},
  };
  for (const auto &r : rows) {
    static cipher::LibCrypto functions; // kept: the library context it makes lives as long as the process
    functions = {};
    EXPECT_EQ(cipher::LoadLibCrypto(r.names, functions), r.loads) << r.row;
    if (r.loads) {
      EXPECT_TRUE(cipher::InitLibCrypto(functions) && functions.aes != nullptr) << r.row;
    }
  }
}

// The first and a later step of the initialisation failing, as memory
// exhaustion makes them: the half-made state is refused, never used.
TEST(LibCrypto, AFailedInitialisationIsRefused) {
  for (const bool first : {true, false}) {
    cipher::LibCrypto functions{};
    ASSERT_TRUE(cipher::LoadLibCrypto(kPresent, functions));
    if (first) functions.init_crypto = [](std::uint64_t, const OPENSSL_INIT_SETTINGS *) { return 0; };
    if (!first) functions.lib_ctx_new = [] { return static_cast<OSSL_LIB_CTX *>(nullptr); };
    EXPECT_FALSE(cipher::InitLibCrypto(functions)) << first;
  }
}

// A load that failed (no descriptor free, say) is tried again by a later
// call, at most once a second; a success is kept for good.
TEST(LibCrypto, AFailedLoadIsTriedAgainAfterASecond) {
  static cipher::LibCryptoLoader loader;
  EXPECT_EQ(cipher::LoadLibCryptoOnce(loader, kAbsent, 5000), nullptr);
  EXPECT_EQ(cipher::LoadLibCryptoOnce(loader, kPresent, 5999), nullptr) << "not again within the second";
  const cipher::LibCrypto *loaded = cipher::LoadLibCryptoOnce(loader, kPresent, 6000);
  ASSERT_NE(loaded, nullptr);
  EXPECT_EQ(cipher::LoadLibCryptoOnce(loader, kAbsent, 6000), loaded);
}

// A configuration that asks every algorithm of a FIPS provider the system
// lacks, loaded by the game into OpenSSL's default context: records are
// encrypted all the same.
TEST(LibCrypto, TheSystemsConfigurationDecidesNothing) {
  const std::string folder = MakeTempDirectory(), conf = folder + "/openssl.cnf";
  WriteFile(conf, "openssl_conf = init\n[init]\nalg_section = algs\n[algs]\ndefault_properties = fips=yes\n");
  ::setenv("OPENSSL_CONF", conf.c_str(), 1);
  ASSERT_EQ(OPENSSL_init_crypto(OPENSSL_INIT_LOAD_CONFIG, nullptr), 1);
  ASSERT_EQ(EVP_CIPHER_fetch(nullptr, "AES-256-CBC", nullptr), nullptr) << "the configuration is in force";
  const std::uint8_t key[cipher::kKeySize] = {}, iv[cipher::kIvSize] = {};
  cipher::Session *session = cipher::backend().open(key, iv);
  EXPECT_NE(session, nullptr);
  cipher::backend().close(session);
  RemoveTree(folder);
}

} // namespace
} // namespace orvane::testing
