// Which filesystems the mapping is available for.
//
// Thread rule: no state.
#ifndef VESK_STORAGE_CORE_FILE_SYSTEM_DEVICE_H
#define VESK_STORAGE_CORE_FILE_SYSTEM_DEVICE_H

#include "storage_core/mount_table.h"

// Whether the addresses that the kernel gives for a file of this mounted filesystem are offsets on
// its block device.
bool FileSystemIsMappable(const MountEntry &mount);

#endif
