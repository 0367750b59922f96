// orvane-logcat: its reading library, then the tool on folders that processes
// of the sample host wrote, its output checked against the independent decryption.
#include "analytics/record_cipher.h"
#include "help_text.h"
#include "key_discovery.h"
#include "logformat/hex.h"
#include "support/test_support.h"
#include "valid_utf8.h"

#include <thread>

namespace orvane::logcat {
namespace {
using namespace orvane::testing;
using F = LineFault;

TEST(RecordJson, ReadsTheFiveMembersAndNothingElse) {
  // Tables read best packed.
  // clang-format off
  const std::pair<std::string, EventRecord> records[] = {
      {"{\"user_id\":\"a\\\"b\xff\x80\",\"game_id\":\"c\\\\d\",\"type\":\"j\xc3\xa9u\",\"time\":\"t\","
       R"("extra":"\b\f\n\r\t\u0001\u0000)" "\x7f\"}", // every escape the library writes; raw bytes
       {"a\"b\xff\x80", "c\\d", "j\xc3\xa9u", "t", std::string("\b\f\n\r\t\x01\0\x7f", 8)}},
      {" {\"extra\" :\"\\/\\u00Aa\\u20AC\\u07ff\\u0080\\u0039\\ud800\\udc00\",\t\"time\": \"\\ud83d\\ude00\" ,\"type\":\"T\",\r\n"
       "\"game_id\":\"g\",\"user_id\":\"\\uDBFF\\uDFFF\" } ", // other writers' forms
       {"\xf4\x8f\xbf\xbf", "g", "T", "\xf0\x9f\x98\x80", "/\xc2\xaa\xe2\x82\xac\xdf\xbf\xc2\x80" "9\xf0\x90\x80\x80"}}};
  const std::string h = R"({"user_id":"u","game_id":"g","type":"T","time":"t")", refused[] = {
      "", "{}", h + "}", h + R"(,"extra":"x")", h + R"(,"extra":"x"}})", h + R"(,"user_id":"x"})",
      h + R"(,"extra":1})", h + R"(,"Extra":"x"})", h + R"(,"extra" "x"})", h + R"(,"extra":"x",})",
      h + R"("extra":"x"})", h + ",\"extra\":\"a\x01}", h + ",\"extra\":\"a\x01n\"}",
      h + R"(,"extra":"\x})", h + R"(,"extra":"\u00g0"})",
      h + R"(,"extra":"\u0})", h + R"(,"extra":"\ud83d})", h + R"(,"extra":"\udfff"})",
      h + R"(,"extra":"\ud83d\u0041"})", h + R"(,"extra":"x)", h + R"(,"extra":"x\)"};
  // clang-format on
  for (const auto &[text, expected] : records) EXPECT_EQ(ParseEventRecord(text), expected) << text;
  for (const std::string &text : refused) EXPECT_EQ(ParseEventRecord(text), std::nullopt) << text;
}

// Valid UTF-8 is copied; a byte alone, overlong, of a surrogate, above U+10FFFF or cut short is escaped.
TEST(ValidUtf8, EscapesExactlyTheBytesNotPartOfUtf8) {
  const std::string valid = "\xc2\x80\xdf\xbf\xe0\xa0\x80\xed\x9f\xbf\xf0\x90\x80\x80\xf4\x8f\xbf\xbf";
  const std::string bad = "\x80\xbf\xc0\xaf\xc1\xbf\xe0\x9f\xbf\xf0\x8f\xbf\xbf\xed\xa0\x80\xf4\x90\x80\x80";
  const std::string escaped = R"(\u0080\u00bf\u00c0\u00af\u00c1\u00bf\u00e0\u009f\u00bf\u00f0\u008f\u00bf)"
                              R"(\u00bf\u00ed\u00a0\u0080\u00f4\u0090\u0080\u0080\u00f5\u00fe\u00ff a\u00e2)";
  std::string out = "kept";
  EXPECT_EQ(AppendValidUtf8(out, valid + bad + "\xf5\xfe\xff a\xe2\x82x\xc3 eight ok\xe9\xc3\xa9\xe9"), 28u);
  EXPECT_EQ(out, "kept" + valid + escaped + "\\u0082x\\u00c3 eight ok\\u00e9\xc3\xa9\\u00e9");
}

