// Exports of the analytics event log: thin forwarders to the recorder.
#include "OrvaneSDK.h"
#include "analytics/event_recorder.h"
#include "api/export_guard.h"

namespace {

std::int32_t Record(const orvane::EventType &type, const char *game_id, const char *user_id,
                    const char *extra) {
  return orvane::RunExport<std::int32_t>(
      -1, orvane::Message(type, orvane::Outcome::kInternalError), [&](orvane::MessageBatch &messages) {
        return orvane::RecordEvent(messages, game_id, user_id, type, extra);
      });
}

} // namespace

extern "C" {

ORVANE_API int32_t ORVANE_CALL oAnalyticsInit(const char *gameId, const char *userId) {
  return Record(orvane::kInitEvent, gameId, userId, nullptr);
}

ORVANE_API int32_t ORVANE_CALL oAnalyticsGameEnter(const char *gameId, const char *userId) {
  return Record(orvane::kEnterEvent, gameId, userId, nullptr);
}

ORVANE_API int32_t ORVANE_CALL oAnalyticsGameExit(const char *gameId, const char *userId) {
  return Record(orvane::kExitEvent, gameId, userId, nullptr);
}

ORVANE_API int32_t ORVANE_CALL oAnalyticsSpecial(const char *gameId, const char *userId, const char *extra) {
  return Record(orvane::kSpecialEvent, gameId, userId, extra);
}

} // extern "C"
