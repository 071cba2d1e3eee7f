// The bitmap file: the raw bitmap bytes, byte 0 first, without header or checksum. It is read and
// written in chunks of 4096 bytes.
//
// It lies where a volume's users may write. What they plant in its place is refused when it is
// opened: a symbolic link, whose target is neither opened nor asked for its size, and a FIFO,
// socket or device, for which nobody waits.
//
// Thread rule: no state; a bitmap belongs to one thread at a time.
#pragma once

#include "bitmap/pin_bitmap.h"

namespace vesk {
// Reads the file into the start of the bitmap's bytes; a file longer than the bitmap fills it
// whole. 0, or -1 after an error message (also for null arguments, and when the file is shorter
// than it was when asked for its size).
int BitmapInitByFile(const char *path, PinBitmap *bitmap);

// Writes all bytes from offset 0; creates the file (0644) if missing and keeps the tail of a longer
// one. 0, or -1 after an error message; then the file may be partly rewritten.
int BitmapWriteToFile(PinBitmap *bitmap, const char *path);
} // namespace vesk
