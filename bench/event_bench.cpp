// orvane-bench: the event path against its floor, and the parts around it.
//
// Besides the Google Benchmark runs, the binary measures oAnalyticsGameEnter
// and the floor (the bare system calls of one event) in interleaved rounds
// and prints the median ratio; --ratio_rounds=0 skips that.
//   --ratio_rounds=N   rounds (default 101)
//   --ratio_batch=N    events per side and round (default 500)
// It restarts itself once with a 4 KiB command line, so that the identity
// lookup reads a launcher-sized one.
#include "bench_sandbox.h"
#include "event_floor.h"

#include "analytics/record_cipher.h"
#include "analytics/record_text.h"
#include "analytics/timestamp.h"
#include "identity/command_line.h"
#include "sdk/log_channel.h"

#include <benchmark/benchmark.h>

#include <algorithm>
#include <chrono>
#include <cstdio>
#include <cstdlib>
#include <cstring>
#include <string>
#include <unistd.h>
#include <vector>

namespace {

using orvane::bench::Sandbox;

constexpr const char *kGameId = "bench";
constexpr const char *kUserId = "player-0001";
// The floor's file sits beside the game's log, under a name of the same
// length, so that both path lookups cost the same.
constexpr const char *kFloorFile = "floor.log";

constexpr std::size_t kCommandLineBytes = 4096;
constexpr const char *kRestartedVariable = "ORVANE_BENCH_COMMAND_LINE";
constexpr const char *kUserUuidArgument = "--userUuid--3f2a9c4e-7b1d-4e8a-9c55-0d6e2b7f1a93";

struct EventSetup {
  Sandbox sandbox;
  std::string logs;
  std::string floor_path;
  std::string line; // as many bytes as the library's line, line break included
};
EventSetup *g_setup = nullptr;

// Starts the game's log and takes the size of one ENTER line from the file.
EventSetup PrepareEvents() {
  EventSetup setup;
  setup.sandbox = orvane::bench::OpenSandbox();
  oRegisterForLogs(orvane::bench::IgnoreMessage);
  const std::string log = setup.sandbox.where.logs + kGameId + ".log";
  if (oAnalyticsInit(kGameId, kUserId) != 0 || oAnalyticsGameEnter(kGameId, kUserId) != 0) {
    std::fprintf(stderr, "orvane-bench: cannot record in %s\n", setup.sandbox.base.c_str());
    std::exit(1);
  }
  const std::int64_t before = orvane::bench::FileSize(log);
  oAnalyticsGameEnter(kGameId, kUserId);
  const std::int64_t line_size = orvane::bench::FileSize(log) - before;
  setup.logs = setup.sandbox.where.logs;
  setup.floor_path = setup.logs + kFloorFile;
  setup.line.assign(static_cast<std::size_t>(line_size), 'a');
  setup.line[0] = '\n';
  return setup;
}

void FloorOnce(const EventSetup &setup) {
  if (FloorEvent(setup.logs.c_str(), setup.floor_path.c_str(), setup.line.data(),
                 setup.line.size()) != 0)
    std::abort();
}

void EnterOnce() {
  if (oAnalyticsGameEnter(kGameId, kUserId) != 0) std::abort();
}

void BM_EventFloor(benchmark::State &state) {
  for (auto _ : state) FloorOnce(*g_setup);
  state.SetItemsProcessed(state.iterations());
}
BENCHMARK(BM_EventFloor);

void BM_GameEnter(benchmark::State &state) {
  for (auto _ : state) EnterOnce();
  state.SetItemsProcessed(state.iterations());
}
BENCHMARK(BM_GameEnter);

// One message to a registered callback that does nothing: what the log
// channel itself costs per message.
void BM_LogToHost(benchmark::State &state) {
  oRegisterForLogs(orvane::bench::IgnoreMessage);
  for (auto _ : state) orvane::LogToHost(LogLevel::Info, "[OrvaneSDK] Analytics ENTER - OK");
  state.SetItemsProcessed(state.iterations());
}
BENCHMARK(BM_LogToHost);

// Composition, encryption and hex of one record of about range(0) bytes,
// into buffers reused as the recorder reuses its own.
void BM_RecordLine(benchmark::State &state) {
  orvane::TimestampCache clock;
  std::string record, line;
  orvane::AppendEventRecord(record, kGameId, kUserId, "SPECIAL", clock.Now(), "");
  const std::size_t wanted = static_cast<std::size_t>(state.range(0));
  const std::string extra(wanted > record.size() ? wanted - record.size() : 0, 'x');
  for (auto _ : state) {
    record.clear();
    line.clear();
    orvane::AppendEventRecord(record, kGameId, kUserId, "SPECIAL", clock.Now(), extra);
    if (!orvane::EncryptRecordText(record, line)) std::abort();
    benchmark::DoNotOptimize(line.data());
  }
  state.SetBytesProcessed(state.iterations() * static_cast<std::int64_t>(record.size()));
  state.counters["record_bytes"] = static_cast<double>(record.size());
}
BENCHMARK(BM_RecordLine)->Arg(100)->Arg(1024)->Arg(64 * 1024);

void BM_Initialize(benchmark::State &state) {
  for (auto _ : state) oInitialize();
}
BENCHMARK(BM_Initialize);

void BM_UserUuidLookup(benchmark::State &state) {
  for (auto _ : state) {
    char *uuid = oAuthGetUserUuid();
    if (uuid[0] == '\0') {
      state.SkipWithError("no --userUuid-- on the command line");
      break;
    }
    oFreeText(uuid);
  }
}
BENCHMARK(BM_UserUuidLookup);

// The search alone, over the same 4 KiB argument list, read once.
void BM_FindValueAfterMarker(benchmark::State &state) {
  orvane::platform::ArgumentList args;
  orvane::platform::native_calls().argument_list(args);
  for (auto _ : state) benchmark::DoNotOptimize(orvane::FindValueAfterMarker(args, orvane::kUserUuidMarker));
}
BENCHMARK(BM_FindValueAfterMarker);

double Median(std::vector<double> values) {
  std::sort(values.begin(), values.end());
  const std::size_t n = values.size();
  return n % 2 ? values[n / 2] : (values[n / 2 - 1] + values[n / 2]) / 2;
}

template <class Step>
double NanosecondsPerEvent(int batch, Step step) {
  const auto start = std::chrono::steady_clock::now();
  for (int i = 0; i < batch; ++i) step();
  const auto stop = std::chrono::steady_clock::now();
  return std::chrono::duration<double, std::nano>(stop - start).count() / batch;
}

// The two sides take turns, in alternating order, so that a drift of the
// machine or the file system weighs on both alike.
void CompareWithFloor(const EventSetup &setup, int rounds, int batch) {
  if (rounds <= 0) return;
  for (int i = 0; i < batch; ++i) {
    FloorOnce(setup);
    EnterOnce();
  }
  std::vector<double> floor, enter, ratio;
  for (int round = 0; round < rounds; ++round) {
    double f, e;
    if (round % 2 == 0) {
      f = NanosecondsPerEvent(batch, [&] { FloorOnce(setup); });
      e = NanosecondsPerEvent(batch, EnterOnce);
    } else {
      e = NanosecondsPerEvent(batch, EnterOnce);
      f = NanosecondsPerEvent(batch, [&] { FloorOnce(setup); });
    }
    floor.push_back(f);
    enter.push_back(e);
    ratio.push_back(e / f);
  }
  std::printf("\nEvent against its floor: %d interleaved rounds of %d events per side, %zu-byte lines\n",
              rounds, batch, setup.line.size());
  std::printf("  floor (stat, open, fstat, write, close)  %9.0f ns/event (median)\n", Median(floor));
  std::printf("  oAnalyticsGameEnter                      %9.0f ns/event (median)\n", Median(enter));
  std::printf("  ratio oAnalyticsGameEnter / floor        %9.3f (median of rounds; min %.3f, max %.3f)\n",
              Median(ratio), *std::min_element(ratio.begin(), ratio.end()),
              *std::max_element(ratio.begin(), ratio.end()));
}

// Runs this program again with launcher-like arguments filling the command
// line to 4 KiB, the user UUID last so that the lookup searches them all.
void RestartWithLongCommandLine(int argc, char **argv) {
  if (std::getenv(kRestartedVariable) != nullptr) return;
  std::vector<std::string> args(argv, argv + argc);
  std::size_t used = std::strlen(kUserUuidArgument) + 1;
  for (const std::string &arg : args) used += arg.size() + 1;
  for (int n = 0; used < kCommandLineBytes; ++n) {
    std::string filler = "--launcher-setting-" + std::to_string(n) + "=";
    const std::size_t room = kCommandLineBytes - used - 1;
    if (room < filler.size()) filler.resize(room);
    else filler.resize(std::min<std::size_t>(63, room), 'v');
    used += filler.size() + 1;
    args.push_back(filler);
  }
  args.push_back(kUserUuidArgument);
  std::vector<char *> pointers;
  for (std::string &arg : args) pointers.push_back(arg.data());
  pointers.push_back(nullptr);
  ::setenv(kRestartedVariable, "1", 1);
  ::execv("/proc/self/exe", pointers.data());
  std::perror("orvane-bench: restart with a long command line"); // goes on without it
}

int IntFlag(int &argc, char **argv, const char *name, int fallback) {
  const std::size_t length = std::strlen(name);
  for (int i = 1; i < argc; ++i) {
    if (std::strncmp(argv[i], name, length) != 0 || argv[i][length] != '=') continue;
    const int value = std::atoi(argv[i] + length + 1);
    for (int j = i; j + 1 < argc; ++j) argv[j] = argv[j + 1];
    --argc;
    return value;
  }
  return fallback;
}

} // namespace

int main(int argc, char **argv) {
  RestartWithLongCommandLine(argc, argv);
  const int rounds = IntFlag(argc, argv, "--ratio_rounds", 101);
  const int batch = IntFlag(argc, argv, "--ratio_batch", 500);
  benchmark::Initialize(&argc, argv);

  EventSetup setup = PrepareEvents();
  g_setup = &setup;
  benchmark::RunSpecifiedBenchmarks();
  benchmark::Shutdown();
  CompareWithFloor(setup, rounds, std::max(batch, 1));
  orvane::bench::CloseSandbox(setup.sandbox);
  return 0;
}
