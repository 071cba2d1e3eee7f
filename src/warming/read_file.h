// Warming one file by its path, from its start. Kept beside the extent reader; no command uses it.
// Thread rule: one caller at a time (verbose lines use the static time text).
#pragma once

#include "warming/work_result.h"

#include <cstdint>

namespace vesk {
// Reads the file up to and including `lastSector` (512-byte sectors) or its end. A file that cannot
// be opened is taken to have gone: Done. Failed after an error message, or Interrupted.
WorkResult FileReadToCache(const char *mountPath, const char *filePath, uint64_t lastSector);
} // namespace vesk
