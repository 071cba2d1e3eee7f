// What pinning files of one volume would cost, summed up file by file. Pure.
//
// Memory: the volume's bitmap twice, a word for each inode, and a mask for each block that a file
// covers in part.
#pragma once

#include "model/file_look.h"
#include "model/world.h"
#include "request/request_fill.h"

#include <bitset>
#include <cstdint>
#include <optional>
#include <string>
#include <unordered_map>
#include <unordered_set>

namespace vesk {
// The sectors that files have on the device, each once.
class SectorCover {
public:
    void Add(uint64_t startSector, uint64_t numSectors);
    uint64_t Sectors() const { return sectors_; }

private:
    static constexpr size_t kBlockSectors = 128;
    void AddWhole(uint64_t block);
    void AddPart(uint64_t block, uint64_t first, uint64_t end);
    std::unordered_map<uint64_t, uint64_t> wholes_; // blocks covered wholly, 64 to a word
    std::unordered_map<uint64_t, std::bitset<kBlockSectors>> parts_; // those covered in part
    uint64_t sectors_ = 0;
};

struct PlanFigures {
    uint64_t files = 0;
    uint64_t bytes = 0; // file sizes
    uint64_t extents = 0;
    std::optional<uint64_t> blocks; // absent where the cache device's size is not known
    std::optional<uint64_t> blocksNew;
    std::optional<int64_t> roundingBytes;
    std::optional<uint64_t> ssdBlocks;
    std::optional<uint64_t> marked;
    std::optional<int64_t> headroom; // blocks left on the SSD when all is pinned
    std::optional<bool> fits;
    uint64_t filesToSend = 0;   // what is pinned already is not sent
    uint64_t sectorsToSend = 0; // theirs
    uint64_t requests = 0;
    uint64_t seconds = 0;
};

class PlanSum {
public:
    explicit PlanSum(const WorldVolume &world);

    // False: a file of this inode is there already. `isPinned`: nothing needs to be sent for it.
    bool Add(const std::string &relativePath, const FileLook &look, bool isPinned);

    // The blocks of a file whose pinning is stored already.
    void AddStored(const FileLook &look);

    PlanFigures Total(unsigned reservePercent) const;
    const WorldVolume &World() const { return world_; }

private:
    const WorldVolume &world_;
    BlockSet planned_;
    BlockSet stored_;
    SectorCover cover_;
    std::unordered_set<uint32_t> inodes_;
    RequestFill fill_;
    PlanFigures figures_;
    uint64_t blocks_ = 0;
    bool isStoredKnown_ = true; // the blocks of all stored pins are
};
} // namespace vesk
