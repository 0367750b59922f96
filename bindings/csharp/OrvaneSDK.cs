// OrvaneSDK for C#: the library's exports for Unity and for plain .NET or
// mono, in one file. The native library is found under the name "OrvaneSDK":
// OrvaneSDK.dll on Windows, libOrvaneSDK.so on Linux.
//
//   OrvaneSDK.RegisterForLogs((level, message) => Console.WriteLine(message));
//   string user = OrvaneSDK.GetUserUuid(), game = OrvaneSDK.GetGameId();
//   if (user != "" && game != "") OrvaneSDK.AnalyticsGameEnter(game, user);
//
// Every call may come from any thread. Texts cross as UTF-8 both ways; a null
// text stays null (the library reads it as empty). Messages reach the
// handler on the thread of the call that caused them, before it returns.
//
// A text holding a NUL character ('\0') would end there for the library,
// which would store it cut: an analytics wrapper refuses it whole instead,
// returns -1 and the handler hears (Error,
// "[OrvaneSDK] Analytics <TYPE> - failed. Text holds a NUL character.").
//
// No wrapper throws an exception of its own. Two can still escape any of
// them, from the runtime's loader, on the first call that needs the library:
//   DllNotFoundException        the native library was not found or did not
//                               load (see docs/csharp.md);
//   EntryPointNotFoundException the library lacks an export (one older than
//                               this binding).
// Where the library is looked for: mono and .NET first in the folder of the
// program's assembly (libOrvaneSDK.so on Linux, OrvaneSDK.dll on Windows),
// then where the system loader looks (LD_LIBRARY_PATH and the ld.so cache on
// Linux; the PATH search of LoadLibrary on Windows). Unity: in the Editor,
// the plugin folder of the package or of Assets (Plugins/x86_64/) with the
// import settings of the README; in a player, <Game>_Data/Plugins/x86_64/,
// where the build puts it.
using System;
using System.Runtime.InteropServices;
using System.Text;
using System.Threading;

namespace Orvane
{
    /// <summary>The level of a message from the library.</summary>
    public enum LogLevel { Info = 0, Warning = 1, Error = 2 }

    /// <summary>
    /// The analytics event log, the launch identity and the library's messages. Every call may come
    /// from any thread. None throws, except DllNotFoundException and EntryPointNotFoundException from the
    /// runtime's loader when the native library or an export is missing (see the top of this file).
    /// </summary>
    public static class OrvaneSDK
    {
        /// <summary>
        /// The exports as they are. Texts are zero-terminated UTF-8 byte arrays. An identity result
        /// belongs to the caller, who releases it with <c>oFreeText</c>: the marshaller's own free (what
        /// a <c>string</c> result would get) is another allocator and crashes on the library's blocks.
        /// </summary>
        public static class Native
        {
            const string Library = "OrvaneSDK";

            [UnmanagedFunctionPointer(CallingConvention.Cdecl)]
            public delegate void LogCallback(int level, IntPtr message);

            [DllImport(Library, CallingConvention = CallingConvention.Cdecl)]
            public static extern void oRegisterForLogs(LogCallback callback);
            [DllImport(Library, CallingConvention = CallingConvention.Cdecl)]
            public static extern void oInitialize();
            [DllImport(Library, CallingConvention = CallingConvention.Cdecl)]
            public static extern int oAnalyticsInit(byte[] gameId, byte[] userId);
            [DllImport(Library, CallingConvention = CallingConvention.Cdecl)]
            public static extern int oAnalyticsGameEnter(byte[] gameId, byte[] userId);
            [DllImport(Library, CallingConvention = CallingConvention.Cdecl)]
            public static extern int oAnalyticsGameExit(byte[] gameId, byte[] userId);
            [DllImport(Library, CallingConvention = CallingConvention.Cdecl)]
            public static extern int oAnalyticsSpecial(byte[] gameId, byte[] userId, byte[] extra);
            [DllImport(Library, CallingConvention = CallingConvention.Cdecl)]
            public static extern IntPtr oAuthGetUserUuid();
            [DllImport(Library, CallingConvention = CallingConvention.Cdecl)]
            public static extern IntPtr oAuthGetGameId();
            [DllImport(Library, CallingConvention = CallingConvention.Cdecl)]
            public static extern void oFreeText(IntPtr text);
            [DllImport(Library, CallingConvention = CallingConvention.Cdecl)]
            public static extern IntPtr oGetVersion();
        }

        static volatile Action<LogLevel, string> handler;
        // Kept for the life of the domain, so the library never calls a
        // collected delegate.
        static readonly Native.LogCallback nativeCallback = OnNativeLog;
        static int unloadHooked;

        /// <summary>
        /// Registers the one handler of the process; <c>null</c> unregisters. It at once receives
        /// (Info, "[OrvaneSDK] Logging initiated."), then every message on the thread of the call that
        /// caused it, before that call returns. Returns only when no other thread is still inside the
        /// previous handler. An exception the handler throws is logged and goes no further.
        /// </summary>
        public static void RegisterForLogs(Action<LogLevel, string> newHandler)
        {
            if (newHandler == null)
            {
                Native.oRegisterForLogs(null);
                handler = null;
                return;
            }
            HookUnload();
            handler = newHandler;
            Native.oRegisterForLogs(nativeCallback);
        }

        /// <summary>Creates the library's storage folders when missing. The first event does it too.</summary>
        public static void Initialize() { Native.oInitialize(); }

