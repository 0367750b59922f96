// Exports of the launch identity.
#include "OrvaneSDK.h"
#include "identity/command_line.h"
#include "sdk/empty_text.h"
#include "sdk/export_guard.h"

namespace {

char *LookUp(const orvane::IdentityLookup &lookup) {
  return orvane::RunExport<char *>(const_cast<char *>(orvane::kEmptyText), lookup.not_found,
                                   [&](orvane::MessageBatch &messages) {
                                     return orvane::LookUpIdentity(messages, lookup);
                                   });
}

} // namespace

extern "C" {

ORVANE_API char *ORVANE_CALL oAuthGetUserUuid(void) { return LookUp(orvane::kUserUuidLookup); }

ORVANE_API char *ORVANE_CALL oAuthGetGameId(void) { return LookUp(orvane::kGameIdLookup); }

} // extern "C"
