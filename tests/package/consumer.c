/* A game built against an installed OrvaneSDK: the version check, then its
 * first event on a new log. For the MSVC ABI it has no C runtime of its own (no
 * headers, no start-up code): it starts at `start` and calls into msvcrt.dll. */
#include <OrvaneSDK.h>

int puts(const char *text);
int strcmp(const char *a, const char *b);

static void ORVANE_CALL print_message(LogLevel level, const char *message) {
  (void)level;
  puts(message);
}

static int run(void) {
  oRegisterForLogs(print_message);
  puts(oGetVersion()); /* ORVANE_EXPECTED_VERSION: the version of the package's metadata */
  if (strcmp(oGetVersion(), ORVANE_SDK_VERSION_STRING) || strcmp(oGetVersion(), ORVANE_EXPECTED_VERSION))
    return 1;
  return oAnalyticsGameEnter("consumer", "u1") != 0;
}

#ifdef _MSC_VER
__declspec(dllimport) void __stdcall ExitProcess(unsigned code);
void start(void) { ExitProcess(run()); }
#else
int main(void) { return run(); }
#endif
