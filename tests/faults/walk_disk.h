// The files of the walk's volume as the kernel tells of them, and random changes of them.
#pragma once

#include <cstdint>
#include <map>
#include <random>
#include <set>
#include <string>

namespace vesk {
using Blocks = std::set<uint64_t>; // of 64 KiB, by their numbers on the device

struct DiskFile {
    uint32_t inode = 0;
    Blocks blocks;

    bool operator==(const DiskFile &other) const {
        return inode == other.inode && blocks == other.blocks;
    }
};

// Regular files by their paths below the volume.
using Disk = std::map<std::string, DiskFile>;

const char kWalkVolume[] = "/volume1";
const char kWalkBitmapFile[] = "veskcachepinfile.bitmap"; // below it

// With all that was written in its place on the device.
Disk DiskLook();

// The first files, of which many share blocks.
void DiskMake(std::mt19937 &random);

// One file is made, grows, shrinks to nothing, goes, gets another name or gives way to another one.
// Tells what was done.
std::string DiskChange(std::mt19937 &random);

// One of the folders, below the volume; the empty text is the volume itself.
std::string DiskFolder(std::mt19937 &random);
bool DiskHasFolder(const std::string &path);

// From 0 to below `count`; the same on every machine.
inline size_t Pick(std::mt19937 &random, size_t count) {
    return static_cast<size_t>(random()) % count;
}
} // namespace vesk
