// orvane-logcat: its reading library, then the tool on folders that processes
// of the sample host wrote, its output checked against the independent decryption.
#include "analytics/record_cipher.h"
#include "key_discovery.h"
#include "logformat/hex.h"
#include "logformat/log_lines.h"
#include "record_filter.h"
#include "support/test_support.h"
#include "valid_utf8.h"

#include <thread>

namespace orvane::logcat {
namespace {
using namespace orvane::testing;

TEST(RecordJson, ReadsTheFiveMembersAndNothingElse) {
  const std::pair<std::string, EventRecord> records[] = {
      {"{\"user_id\":\"a\\\"b\xff\x80\",\"game_id\":\"c\\\\d\",\"type\":\"j\xc3\xa9u\",\"time\":\"t\","
       "\"extra\":"
       R"("\b\f\n\r\t\u0001\u0000)"
       "\x7f\"}", // every escape the library writes; raw bytes, UTF-8 or not
       {"a\"b\xff\x80", "c\\d", "j\xc3\xa9u", "t", std::string("\b\f\n\r\t\x01\0\x7f", 8)}},
      {" {\"extra\" :\"\\/\\u00e9\\u20AC\\u07ff\",\t\"time\": \"\\ud83d\\ude00\" "
       ",\"type\":\"T\",\r\n\"game_id\":"
       "\"g\",\"user_id\":\"\\uDBFF\\uDFFF\" } ", // other writers' forms
       {"\xf4\x8f\xbf\xbf", "g", "T", "\xf0\x9f\x98\x80", "/\xc3\xa9\xe2\x82\xac\xdf\xbf"}}};
  for (const auto &[text, expected] : records) EXPECT_EQ(ParseEventRecord(text), expected) << text;
  const std::string h = R"({"user_id":"u","game_id":"g","type":"T","time":"t")",
                    refused[] = {"",
                                 "{}",
                                 h + "}",
                                 h + R"(,"extra":"x")",
                                 h + R"(,"extra":"x"}})",
                                 h + R"(,"user_id":"x"})",
                                 h + R"(,"extra":1})",
                                 h + R"(,"Extra":"x"})",
                                 h + R"(,"extra" "x"})",
                                 h + R"(,"extra":"x",})",
                                 h + R"("extra":"x"})",
                                 h + ",\"extra\":\"a\nb\"}",
                                 h + R"(,"extra":"\x})",
                                 h + R"(,"extra":"\u00g0"})",
                                 h + R"(,"extra":"\u00"})",
                                 h + R"(,"extra":"\ud83d"})",
                                 h + R"(,"extra":"\udfff"})",
                                 h + R"(,"extra":"\ud83d\u0041"})",
                                 h + R"(,"extra":"x)",
                                 h + R"(,"extra":"x\)"};
  for (const std::string &text : refused) EXPECT_EQ(ParseEventRecord(text), std::nullopt) << text;
}

// Valid UTF-8 (here its edges) is copied; every other byte becomes one escape.
TEST(ValidUtf8, EscapesExactlyTheBytesNotPartOfUtf8) {
  const std::string valid =
      "\"ascii\\\" \xc2\x80\xdf\xbf\xe0\xa0\x80\xed\x9f\xbf\xf0\x90\x80\x80\xf4\x8f\xbf\xbf";
  // Alone, overlong, surrogate, above U+10FFFF, never UTF-8, cut short.
  const std::string bad =
      "\x80\xbf\xc0\xaf\xc1\xbf \xe0\x9f\xbf\xf0\x8f\xbf\xbf \xed\xa0\x80\xf4\x90\x80\x80 "
      "\xf5\xfe\xff a\xe2\x82x\xc3";
  std::string out = "kept";
  EXPECT_EQ(AppendValidUtf8(out, valid + bad + "eight ok\xe9\xc3\xa9\xe9"), 28u);
  EXPECT_EQ(
      out,
      "kept" + valid +
          R"(\u0080\u00bf\u00c0\u00af\u00c1\u00bf \u00e0\u009f\u00bf\u00f0\u008f\u00bf\u00bf )"
          R"(\u00ed\u00a0\u0080\u00f4\u0090\u0080\u0080 \u00f5\u00fe\u00ff a\u00e2\u0082x\u00c3eight ok\u00e9)"
          "\xc3\xa9\\u00e9");
}