std::size_t g_count = 0;
// The last winner is tried first: a run of lines under one key costs one decryption a line.
TEST(LogLine, ReadWithTheFirstCandidateThatGivesARecord) {
  const KeyText &key_text = TakeKeyText("g1"); // the library encrypts every line of this process under g1
  RecordCipher cipher;
  auto encrypt = [&](std::string_view t, std::string h = "") {
    EncryptRecordText(cipher, key_text, t, h);
    return h;
  };
  const std::string good = encrypt(R"({"user_id":"u","game_id":"g","type":"T","time":"t","extra":""})");
  const std::vector<std::string> first = {"g1", "g2", "g3"}, last = {"g2", "g3", "g1"};
  CallsGuard guard;
  cipher::backend().decrypt = [](cipher::Session *s, const std::uint8_t *in, std::size_t n, std::uint8_t *o) {
    return ++g_count, cipher::native_backend().decrypt(s, in, n, o);
  };
  KeyPool pool;
  LineBuffers buf;
  EventRecord r;
  // clang-format off
  const struct { std::string line; KeyCandidates keys; F fault; std::size_t winner, decryptions; } cases[] = {
      {good, {first}, F::kNone, 0, 1}, {good, {last}, F::kNone, 2, 3}, {good, {last, 2}, F::kNone, 2, 1},
      {good, {first, 2}, F::kNone, 0, 2}, {good, {{"g2", "g3"}, 1}, F::kBadPadding, 1, 2},
      {good.substr(0, 32), {first, 1}, F::kBadPadding, 1, 3}, // its first block alone
      {encrypt(R"({"user_id":"u"})"), {last, 1}, F::kNotRecord, 1, 3}, {"", {first}, F::kNotBlocks, 0, 0},
      {good.substr(8), {first}, F::kNotBlocks, 0, 0}, {"x", {first}, F::kNotHex, 0, 0},
      {good.substr(0, 10) + "g" + good.substr(11), {first}, F::kNotHex, 0, 0}};
  for (auto c : cases) // braces: ReadLine runs before the winner and the count are read
    EXPECT_EQ((std::tuple{ReadLine(pool, c.keys, c.line, buf, r), c.keys.winner, std::exchange(g_count, 0)}),
              std::tuple(c.fault, c.winner, c.decryptions)) << c.line;
  // clang-format on
  cipher::backend().open = [](const std::uint8_t *, const std::uint8_t *) -> cipher::Session * {
    return nullptr;
  };
  KeyCandidates unusable{{"g4"}};
  EXPECT_EQ(ReadLine(pool, unusable, good, buf, r), F::kBadPadding);
  EXPECT_TRUE(pool.failed) << "a key whose session cannot be made is reported";
}

