// Handing the stored bitmap to the cache driver again.
// Thread rule: for one-shot processes; no lock is taken.
#pragma once

namespace vesk {

// Sends the volume's bitmap file to the driver unless the driver holds a bitmap already or there is
// none. A bitmap whose size has changed is written back first. 0, or -1 after an error message.
int SendBitmap(const char *mountPath);

} // namespace vesk
