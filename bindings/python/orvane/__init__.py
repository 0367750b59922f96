"""OrvaneSDK for Python (ctypes): the library's exports for Python games (pygame, Ren'Py) and tools.

    import orvane
    orvane.register_for_logs(lambda level, message: print(level.name, message))
    user, game = orvane.get_user_uuid(), orvane.get_game_id()
    if user and game:
        orvane.analytics_game_enter(game, user)

Every call may come from any thread; messages reach the handler on the thread of the call that caused
them, before it returns (ctypes takes the interpreter lock for it). Texts cross as UTF-8 both ways: a str
is encoded (a byte that was not UTF-8 in a text this module returned, kept as a lone surrogate, goes back
as that byte), bytes pass as they are, None is read by the library as empty. A text holding a NUL
character would end there for the library, which would store it cut: an analytics call refuses it whole
instead, returns -1 and the handler hears
(ERROR, "[OrvaneSDK] Analytics <TYPE> - failed. Text holds a NUL character.").

The library is loaded at the first call, from the path given to load(), else beside the game (the folder
of a frozen game's executable or of the started script), else where the system loader looks. OSError
tells that it was not found; AttributeError that it lacks an export (one older than this module).
"""
import ctypes
import enum
import os
import sys
import threading

__all__ = ["LogLevel", "load", "register_for_logs", "initialize", "analytics_init", "analytics_game_enter",
           "analytics_game_exit", "analytics_special", "get_user_uuid", "get_game_id", "get_version"]


class LogLevel(enum.IntEnum):
    """The level of a message from the library."""
    INFO = 0
    WARNING = 1
    ERROR = 2


if sys.platform == "win32":
    _NAMES = ("OrvaneSDK.dll",)
else:
    _NAMES = ("libOrvaneSDK.so.1", "libOrvaneSDK.so")

# The native callback type: void (int32_t level, const char *message), cdecl. A c_void_p message is read
# at once (it lives only during the call).
_CALLBACK = ctypes.CFUNCTYPE(None, ctypes.c_int32, ctypes.c_void_p)
_load_lock = threading.Lock()
_library = None
_handler = None


def _deliver(level, message):
    handler = _handler
    if handler is not None:
        handler(LogLevel(level), message)


def _on_native_log(level, message):
    # What the handler raises is reported by ctypes (sys.unraisablehook) and never reaches the library.
    _deliver(level, ctypes.string_at(message).decode("utf-8", "replace"))


# One native callback for the life of the process: the library can never call a collected one, and
# replacing the handler is an assignment.
_native_callback = _CALLBACK(_on_native_log)


def _beside_the_game():
    main = sys.executable if getattr(sys, "frozen", False) else (sys.argv[0] if sys.argv else "")
    folder = os.path.dirname(os.path.abspath(main)) if main else os.getcwd()
    for name in _NAMES:
        if os.path.isfile(os.path.join(folder, name)):
            return os.path.join(folder, name)
    return None


def _declare(library):
    text, result = ctypes.c_char_p, ctypes.c_int32
    signatures = {
        "oRegisterForLogs": ([_CALLBACK], None),
        "oInitialize": ([], None),
        "oAnalyticsInit": ([text, text], result),
        "oAnalyticsGameEnter": ([text, text], result),
        "oAnalyticsGameExit": ([text, text], result),
        "oAnalyticsSpecial": ([text, text, text], result),
        # Identity results are kept as addresses: c_char_p would drop the pointer oFreeText needs.
        "oAuthGetUserUuid": ([], ctypes.c_void_p),
        "oAuthGetGameId": ([], ctypes.c_void_p),
        "oFreeText": ([ctypes.c_void_p], None),
        "oGetVersion": ([], ctypes.c_char_p),
    }
    for name, (arguments, restype) in signatures.items():
        function = getattr(library, name)
        function.argtypes, function.restype = arguments, restype
    return library


def load(path=None):
    """Loads the library once per process and returns it (a ctypes.CDLL with every export declared).

    path names the library file; without it, it is looked for beside the game, then by the system loader
    (LD_LIBRARY_PATH on Linux, the DLL search path on Windows). Later calls return the loaded one.
    """
    global _library
    with _load_lock:
        if _library is None:
            found = path or _beside_the_game()
            candidates = [found] if found else list(_NAMES)
            for candidate in candidates:
                try:
                    _library = _declare(ctypes.CDLL(candidate))
                    break
                except OSError:
                    if candidate is candidates[-1]:
                        raise
        return _library


def _lib():
    return load() if _library is None else _library


def register_for_logs(handler):
    """Makes handler(level, message) the process's one handler; None unregisters.

    It at once receives (INFO, "[OrvaneSDK] Logging initiated."). Unregistering returns only when no other
    thread is still inside the handler.
    """
    global _handler
    if handler is None:
        _lib().oRegisterForLogs(_CALLBACK())  # a null function pointer
        _handler = None
    else:
        _handler = handler
        _lib().oRegisterForLogs(_native_callback)


def initialize():
    """Creates the library's storage folders when missing; the first event does it too."""
    _lib().oInitialize()


def _utf8(text):
    if text is None or isinstance(text, bytes):
        return text
    return text.encode("utf-8", "surrogateescape")


def _record(export, event_type, *texts):
    encoded = [_utf8(text) for text in texts]
    if any(text is not None and b"\0" in text for text in encoded):
        _deliver(LogLevel.ERROR, "[OrvaneSDK] Analytics %s - failed. Text holds a NUL character." % event_type)
        return -1
    return getattr(_lib(), export)(*encoded)


def analytics_init(game_id, user_id):
    """Starts the game's log with its INIT record, unless it has one. 0 when done, -1 when refused."""
    return _record("oAnalyticsInit", "INIT", game_id, user_id)


def analytics_game_enter(game_id, user_id):
    """Records that the user entered the game. 0 when written, -1 when refused or not written."""
    return _record("oAnalyticsGameEnter", "ENTER", game_id, user_id)


def analytics_game_exit(game_id, user_id):
    """Records that the user left the game. 0 when written, -1 when refused or not written."""
    return _record("oAnalyticsGameExit", "EXIT", game_id, user_id)


def analytics_special(game_id, user_id, extra=""):
    """Records a game-defined event with extra stored as given. 0 when written, -1 when refused."""
    return _record("oAnalyticsSpecial", "SPECIAL", game_id, user_id, extra)


def _take_text(address):
    try:
        return ctypes.string_at(address).decode("utf-8", "surrogateescape")
    finally:
        _lib().oFreeText(address)


def get_user_uuid():
    """The user UUID the launcher put on the command line (after "--userUuid--"); "" when absent."""
    return _take_text(_lib().oAuthGetUserUuid())


def get_game_id():
    """The game id the launcher put on the command line (after "--gameId--"); "" when absent."""
    return _take_text(_lib().oAuthGetGameId())


def get_version():
    """The loaded library's version, "MAJOR.MINOR.PATCH" (a constant of the library: not freed)."""
    return _lib().oGetVersion().decode("ascii")
