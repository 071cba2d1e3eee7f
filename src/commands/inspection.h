// Asking the cache driver or the configuration what is pinned, and handing the stored bitmap to the
// driver again. Thread rule: for one-shot processes; no lock is taken.
#ifndef COMMANDS_INSPECTION_H
#define COMMANDS_INSPECTION_H

// The driver's bitmap-set state (non-zero: set); 0 also on any failure, after an error message.
int CheckBitmapSet(const char *mountPath);

// Sends the volume's bitmap file to the driver unless the driver holds a bitmap already or there is
// none. A bitmap whose size has changed is written back first. 0, or -1 after an error message.
int SendBitmap(const char *mountPath);

const int checkPinPinned = 0;
const int checkPinNotPinned = 1;
const int checkPinError = 2; // after an error message

// Whether the file's inode number is recorded for the volume of its top directory.
int CheckFileIsPin(const char *configPath, const char *filePath);

#endif
