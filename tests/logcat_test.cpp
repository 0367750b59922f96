// orvane-logcat: its reading library, then the tool on folders that processes
// of the sample host wrote, its output checked against the independent decryption.
#include "analytics/record_cipher.h"
#include "help_text.h"
#include "key_discovery.h"
#include "line_reader.h"
#include "logformat/hex.h"
#include "record_filter.h"
#include "support/test_support.h"
#include "valid_utf8.h"

#include <filesystem>
#include <fstream>
#include <thread>

#include <fcntl.h>
#include <sys/file.h>
#include <sys/socket.h>
#include <sys/stat.h>
#include <sys/un.h>
#include <unistd.h>

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
      {" {\"extra\" :\"\\/\\u00Aa\\u20AC\\u07ff\\u0080\\u0039\\ud800\\udc00\",\t"
       "\"time\": \"\\ud83d\\ude00\" ,\"type\":\"T\",\r\n"
       "\"game_id\":\"g\",\"user_id\":\"\\uDBFF\\uDFFF\" } ", // other writers' forms
       {"\xf4\x8f\xbf\xbf", "g", "T", "\xf0\x9f\x98\x80",
        "/\xc2\xaa\xe2\x82\xac\xdf\xbf\xc2\x80" "9\xf0\x90\x80\x80"}}};
  const std::string h = R"({"user_id":"u","game_id":"g","type":"T","time":"t")", refused[] = {
      "", "{}", h + "}", h + R"(,"extra":"x")", h + R"(,"extra":"x"}})", h + R"(,"user_id":"x"})",
      h + R"(,"extra":1})", h + R"(,"Extra":"x"})", h + R"(,"extra" "x"})", h + R"(,"extra":"x",})",
      h + R"("extra":"x"})", h + ",\"extra\":\"a\x01}", h + ",\"extra\":\"a\x01n\"}",
      h + R"(,"extra":"\x})", h + R"(,"extra":"\u00g0"})", h + R"(,"extra":"\u)", h + R"(,"extra":"\u004)",
      h + R"(,"extra":"\u0})", h + R"(,"extra":"\ud83d})", h + R"(,"extra":"\udfff"})",
      h + R"(,"extra":"\ud83d\u0041"})", h + R"(,"extra":"x)", h + R"(,"extra":"x\)"}; // the last: cut
  // clang-format on
  for (const auto &[text, expected] : records) EXPECT_EQ(ParseEventRecord(text), expected) << text;
  for (const std::string &text : refused) EXPECT_EQ(ParseEventRecord(text), std::nullopt) << text;
}

// Valid UTF-8 is copied; a byte alone, overlong, of a surrogate, above U+10FFFF or cut short is escaped.
TEST(ValidUtf8, EscapesExactlyTheBytesNotPartOfUtf8) {
  const std::string valid = "\xc2\x80\xdf\xbf\xe0\xa0\x80\xed\x9f\xbf\xf0\x90\x80\x80\xf4\x8f\xbf\xbf";
  // clang-format off
  const std::pair<std::string, std::string> cases[] = { // bytes, printed
      {valid, valid}, {"\x80\xbf\xf5\xfe\xff", R"(\u0080\u00bf\u00f5\u00fe\u00ff)"}, // never the start of one
      {"\xc0\xaf\xc1\xbf\xe0\x9f\xbf", R"(\u00c0\u00af\u00c1\u00bf\u00e0\u009f\u00bf)"}, // overlong
      {"\xf0\x8f\xbf\xbf\xed\xa0\x80", R"(\u00f0\u008f\u00bf\u00bf\u00ed\u00a0\u0080)"}, // and a surrogate
      {"\xf4\x90\x80\x80", R"(\u00f4\u0090\u0080\u0080)"}, {"a\xe2\x82x\xc3 b", R"(a\u00e2\u0082x\u00c3 b)"},
      {"\xe9\xc3\xa9\xe9", "\\u00e9\xc3\xa9\\u00e9"}};
  // clang-format on
  for (const auto &[bytes, printed] : cases) {
    std::string out = "kept";
    EXPECT_EQ(AppendValidUtf8(out, bytes) * 5, printed.size() - bytes.size()) << printed; // 5 more an escape
    EXPECT_EQ(out, "kept" + printed) << printed;
  }
}

