// Where a file's data lies on the volume's block device, as the platform's storage-core library
// tells it. Thread rule: no state. A lookup can take about ten seconds: a file whose data has no
// place on the device yet is waited for.
#pragma once

#include "vesk/storage_core.h"

#include <cstdint>
#include <string>

namespace vesk {
// The device object of the file system that holds `path`, owned by the caller (delete it), or null
// after an error message.
FileSystemDevice *CreateFileSystemDeviceByFilePath(const std::string &path);

// Fills `table` with the extents of the file with this inode number in filePath's folder. An empty
// answer is followed by one sync() of the system and up to ten tries a second apart; a failing
// lookup is not tried again. 0 when the table holds at least one extent, else -1 after an error
// message, and the table is as the last try left it.
int GetMappingTableFromFile(FileMappingTable *table, const char *mountPath,
                            const std::string &filePath, uint32_t inode);
} // namespace vesk
