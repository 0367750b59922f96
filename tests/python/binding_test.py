"""The Python binding as a game uses it, under the system's python3: found beside the game, identity in
UTF-8, four threads recording with their messages on their own threads, a NUL refused, the log read back
by orvane-logcat.  binding_test.py LIBRARY_DIR LOGCAT VERSION --userUuid--... --gameId--..."""
import gc, json, os, subprocess, sys, tempfile, threading, tomllib

library_dir, logcat, version = sys.argv[1:4]
sys.path.insert(0, os.path.join(os.path.dirname(__file__), "../../bindings/python"))
sys.argv[0] = os.path.join(library_dir, "game.py")  # the game's folder holds the library
os.environ["XDG_DATA_HOME"] = tempfile.mkdtemp()
import orvane

heard = []
def listen():  # the handler's only reference is the module's
    orvane.register_for_logs(lambda level, message: heard.append((level, message, threading.get_ident())))
listen()
gc.collect()
user, game = orvane.get_user_uuid(), orvane.get_game_id()
assert (user, game) == ("3f6c-ünï", "space-race"), (user, game)
with open(os.path.join(os.path.dirname(__file__), "../../bindings/python/pyproject.toml"), "rb") as f:
    assert orvane.get_version() == tomllib.load(f)["project"]["version"] == version

def record(n, results):
    results[n] = [orvane.analytics_special(game, user, "thread=%d;n=%d;é" % (n, i)) for i in range(100)]
results = {}
threads = [threading.Thread(target=record, args=(n, results)) for n in range(4)]
[t.start() for t in threads]
[t.join() for t in threads]
assert all(r == [0] * 100 for r in results.values()) and len(results) == 4
ok = [h for h in heard if h[1] == "[OrvaneSDK] Analytics SPECIAL - OK"]
assert len(ok) == 400 and {h[2] for h in ok} == {t.ident for t in threads}, len(ok)
assert heard[0][:2] == (orvane.LogLevel.INFO, "[OrvaneSDK] Logging initiated."), heard[0]

del heard[:]
assert orvane.analytics_game_exit(game, "u\0ser") == -1 and orvane.analytics_special(game, user, b"a\0") == -1
assert heard == [(orvane.LogLevel.ERROR, "[OrvaneSDK] Analytics %s - failed. Text holds a NUL character." % t,
                  threading.get_ident()) for t in ("EXIT", "SPECIAL")], heard
orvane.register_for_logs(None)
assert orvane.analytics_game_enter(game, user) == 0 and len(heard) == 2

log = os.path.join(os.environ["XDG_DATA_HOME"], "Orvane/Logs/space-race.log")
records = [json.loads(line) for line in subprocess.run([logcat, log], check=True, capture_output=True,
                                                         text=True, encoding="utf-8").stdout.splitlines()]
assert [r["type"] for r in records] == ["INIT"] + ["SPECIAL"] * 400 + ["ENTER"], [r["type"] for r in records]
assert sorted(r["extra"] for r in records[1:401]) == sorted(
    "thread=%d;n=%d;é" % (n, i) for n in range(4) for i in range(100)) and records[0]["user_id"] == user
print("python binding: 400 events from 4 threads read back")
