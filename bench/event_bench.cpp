// orvane-bench: the event path against its floor, and the parts around it.
//
// Besides the Google Benchmark runs, the binary measures oAnalyticsGameEnter
// and the floor (the bare system calls of one event) in interleaved rounds
// and prints the median ratio; --ratio_rounds=0 skips that. Then it measures
// how 1, 2 and 4 threads scale against the same threads' bare system calls,
// and the latency of one thread's calls while three others record.
//   --ratio_rounds=N     rounds (default 101)
//   --ratio_batch=N      events per side and round (default 500)
//   --scaling_rounds=N   rounds of the thread scaling (default 21; 0 skips)
//   --scaling_batch=N    events per thread and measurement (default 400)
//   --latency_calls=N    timed calls per latency figure (default 20000; 0 skips)
// It restarts itself once with a 4 KiB command line, so that the identity
// lookup reads a launcher-sized one.
#include "bench_sandbox.h"
#include "event_floor.h"

#include "analytics/record_cipher.h"
#include "core/log_channel.h"
#include "identity/command_line.h"
#include "logformat/record_text.h"
#include "logformat/timestamp.h"

#include <benchmark/benchmark.h>

#include <algorithm>
#include <atomic>
#include <chrono>
#include <cstdio>
#include <cstdlib>
#include <cstring>
#include <ctime>
#include <string>
#include <thread>
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
  if (FloorEvent(setup.logs.c_str(), setup.floor_path.c_str(), setup.line.data(), setup.line.size()) != 0)
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
  orvane::RecordCipher cipher;
  std::string record, line;
  orvane::AppendEventRecord(record, kGameId, kUserId, "SPECIAL", clock.At(std::time(nullptr)), "");
  const std::size_t wanted = static_cast<std::size_t>(state.range(0));
  const std::string extra(wanted > record.size() ? wanted - record.size() : 0, 'x');
  for (auto _ : state) {
    record.clear();
    line.clear();
    orvane::AppendEventRecord(record, kGameId, kUserId, "SPECIAL", clock.At(std::time(nullptr)), extra);
    if (!orvane::EncryptRecordText(cipher, orvane::TakeKeyText(kGameId), record, line)) std::abort();
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

// Several threads recording at once, each on a log of its own or all on one
// log, against the same threads making the bare system calls of an event
// (open, fstat, one write, close) on files of their own or on one file. The
// ids and floor file names have the length of kGameId, so every line has
// the same size.
constexpr const char *kThreadGameIds[] = {"benc0", "benc1", "benc2", "benc3"};
constexpr const char *kThreadFloorFiles[] = {"flor0.log", "flor1.log", "flor2.log", "flor3.log"};

// Events per second of `threads` threads doing `batch` steps each, from the
// moment they are all released together to the last one's end.
template <class Step>
double EventsPerSecond(int threads, int batch, Step step) {
  std::atomic<int> ready{0};
  std::atomic<bool> go{false};
  std::vector<std::thread> running;
  for (int t = 0; t < threads; ++t)
    running.emplace_back([&, t] {
      ++ready;
      while (!go.load(std::memory_order_acquire)) std::this_thread::yield();
      for (int i = 0; i < batch; ++i) step(t);
    });
  while (ready.load() != threads) std::this_thread::yield();
  const auto start = std::chrono::steady_clock::now();
  go.store(true, std::memory_order_release);
  for (std::thread &thread : running) thread.join();
  const double seconds = std::chrono::duration<double>(std::chrono::steady_clock::now() - start).count();
  return threads * batch / seconds;
}

void ScalingReport(const EventSetup &setup, int rounds, int batch) {
  if (rounds <= 0) return;
  for (const char *game : kThreadGameIds) oAnalyticsInit(game, kUserId);
  const auto library = [](bool own) {
    return [own](int t) {
      if (oAnalyticsGameEnter(own ? kThreadGameIds[t] : kGameId, kUserId) != 0) std::abort();
    };
  };
  const auto floor = [&setup](bool own) {
    return [&setup, own](int t) {
      const std::string path = own ? setup.logs + kThreadFloorFiles[t] : setup.floor_path;
      if (FloorEvent(setup.logs.c_str(), path.c_str(), setup.line.data(), setup.line.size()) != 0)
        std::abort();
    };
  };
  // [side][own log][threads index] -> events per second, one per round.
  constexpr int kThreadCounts[] = {1, 2, 4};
  std::vector<double> rate[2][2][3];
  for (int round = 0; round < rounds; ++round)
    for (int k = 0; k < 12; ++k) {
      const int turn = (k + round) % 12; // every configuration takes every place in the order
      const int side = turn % 2, own = turn / 2 % 2, n = turn / 4;
      rate[side][own][n].push_back(side == 0 ? EventsPerSecond(kThreadCounts[n], batch, library(own))
                                             : EventsPerSecond(kThreadCounts[n], batch, floor(own)));
    }
  std::printf(
      "\nThreads recording at once: %d interleaved rounds of %d events per thread (median events/s)\n",
      rounds, batch);
  std::printf("  %-22s %8s %12s %8s %14s %8s %10s\n", "", "threads", "library", "x 1", "floor", "x 1",
              "of floor's");
  for (int own = 1; own >= 0; --own)
    for (int n = 0; n < 3; ++n) {
      const double lib = Median(rate[0][own][n]), flo = Median(rate[1][own][n]);
      const double lib_scale = lib / Median(rate[0][own][0]), floor_scale = flo / Median(rate[1][own][0]);
      std::printf("  %-22s %8d %12.0f %8.2f %14.0f %8.2f %10.2f\n", own ? "a log per thread" : "one log",
                  kThreadCounts[n], lib, lib_scale, flo, floor_scale, lib_scale / floor_scale);
    }
}

// Latency of one thread's calls, alone and while three others record.
void LatencyReport(int calls) {
  if (calls <= 0) return;
  const auto percentiles = [calls](int others) {
    std::atomic<bool> done{false};
    std::vector<std::thread> busy;
    for (int t = 1; t <= others; ++t)
      busy.emplace_back([&done, t] {
        while (!done.load(std::memory_order_relaxed)) oAnalyticsGameEnter(kThreadGameIds[t], kUserId);
      });
    std::vector<double> micros(static_cast<std::size_t>(calls));
    for (double &us : micros)
      us = NanosecondsPerEvent(1, [] { oAnalyticsGameEnter(kThreadGameIds[0], kUserId); }) / 1000;
    done = true;
    for (std::thread &thread : busy) thread.join();
    std::sort(micros.begin(), micros.end());
    std::printf("  %d other threads recording: p50 %7.1f us, p99 %7.1f us\n", others,
                micros[micros.size() / 2], micros[micros.size() * 99 / 100]);
  };
  std::printf("\nLatency of oAnalyticsGameEnter on one thread, %d calls\n", calls);
  percentiles(0);
  percentiles(3);
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
    if (room < filler.size())
      filler.resize(room);
    else
      filler.resize(std::min<std::size_t>(63, room), 'v');
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
  const int scaling_rounds = IntFlag(argc, argv, "--scaling_rounds", 21);
  const int scaling_batch = IntFlag(argc, argv, "--scaling_batch", 400);
  const int latency_calls = IntFlag(argc, argv, "--latency_calls", 20000);
  benchmark::Initialize(&argc, argv);

  EventSetup setup = PrepareEvents();
  g_setup = &setup;
  benchmark::RunSpecifiedBenchmarks();
  benchmark::Shutdown();
  CompareWithFloor(setup, rounds, std::max(batch, 1));
  ScalingReport(setup, scaling_rounds, std::max(scaling_batch, 1));
  LatencyReport(latency_calls);
  orvane::bench::CloseSandbox(setup.sandbox);
  return 0;
}