std::size_t g_decryptions = 0;
// The last winner is tried first: a run of lines under one key costs one decryption a line.
TEST(LogLine, ReadWithTheFirstCandidateThatGivesARecord) {
  TakeKeyText("g1"); // the library encrypts every line of this process under g1
  RecordCipher cipher;
  auto encrypt = [&](std::string_view text, std::string hex = "") {
    return EncryptRecordText(cipher, text, hex), hex;
  };
  const std::string record = R"({"user_id":"u1","game_id":"g1","type":"SPECIAL","time":"t","extra":"a\"b"})";
  const std::string good = encrypt(record);
  std::string flipped = good; // the padding byte of the last block flips
  flipped[good.size() - 34] = flipped[good.size() - 34] == '0' ? '8' : '0';
  const std::vector<std::string> first = {"g1", "g2", "g3"}, last = {"g2", "g3", "g1"};
  using F = LineFault;
  const struct {
    std::string line;
    KeyCandidates keys;
    F fault;
    std::size_t winner, decryptions;
  } cases[] = {{good, {first}, F::kNone, 0, 1},
               {good, {last}, F::kNone, 2, 3},
               {good, {last, 2}, F::kNone, 2, 1},
               {good, {first, 2}, F::kNone, 0, 2},
               {good, {{"g2", "g3"}, 1}, F::kBadPadding, 1, 2},
               {flipped, {first, 1}, F::kBadPadding, 1, 3},
               {encrypt(R"({"user_id":"u"})"), {last, 1}, F::kNotRecord, 1, 3},
               {"", {first}, F::kNotBlocks, 0, 0},
               {good.substr(0, good.size() - 8), {first}, F::kNotBlocks, 0, 0},
               {"x", {first}, F::kNotHex, 0, 0},
               {good.substr(0, 10) + "g" + good.substr(11), {first}, F::kNotHex, 0, 0}};
  CallsGuard guard;
  cipher::backend().decrypt = [](cipher::Session *s, const std::uint8_t *in, std::size_t n,
                                 std::uint8_t *out) {
    return ++g_decryptions, cipher::native_backend().decrypt(s, in, n, out);
  };
  KeyPool pool;
  LineBuffers buffers;
  for (auto c : cases) {
    EventRecord read;
    g_decryptions = 0;
    EXPECT_EQ(std::tuple(ReadLine(pool, c.keys, c.line, buffers, read), c.keys.winner, g_decryptions),
              std::tuple(c.fault, c.winner, c.decryptions))
        << c.line;
  }
  CloseKeyPool(pool);
  const std::string long_id(70, 'x'),
      ids[] = {"g1", "g2", "g1", long_id, long_id + "z"}; // 65 bytes make the key
  KeyCandidates keys;
  for (const std::string &id : ids) AddCandidate(keys, id);
  EXPECT_EQ(keys.game_ids, (std::vector<std::string>{"g1", "g2", long_id}));
}

TEST(LogLines, SplitsLfAndCrLfHoweverReadsCutTheBytes) {
  LineSplitter split;
  std::string seen;
  for (std::string_view chunk : {"\r\nab\ncd\r\ne", "f\r", "\nc\r\r\n", "x\r"})
    FeedBytes(split, chunk,
              [&](std::uint64_t n, std::string_view l) { ((seen += std::to_string(n)) += l) += '|'; });
  EXPECT_EQ(seen + std::string(PartialLine(split)), "1|2ab|3cd|4ef|5c\r|x");
}