using Output = std::tuple<int, std::string, std::string>; // exit status, standard output, standard error
class LogcatTool : public ::testing::Test {
protected:
  void SetUp() override { dir_ = MakeTempDirectory(), logs_ = dir_ + "/Orvane/Logs/"; }
  void TearDown() override { RemoveTree(dir_); }
  // orvane-logcat with its output streams apart, `input` (or the null device) on standard input.
  Output Run(std::vector<std::string> args, const std::string &input = "", int seconds = 30) {
    const std::string in = input.empty() ? "/dev/null" : dir_ + "/in";
    WriteFile(dir_ + "/in", input);
    args.insert(args.begin(), {"sh", "-c", R"(exec "$0" "$@" <"$I" 2>"$T/err")", ORVANE_LOGCAT_PATH});
    auto result = RunChild("/bin/sh", args, {{"I", in}, {"T", dir_}, {"XDG_DATA_HOME", dir_}}, seconds);
    return {result.exit_code, result.output, ReadFile(dir_ + "/err").value_or("")};
  }
  // One process of the sample host, after `pause` ms: its first game id keys every log it writes.
  void Host(std::vector<std::string> calls, int status = 0, int pause = 0) {
    std::this_thread::sleep_for(std::chrono::milliseconds(pause));
    calls.insert(calls.begin(), "orvane-host");
    EXPECT_EQ(RunChild(ORVANE_HOST_PATH, calls, {{"XDG_DATA_HOME", dir_}}).exit_code, status);
  }
  // What the tool prints for a log: each record decrypted under the first of `ids` that reads it, a byte of
  // 0x80 and above as \u00XX (none here is part of valid UTF-8), with what --with-file, --show-key add.
  std::string Printed(std::string game, std::vector<std::string> ids, bool file = false, bool key = false) {
    std::string out;
    for (const std::string &line : Split(ReadFile(logs_ + game + ".log").value_or(""), "\n"))
      for (const std::string &id : ids)
        if (auto p = DecryptLine(line, KeyTextFor(id)); p && p->starts_with("{\"user_id\"")) {
          if (file) p->insert(p->size() - 1, ",\"file\":\"" + game + ".log\"");
          if (key) p->insert(p->size() - 1, ",\"key_game_id\":\"" + id + "\"");
          for (std::uint8_t c : *p + "\n") c < 0x80 ? void(out += char(c)) : AppendHex(out += "\\u00", &c, 1);
          break;
        }
    return out;
  }
  std::string dir_, logs_;
};

