// The storage directories: where they are, whether they exist, and creating
// them.
#pragma once

#include "core/log_channel.h"
#include "platform/platform.h"

namespace orvane {

// The directories of this process, found on first use and then fixed.
const platform::StorageLocation &Storage();
// Points the library at other directories; tests use it to stay out of the
// real home directory.
void SetStorageForTesting(platform::StorageLocation where);

bool DirectoryExists(const char *path);

// Where the logs directory is missing, mends the root and logs directories
// and creates every level still missing, then adds
// "Initialize() - OK." or, when the logs directory is still missing,
// "Initialize() - failed." to `messages`.
void InitializeStorage(MessageBatch &messages);
// Gives the root and logs directories their owner-only mode back, for a log
// that could not be opened though the logs directory is there.
void MendStorage();

} // namespace orvane
