// Exports of the SDK surface: the log channel, initialisation and the version.
#include "OrvaneSDK.h"
#include "api/export_guard.h"
#include "core/storage.h"

extern "C" {

ORVANE_API void ORVANE_CALL oRegisterForLogs(OrvaneLogCallback callback) {
  const int cancellation = orvane::platform::DisableCancellation();
  orvane::RegisterForLogs(callback);
  orvane::platform::RestoreCancellation(cancellation);
}

ORVANE_API void ORVANE_CALL oInitialize(void) {
  orvane::RunExport(0, "[OrvaneSDK] Initialize() - failed.", [](orvane::MessageBatch &messages) {
    orvane::InitializeStorage(messages);
    return 0;
  });
}

ORVANE_API const char *ORVANE_CALL oGetVersion(void) { return ORVANE_SDK_VERSION_STRING; }

} // extern "C"
