// The C# binding under mono, against the built libOrvaneSDK.so. One program,
// one case per run (ctest names the case and passes the command line):
//   example LOGCAT --userUuid--... --gameId--...   the worked example
//   free-loop --userUuid--...                      results freed, no growth
//   threads                                        messages from four threads
//   reload                                         a handler in an unloaded domain
// Every run records under its own temporary XDG_DATA_HOME.
using System;
using System.Collections.Generic;
using System.Diagnostics;
using System.IO;
using System.Text;
using System.Text.RegularExpressions;
using System.Threading;
using Orvane;

static class BindingTest
{
    static int failures;
    static string data;

    static void Equal<T>(T expected, T actual, string what)
    {
        if (EqualityComparer<T>.Default.Equals(expected, actual)) return;
        Console.WriteLine("FAILED: " + what + "\n  expected: " + expected + "\n  actual:   " + actual);
        ++failures;
    }

    static int Main(string[] args)
    {
        // Before the first call loads the library, which reads it then.
        data = Path.Combine(Path.GetTempPath(), "orvane-csharp-" + Guid.NewGuid().ToString("N"));
        Directory.CreateDirectory(data);
        Environment.SetEnvironmentVariable("XDG_DATA_HOME", data);
        try
        {
            switch (args[0])
            {
                case "example": Example(args[1]); break;
                case "free-loop": FreeLoop(); break;
                case "threads": Threads(); break;
                case "reload": Reload(); break;
                default: throw new ArgumentException("unknown case " + args[0]);
            }
        }
        finally
        {
            Directory.Delete(data, true);
        }
        Console.WriteLine(failures == 0 ? "passed" : failures + " check(s) failed");
        return failures == 0 ? 0 : 1;
    }

    // A game's first event on a machine where nothing is stored yet, with
    // its identity from this process's command line; then every other call.
    static void Example(string logcat)
    {
        var heard = new List<string>();
        OrvaneSDK.RegisterForLogs((level, message) => heard.Add((int)level + " " + message));
        string user = OrvaneSDK.GetUserUuid(), game = OrvaneSDK.GetGameId();
        Equal("a1b2c3d4", user, "GetUserUuid");
        Equal("demo42", game, "GetGameId");
        Equal(0, OrvaneSDK.AnalyticsGameEnter(game, user), "AnalyticsGameEnter");
        Equal(0, OrvaneSDK.AnalyticsInit(game, user), "AnalyticsInit on a started log");
        Equal(0, OrvaneSDK.AnalyticsSpecial(game, user, "caf\u00e9 \"\u2713\""), "AnalyticsSpecial");
        Equal(0, OrvaneSDK.AnalyticsGameExit(game, user), "AnalyticsGameExit");
        Equal(-1, OrvaneSDK.AnalyticsGameEnter(null, user), "a null game id");
        OrvaneSDK.Initialize();
        OrvaneSDK.RegisterForLogs(null);
        Equal("demo42", OrvaneSDK.GetGameId(), "GetGameId, unregistered");
        string[] expected = {
            "0 [OrvaneSDK] Logging initiated.",
            "0 [OrvaneSDK] Authentication - OK",
            "0 [OrvaneSDK] Return GameID - OK",
            "0 [OrvaneSDK] Analytics ENTER - SDK was never initialized. Initializing the SDK.",
            "0 [OrvaneSDK] Initialize() - OK.",
            "1 [OrvaneSDK] Analytics ENTER - log was never initialized. Initialized the game log",
            "0 [OrvaneSDK] Analytics INIT - OK",
            "0 [OrvaneSDK] Analytics ENTER - OK",
            "1 [OrvaneSDK] Analytics INIT - log had been already initialized.",
            "0 [OrvaneSDK] Analytics SPECIAL - OK",
            "0 [OrvaneSDK] Analytics EXIT - OK",
            "2 [OrvaneSDK] Analytics ENTER - failed. Game id is empty",
            "0 [OrvaneSDK] Initialize() - OK.",
        };
        Equal(string.Join("\n", expected), string.Join("\n", heard), "messages");

        var run = new ProcessStartInfo(logcat, Path.Combine(data, "Orvane/Logs/demo42.log"));
        run.UseShellExecute = false;
        run.RedirectStandardOutput = true;
        run.StandardOutputEncoding = Encoding.UTF8;
        Process reader = Process.Start(run);
        string records = reader.StandardOutput.ReadToEnd();
        reader.WaitForExit();
        Equal(0, reader.ExitCode, "orvane-logcat's exit status");
        Func<string, string, string> line = (type, extra) => "{\"user_id\":\"a1b2c3d4\",\"game_id\":\"demo42\"," +
            "\"type\":\"" + type + "\",\"time\":\"T\",\"extra\":\"" + extra + "\"}\n";
        Equal(line("INIT", "") + line("ENTER", "") + line("SPECIAL", "caf\u00e9 \\\"\u2713\\\"") + line("EXIT", ""),
              Regex.Replace(records, "\"time\":\"\\d{4}-\\d\\d-\\d\\dT\\d\\d:\\d\\d:\\d\\d\"", "\"time\":\"T\""),
              "the log read back");
    }