std::size_t g_count = 0;
// The last winner is tried first: a run of lines under one key costs one decryption a line.
TEST(LogLine, ReadWithTheFirstCandidateThatGivesARecord) {
  const KeyText &key_text = TakeKeyText("g1"); // the library encrypts every line of this process under g1
  RecordCipher cipher;
  std::string good;
  std::string not_record;
  EncryptRecordText(cipher, key_text, R"({"user_id":"u","game_id":"g","type":"T","time":"t","extra":""})",
                    good);
  EncryptRecordText(cipher, key_text, R"({"user_id":"u"})", not_record);
  const std::vector<std::string> first = {"g1", "g2", "g3"}, last = {"g2", "g3", "g1"};
  CallsGuard guard;
  cipher::backend().decrypt = [](cipher::Session *s, const std::uint8_t *in, std::size_t n, std::uint8_t *o) {
    ++g_count;
    return cipher::native_backend().decrypt(s, in, n, o);
  };
  KeyPool pool;
  LineBuffers buf;
  EventRecord r;
  const auto keys = [](std::vector<std::string> ids, std::size_t folder_winner = 0) {
    KeyCandidates made;
    for (const std::string &id : ids) AddCandidate(made, id);
    made.last_winner = folder_winner;
    return made;
  };
  using Ids = std::vector<std::string>;
  // clang-format off
  const struct { std::string line; Ids ids; std::size_t before; F fault; std::size_t winner, decryptions; } cases[] = {
      {good, first, 0, F::kNone, 0, 1}, {good, last, 0, F::kNone, 2, 3}, {good, last, 2, F::kNone, 2, 1},
      {good, first, 2, F::kNone, 0, 2}, {good, {"g2", "g3"}, 1, F::kBadPadding, 1, 2},
      {good.substr(0, 32), first, 1, F::kBadPadding, 1, 3}, // its first block alone
      {not_record, last, 1, F::kNotRecord, 1, 3}, {"", first, 0, F::kNotBlocks, 0, 0},
      {good.substr(8), first, 0, F::kNotBlocks, 0, 0}, {"x", first, 0, F::kNotHex, 0, 0},
      {good.substr(0, 10) + "g" + good.substr(11), first, 0, F::kNotHex, 0, 0},
      {good, {}, 0, F::kBadPadding, 0, 0}}; // no candidate
  for (auto c : cases) { // the folder's winner is the file's: tried once
    KeyCandidates k = keys(c.ids, c.before);
    EXPECT_EQ((std::tuple{ReadLine(pool, k, c.before, c.line, buf, r), c.before, std::exchange(g_count, 0)}),
              std::tuple(c.fault, c.winner, c.decryptions)) << c.line;
  }
  // Then the folder's winner, right after the file's own.
  KeyCandidates folder = keys({"g2", "g3", "g4", "g1"}, 3), other = keys({"g2", "g3"}, 1);
  std::size_t winner = 0, most = 0;
  EXPECT_EQ((std::tuple{ReadLine(pool, folder, winner, good, buf, r), winner, std::exchange(g_count, 0)}),
            std::tuple(F::kNone, 3U, 2U));
  EXPECT_EQ((std::tuple{ReadLine(pool, other, winner = 0, good, buf, r), other.last_winner, g_count}),
            std::tuple(F::kBadPadding, 1U, 2U)) << "kept when no key reads the line";
  // clang-format on
  // Past its bound the pool starts empty again: a folder of many games keeps its memory.
  for (std::size_t k = 0; k <= kPooledKeys; ++k) {
    KeyCandidates one = keys({std::to_string(k)});
    ReadLine(pool, one, winner, good, buf, r);
    most = std::max(most, pool.keys.size());
  }
  EXPECT_EQ(most, kPooledKeys);
  cipher::backend().open = [](const std::uint8_t *, const std::uint8_t *) -> cipher::Session * {
    return nullptr;
  };
  KeyCandidates unusable = keys({"g4"});
  EXPECT_EQ(ReadLine(pool, unusable, winner, good, buf, r), F::kBadPadding);
  EXPECT_TRUE(pool.failed) << "a key whose session cannot be made is reported";
  const std::string part(kKeyGameIdBytes, 'k'); // ids alike in the bytes that make the key: one candidate
  KeyCandidates alike;
  for (const std::string &id : {part + "a", part + "b", part.substr(1) + "x", part}) AddCandidate(alike, id);
  EXPECT_EQ(alike.game_ids, (std::vector<std::string>{part + "a", part.substr(1) + "x"}));
  EXPECT_EQ(FindCandidate(alike, part + "z"), 0U);
}

