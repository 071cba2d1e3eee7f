// Opening a folder of a volume without leaving the volume.
//
// Thread rule: no state; the functions are independent of each other.
#pragma once

#include "base/scoped_fd.h"

#include <fcntl.h>
#include <sys/types.h>

#include <string>

namespace vesk {
// How users' files and folders are opened beside O_NOFOLLOW and O_DIRECTORY: whatever they have
// become meanwhile, opening it waits for nobody and changes nothing.
constexpr int kOpenForReading = O_RDONLY | O_NONBLOCK | O_NOCTTY | O_CLOEXEC;

// Opens a folder, an absolute path, on the filesystem with this device number, for reading. The way
// to the mount point is the administrator's and is followed as usual. From there on the path is the
// users': a symbolic link in it is a failure, and so is a ".." above the mount point. Not open: a
// failure, or the path does not lead through a mount point of this filesystem.
ScopedFd FolderOpenOnDevice(const std::string &path, dev_t device);

// The second half (errno tells why it fails: ELOOP a link, EXDEV another filesystem): a relative
// path below an open folder, the folder itself where it is empty. Other filesystems mounted below
// it are a failure and are asked for nothing: who has mounted one may let every question wait.
ScopedFd FolderOpenBeneath(int folder, const std::string &path);

// The same where the kernel has no call for it: step by step, each folder from the one above.
ScopedFd FolderOpenStepwise(int folder, const std::string &path);

// Opens an entry of an open folder, which must be no symbolic link, for reading. Not open where
// something is mounted on it, as far as the kernel can be told to look.
ScopedFd FileOpenInFolder(int folder, const std::string &name);
} // namespace vesk
