// Development and repair: changing a volume's bitmap by sector range, past the service. Nothing is
// read into the cache and no record changes.
//
// Thread rule: for one-shot processes; no lock is taken.
#pragma once

#include <cstdint>

namespace vesk {

// Sets (op 1) or clears (op 0) the range (512-byte sectors), writes the bitmap file and sends the
// bitmap to the driver. 0, or -1 after an error message; what came before the failure stays.
int ModifyBitmap(const char *mountPath, uint64_t startSector, uint64_t numSectors, int op);

int SetBitmap(const char *mountPath, uint64_t startSector, uint64_t numSectors);
int UnsetBitmap(const char *mountPath, uint64_t startSector, uint64_t numSectors);

} // namespace vesk
