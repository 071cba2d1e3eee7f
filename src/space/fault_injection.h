// A switch for field tests: makes the extent lookup of one file fail.
//
// The control file /tmp/veskcachepinfiletool.debug holds the full path of the file whose lookups
// shall fail, with or without one line feed behind it. Without the file nothing fails.
//
// Thread rule: no state.
#pragma once

#include <string>

namespace vesk {
// 1 when the lookup of this file (full path, compared whole) shall fail, else 0. A control file
// that is not a regular file counts as absent, and opening it never blocks; of one that cannot be
// read there is an error message.
int FileSimulateGetMappingFailed(const std::string &filePath);
} // namespace vesk