        /// <summary>Starts the game's log with its INIT record, unless it has one.</summary>
        /// <returns>0 when done, -1 when refused or not written (the messages say why; a text holding a NUL
        /// character is refused).</returns>
        public static int AnalyticsInit(string gameId, string userId)
        {
            if (HoldsNul("INIT", gameId, userId)) return -1;
            return Native.oAnalyticsInit(ToUtf8(gameId), ToUtf8(userId));
        }

        /// <summary>Records that the user entered the game.</summary>
        /// <returns>0 when written, -1 when refused or not written (the messages say why; a text holding a
        /// NUL character is refused).</returns>
        public static int AnalyticsGameEnter(string gameId, string userId)
        {
            if (HoldsNul("ENTER", gameId, userId)) return -1;
            return Native.oAnalyticsGameEnter(ToUtf8(gameId), ToUtf8(userId));
        }

        /// <summary>Records that the user left the game.</summary>
        /// <returns>0 when written, -1 when refused or not written (the messages say why; a text holding a
        /// NUL character is refused).</returns>
        public static int AnalyticsGameExit(string gameId, string userId)
        {
            if (HoldsNul("EXIT", gameId, userId)) return -1;
            return Native.oAnalyticsGameExit(ToUtf8(gameId), ToUtf8(userId));
        }

        /// <summary>Records a game-defined event; <paramref name="extra"/> is stored as given; one
        /// holding a NUL character is refused.</summary>
        /// <returns>0 when written, -1 when refused or not written (the messages say why; a text holding a
        /// NUL character is refused).</returns>
        public static int AnalyticsSpecial(string gameId, string userId, string extra)
        {
            if (HoldsNul("SPECIAL", gameId, userId, extra)) return -1;
            return Native.oAnalyticsSpecial(ToUtf8(gameId), ToUtf8(userId), ToUtf8(extra));
        }

        /// <summary>
        /// The user UUID the launcher put on the command line (after "--userUuid--"); "" when absent.
        /// On Windows the library keeps the low byte of each UTF-16 unit, so only ASCII values decode
        /// unchanged there.
        /// </summary>
        public static string GetUserUuid() { return TakeText(Native.oAuthGetUserUuid()); }

        /// <summary>The game id the launcher put on the command line (after "--gameId--"); "" when absent.</summary>
        public static string GetGameId() { return TakeText(Native.oAuthGetGameId()); }

        /// <summary>The loaded library's version, "MAJOR.MINOR.PATCH".</summary>
        public static string GetVersion() { return FromUtf8(Native.oGetVersion()); } // a constant: not freed

        // IL2CPP hands only static methods marked so to native code.
        [AOT.MonoPInvokeCallback(typeof(Native.LogCallback))]
        static void OnNativeLog(int level, IntPtr message)
        {
            Deliver((LogLevel)level, message);
        }

        // Runs the handler on a message. An exception must not unwind into
        // the library's frames: the call would never count as ended, and
        // withdrawing would hang; so what the handler throws goes no further.
        static void Deliver(LogLevel level, IntPtr native, string text = null)
        {
            try
            {
                Action<LogLevel, string> current = handler;
                if (current != null) current(level, text ?? FromUtf8(native));
            }
            catch (Exception e)
            {
#if UNITY_5_3_OR_NEWER
                UnityEngine.Debug.LogException(e);
#else
                Console.Error.WriteLine(e);
#endif
            }
        }

        // The native library stays loaded when a script domain goes (Unity
        // reloads scripts in the Editor; a host may unload an AppDomain):
        // the handler is withdrawn first, or the library would call code
        // that no longer exists.
        static void HookUnload()
        {
            if (Interlocked.Exchange(ref unloadHooked, 1) != 0) return;
            AppDomain.CurrentDomain.DomainUnload += delegate { Withdraw(); };
#if UNITY_EDITOR
            UnityEditor.AssemblyReloadEvents.beforeAssemblyReload += Withdraw;
#endif
#if UNITY_5_3_OR_NEWER
            UnityEngine.Application.quitting += Withdraw;
#endif
        }

        static void Withdraw()
        {
            if (handler != null) RegisterForLogs(null);
        }

        // True, with the Error message sent, when a text holds a NUL character.
        static bool HoldsNul(string type, params string[] texts)
        {
            foreach (string text in texts)
            {
                if (text == null || text.IndexOf('\0') < 0) continue;
                Deliver(LogLevel.Error, IntPtr.Zero,
                    "[OrvaneSDK] Analytics " + type + " - failed. Text holds a NUL character.");
                return true;
            }
            return false;
        }

        static byte[] ToUtf8(string text)
        {
            if (text == null) return null;
            byte[] bytes = new byte[Encoding.UTF8.GetByteCount(text) + 1];
            Encoding.UTF8.GetBytes(text, 0, text.Length, bytes, 0);
            return bytes;
        }

        // Copied at once: a message lives only during the callback.
        static string FromUtf8(IntPtr text)
        {
            int length = 0;
            while (Marshal.ReadByte(text, length) != 0) ++length;
            byte[] bytes = new byte[length];
            Marshal.Copy(text, bytes, 0, length);
            return Encoding.UTF8.GetString(bytes);
        }

        static string TakeText(IntPtr result)
        {
            try { return FromUtf8(result); }
            finally { Native.oFreeText(result); }
        }
    }
}

#if !UNITY_5_3_OR_NEWER
namespace AOT
{
    // Unity defines this attribute; elsewhere the callback's marker is ours.
    [AttributeUsage(AttributeTargets.Method)]
    sealed class MonoPInvokeCallbackAttribute : Attribute
    {
        public MonoPInvokeCallbackAttribute(Type type) { }
    }
}
#endif