// A line past the limit is reported once, where it starts, and dropped to its end unheld, however reads cut
// it.
TEST(LineReader, ALineTooLongIsReportedAtItsStartAndNeverHeld) {
  const std::string bytes =
      "ab\nabcdefgh\nabcde\r\nabcdef\r\n\nabc"; // the limit 6 holds "abcde\r", not "abcdef\r"
  for (const std::size_t cut : {1, 2, 5, 100}) {
    LineReader reader{{}, 6};
    std::string seen;
    std::size_t most = 0;
    for (std::size_t at = 0; at < bytes.size(); at += cut) {
      FeedLines(
          reader, std::string_view(bytes).substr(at, cut),
          [&](std::uint64_t n, std::string_view line) {
            seen += std::to_string(n) + ":" + std::string(line) + " ";
          },
          [&](std::uint64_t n) { seen += std::to_string(n) + ":long "; });
      most = std::max(most, reader.lines.partial.size());
    }
    EXPECT_EQ(seen + std::string(PartialLine(reader.lines)), "1:ab 2:long 3:abcde 4:long 5: abc") << cut;
    EXPECT_LE(most, 6U) << cut;
  }
}

// Real days and times only, and a window that some time can pass.
TEST(RecordFilter, BoundsAreRealTimesInAnOpenWindow) {
  for (const std::string bad :
       {"2026-13-01", "2026-00-10", "2026-01-00", "2026-01-32", "2023-02-29", "1900-02-29", "2024-02-30",
        "2026-04-31", "2026-06-31", "2026-09-31", "2026-11-31", "2026-01-01T24:00:00", "2026-01-01T23:60:00",
        "2026-01-01T23:59:60", "2026/01/01", "2026-01-01 00:00:00"})
    EXPECT_FALSE(IsTimeBound(bad)) << bad;
  for (const std::string real :
       {"2000-02-29", "2024-02-29", "2023-01-31", "2023-04-30", "2023-12-31T23:59:59"})
    EXPECT_TRUE(IsTimeBound(real)) << real;
  EXPECT_TRUE(WindowIsOpen({"2023-01-31", "2023-01-31", {}}) &&
              WindowIsOpen({"2023-12-31T23:59:59", "2023-12-31", {}})); // a date alone: its whole day
  EXPECT_FALSE(WindowIsOpen({"2023-01-31T08:00:01", "2023-01-31T08:00:00", {}}));
  EXPECT_FALSE(WindowIsOpen({"2023-04-30", "2023-01-31T23:59:59", {}}));
}