TEST(RecordFilter, TimeWindowAndTypes) {
  EXPECT_TRUE(IsTimeBound("2024-05-17") && IsTimeBound("2024-05-17T08:30:00") && IsEventType("ENTER"));
  EXPECT_FALSE(IsTimeBound("2024-05-1x") || IsTimeBound("2024-05-17 08:30:00") ||
               IsTimeBound("2024-05-17T08"));
  const std::pair<RecordFilter, bool> cases[] = {// for a SPECIAL record of 2024-05-17T08:30:00
                                                 {{}, true},
                                                 {{"2024-05-17T08:30:00", "2024-05-17T08:30:00", {}}, true},
                                                 {{"2024-05-17", "2024-05-17", {"ENTER", "SPECIAL"}}, true},
                                                 {{"2024-05-17T08:30:01", "", {}}, false},
                                                 {{"", "2024-05-17T08:29:59", {}}, false},
                                                 {{"", "2024-05-16", {}}, false},
                                                 {{"", "", {"EXIT"}}, false}};
  for (const auto &[filter, passes] : cases)
    EXPECT_EQ(Passes(filter, {"u", "g", "SPECIAL", "2024-05-17T08:30:00", ""}), passes) << filter.since;
}

using Output = std::tuple<int, std::string, std::string>; // exit status, standard output, standard error
class LogcatTool : public ::testing::Test {
protected:
  void SetUp() override { dir_ = MakeTempDirectory(), logs_ = dir_ + "/Orvane/Logs/"; }
  void TearDown() override { RemoveTree(dir_); }
  // `program` with its output streams apart, `input` (or the null device) on standard input.
  Output Run(std::vector<std::string> args, const std::string &input = "",
             const char *program = ORVANE_LOGCAT_PATH, int seconds = 30) {
    WriteFile(dir_ + "/in", input);
    args.insert(args.begin(), {"sh", "-c",
                               input.empty() ? "exec \"$0\" \"$@\" </dev/null 2>\"$T/err\""
                                             : "exec \"$0\" \"$@\" <\"$T/in\" 2>\"$T/err\"",
                               program});
    const ChildResult result = RunChild("/bin/sh", args, {{"T", dir_}, {"XDG_DATA_HOME", dir_}}, seconds);
    return {result.exit_code, result.output, ReadFile(dir_ + "/err").value_or("")};
  }
  // One process of the sample host: its first game id keys every log it writes.
  void Host(const std::vector<std::string> &calls, int status = 0) {
    EXPECT_EQ(std::get<0>(Run(calls, "", ORVANE_HOST_PATH)), status);
  }
  // What the tool prints for a log: each record decrypted under the first of `keys` that reads it, each byte
  // of 0x80 and above as \u00XX (none here is part of valid UTF-8); `shown` adds --with-file --show-key.
  std::string Printed(const std::string &game, const std::vector<std::string> &keys, bool shown = false) {
    std::string out;
    for (const std::string &line : Split(ReadFile(logs_ + game + ".log").value_or(""), "\n"))
      for (const std::string &key : keys)
        if (auto plain = DecryptLine(line, KeyTextFor(key)); plain && plain->starts_with("{\"user_id\"")) {
          if (shown)
            plain->insert(plain->size() - 1,
                          ",\"file\":\"" + game + ".log\",\"key_game_id\":\"" + key + "\"");
          for (std::uint8_t c : *plain + "\n")
            c < 0x80 ? void(out += char(c)) : AppendHex(out += "\\u00", &c, 1);
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
  const std::vector<std::string> ids = {"gA", "gB"};
  const std::string a = Printed("gA", ids), b = Printed("gB", ids);
  const std::vector<std::string> la = Split(a, "\n"), lb = Split(b, "\n");
  const std::pair<std::vector<std::string>, std::string> runs[] = {
      {{logs_}, a + b},
      {{logs_ + "gB.log", "--", logs_ + "gB.log"}, b},
      {{}, a + b}, // none: the library's folder
      {{"--with-file", "--show-key", logs_}, Printed("gA", ids, true) + Printed("gB", ids, true)},
      {{"--type", "INIT", "--type=SPECIAL", logs_}, la[0] + "\n" + lb[0] + "\n" + lb[3] + "\n"},
      {{"--since=2999-01-01", logs_}, ""},
      {{"--until", "2000-01-01", "--since", "2000-01-01", logs_}, ""},
      {{"--check", logs_},
       logs_ + "gA.log: 3 records, 0 bad lines, 0 records with bytes not UTF-8\n" + logs_ +
           "gB.log: 4 records, 0 bad lines, 1 records with bytes not UTF-8\n"}};
  for (const auto &[args, expected] : runs) EXPECT_EQ(Run(args), Output(0, expected, "")) << args[0];
  const std::string line =
      Split(*ReadFile(logs_ + "gB.log"), "\n")[2]; // piped, with an empty line, the key named
  EXPECT_EQ(Run({"--key-game-id=gB"}, "\r\n" + line + "\r\n"), Output(0, lb[2] + "\n", ""));
  // A process whose first game left no log: no candidate reads its line. One
  // whose first call had an empty game id: the fixed key text alone reads it.
  Host({"init", "", "u4", "exit", "gA", "u4"}, 1); // the refused call makes it exit 1
  Host({"init", "gZ", "u5", "exit", "gA", "u5"});
  std::remove((logs_ + "gZ.log").c_str());
  const std::string report =
      "orvane-logcat: " + logs_ + "gA.log:5: " + std::string(FaultText(LineFault::kBadPadding));
  EXPECT_EQ(Run({logs_}), Output(1, Printed("gA", {"gA", "gB", ""}) + b, report + "\n"));
  EXPECT_EQ(std::get<0>(Run({"--key-game-id", "gZ", "--check", logs_})), 0); // named, it reads every line
  // Followed: the logs, then each new line once, the newest before it ends; one is keyed by a new log's game.
  Output followed;
  std::thread follower([&] {
    followed = Run({"--follow", "--type", "SPECIAL", logs_}, "", ORVANE_LOGCAT_PATH, 4);
  });
  for (const auto &calls :
       std::vector<std::vector<std::string>>{{"enter", "gF", "u6", "special", "gB", "u6", "s"},
                                             {"special", "gA", "u7", "t"},
                                             {"exit", "gA", "u7"}}) {
    std::this_thread::sleep_for(std::chrono::milliseconds(500));
    Host(calls);
  }
  follower.join();
  EXPECT_EQ(std::get<1>(followed), lb[3] + "\n" + Split(Printed("gB", {"gA", "gB", "gF"}), "\n")[4] + "\n" +
                                       Split(Printed("gA", {"gA", "gB", ""}), "\n")[4] + "\n");
}

TEST_F(LogcatTool, UsageErrorsHelpAndVersion) {
  const std::pair<std::vector<std::string>, std::string> cases[] = {
      // dir_: a folder that holds no log
      {{"--frobnicate"}, "unknown option --frobnicate\nTry 'orvane-logcat --help'.\n"},
      {{"--until"}, "needs a value"},
      {{"--since", "yesterday", dir_}, "--since takes YYYY-MM-DD"},
      {{"--type=exit", dir_}, "--type takes INIT"},
      {{"--check", "--follow"}, "do not go together"},
      {{"-"}, "standard input has no file name"},
      {{dir_ + "/in"}, "does not end in .log"},
      {{dir_ + "/.log"}, "does not end in .log"},
      {{}, "no such folder"},
      {{logs_ + "g.log"}, "g.log: cannot open"},
      {{"--", "-x.log"}, "-x.log: cannot open"}};
  for (Output run; const auto &[args, message] : cases)
    EXPECT_TRUE(std::get<0>(run = Run(args)) == 2 && std::get<2>(run).find(message) != std::string::npos)
        << message;
  EXPECT_TRUE(std::get<1>(Run({"--help"})).ends_with("or a file or folder that could not be read\n"));
  EXPECT_EQ(Run({"--version"}), Output(0, "orvane-logcat " ORVANE_VERSION "\n", ""));
}

} // namespace
} // namespace orvane::logcat
