/* shared_log_writer.exe PROCESS EVENTS: four threads of one game process
 * record EVENTS SPECIAL events each on the log of game g1, extra text
 * "pPROCESS tTHREAD nEVENT", through OrvaneSDK.dll as a game loads it. Exits 0
 * when every call returned 0. Several run at once under wine, where appends
 * are no single step, and shared_log_under_wine.sh checks every record. */
#include "OrvaneSDK.h"

#include <stdio.h>
#include <stdlib.h>
#include <windows.h>

typedef int32_t(ORVANE_CALL *special_fn)(const char *, const char *, const char *);
static special_fn special;
static int process, events;
static volatile LONG failures;

static DWORD WINAPI record(LPVOID thread) {
  char extra[64];
  for (int n = 0; n < events; ++n) {
    snprintf(extra, sizeof extra, "p%d t%d n%d", process, (int)(INT_PTR)thread, n);
    if (special("g1", "u1", extra) != 0) InterlockedIncrement(&failures);
  }
  return 0;
}

int main(int argc, char **argv) {
  if (argc != 3) return 2;
  process = atoi(argv[1]);
  events = atoi(argv[2]);
  HMODULE library = LoadLibraryA("OrvaneSDK.dll");
  if (library == NULL) return 2;
  special = (special_fn)(void (*)(void))GetProcAddress(library, "oAnalyticsSpecial");
  HANDLE threads[4];
  for (INT_PTR t = 0; t < 4; ++t) threads[t] = CreateThread(NULL, 0, record, (LPVOID)t, 0, NULL);
  WaitForMultipleObjects(4, threads, TRUE, INFINITE);
  printf("%ld failed\n", failures);
  return failures == 0 ? 0 : 1;
}
