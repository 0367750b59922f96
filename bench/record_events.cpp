// orvane-bench-events: records ENTER events in a private data directory, for
// instruction counts under callgrind and for the resident-memory check.
//
//   orvane-bench-events N          one INIT, then N ENTER events
//   orvane-bench-events --rss N    the same after 10,000 events of warm-up,
//                                  printing how resident memory moved
#include "bench_sandbox.h"

#include <cstdio>
#include <cstdlib>
#include <cstring>

namespace {

constexpr const char *kGameId = "bench";
constexpr const char *kUserId = "player-0001";

bool RecordEnters(long count) {
  for (long i = 0; i < count; ++i)
    if (oAnalyticsGameEnter(kGameId, kUserId) != 0) return false;
  return true;
}

int Usage() {
  std::fprintf(stderr, "usage: orvane-bench-events [--rss] EVENTS\n");
  return 2;
}

} // namespace

int main(int argc, char **argv) {
  const bool rss = argc == 3 && std::strcmp(argv[1], "--rss") == 0;
  if (argc != 2 && !rss) return Usage();
  char *end = nullptr;
  const long events = std::strtol(argv[argc - 1], &end, 10);
  if (*end != '\0' || events < 0) return Usage();

  const orvane::bench::Sandbox sandbox = orvane::bench::OpenSandbox();
  oRegisterForLogs(orvane::bench::IgnoreMessage);
  bool ok = oAnalyticsInit(kGameId, kUserId) == 0;
  if (rss) {
    constexpr long kWarmUp = 10000;
    ok = ok && RecordEnters(kWarmUp);
    // The first reading faults in the reading code itself (file pages come
    // 64 KiB at a time), which is no growth of the library's.
    orvane::bench::ResidentBytes();
    const std::int64_t before = orvane::bench::ResidentBytes();
    ok = ok && RecordEnters(events);
    const std::int64_t after = orvane::bench::ResidentBytes();
    std::printf("resident memory: %lld KiB after %ld warm-up events, %lld KiB after %ld more: "
                "growth %lld KiB\n",
                static_cast<long long>(before / 1024), kWarmUp, static_cast<long long>(after / 1024), events,
                static_cast<long long>((after - before) / 1024));
  } else {
    ok = ok && RecordEnters(events);
  }
  orvane::bench::CloseSandbox(sandbox);
  if (!ok) std::fprintf(stderr, "orvane-bench-events: an event failed\n");
  return ok ? 0 : 1;
}
