// The C# binding under mono against the built libOrvaneSDK.so, under a temporary XDG_DATA_HOME:
//   mono orvane-binding-test.exe ORVANE-LOGCAT VERSION --userUuid--a1b2c3d4 --gameId--demo42
using System;
using System.Collections.Generic;
using System.Diagnostics;
using System.IO;
using System.Text.RegularExpressions;
using Orvane;

static class BindingTest {
    static readonly string data = Path.GetTempPath() + "orvane-csharp-" + Guid.NewGuid().ToString("N");

    static void Equal<T>(T expected, T got, string what) {
        if (!Equals(expected, got))
            throw new Exception(what + "\n  expected: " + expected + "\n  got:      " + got);
    }

    static int Main(string[] args) {
        // Read when the library loads.
        Environment.SetEnvironmentVariable("XDG_DATA_HOME", Directory.CreateDirectory(data).FullName);
        try { Reload(); Example(args[0], args[1]); return 0; }
        catch (Exception e) { Console.WriteLine("FAILED: " + e.Message); return 1; }
        finally { Directory.Delete(data, true); }
    }

    // A game's first event on a machine where nothing is stored yet, with its identity from this
    // process's command line, then every other call; the log read back by orvane-logcat.
    static void Example(string logcat, string version) {
        var heard = new List<string>();
        OrvaneSDK.RegisterForLogs((level, message) => heard.Add(level.ToString()[0] + message.Substring(12)));
        string user = OrvaneSDK.GetUserUuid(), game = OrvaneSDK.GetGameId(), extra = "caf\u00e9 \"\u2713\"";
        Equal("a1b2c3d4 demo42 " + version + " 0 0 0 0 -1 -1 -1", string.Join(" ", user, game,
            OrvaneSDK.GetVersion(), OrvaneSDK.AnalyticsGameEnter(game, user),
            OrvaneSDK.AnalyticsInit(game, user), OrvaneSDK.AnalyticsSpecial(game, user, extra),
            OrvaneSDK.AnalyticsGameExit(game, user), OrvaneSDK.AnalyticsGameEnter(null, user),
            OrvaneSDK.AnalyticsSpecial(game, user, "before\0after"), // a NUL: refused, never stored cut
            OrvaneSDK.AnalyticsGameExit(game + "\0x", user)), "identity, results");
        OrvaneSDK.Initialize();
        // A message of each level arrives with it, and the NUL refusals; the order is the recorder's.
        Equal("ILogging initiated.|WAnalytics INIT - log had been already initialized.|EAnalytics " +
              "SPECIAL - failed. Text holds a NUL character.|EAnalytics EXIT - failed. Text holds a NUL " +
              "character.|15", string.Join("|", heard[0], heard[8], heard[12], heard[13], heard.Count),
              "messages, level first");
        var run = new ProcessStartInfo(logcat, data + "/Orvane/Logs/demo42.log") {
            UseShellExecute = false, RedirectStandardOutput = true,
            StandardOutputEncoding = System.Text.Encoding.UTF8};
        Process reader = Process.Start(run);
        string records =
            Regex.Replace(reader.StandardOutput.ReadToEnd(), @"\d{4}-\d\d-\d\dT\d\d:\d\d:\d\d", "T");
        reader.WaitForExit();
        Func<string, string, string> line = (type, text) => "{\"user_id\":\"a1b2c3d4\"," +
            "\"game_id\":\"demo42\",\"type\":\"" + type + "\",\"time\":\"T\",\"extra\":\"" +
            text.Replace("\"", "\\\"") + "\"}\n";
        Equal(line("INIT", "") + line("ENTER", "") + line("SPECIAL", extra) + line("EXIT", "") + 0,
              records + reader.ExitCode, "the log read back by orvane-logcat, and its exit status");
    }

    // First, a script domain registers and is unloaded, as Unity's Editor reloads scripts: the
    // binding withdraws the handler first, so a message from the main domain neither calls into the
    // unloaded code nor reaches it.
    static void Reload() {
        AppDomain scripts = AppDomain.CreateDomain("scripts");
        // There `data` is another path.
        scripts.DoCallBack(() => OrvaneSDK.RegisterForLogs((level, message) => File.AppendAllText(
            Environment.GetEnvironmentVariable("XDG_DATA_HOME") + "/heard", message + "\n")));
        AppDomain.Unload(scripts);
        Equal(-1, OrvaneSDK.AnalyticsGameEnter("", "u1"), "a call with a message after the unload");
        Equal("[OrvaneSDK] Logging initiated.\n", File.ReadAllText(data + "/heard"),
              "what the handler heard");
    }
}
