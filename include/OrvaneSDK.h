/*
 * OrvaneSDK: analytics event log and launch identity for games.
 *
 * The library records a game's analytics events as encrypted lines in one
 * local log file per game id, hands the game the user UUID and game id that
 * the launcher put on the process command line, and tells the game what it
 * did through one log callback.
 *
 * Where the files go:
 *   Windows: C:\Orvane\Logs\<game id>.log
 *   Linux:   $XDG_DATA_HOME/Orvane/Logs/<game id>.log
 *            (or ~/.local/share/Orvane/Logs/<game id>.log)
 *
 * Threads: every function may be called from any thread, also at the same
 * time. The library starts no thread of its own; every function runs to
 * completion on the caller's thread and delivers its messages to the
 * registered callback on that thread before it returns. No library lock is
 * held while the callback runs, so a callback may call back into the library.
 * Replacing or removing the callback waits for its calls on other threads
 * (see oRegisterForLogs).
 *
 * Texts: every text is zero-terminated narrow (8-bit) text, used byte for
 * byte. The library only reads a text argument during the call and keeps no
 * pointer to it. A null text counts as an empty one.
 *
 * Errors: no function throws, aborts or returns an error code other than the
 * ones documented here. Failures show as a result and an ORVANE_LOG_ERROR
 * message.
 *
 * These comments are the reference for each function, its messages and the
 * game id rule. The pages beside the SDK's README link here and add what a
 * reader needs besides: docs/events.md (when to send each event, running
 * without a launcher), docs/troubleshooting.md (what to do about each
 * message), docs/log-format.md (the exact bytes on disk, the key rule),
 * docs/security.md (what the encryption protects, and what not).
 */
#ifndef ORVANE_SDK_H
#define ORVANE_SDK_H

#include <stdint.h>

#include "OrvaneSDKVersion.h"

/*
 * On Windows the functions are imported from the DLL (dllimport). Define
 * ORVANE_STATIC before including this header for declarations without the
 * import attribute: a host that looks the functions up at run time, or one
 * that builds the library's sources into itself (docs/integrating.md).
 */
#if defined(_WIN32)
#define ORVANE_CALL __cdecl
#if defined(ORVANE_BUILDING_LIBRARY)
#define ORVANE_API __declspec(dllexport)
#elif defined(ORVANE_STATIC)
#define ORVANE_API
#else
#define ORVANE_API __declspec(dllimport)
#endif
#else
#define ORVANE_CALL
#define ORVANE_API __attribute__((visibility("default")))
#endif

