// A session as a game records it: put this component on a GameObject of the
// game's first scene. INIT when it starts, ENTER with its scene, EXIT when the
// scene (or the game) ends, a SPECIAL event from the button it draws; every
// message of the library goes to the Console at its level.
using Orvane;
using UnityEngine;

namespace Orvane.Sample
{
    public class SessionRecorder : MonoBehaviour
    {
        // The launcher puts the identity on a player's command line; the
        // Editor has none, so it records under these.
        public string editorUserUuid = "00000000-0000-4000-8000-000000000000";
        public string editorGameId = "sample-game";

        string user, game;
        int specials;

        void Start()
        {
            OrvaneSDK.RegisterForLogs(ToConsole);
            Debug.Log("[SessionRecorder] OrvaneSDK " + OrvaneSDK.GetVersion());
            user = OrvaneSDK.GetUserUuid();
            game = OrvaneSDK.GetGameId();
            if (Application.isEditor && user == "") user = editorUserUuid;
            if (Application.isEditor && game == "") game = editorGameId;
            OrvaneSDK.AnalyticsInit(game, user); // a log that has its INIT keeps it, with a Warning
            OrvaneSDK.AnalyticsGameEnter(game, user);
        }

        void OnGUI()
        {
            if (GUILayout.Button("Record SPECIAL"))
                OrvaneSDK.AnalyticsSpecial(game, user, "button " + ++specials);
        }

        // Also when the player quits, and in the Editor when Play mode ends.
        void OnDestroy()
        {
            if (game != null) OrvaneSDK.AnalyticsGameExit(game, user);
        }

        // On the thread of the call that caused the message, before it returns.
        static void ToConsole(LogLevel level, string message)
        {
            if (level == LogLevel.Error) Debug.LogError(message);
            else if (level == LogLevel.Warning) Debug.LogWarning(message);
            else Debug.Log(message);
        }
    }
}
