#include "bitmap/file_marking.h"

#include "base/log.h"
#include "space/file_extents.h"

#include <algorithm>
#include <chrono>

namespace vesk {
namespace {
// Times the extent lookup, for measurements on the appliance; off in every build that ships.
const bool kTimeExtentLookup = false;

using Clock = std::chrono::steady_clock;

// Sets the file's blocks or, with a list of ranges, clears them and appends the extents to it.
void ApplyExtents(const FileMappingTable &table, const std::string &filePath, PinBitmap *bitmap,
                  std::vector<UnpinInfo> *cleared, const LogPlace &place) {
    for (const FileMappingEntry &entry : table.entries) {
        LogWrite(LogClass::Debug, place,
                 "File [%s] start sector=%llu num_sector=%llu device_start sector =%llu\n",
                 filePath.c_str(), LogU64(entry.fileStartSector), LogU64(entry.numSectors),
                 LogU64(entry.deviceStartSector));
        if (cleared == nullptr) {
            BitmapSetRange(bitmap, entry.deviceStartSector, entry.numSectors);
        } else {
            cleared->push_back({entry.deviceStartSector, entry.numSectors});
            BitmapUnsetRange(bitmap, entry.deviceStartSector, entry.numSectors);
        }
    }
}
} // namespace

int BitmapAddFile(PinBitmap *bitmap, const char *mountPath, const std::string &filePath,
                  uint32_t inode, FileMappingTable *tableOut) {
    LogVerbose("Add file (%s) start", filePath.c_str());
    FileMappingTable table;
    const Clock::time_point start = Clock::now(); // NOLINT(clang-analyzer-deadcode.DeadStores)
    if (kTimeExtentLookup) {
        LogVerbose("Get mapping of file (%s) start. Time=%s", filePath.c_str(), GetTimeString());
    }
    if (GetMappingTableFromFile(&table, mountPath, filePath, inode) < 0) {
        LogVerbose("Can't get mapping table of file (%s)", filePath.c_str());
        return -1;
    }
    if (kTimeExtentLookup) {
        LogVerbose("Geting mapping of file (%s) finish. Time=%s", filePath.c_str(),
                   GetTimeString());
        LogVerbose("Spend %f seconds", std::chrono::duration<double>(Clock::now() - start).count());
    }
    ApplyExtents(table, filePath, bitmap, nullptr, LogHere());
    // Of a file in many pieces the extents are what takes memory: handed over, not copied.
    tableOut->entries.swap(table.entries);
    LogVerbose("Add file (%s) finish", filePath.c_str());
    return 0;
}

int UnsetBitmapAndAppendUnpinInfos(const char * /*cachePath*/, PinBitmap *bitmap,
                                   const char *mountPath, const std::string &filePath,
                                   uint32_t inode, std::vector<UnpinInfo> *infos) {
    FileMappingTable table;
    if (GetMappingTableFromFile(&table, mountPath, filePath, inode) < 0) {
        LogError("Get mapping table of file (%s) failed", filePath.c_str());
        return -1;
    }
    // Room for all at once, and for further files no more often than doubling needs.
    const size_t needed = infos->size() + table.entries.size();
    if (needed > infos->capacity()) {
        infos->reserve(std::max(needed, 2 * infos->capacity()));
    }
    ApplyExtents(table, filePath, bitmap, infos, LogHere());
    return 0;
}
} // namespace vesk
