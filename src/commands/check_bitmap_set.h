// Asking the cache driver whether it holds a bitmap.
// Thread rule: for one-shot processes; no lock is taken.
#ifndef COMMANDS_CHECK_BITMAP_SET_H
#define COMMANDS_CHECK_BITMAP_SET_H

// The driver's bitmap-set state (non-zero: set); 0 also on any failure, after an error message.
int CheckBitmapSet(const char *mountPath);

#endif
