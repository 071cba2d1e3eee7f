#include "tests/support/test_device.h"

#include "cachedev/caller_memory.h"

#include <gtest/gtest.h>

#include <filesystem>
#include <fstream>
#include <stdexcept>
#include <unistd.h>

namespace vesk {
namespace {
std::vector<uint64_t> BlocksOf(const std::vector<BlockRun> &runs) {
    std::vector<uint64_t> blocks;
    for (const BlockRun &run : runs) {
        for (uint64_t i = 0; i < run.count; ++i) {
            blocks.push_back(run.first + i);
        }
    }
    return blocks;
}
} // namespace

TestDevice::TestDevice(uint64_t deviceBytes, uint32_t slots)
    : backingPath(folder.Path("backing.img")), ssdPath(folder.Path("ssd.img")) {
    TestMakeFile(backingPath, 0); // for its mode
    WriteWhole(backingPath, TestBytes(0, static_cast<size_t>(deviceBytes)));
    TestMakeFile(ssdPath, slots * kBlockBytes);
    std::string error;
    if (!CacheImagesOpen(backingPath, ssdPath, device.images, error)) {
        throw std::runtime_error(error);
    }
    CacheDeviceStart(device);
}

char TestByte(uint64_t offset) {
    // Differs between blocks as well as within one.
    return static_cast<char>((offset * 31 + offset / kBlockBytes * 7 + offset / 509) & 0xFF);
}

std::string TestBytes(uint64_t offset, size_t size) {
    std::string bytes(size, '\0');
    for (size_t i = 0; i < size; ++i) {
        bytes[i] = TestByte(offset + i);
    }
    return bytes;
}

void TestMakeFile(const std::string &path, uint64_t size) {
    std::ofstream(path, std::ios::binary | std::ios::trunc).close();
    std::filesystem::resize_file(path, size);
    // As images should be, whatever the mask of who runs the tests.
    std::filesystem::permissions(path, std::filesystem::perms(0600));
}

std::string TestRead(CacheDevice &device, uint64_t offset, size_t size) {
    std::string bytes;
    int calls = 0;
    const int64_t result = CacheDeviceRead(device, offset, size, [&](const ImagePieces &pieces) {
        ++calls;
        for (int i = 0; i < pieces.count; ++i) {
            bytes.append(static_cast<const char *>(pieces.parts[i].iov_base),
                         pieces.parts[i].iov_len);
        }
    });
    EXPECT_EQ(calls, result > 0 ? 1 : 0);
    EXPECT_EQ(static_cast<int64_t>(bytes.size()), result);
    return bytes;
}

int64_t TestReadResult(CacheDevice &device, uint64_t offset, size_t size) {
    return CacheDeviceRead(device, offset, size, [](const ImagePieces &) {});
}

void TestTouch(CacheDevice &device, const std::vector<uint64_t> &blocks) {
    for (const uint64_t block : blocks) {
        EXPECT_EQ(TestReadResult(device, block * kBlockBytes, 1), 1) << "block " << block;
    }
}

std::vector<uint8_t> TestBitmap(const CacheDevice &device, const std::vector<uint64_t> &blocks) {
    std::vector<uint8_t> bitmap(static_cast<size_t>(CacheDeviceBitmapBytes(device)));
    for (const uint64_t block : blocks) {
        uint8_t &byte = bitmap.at(static_cast<size_t>(block / 8));
        byte = static_cast<uint8_t>(byte | (1U << (block % 8)));
    }
    return bitmap;
}

std::vector<uint64_t> TestCached(CacheDevice &device) {
    const std::string bits = CacheDeviceCachedBits(device);
    return BlocksOf(BitRunsOf(reinterpret_cast<const unsigned char *>(bits.data()), bits.size()));
}

std::vector<uint64_t> TestPinned(CacheDevice &device) {
    return BlocksOf(CacheDeviceSnapshot(device).pinned);
}

bool TestHasCallerMemory() {
    const char there = 'x';
    char here = 0;
    const Caller self = {getpid(), sizeof(void *) == 4};
    return CallerRead(self, reinterpret_cast<uintptr_t>(&there), &here, 1) == 0 && here == there;
}
} // namespace vesk
