/* A game built against an installed OrvaneSDK package: its first event on a
 * new log, and the version check. ORVANE_EXPECTED_VERSION is the package's
 * version as its metadata gives it. Built for the MSVC ABI (_MSC_VER) it has
 * no C runtime: it writes through kernel32 and starts at `start`. */
#include <OrvaneSDK.h>

#ifdef _MSC_VER
__declspec(dllimport) void *GetStdHandle(unsigned long);
__declspec(dllimport) int WriteFile(void *, const void *, unsigned long, unsigned long *, void *);
__declspec(dllimport) void ExitProcess(unsigned);
static void put(const char *text) {
  unsigned long size = 0, written;
  while (text[size]) ++size;
  WriteFile(GetStdHandle((unsigned long)-11), text, size, &written, 0);
}
#else
#include <stdio.h>
static void put(const char *text) { fputs(text, stdout); }
#endif

static void ORVANE_CALL print_message(LogLevel level, const char *message) {
  (void)level;
  put("  ");
  put(message);
  put("\n");
}

static int same(const char *a, const char *b) {
  while (*a && *a == *b) ++a, ++b;
  return *a == *b;
}

static int run(void) {
  oRegisterForLogs(print_message);
  put("oGetVersion() = ");
  put(oGetVersion());
  put("\n");
  if (!same(oGetVersion(), ORVANE_SDK_VERSION_STRING) || !same(oGetVersion(), ORVANE_EXPECTED_VERSION)) {
    put("differs from the header's " ORVANE_SDK_VERSION_STRING " or the package's " ORVANE_EXPECTED_VERSION "\n");
    return 1;
  }
  return oAnalyticsGameEnter("consumer", "u1") != 0;
}

#ifdef _MSC_VER
void start(void) { ExitProcess(run()); }
#else
int main(void) { return run(); }
#endif
