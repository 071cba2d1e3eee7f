// Block devices: their paths, and what a probe of their superblocks tells.
//
// Thread rule: no state; the functions are independent of each other.
#pragma once

#include "storage_core/mount_table.h"

#include <sys/types.h>

#include <string>

namespace vesk {
// The path of the block device that a mounted filesystem sits on, or an empty text where it has
// none. The mount's source is the path if it is a node of that very device; where it is not
// ("/dev/root", a node missing from this namespace) the device number is looked up. Filesystems
// without a block device number of their own have none, except btrfs, whose source is taken.
std::string BlockDeviceOfMount(const MountEntry &mount);

// The path of the block device with this number, or an empty text.
std::string BlockDeviceByNumber(dev_t device);

// The number of the block device with this path; 0: the path names no block device.
dev_t BlockDeviceNumber(const std::string &devicePath);

// Whether the device with this number begins somewhere inside another one, or within what another
// one translates: a partition, a loop device with an offset or over such a device, a RAID, a cache
// or a logical volume. Sectors counted from its start are others of the device below. `folder` is
// where the kernel describes devices by their numbers; of a device that it does not know nothing
// can be said, which counts as an offset.
bool BlockDeviceHasOffset(dev_t device, const std::string &folder = "/sys/dev/block");

// One value of the superblock found on a block device, by libblkid's name for it ("UUID", "TYPE").
// Of a filesystem that is mounted (`mountType`, the mount table's word) only superblocks of that
// type count: whoever may write files on it can give their blocks the bytes of any other, a RAID's
// at the device's end for instance. Empty type: not mounted, every kind counts.
// Empty: no such value, or the device cannot be read or carries signatures that contradict each
// other.
std::string BlockDeviceProbe(const std::string &devicePath, const char *name,
                             const std::string &mountType);
} // namespace vesk
