// Exports of the launch identity.
#include "OrvaneSDK.h"
#include "api/export_guard.h"
#include "core/empty_text.h"
#include "identity/command_line.h"

#include <cstdlib>

namespace {

char *LookUp(const orvane::IdentityLookup &lookup) {
  return orvane::RunExport<char *>(
      const_cast<char *>(orvane::kEmptyText), lookup.not_found,
      [&](orvane::MessageBatch &messages) { return orvane::LookUpIdentity(messages, lookup); });
}

} // namespace

extern "C" {

ORVANE_API char *ORVANE_CALL oAuthGetUserUuid(void) { return LookUp(orvane::kUserUuidLookup); }

ORVANE_API char *ORVANE_CALL oAuthGetGameId(void) { return LookUp(orvane::kGameIdLookup); }

// A result is a block of this library's C runtime: a host on another runtime
// (an MSVC game, .NET) would hand it to an allocator that does not own it.
// free(nullptr) does nothing, so only the constant needs a test.
ORVANE_API void ORVANE_CALL oFreeText(char *text) {
  if (text != orvane::kEmptyText) std::free(text);
}

} // extern "C"
