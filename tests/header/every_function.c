/* A game's use of the header, compiled as every C and C++ standard by tests/header/header_test.sh:
 * every function called, the level constants compared and used as case labels. */
#include "OrvaneSDK.h"

/* The callback passes the level as a 32-bit integer in every language mode. */
typedef char level_is_32_bits[sizeof(OrvaneLogLevel) == sizeof(int32_t) ? 1 : -1];

static int errors;
static OrvaneLogCallback no_callback; /* null without a literal that one language or another warns about */

static void ORVANE_CALL on_message(OrvaneLogLevel level, const char *message) {
  switch (level) {
  case ORVANE_LOG_INFO:
  case ORVANE_LOG_WARNING:
    break;
  case ORVANE_LOG_ERROR:
    errors += message[0] == '[';
    break;
  }
  errors += level == ORVANE_LOG_ERROR;
#if defined(__cplusplus) && __cplusplus >= 201103L
  errors += level == OrvaneLogLevel::Error; /* the scoped spelling of C++11 on */
#endif
}

int main(void) {
  LogCallback previous_name = on_message;
  char *user = oAuthGetUserUuid();
  char *game = oAuthGetGameId();
  oRegisterForLogs(previous_name);
  oInitialize();
  errors += oAnalyticsInit(game, user) + oAnalyticsGameEnter(game, user) + oAnalyticsGameExit(game, user) +
            oAnalyticsSpecial(game, user, "level=3");
  oFreeText(user);
  oFreeText(game);
  oRegisterForLogs(no_callback);
  return errors + (oGetVersion()[0] == ORVANE_SDK_VERSION_STRING[0] ? 0 : 1);
}
