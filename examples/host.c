/*
 * orvane-host: a sample game host for OrvaneSDK.
 *
 * It loads the library at run time, as a game does, registers a log callback
 * that prints every message, and runs the calls named on its command line:
 *
 *   orvane-host [--library PATH] [CALL ...] [-- LAUNCHER ARGS ...]
 *
 *   register            register the printing callback
 *   register-null       unregister (messages are dropped)
 *   initialize          oInitialize()
 *   init GAME USER      oAnalyticsInit
 *   enter GAME USER     oAnalyticsGameEnter
 *   exit GAME USER      oAnalyticsGameExit
 *   special GAME USER EXTRA   oAnalyticsSpecial
 *   uuid                oAuthGetUserUuid
 *   gameid              oAuthGetGameId
 *   wait-for PATH       wait (10 s at most) until PATH exists, so that a
 *                       test can release several hosts at the same moment
 *   exit-at-exit GAME USER   oAnalyticsGameExit from an exit handler that
 *                       was registered before the library was loaded
 *
 * Words after "--" are not calls: that is where a launcher's
 * --userUuid--... and --gameId--... arguments go. The callback is registered
 * first unless the calls begin with register or register-null. With no
 * calls, a short demo game session runs.
 */
/* Only the prefixed names, as a game with its own LogLevel would include it. */
#define ORVANE_NO_SHORT_NAMES
#include "OrvaneSDK.h"
typedef const char *LogLevel; /* a game's own name, no clash */

#include <stdio.h>
#include <stdlib.h>
#include <string.h>

#ifdef _WIN32
#include <windows.h>
typedef HMODULE library_t;
#define LIBRARY_NAME "OrvaneSDK.dll"
static library_t open_library(const char *path) { return LoadLibraryA(path); }
static void *find_symbol(library_t lib, const char *name) {
  return (void *)(uintptr_t)GetProcAddress(lib, name);
}
static void pause_briefly(void) { Sleep(1); }
static int own_directory(char *out, size_t size) {
  DWORD n = GetModuleFileNameA(NULL, out, (DWORD)size);
  if (n == 0 || n >= size) return 0;
  while (n > 0 && out[n - 1] != '\\' && out[n - 1] != '/') --n;
  out[n] = '\0';
  return 1;
}
#else
#include <dlfcn.h>
#include <time.h>
#include <unistd.h>
typedef void *library_t;
#define LIBRARY_NAME "libOrvaneSDK.so"
static library_t open_library(const char *path) { return dlopen(path, RTLD_NOW | RTLD_LOCAL); }
static void *find_symbol(library_t lib, const char *name) { return dlsym(lib, name); }
static void pause_briefly(void) {
  struct timespec t = {0, 200 * 1000};
  nanosleep(&t, NULL);
}
static int own_directory(char *out, size_t size) {
  ssize_t n = readlink("/proc/self/exe", out, size - 1);
  if (n <= 0) return 0;
  while (n > 0 && out[n - 1] != '/') --n;
  out[n] = '\0';
  return 1;
}
#endif

typedef void(ORVANE_CALL *register_fn)(OrvaneLogCallback);
typedef void(ORVANE_CALL *initialize_fn)(void);
typedef int32_t(ORVANE_CALL *event_fn)(const char *, const char *);
typedef int32_t(ORVANE_CALL *special_fn)(const char *, const char *, const char *);
typedef char *(ORVANE_CALL *identity_fn)(void);
typedef void(ORVANE_CALL *free_text_fn)(char *);

static struct {
  register_fn register_for_logs;
  initialize_fn initialize;
  event_fn init, enter, exit;
  special_fn special;
  identity_fn user_uuid, game_id;
  free_text_fn free_text;
} sdk;

static void ORVANE_CALL print_message(OrvaneLogLevel level, const char *message) {
  static const char *const names[] = {"INFO", "WARNING", "ERROR"};
  const char *name = (level >= 0 && level <= 2) ? names[level] : "?";
  printf("  [%d %s] %s\n", (int)level, name, message);
  fflush(stdout);
}

static int load(const char *path) {
  char buffer[4096];
  if (path == NULL) {
    if (!own_directory(buffer, sizeof buffer - strlen(LIBRARY_NAME))) return 0;
    strcat(buffer, LIBRARY_NAME);
    path = buffer;
  }
  library_t lib = open_library(path);
  if (!lib) {
    fprintf(stderr, "orvane-host: cannot load %s\n", path);
    return 0;
  }
#define FIND(field, name)                                                                                    \
  if (!(*(void **)&sdk.field = find_symbol(lib, name))) {                                                    \
    fprintf(stderr, "orvane-host: %s has no export %s\n", path, name);                                       \
    return 0;                                                                                                \
  }
  FIND(register_for_logs, "oRegisterForLogs");
  FIND(initialize, "oInitialize");
  FIND(init, "oAnalyticsInit");
  FIND(enter, "oAnalyticsGameEnter");
  FIND(exit, "oAnalyticsGameExit");
  FIND(special, "oAnalyticsSpecial");
  FIND(user_uuid, "oAuthGetUserUuid");
  FIND(game_id, "oAuthGetGameId");
  FIND(free_text, "oFreeText");
#undef FIND
  return 1;
}

/* Prints an identity result. Unless a found one is kept, it goes back to the
 * library's own allocator at once, empty or not: a host never frees results
 * with its own C runtime. */