using Output = std::tuple<int, std::string, std::string>; // exit status, standard output, standard error
class LogcatTool : public ::testing::Test {
protected:
  void TearDown() override { RemoveTree(dir_); }
  // orvane-logcat as `user_` (setpriv's arguments, or none), `input` (or the null device) on standard input.
  Output Run(std::vector<std::string> args, const std::string &input = "", int seconds = 30) {
    const std::string in = input.empty() ? "/dev/null" : dir_ + "/in";
    WriteFile(dir_ + "/in", input);
    args.insert(args.begin(), {"sh", "-c", R"(exec $U "$0" "$@" <"$I" 2>"$T/err")", ORVANE_LOGCAT_PATH});
    auto ran =
        RunChild("/bin/sh", args, {{"I", in}, {"T", dir_}, {"U", user_}, {"XDG_DATA_HOME", dir_}}, seconds);
    return {ran.exit_code, ran.output, ReadFile(dir_ + "/err").value_or("")};
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
  std::string dir_ = MakeTempDirectory();
  std::string logs_ = dir_ + "/Orvane/Logs/";
  std::string user_;
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
      {{"--show-key", "--with-file", logs_}, Printed("gA", ids, true, true) + Printed("gB", ids, true, true)},
      {{"--type", "INIT", "--type=EXIT", "--type=SPECIAL", logs_},
       Split(a, "\n")[0] + "\n" + Split(a, "\n")[2] + "\n" + lb[0] + "\n" + lb[3] + "\n"},
      {{"--since=2999-01-01T00:00:00", logs_}, ""}, {{}, a + b}, // {}: the default folder
      {{"--until", "2000-01-01", "--since", "2000-01-01", logs_}, ""},
      {{"--since", first, "--until=" + day, logs_}, a + b}, // bounds hold their own second and day
      {{"--check", logs_}, logs_ + "gA.log: 3 records, 0 bad lines, 0 records with bytes not UTF-8\n" +
                           logs_ + "gB.log: 4 records, 0 bad lines, 1 records with bytes not UTF-8\n"}};
  // clang-format on
  for (const auto &[args, expected] : runs)
    EXPECT_EQ(Run(args), Output(0, expected, "")) << ::testing::PrintToString(args);
  // Piped after an empty line and ended by a CR alone, followed or not: standard input is read once.
  const std::string line = Split(*ReadFile(logs_ + "gB.log"), "\n")[2];
  for (const std::vector<std::string> &args :
       {std::vector<std::string>{"--key-game-id=gB"}, {"--key-game-id=gB", "--follow"}})
    EXPECT_EQ(Run(args, "\r\n" + line + "\r", 10), Output(0, lb[2] + "\n", "")) << args.size();
  // Checked, it has lost the log's start, not the line breaks before it. (A torn line is the reading
  // library's kNotBlocks, reported as the bad padding below.)
  EXPECT_EQ(Run({"--check", "--key-game-id=gB"}, "\r\n\n" + line + "\n" + line),
            Output(1, "-: 1 records, 1 bad lines, 0 records with bytes not UTF-8\n",
                   "orvane-logcat: -:3: first record is not INIT\n"));
  // Keyed by an empty game id, the fixed key text alone reads a line; by a game with no log, none does.
  Host({"init", "", "u4", "exit", "gA", "u4"}, 1); // the refused call makes it exit 1
  Host({"init", "gZ", "u5", "exit", "gA", "u5"});
  std::remove((logs_ + "gZ.log").c_str());
  // Under a key that no candidate gives, the padding still reads right now and then, by chance.
  const std::string fifth = Split(*ReadFile(logs_ + "gA.log"), "\n")[4];
  F fault = F::kBadPadding;
  for (const char *id : {"gA", "gB", ""})
    if (DecryptLine(fifth, KeyTextFor(id))) fault = F::kNotRecord;
  const std::string bad = "orvane-logcat: " + logs_ + "gA.log:5: " + std::string(FaultText(fault));
  EXPECT_EQ(Run({logs_}), Output(1, Printed("gA", {"gA", "gB", ""}) + b, bad + "\n"));
  // Followed: the logs, then each new line once, the newest before it ends; one keyed by a new log's game;
  // a missing log is waited for; one cut shorter is read again, one moved away and started again is read
  // from the new one's start.
  Output followed;
  std::thread tail([&] { followed = Run({"--follow", "--type=SPECIAL", logs_, logs_ + "gW.log"}, "", 6); });
  Host({"enter", "gF", "u6", "special", "gB", "u6", "s"}, 0, 500);
  Host({"special", "gA", "u7", "t"}, 0, 500);
  Host({"exit", "gA", "u7"}, 0, 500);
  const std::string s = Split(Printed("gB", {"gA", "gB", "gF"}), "\n")[4] + "\n";
  const std::string t = Split(Printed("gA", {"gA", "gB", ""}), "\n")[4] + "\n";
  std::this_thread::sleep_for(std::chrono::milliseconds(500));
  std::filesystem::resize_file(logs_ + "gB.log", ReadFile(logs_ + "gB.log")->rfind('\n')); // back to lb[3]
  std::this_thread::sleep_for(std::chrono::milliseconds(500));
  std::filesystem::rename(logs_ + "gA.log", logs_ + "gA.old");
  Host({"special", "gA", "u8", "v"}); // a new log: its INIT, then this
  tail.join();
  const std::string v = Split(Printed("gA", {"gA"}), "\n")[1] + "\n";
  const std::string said = "orvane-logcat: " + logs_;
  const std::string notices = said + "gW.log: does not exist yet; waiting for it\n" + bad + "\n" + said +
                              "gB.log: became shorter; reading it again from the start\n" + said +
                              "gA.log: was replaced; reading the new file from its start\n";
  EXPECT_EQ(followed, Output(-1, lb[3] + "\n" + s + t + lb[3] + "\n" + v, notices));
}

