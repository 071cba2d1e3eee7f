// Unpinning one sector range of a volume's cache. Neither bitmap file nor configuration is changed.
// Thread rule: for one-shot processes; no lock is taken.
#pragma once

#include <cstdint>

namespace vesk {

// Releases one range (512-byte sectors) of the volume's cache. 0, or -1 after an error message.
int UnpinRange(const char *mountPath, uint64_t startSector, uint64_t numSectors);

} // namespace vesk
