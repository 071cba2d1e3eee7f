// Deleting a volume's bitmap file.
// Thread rule: for one-shot processes; no lock is taken.
#pragma once

namespace vesk {

// Records and driver keep what they have. 0, also when there is no bitmap file, or -1 after an
// error message.
int DeleteBitmap(const char *mountPath);

} // namespace vesk