#if defined(__SANITIZE_ADDRESS__) || defined(__SANITIZE_THREAD__)
constexpr bool kSanitized = true; // its shadow memory takes more address space than any limit here allows
#else
constexpr bool kSanitized = false;
#endif

// Only regular files are read: anything else is reported with what it is, a link that leads nowhere with the
// system's reason, and the run goes on to exit 2. A line longer than any the library writes (a zero-filled
// tail) is skipped unheld; a line that memory cannot hold costs only the rest of its file.
TEST_F(LogcatTool, OnlyRegularFilesAreReadAndTheRunGoesOn) {
  Host({"init", "g1", "u1"});
  const std::string g1 = Printed("g1", {"g1"}), said = "orvane-logcat: " + logs_;
  mkfifo((logs_ + "fifo.log").c_str(), 0600);
  symlink("loop.log", (logs_ + "loop.log").c_str());
  symlink("gone", (logs_ + "dead.log").c_str());
  sockaddr_un address{AF_UNIX, {}};
  (logs_ + "sock.log").copy(address.sun_path, sizeof address.sun_path - 1);
  const int sock = socket(AF_UNIX, SOCK_STREAM, 0);
  ASSERT_EQ(bind(sock, reinterpret_cast<sockaddr *>(&address), sizeof address), 0);
  WriteFile(logs_ + "long.log", "");
  std::filesystem::resize_file(logs_ + "long.log", std::size_t{1} << 30); // sparse: no disk taken
  std::ofstream(logs_ + "long.log", std::ios::app) << "\n" << *ReadFile(logs_ + "g1.log");
  user_ = kSanitized ? "" : "prlimit --as=400000000 --";
  EXPECT_EQ(Run({logs_, "--key-game-id=g1", "/dev/null"}),
            Output(2, g1 + g1,
                   said + "dead.log: cannot open: No such file or directory\n" + said +
                       "fifo.log: is a FIFO, not a regular file; not read\n" + said +
                       "long.log:1: longer than any line the library writes; skipped to its end\n" + said +
                       "loop.log: cannot open: Too many levels of symbolic links\n" + said +
                       "sock.log: is a socket, not a regular file; not read\n"
                       "orvane-logcat: /dev/null: is a character device, not a regular file; not read\n"));
  close(sock);
  if (kSanitized) return;
  RemoveTree(logs_);
  Host({"init", "g1", "u1"});
  WriteFile(logs_ + "a.log", std::string(48 << 20, 'a')); // hex of whole blocks, held with its bytes
  user_ = "prlimit --as=90000000 --";
  EXPECT_EQ(Run({logs_}), Output(2, Printed("g1", {"g1"}),
                                 said + "a.log: out of memory; the rest of this file is not read\n"));
}

// Each log is read once however its path is spelled or reached, and a log is open only while it is read (when
// followed, but for a bound), so a folder of many logs reads under a small descriptor limit.
TEST_F(LogcatTool, EachLogIsReadOnceAndFewAreOpen) {
  Host({"init", "g1", "u1"});
  std::string all = Printed("g1", {"g1"});
  const std::string once = all, log = *ReadFile(logs_ + "g1.log");
  for (int k = 0; k < 300; ++k, all += once) WriteFile(logs_ + "c" + std::to_string(k) + ".log", log);
  std::filesystem::create_symlink("g1.log", logs_ + "link.log");
  std::filesystem::create_hard_link(logs_ + "g1.log", logs_ + "hard.log");
  user_ = "prlimit --nofile=100 --";
  const std::string spelled = dir_ + "/Orvane/./Logs/g1.log";
  EXPECT_EQ(Run({logs_, spelled, logs_ + "../Logs/", dir_ + "/Orvane/Logs"}), Output(0, all, ""));
  Output followed; // the last log, closed since, is found again by its path
  std::thread tail([&] { followed = Run({"--follow", logs_}, "", 6); });
  std::this_thread::sleep_for(std::chrono::milliseconds(2000));
  std::ofstream(logs_ + "c299.log", std::ios::app) << "\n" << log;
  tail.join();
  EXPECT_EQ(followed, Output(-1, all + once, ""));
}