static char *show_identity(const char *name, char *result, int keep) {
  if (result[0] == '\0')
    printf("%s() = \"\" (not found)\n", name);
  else
    printf("%s() = \"%s\"\n", name, result);
  if (keep && result[0] != '\0') return result;
  sdk.free_text(result);
  return NULL;
}

static int32_t show_event(const char *name, int32_t result) {
  printf("%s() = %d\n", name, (int)result);
  fflush(stdout);
  return result;
}

static int demo(void) {
  char *user = show_identity("oAuthGetUserUuid", sdk.user_uuid(), 1);
  char *game = show_identity("oAuthGetGameId", sdk.game_id(), 1);
  const char *user_id = user ? user : "demo-user-0001";
  const char *game_id = game ? game : "demo-game";
  int failures = 0;
  printf("-- a game session of %s for %s\n", game_id, user_id);
  failures += show_event("oAnalyticsInit", sdk.init(game_id, user_id)) != 0;
  failures += show_event("oAnalyticsGameEnter", sdk.enter(game_id, user_id)) != 0;
  failures += show_event("oAnalyticsSpecial", sdk.special(game_id, user_id, "level=3;score=1200")) != 0;
  failures += show_event("oAnalyticsSpecial", sdk.special(game_id, user_id, "boss \"Hydra\" defeated")) != 0;
  failures += show_event("oAnalyticsGameExit", sdk.exit(game_id, user_id)) != 0;
  sdk.free_text(user); /* null when not found: ignored */
  sdk.free_text(game);
  return failures ? 1 : 0;
}

static void wait_for(const char *path) {
  for (int i = 0; i < 50000; ++i) {
    FILE *f = fopen(path, "rb");
    if (f) {
      fclose(f);
      return;
    }
    pause_briefly();
  }
  fprintf(stderr, "orvane-host: %s did not appear\n", path);
}

/* Games often record their EXIT from an exit handler, which runs after the
 * library's own exit-time clean-up would have (it was registered first). */
static const char *exit_game, *exit_user;
static void record_exit_at_exit(void) {
  if (exit_game) show_event("oAnalyticsGameExit", sdk.exit(exit_game, exit_user));
}

static int need(int argc, int i, int count, const char *call) {
  if (i + count < argc) return 1;
  fprintf(stderr, "orvane-host: %s needs %d argument(s)\n", call, count);
  return 0;
}

int main(int argc, char **argv) {
  const char *library = NULL;
  int first = 1;
  if (argc > 2 && strcmp(argv[1], "--library") == 0) {
    library = argv[2];
    first = 3;
  }
  int last = first; /* calls are argv[first .. last) */
  while (last < argc && strcmp(argv[last], "--") != 0) ++last;

  atexit(record_exit_at_exit);
  if (!load(library)) return 2;
  setvbuf(stdout, NULL, _IOLBF, 0);

  if (first == last || (strcmp(argv[first], "register") != 0 && strcmp(argv[first], "register-null") != 0)) {
    printf("oRegisterForLogs(print_message)\n");
    sdk.register_for_logs(print_message);
  }
  if (first == last) return demo();

  int status = 0;
  for (int i = first; i < last; ++i) {
    const char *call = argv[i];
    if (strcmp(call, "register") == 0) {
      printf("oRegisterForLogs(print_message)\n");
      sdk.register_for_logs(print_message);
    } else if (strcmp(call, "register-null") == 0) {
      printf("oRegisterForLogs(NULL)\n");
      sdk.register_for_logs(NULL);
    } else if (strcmp(call, "initialize") == 0) {
      printf("oInitialize()\n");
      sdk.initialize();
    } else if (strcmp(call, "init") == 0 || strcmp(call, "enter") == 0 || strcmp(call, "exit") == 0) {
      if (!need(last, i, 2, call)) return 2;
      event_fn fn = sdk.exit;
      const char *name = "oAnalyticsGameExit";
      if (strcmp(call, "init") == 0) fn = sdk.init, name = "oAnalyticsInit";
      if (strcmp(call, "enter") == 0) fn = sdk.enter, name = "oAnalyticsGameEnter";
      status |= show_event(name, fn(argv[i + 1], argv[i + 2])) != 0;
      i += 2;
    } else if (strcmp(call, "special") == 0) {
      if (!need(last, i, 3, call)) return 2;
      status |= show_event("oAnalyticsSpecial", sdk.special(argv[i + 1], argv[i + 2], argv[i + 3])) != 0;
      i += 3;
    } else if (strcmp(call, "wait-for") == 0) {
      if (!need(last, i, 1, call)) return 2;
      wait_for(argv[++i]);
    } else if (strcmp(call, "exit-at-exit") == 0) {
      if (!need(last, i, 2, call)) return 2;
      exit_game = argv[i + 1];
      exit_user = argv[i + 2];
      i += 2;
    } else if (strcmp(call, "uuid") == 0) {
      show_identity("oAuthGetUserUuid", sdk.user_uuid(), 0);
    } else if (strcmp(call, "gameid") == 0) {
      show_identity("oAuthGetGameId", sdk.game_id(), 0);
    } else {
      fprintf(stderr, "orvane-host: unknown call '%s'\n", call);
      return 2;
    }
  }
  return status;
}