TEST_F(LogcatTool, ReadsEveryLineOfAFolderThatProcessesWroteInAnyOrder) {
  std::string extra = "q\" b\\ n\n t\t cut \xe2\x82x overlong \xc0\xaf all ";
  for (int c = 0x80; c <= 0xff; ++c) extra += static_cast<char>(c);
  Host({"init", "gA", "u1", "enter", "gB", "u1"});          // both logs keyed by gA
  Host({"enter", "gB", "u2", "enter", "gA", "u2"});         // ... then by gB
  Host({"exit", "gA", "u3", "special", "gB", "u3", extra}); // ... then by gA again
  WriteFile(logs_ + "notes.txt", "not a log");              // not read
  const std::vector<std::string> ids = {"gA", "gB"};
  const std::string a = Printed("gA", ids), b = Printed("gB", ids);
  const std::vector<std::string> lb = Split(b, "\n");
  const std::string first = a.substr(a.find("\"time\":\"") + 8, 19),
                    day = first.substr(0, 10); // the first record's
  // clang-format off
  const std::pair<std::vector<std::string>, std::string> runs[] = {
      {{logs_}, a + b}, {{logs_ + "gB.log", "--", logs_ + "gB.log"}, b},
      {{"--show-key", logs_}, Printed("gA", ids, false, true) + Printed("gB", ids, false, true)},
      {{"--with-file", logs_ + "gA.log"}, Printed("gA", ids, true)}, {{}, a + b}, // none: the default folder
      {{"--type", "INIT", "--type=EXIT", "--type=SPECIAL", logs_},
       Split(a, "\n")[0] + "\n" + Split(a, "\n")[2] + "\n" + lb[0] + "\n" + lb[3] + "\n"},
      {{"--since=2999-01-01T00:00:00", logs_}, ""}, {{"--until", "2000-01-01", "--since", "2000-01-01", logs_}, ""},
      {{"--since", first, "--until=" + day, logs_}, a + b}, // bounds hold their own second and day
      {{"--check", logs_}, logs_ + "gA.log: 3 records, 0 bad lines, 0 records with bytes not UTF-8\n" +
                           logs_ + "gB.log: 4 records, 0 bad lines, 1 records with bytes not UTF-8\n"}};
  // clang-format on
  for (const auto &[args, expected] : runs) EXPECT_EQ(Run(args), Output(0, expected, "")) << args[0];
  // Piped after an empty line and ended by a CR alone, followed or not: standard input is read once.
  const std::string line = Split(*ReadFile(logs_ + "gB.log"), "\n")[2];
  for (const std::vector<std::string> &args :
       {std::vector<std::string>{"--key-game-id=gB"}, {"--key-game-id=gB", "--follow"}})
    EXPECT_EQ(Run(args, "\r\n" + line + "\r", 10), Output(0, lb[2] + "\n", "")) << args.size();
  // Keyed by an empty game id, the fixed key text alone reads a line; by a game with no log, none does.
  Host({"init", "", "u4", "exit", "gA", "u4"}, 1); // the refused call makes it exit 1
  Host({"init", "gZ", "u5", "exit", "gA", "u5"});
  std::remove((logs_ + "gZ.log").c_str());
  const std::string bad = "orvane-logcat: " + logs_ + "gA.log:5: " + std::string(FaultText(F::kBadPadding));
  EXPECT_EQ(Run({logs_}), Output(1, Printed("gA", {"gA", "gB", ""}) + b, bad + "\n"));
  // Followed: the logs, then each new line once, the newest before it ends; one keyed by a new log's game;
  // a missing log is waited for.
  Output followed;
  std::thread tail([&] { followed = Run({"--follow", "--type=SPECIAL", logs_, logs_ + "gW.log"}, "", 6); });
  Host({"enter", "gF", "u6", "special", "gB", "u6", "s"}, 0, 500);
  Host({"special", "gA", "u7", "t"}, 0, 500);
  Host({"exit", "gA", "u7"}, 0, 500);
  tail.join();
  const std::string s = Split(Printed("gB", {"gA", "gB", "gF"}), "\n")[4] + "\n",
                    t = Split(Printed("gA", {"gA", "gB", ""}), "\n")[4] + "\n";
  const std::string waiting = "orvane-logcat: " + logs_ + "gW.log: does not exist yet; waiting for it\n";
  EXPECT_EQ(followed, Output(-1, lb[3] + "\n" + s + t, waiting + bad + "\n"));
}

TEST_F(LogcatTool, UsageErrorsHelpAndVersion) {
  // clang-format off
  const std::pair<std::vector<std::string>, std::string> cases[] = { // dir_ holds no log
      {{"--frobnicate"}, "unknown option --frobnicate\nTry 'orvane-logcat --help'.\n"},
      {{"--until"}, "needs a value"}, {{"--since", "yesterday", dir_}, "--since takes YYYY-MM-DD"},
      {{"--type=exit", dir_}, "--type takes INIT"}, {{"--check", "--follow"}, "do not go together"},
      {{"-"}, "standard input has no file name"}, {{dir_ + "/in"}, "does not end in .log"},
      {{dir_ + "/.log"}, "does not end in .log"}, {{}, "no such folder"},
      {{logs_ + "g.log"}, "g.log: cannot open"}, {{"--", "-x.log"}, "-x.log: cannot open"}};
  // clang-format on
  for (Output run; const auto &[args, message] : cases)
    EXPECT_TRUE(std::get<0>(run = Run(args)) == 2 && std::get<2>(run).find(message) != std::string::npos)
        << message;
  const std::string waiting = "orvane-logcat: " + logs_ + ": does not exist yet; waiting for it\n";
  EXPECT_EQ(Run({"--follow"}, "", 2), Output(-1, "", waiting)) << "said once";
  EXPECT_EQ(Run({"--help"}), Output(0, std::string(kHelpText), ""));
  EXPECT_EQ(Run({"--version"}), Output(0, "orvane-logcat " ORVANE_VERSION "\n", ""));
}

} // namespace
} // namespace orvane::logcat
