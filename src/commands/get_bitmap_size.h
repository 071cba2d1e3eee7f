// The size that a volume's bitmap needs.
// Thread rule: for one-shot processes; no lock is taken.
#pragma once

#include <cstdint>

namespace vesk {

// The bitmap size (bytes) that the volume's cache device needs. 0, or -1 after an error message.
int GetBitmapSizeByte(const char *mountPath, uint64_t *size);

} // namespace vesk
