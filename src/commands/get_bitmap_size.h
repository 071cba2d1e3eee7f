// The size that a volume's bitmap needs.
// Thread rule: for one-shot processes; no lock is taken.
#ifndef COMMANDS_GET_BITMAP_SIZE_H
#define COMMANDS_GET_BITMAP_SIZE_H

#include <cstdint>

// The bitmap size (bytes) that the volume's cache device needs. 0, or -1 after an error message.
int GetBitmapSizeByte(const char *mountPath, uint64_t *size);

#endif
