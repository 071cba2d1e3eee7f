// The kernel's mount table as plain records, and the two ways to find a mount in it.
//
// Thread rule: no state; the functions are independent of each other.
#pragma once

#include <sys/types.h>

#include <string>
#include <vector>

namespace vesk {
// The table of the calling thread's mount namespace. Not the process's: a process whose first
// thread has ended, as the pin service's can, has no readable table of its own.
constexpr char kMountTablePath[] = "/proc/thread-self/mountinfo";

// One mount. Texts are decoded: a blank is a blank, not \040.
struct MountEntry {
    int id = 0;       // number of this mount
    int parentId = 0; // number of the mount that holds the mount point
    dev_t device =
        0; // device number; major 0: the filesystem has no block device of its own number
    std::string root; // path inside the filesystem that is seen at the mount point; "/": all of it
    std::string target;  // mount point, absolute path
    std::string type;    // filesystem type
    std::string source;  // what was mounted, usually a device path
    std::string options; // options of the filesystem, comma-separated
};

// Reads a mount table in the kernel's format, in the kernel's order.
// False: the table cannot be read; `entries` is then empty.
bool MountTableRead(const char *path, std::vector<MountEntry> &entries);

// The first mount of the filesystem with this device number, or null. Automount points are passed
// over. The result points into `entries`.
const MountEntry *MountFindByDevice(const std::vector<MountEntry> &entries, dev_t device);

// The mount that an absolute path without symbolic links lies on; never one that another mount
// hides, at its own mount point or at a folder above it. Null where no mount point is above the
// path. The result points into `entries`.
const MountEntry *MountFindByPath(const std::vector<MountEntry> &entries, const std::string &path);

// The value of one of the mount's filesystem options; empty where it is absent or has no value.
std::string MountOptionValue(const MountEntry &entry, const char *name);

// Whether the addresses that the kernel gives for a file of this mounted filesystem are offsets on
// its block device.
bool FileSystemIsMappable(const MountEntry &mount);
} // namespace vesk
