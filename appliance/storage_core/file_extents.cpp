#include "storage_core/file_extents.h"

#include <linux/fs.h>
#include <sys/ioctl.h>

namespace vesk {
namespace {
constexpr uint64_t kSectorBytes = 512;
constexpr uint32_t kBatchExtents = 128; // extents per question; about 7 KiB

constexpr uint32_t kFlagsWithoutPlace = FIEMAP_EXTENT_UNKNOWN | FIEMAP_EXTENT_DELALLOC |
                                        FIEMAP_EXTENT_ENCODED | FIEMAP_EXTENT_NOT_ALIGNED |
                                        FIEMAP_EXTENT_DATA_INLINE | FIEMAP_EXTENT_DATA_TAIL;

bool Ask(int fd, uint64_t start, uint32_t extents, fiemap *answer) {
    answer->fm_start = start;
    answer->fm_length = FIEMAP_MAX_OFFSET - start;
    answer->fm_flags = FIEMAP_FLAG_SYNC;
    answer->fm_mapped_extents = 0;
    answer->fm_reserved = 0;
    answer->fm_extent_count = extents; // 0: they are only counted
    return ioctl(fd, FS_IOC_FIEMAP, answer) == 0;
}

const fiemap_extent &LastOf(const fiemap &answer) {
    return answer.fm_extents[answer.fm_mapped_extents - 1];
}

bool IsLast(const fiemap &answer) {
    return (LastOf(answer).fe_flags & FIEMAP_EXTENT_LAST) != 0;
}

// Room for all extents of a file that has many: growing would take three times the memory while a
// table of hundreds of thousands is copied.
void Reserve(int fd, std::vector<FileMappingEntry> &entries) {
    fiemap count = {};
    if (Ask(fd, 0, 0, &count)) {
        entries.reserve(entries.size() + count.fm_mapped_extents);
    }
}
} // namespace

bool FileExtentConvert(const fiemap_extent &extent, FileMappingEntry &entry) {
    if ((extent.fe_flags & kFlagsWithoutPlace) != 0 || extent.fe_length == 0 ||
        (extent.fe_logical | extent.fe_physical | extent.fe_length) % kSectorBytes != 0) {
        return false;
    }
    entry.fileStartSector = extent.fe_logical / kSectorBytes;
    entry.numSectors = extent.fe_length / kSectorBytes;
    entry.deviceStartSector = extent.fe_physical / kSectorBytes;
    entry.flag = (extent.fe_flags & FIEMAP_EXTENT_UNWRITTEN) != 0 ? 1 : 0;
    return true;
}

bool FileExtentsRead(int fd, std::vector<FileMappingEntry> &entries) {
    // Not cleared: the kernel fills what it says it has filled.
    alignas(fiemap) char buffer[sizeof(fiemap) + kBatchExtents * sizeof(fiemap_extent)];
    auto *batch = reinterpret_cast<fiemap *>(buffer);
    uint64_t start = 0;
    while (true) {
        if (!Ask(fd, start, kBatchExtents, batch)) {
            return false;
        }
        if (batch->fm_mapped_extents == 0) {
            return true;
        }
        if (start == 0 && !IsLast(*batch)) {
            Reserve(fd, entries);
        }
        for (uint32_t i = 0; i < batch->fm_mapped_extents; ++i) {
            FileMappingEntry entry = {};
            if (FileExtentConvert(batch->fm_extents[i], entry)) {
                entries.push_back(entry);
            }
        }
        if (IsLast(*batch)) {
            return true;
        }
        const fiemap_extent &last = LastOf(*batch);
        // Extents that do not lead on would be asked for for ever.
        if (last.fe_logical + last.fe_length <= start) {
            return false;
        }
        start = last.fe_logical + last.fe_length;
    }
}
} // namespace vesk
