// Launch identity: values that the launcher writes into the command line,
// each as a marker followed directly by its value inside one argument.
#pragma once

#include "core/log_channel.h"
#include "platform/platform.h"

#include <string>
#include <string_view>

namespace orvane {

inline constexpr std::string_view kUserUuidMarker = "--userUuid--";
inline constexpr std::string_view kGameIdMarker = "--gameId--";

// The rest of the first argument that holds `marker`, after the marker, with
// every unit narrowed to its low 8 bits; empty when no argument holds it.
// Argument 0 is searched like the others.
std::string FindValueAfterMarker(const platform::ArgumentList &args, std::string_view marker);

struct IdentityLookup {
  std::string_view marker;
  const char *found;     // Info message when a value is returned
  const char *not_found; // Error message when none is
};
extern const IdentityLookup kUserUuidLookup;
extern const IdentityLookup kGameIdLookup;

// The value after the lookup's marker on this process's command line, in a
// new malloc block owned by the caller, or kEmptyText when there is none.
char *LookUpIdentity(MessageBatch &messages, const IdentityLookup &lookup);

} // namespace orvane
