// Warming after a pin request: every written extent of every pinned file is read through the cache
// device. Thread rule: called on the worker's thread, without the service lock. Gives way before
// each file and each extent when the volume is pending.
#pragma once

#include "vesk/storage_core.h"
#include "warming/work_result.h"

#include <cstddef>
#include <string>
#include <vector>

namespace vesk {
struct FileToWarm {
    std::string path;       // full path, for messages, which show its first 511 bytes
    FileMappingTable table; // extents on the volume's block device
};

// Done, Failed after an error message, or Interrupted.
WorkResult ReadFilesToCache(const char *mountPath, const std::vector<FileToWarm> &files);

// The same for one file's extents, from the open cache device.
WorkResult ReadMappingRangesToCache(const char *mountPath, int fd, const FileMappingTable &table,
                                    char *buffer, size_t bufferSize);
} // namespace vesk
