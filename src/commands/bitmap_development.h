// Development and repair: changing a volume's bitmap by sector range, past the service, and the
// size a volume's bitmap needs. Nothing is read into the cache and no record changes.
//
// Thread rule: for one-shot processes; no lock is taken.
#ifndef COMMANDS_BITMAP_DEVELOPMENT_H
#define COMMANDS_BITMAP_DEVELOPMENT_H

#include <cstdint>

// Sets (op 1) or clears (op 0) the range (512-byte sectors), writes the bitmap file and sends the
// bitmap to the driver. 0, or -1 after an error message; what came before the failure stays.
int ModifyBitmap(const char *mountPath, uint64_t startSector, uint64_t numSectors, int op);

int SetBitmap(const char *mountPath, uint64_t startSector, uint64_t numSectors);
int UnsetBitmap(const char *mountPath, uint64_t startSector, uint64_t numSectors);

// The bitmap size (bytes) that the volume's cache device needs. 0, or -1 after an error message.
int GetBitmapSizeByte(const char *mountPath, uint64_t *size);

#endif