    // Get-and-free, found and empty, until the heap has settled; then
    // 100,000 more must not grow the process (a block kept per call would
    // add megabytes; freeing the constant empty text would crash).
    static void FreeLoop()
    {
        string uuid = Environment.GetCommandLineArgs()[2].Substring("--userUuid--".Length);
        Action getAndFree = () => {
            Equal(uuid, OrvaneSDK.GetUserUuid(), "GetUserUuid");
            Equal("", OrvaneSDK.GetGameId(), "GetGameId");
        };
        for (int i = 0; i < 50000; ++i) getAndFree();
        long before = ResidentBytes();
        for (int i = 0; i < 50000; ++i) getAndFree();
        long growth = ResidentBytes() - before;
        Equal(true, growth < 4 << 20, "resident memory growth below 4 MiB over 100,000 calls (" + growth + " bytes)");
    }

    static long ResidentBytes()
    {
        GC.Collect();
        GC.WaitForPendingFinalizers();
        return long.Parse(File.ReadAllText("/proc/self/statm").Split(' ')[1]) * Environment.SystemPageSize;
    }

    // Four threads report at once; each message reaches the handler on the
    // thread that caused it.
    [ThreadStatic] static int threadIndex; // 0 on the main thread
    static void Threads()
    {
        const int threads = 4, calls = 1000;
        var heard = new int[threads + 1];
        OrvaneSDK.RegisterForLogs((level, message) => {
            if (level == LogLevel.Error && message == "[OrvaneSDK] Return GameID - Empty") Interlocked.Increment(ref heard[threadIndex]);
        });
        var start = new Barrier(threads);
        var running = new List<Thread>();
        for (int t = 1; t <= threads; ++t)
        {
            int index = t;
            running.Add(new Thread(() => {
                threadIndex = index;
                start.SignalAndWait();
                for (int i = 0; i < calls; ++i) OrvaneSDK.GetGameId();
            }));
            running[running.Count - 1].Start();
        }
        foreach (Thread thread in running) thread.Join();
        OrvaneSDK.RegisterForLogs(null);
        Equal("0 1000 1000 1000 1000", string.Join(" ", heard), "messages heard per thread (main, then the four)");
    }

    // A script domain registers and is unloaded, as Unity's Editor reloads
    // scripts: the binding withdraws the handler first, so an event from the
    // main domain neither calls into the unloaded code nor reaches it.
    static void Reload()
    {
        AppDomain scripts = AppDomain.CreateDomain("scripts");
        scripts.SetData("heard", Path.Combine(data, "heard"));
        scripts.DoCallBack(RegisterInDomain);
        AppDomain.Unload(scripts);
        Equal(0, OrvaneSDK.AnalyticsGameEnter("g1", "u1"), "an event after the unload");
        Equal("[OrvaneSDK] Logging initiated.\n", File.ReadAllText(Path.Combine(data, "heard")), "what the withdrawn handler heard");
    }

    static void RegisterInDomain()
    {
        string heard = (string)AppDomain.CurrentDomain.GetData("heard");
        OrvaneSDK.RegisterForLogs((level, message) => File.AppendAllText(heard, message + "\n"));
    }
}
