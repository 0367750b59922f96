// The few members of Unity's assemblies that the binding and the sample use, with Unity's signatures,
// so that mcs compiles them as Unity would: UnityEditor exists only in the Editor's compilation.
using System;

namespace UnityEngine
{
    public class MonoBehaviour { }
    public class GUILayoutOption { }
    public static class GUILayout
    {
        public static bool Button(string text, params GUILayoutOption[] options) { return false; }
    }
    public static class Debug
    {
        public static void Log(object message) { }
        public static void LogWarning(object message) { }
        public static void LogError(object message) { }
        public static void LogException(Exception exception) { }
    }
    public static class Application
    {
        public static bool isEditor { get { return false; } }
        public static event Action quitting { add { } remove { } }
    }
}

namespace AOT
{
    [AttributeUsage(AttributeTargets.Method)]
    public class MonoPInvokeCallbackAttribute : Attribute
    {
        public MonoPInvokeCallbackAttribute(Type type) { }
    }
}

#if UNITY_EDITOR
namespace UnityEditor
{
    public static class AssemblyReloadEvents
    {
        public delegate void AssemblyReloadCallback();
        public static event AssemblyReloadCallback beforeAssemblyReload { add { } remove { } }
    }
}
#endif
