#include "verbs/plan_figures.h"

#include "bitmap/pin_bitmap.h"

#include <algorithm>
#include <cerrno>

namespace vesk {
namespace {
const uint64_t kBlockBytes = 65536;
const uint64_t kSectorBytes = 512;
// The service takes a request a second, and reads what it pins; this is what a disk gives.
const uint64_t kReadBytesPerSecond = uint64_t{100} << 20;

} // namespace

void SectorCover::AddWhole(uint64_t block) {
    uint64_t &word = wholes_[block >> 6];
    const uint64_t bit = uint64_t{1} << (block & 63);
    if ((word & bit) != 0) {
        return;
    }
    word |= bit;
    sectors_ += kBlockSectors;
    const auto part = parts_.find(block);
    if (part != parts_.end()) {
        sectors_ -= part->second.count();
        parts_.erase(part);
    }
}

void SectorCover::AddPart(uint64_t block, uint64_t first, uint64_t end) {
    const auto whole = wholes_.find(block >> 6);
    if (whole != wholes_.end() && (whole->second >> (block & 63) & 1) != 0) {
        return;
    }
    std::bitset<kBlockSectors> &sectors = parts_[block];
    const size_t before = sectors.count();
    for (uint64_t sector = first; sector < end; ++sector) {
        sectors.set(static_cast<size_t>(sector));
    }
    sectors_ += sectors.count() - before;
}

void SectorCover::Add(uint64_t startSector, uint64_t numSectors) {
    const uint64_t end = startSector + numSectors;
    for (uint64_t at = startSector; at < end;) {
        const uint64_t block = at / kBlockSectors;
        const uint64_t blockStart = block * kBlockSectors;
        const uint64_t partEnd = std::min(end, blockStart + kBlockSectors);
        if (partEnd - at == kBlockSectors) {
            AddWhole(block);
        } else {
            AddPart(block, at - blockStart, partEnd - blockStart);
        }
        at = partEnd;
    }
}

PlanSum::PlanSum(const WorldVolume &world)
    : world_(world),
      planned_(BlockSetOf((world.volume.deviceBytes.value_or(0) >> kBitmapByteShift) + 1)),
      stored_(planned_) {}

bool PlanSum::Add(const std::string &relativePath, const FileLook &look, bool isPinned) {
    const auto inode = static_cast<uint32_t>(look.status.inode);
    if (!inodes_.insert(inode).second) {
        return false;
    }
    ++figures_.files;
    figures_.bytes += look.status.bytes;
    figures_.extents += look.table.entries.size();
    uint64_t sectors = 0;
    for (const FileMappingEntry &entry : look.table.entries) {
        cover_.Add(entry.deviceStartSector, entry.numSectors);
        sectors += entry.numSectors;
    }
    for (const BitRun &run : look.blocks) {
        blocks_ += BlockSetAdd(&planned_, run);
    }
    if (isPinned) {
        return true;
    }
    figures_.sectorsToSend += sectors;
    ++figures_.filesToSend;
    const std::string &mountPath = world_.volume.mountPath;
    const std::string path = mountPath + "/" + relativePath;
    if (figures_.requests == 0 || !RequestFillAdd(&fill_, mountPath, path, inode)) {
        fill_ = {};
        RequestFillAdd(&fill_, mountPath, path, inode);
        ++figures_.requests;
    }
    return true;
}

void PlanSum::AddStored(const FileLook &look) {
    // A file that is gone gets no blocks; of one that cannot be looked at nobody knows.
    isStoredKnown_ = isStoredKnown_ && (FileIsNowhere(look.error) || look.hasExtents);
    for (const BitRun &run : look.blocks) {
        BlockSetAdd(&stored_, run);
    }
}

PlanFigures PlanSum::Total(unsigned reservePercent) const {
    const Volume &volume = world_.volume;
    PlanFigures figures = figures_;
    if (volume.deviceBytes) {
        figures.blocks = blocks_;
        figures.roundingBytes = static_cast<int64_t>(blocks_ * kBlockBytes) -
                                static_cast<int64_t>(cover_.Sectors() * kSectorBytes);
    }
    figures.ssdBlocks = volume.ssdBlocks;
    figures.seconds = world_.known.requests + world_.known.sent + figures.requests +
                      figures_.sectorsToSend * kSectorBytes / kReadBytesPerSecond;
    if (!volume.marked) {
        return figures;
    }
    // Marking ends at the bitmap's end, which is up to seven blocks before the device's.
    const BlockSet &marked = *volume.marked;
    uint64_t blocksNew = 0;
    uint64_t storedNew = 0;
    for (size_t at = 0; at < marked.size(); ++at) {
        const auto newBits = planned_[at] & ~marked[at];
        const auto onlyStored = stored_[at] & ~marked[at] & ~planned_[at];
        blocksNew += static_cast<unsigned>(__builtin_popcount(newBits & 0xFF));
        storedNew += static_cast<unsigned>(__builtin_popcount(onlyStored & 0xFF));
    }
    figures.blocksNew = blocksNew;
    figures.marked = BlockSetCount(marked);
    if (volume.ssdBlocks && isStoredKnown_ && world_.known.isWhole) {
        const uint64_t reserve = (*volume.ssdBlocks * reservePercent + 99) / 100;
        figures.headroom = static_cast<int64_t>(*volume.ssdBlocks) -
                           static_cast<int64_t>(*figures.marked + storedNew + blocksNew + reserve);
        figures.fits = *figures.headroom >= 0;
    }
    return figures;
}
} // namespace vesk