// An unended last line that no key reads is still being written while a writer of the library holds the log's
// lock (every append holds it): it is waited for. With no writer at work it is torn, and reported.
TEST_F(LogcatTool, CheckWaitsForTheLastLineAWriterIsAppending) {
  Host({"init", "g1", "u1", "enter", "g1", "u1"});
  const std::string path = logs_ + "g1.log", log = *ReadFile(path), torn = log.substr(0, log.size() - 20);
  const std::string summary = logs_ + "g1.log: 2 records, 0 bad lines, 0 records with bytes not UTF-8\n";
  WriteFile(path, torn);
  const int writer = open(path.c_str(), O_WRONLY | O_APPEND);
  ASSERT_EQ(flock(writer, LOCK_SH), 0);
  Output checked;
  std::thread check([&] { checked = Run({"--check", logs_}); });
  std::this_thread::sleep_for(std::chrono::milliseconds(300)); // either way, the line is read whole
  ASSERT_EQ(write(writer, log.data() + torn.size(), 20), 20);
  close(writer);
  check.join();
  EXPECT_EQ(checked, Output(0, summary, ""));
  WriteFile(path, torn);
  EXPECT_EQ(Run({"--check", logs_}),
            Output(1, logs_ + "g1.log: 1 records, 1 bad lines, 0 records with bytes not UTF-8\n",
                   "orvane-logcat: " + path + ":2: not whole 16-byte blocks of hex\n"));
}

// A usage error, or a file or folder that could not be read (even after a bad line), exits 2 and says why.
TEST_F(LogcatTool, UsageAndReadFailuresExitTwo) {
  std::filesystem::create_directory(dir_ + "/locked");
  std::filesystem::permissions(dir_ + "/locked", std::filesystem::perms::none);
  std::filesystem::create_directory(dir_ + "/closed"); // apart: its log would give the others a key
  WriteFile(dir_ + "/closed/g.log", "");
  std::filesystem::permissions(dir_ + "/closed/g.log", std::filesystem::perms::none);
  user_ = geteuid() == 0 ? "setpriv --reuid=65534 --regid=65534 --clear-groups" : ""; // root may list any
  // clang-format off
  const std::pair<std::vector<std::string>, std::string> cases[] = {
      {{"--frobnicate"}, "unknown option --frobnicate\nTry 'orvane-logcat --help'.\n"},
      {{"--until"}, "needs a value"}, {{"--since", "yesterday", dir_}, "--since takes YYYY-MM-DD"},
      {{"--since=2024-05-18", "--until=2024-05-17", dir_}, "2024-05-18 is after --until 2024-05-17\nTry"},
      {{"--type=exit", dir_}, "--type takes INIT"}, {{"--check", "--follow"}, "do not go together"},
      {{"-"}, "standard input has no file name"}, {{dir_ + "/in"}, "does not end in .log"},
      {{"--follow", dir_ + "/.log"}, "does not end in .log"}, {{"--", "-x.log"}, "-x.log: cannot open"},
      {{}, "Logs/: cannot list: No such file or directory (no game has recorded here yet?)"},
      {{dir_ + "/x"}, "/x: cannot open: No such file or directory"}, // not taken for a log without a key
      {{"--check", dir_ + "/in/"}, "/in/: cannot open: Not a directory"},
      {{"--check", "--key-game-id=g", "/proc/self/mem", "/proc/self/cmdline"}, "read error: Input/output"},
      {{dir_ + "/closed/g.log"}, "/g.log: cannot open: Permission denied"},
      {{"--check", dir_ + "/locked"}, "/locked: cannot list: Permission denied"}}; // no empty folder
  // clang-format on
  for (const auto &[args, message] : cases) {
    const auto [status, out, err] = Run(args);
    const bool said = err.find(message) != std::string::npos;
    const bool empty = err.find("holds no .log files") != std::string::npos; // no folder here is empty
    EXPECT_TRUE(status == 2 && said && !empty) << message << "\n" << err;
  }
  std::filesystem::permissions(dir_ + "/locked", std::filesystem::perms::owner_all);
  const std::string waiting = "orvane-logcat: " + logs_ + ": does not exist yet; waiting for it\n";
  EXPECT_EQ(Run({"--follow"}, "", 2), Output(-1, "", waiting)) << "said once";
  EXPECT_EQ(Run({"--help"}), Output(0, std::string(kHelpText), ""));
  EXPECT_EQ(Run({"--version"}), Output(0, "orvane-logcat " ORVANE_VERSION "\n", ""));
}

} // namespace
} // namespace orvane::logcat
