// Asking the configuration whether a file is pinned.
// Thread rule: for one-shot processes; no lock is taken.
#pragma once

namespace vesk {

enum class PinCheck : int {
    Pinned = 0,
    NotPinned = 1,
    Error = 2, // after an error message
};

// Whether the file's inode number is recorded for the volume of its top directory.
PinCheck CheckFileIsPin(const char *configPath, const char *filePath);

} // namespace vesk