#ifdef __cplusplus
extern "C" {
#endif

/*
 * Level of a message: how the host should take it. Only these three occur.
 * C sees a 32-bit integer and prefixed constants. C++ sees OrvaneLogLevel as
 * an enumeration of the same size whose values are the same prefixed names,
 * so `level == ORVANE_LOG_ERROR` and `case ORVANE_LOG_WARNING:` work as in C;
 * from C++11 on it is a scoped enum (also OrvaneLogLevel::Info, ::Warning,
 * ::Error), so no bare name such as `Error` enters the host's scope.
 */
#if defined(__cplusplus) && (__cplusplus >= 201103L || (defined(_MSC_VER) && _MSC_VER >= 1700))
enum class OrvaneLogLevel : int32_t { Info = 0, Warning = 1, Error = 2 };
#define ORVANE_LOG_INFO (OrvaneLogLevel::Info)
#define ORVANE_LOG_WARNING (OrvaneLogLevel::Warning)
#define ORVANE_LOG_ERROR (OrvaneLogLevel::Error)
#elif defined(__cplusplus)
/* C++98 and C++03: a plain enum, an int on every C++ ABI, as the callback passes it. */
enum OrvaneLogLevel { OrvaneLogLevel_Info = 0, OrvaneLogLevel_Warning = 1, OrvaneLogLevel_Error = 2 };
#define ORVANE_LOG_INFO OrvaneLogLevel_Info
#define ORVANE_LOG_WARNING OrvaneLogLevel_Warning
#define ORVANE_LOG_ERROR OrvaneLogLevel_Error
#else
typedef int32_t OrvaneLogLevel;
#define ORVANE_LOG_INFO 0    /* success and progress */
#define ORVANE_LOG_WARNING 1 /* notice about the state of a game's log file */
#define ORVANE_LOG_ERROR 2   /* refused input or a failure */
#endif

/*
 * The host's log callback, called on the thread of the library call that
 * caused the message: on several threads at once when several threads call
 * the library. A host whose callbacks are bound to one thread (a LuaJIT
 * ffi.cast callback, a script engine's main state) registers a callback
 * written in C, calls the library only from that thread, or uses a binding
 * that hands messages over to that thread (bindings/lua/orvane.lua).
 * `message` begins with "[OrvaneSDK] ", carries no line end, and is valid
 * only during the call: copy it to keep it.
 * The callback must return (no longjmp, no exception through C frames):
 * withdrawing it waits for its calls to end. C# hosts use
 * bindings/csharp/OrvaneSDK.cs, which keeps its delegate alive.
 */
typedef void(ORVANE_CALL *OrvaneLogCallback)(OrvaneLogLevel level, const char *message);

/*
 * The short names of earlier headers. A host that has its own LogLevel or
 * LogCallback defines ORVANE_NO_SHORT_NAMES before including this header.
 */
#ifndef ORVANE_NO_SHORT_NAMES
typedef OrvaneLogLevel LogLevel;
typedef OrvaneLogCallback LogCallback;
#endif

/*
 * Registers the one log callback, replacing the previous one (null included).
 * A non-null callback at once receives
 *   (ORVANE_LOG_INFO, "[OrvaneSDK] Logging initiated.").
 * A null callback unregisters: messages are then dropped until a non-null
 * callback is registered. Messages sent while none is registered are lost;
 * register first to see everything.
 *
 * It returns only when no other thread is still inside the previous
 * callback, so the host may then free it or unload the code behind it
 * (a script domain, a plugin); it waits only for deliveries that began
 * before it, however steadily other threads report. Called from inside a
 * callback, it does not wait for that call itself. Do not call it while holding a lock that the
 * callback takes, nor from callbacks on two threads at once: each would wait
 * for the other.
 */
ORVANE_API void ORVANE_CALL oRegisterForLogs(OrvaneLogCallback callback);

/*
 * Creates the storage directories (Windows: C:\Orvane\ and C:\Orvane\Logs\)
 * where they are missing, then reports
 *   (ORVANE_LOG_INFO,  "[OrvaneSDK] Initialize() - OK.")      or
 *   (ORVANE_LOG_ERROR, "[OrvaneSDK] Initialize() - failed.")  when the logs
 *   directory still does not exist afterwards.
 * Optional: recording an event initialises the SDK itself when needed.
 */
ORVANE_API void ORVANE_CALL oInitialize(void);

/*
 * Analytics events. Each appends one encrypted line to the game's log file,
 * which always starts with the game's INIT line, and returns 0 on success or
 * -1 when the call was refused or the line could not be written.
 *
 * Messages, each "[OrvaneSDK] Analytics <TYPE> - " followed by:
 *   INFO    "OK"                                   line written, result 0
 *   INFO    "SDK was never initialized. Initializing the SDK."
 *                                                  (then oInitialize runs)
 *   WARNING "log was never initialized. Initialized the game log"
 *                                                  (ENTER/EXIT/SPECIAL on an
 *                                                  empty log: an INIT line is
 *                                                  written first, with its
 *                                                  own INIT messages)
 *   WARNING "log had been already initialized."   INIT on a non-empty log:
 *                                                  nothing written, result 0
 *   ERROR   "failed. Game id is empty"             result -1
 *   ERROR   "failed. User id is empty"             result -1
 *   ERROR   "log file failed to open. Maybe a bad game_id (<id>)?"
 *                                                  result -1; also for a game
 *                                                  id that is not a plain file
 *                                                  name (see below); an id
 *                                                  over 256 bytes shows its
 *                                                  first 256 and "...", and
 *                                                  control bytes as \xNN
 *   ERROR   "log file failed to write."            result -1 (disk full, I/O,
 *                                                  or the log's size could
 *                                                  not be measured); a first
 *                                                  line that did not go in
 *                                                  whole is cut away (on a
 *                                                  file system that locks
 *                                                  files)
 *   ERROR   "log file is locked by another process."
 *                                                  result -1: another writer
 *                                                  held the log for over a
 *                                                  second while starting it,
 *                                                  or kept this one from
 *                                                  starting it (a file system
 *                                                  without locks never
 *                                                  refuses)
 *   ERROR   "failed. Record encryption failed."    result -1
 *   ERROR   "failed. Record too large."            result -1: the line would
 *                                                  exceed 64 MiB; nothing
 *                                                  written
 *   ERROR   "failed. Internal error."              result -1 (out of memory)
 *
 * Only a regular file is a log: a link, FIFO, terminal or a device that reads
 * as empty at the log's path is refused as a bad game id (on Linux a block
 * device, which only root can place, is not looked for). A game id must be usable as a file name on every platform: it is refused
 * when it is "." or "..", holds a byte below 0x20 or one of / \ : * ? " < > |,
 * ends in "." or " ", or its part before the first "." is a Windows device
 * name (CON, PRN, AUX, NUL, CONIN$, CONOUT$, COM0-COM9, LPT0-LPT9, also
 * with blanks before the extension or a superscript port digit, any case).
 */
ORVANE_API int32_t ORVANE_CALL oAnalyticsInit(const char *gameId, const char *userId);
ORVANE_API int32_t ORVANE_CALL oAnalyticsGameEnter(const char *gameId, const char *userId);
ORVANE_API int32_t ORVANE_CALL oAnalyticsGameExit(const char *gameId, const char *userId);
/* `extra` is the game's own text for the event, stored with it (null = ""). */
ORVANE_API int32_t ORVANE_CALL oAnalyticsSpecial(const char *gameId, const char *userId, const char *extra);

/*
 * Launch identity: the text that follows "--userUuid--" (oAuthGetUserUuid) or
 * "--gameId--" (oAuthGetGameId) in the first process argument that holds the
 * marker, up to the end of that argument.
 *
 * The result is never null and belongs to the caller, who releases it with
 * oFreeText (below), whatever it holds.
 *   - Found: a new block; every call returns a new one. Messages:
 *     (INFO, "[OrvaneSDK] Authentication - OK") or
 *     (INFO, "[OrvaneSDK] Return GameID - OK").
 *   - Not found, empty, or not to be had (the command line cannot be read,
 *     memory is exhausted): a constant empty text "", which oFreeText ignores.
 *     Messages: (ERROR, "[OrvaneSDK] Authentication - Failed") or
 *     (ERROR, "[OrvaneSDK] Return GameID - Empty").
 *
 * Each UTF-16 unit of the Windows command line gives one byte, its low 8 bits
 * (on Linux each argument's bytes come back unchanged).
 */
ORVANE_API char *ORVANE_CALL oAuthGetUserUuid(void);
ORVANE_API char *ORVANE_CALL oAuthGetGameId(void);

/*
 * Releases a result of oAuthGetUserUuid or oAuthGetGameId with the
 * library's own allocator: the way every host releases results, since a
 * game built with another C runtime (MSVC, .NET) cannot free the library's
 * blocks itself. Null and the constant empty text are ignored, so any result
 * may be passed. (A non-empty result is a malloc block of the library's C
 * runtime; a host on that same runtime may still free() it.)
 */
ORVANE_API void ORVANE_CALL oFreeText(char *text);

/*
 * The version of the loaded library, "MAJOR.MINOR.PATCH", for a host that
 * checks it against ORVANE_SDK_VERSION_STRING of the headers it was built
 * with (same MAJOR: compatible). A constant text: never free it. Sends no
 * message; any thread.
 */
ORVANE_API const char *ORVANE_CALL oGetVersion(void);

#ifdef __cplusplus
} /* extern "C" */
#endif

#endif /* ORVANE_SDK_H */
