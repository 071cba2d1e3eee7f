// Where a file's data lies on the volume's block device, as the platform's storage-core library
// tells it. Thread rule: no state.
#pragma once

#include "vesk/storage_core.h"

#include <cstdint>
#include <string>

namespace vesk {
// The device object of the file system that holds `path`, owned by the caller (delete it), or null
// after an error message.
FileSystemDevice *CreateFileSystemDeviceByFilePath(const std::string &path);

// Asks once for the extents of the file with this inode number in filePath's folder. 0, and then an
// empty table: nothing of the file has a place on the device; or -1 without a message.
int FileExtentsAsk(FileSystemDevice &device, const std::string &filePath, uint64_t inode,
                   FileMappingTable *table);

// The same for a request that is carried out, which waits about ten seconds for a file whose data
// has no place on the device yet: an empty answer is followed by one sync() of the system and up to
// ten tries a second apart; a failing lookup is not tried again. 0 when the table holds at least
// one extent, else -1 after an error message, and the table is as the last try left it.
int GetMappingTableFromFile(FileMappingTable *table, const char *mountPath,
                            const std::string &filePath, uint32_t inode);
} // namespace vesk
