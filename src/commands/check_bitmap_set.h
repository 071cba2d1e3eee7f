// Asking the cache driver whether it holds a bitmap.
// Thread rule: for one-shot processes; no lock is taken.
#pragma once

namespace vesk {

// The driver's bitmap-set state (non-zero: set); 0 also on any failure, after an error message.
int CheckBitmapSet(const char *mountPath);

} // namespace vesk
