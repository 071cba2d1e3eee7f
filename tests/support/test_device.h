// A cache device on throw-away images, for tests.
#pragma once

#include "cachedev/cache_device.h"
#include "tests/support/temp_dir.h"

#include <cstddef>
#include <cstdint>
#include <string>
#include <vector>

namespace vesk {
// An opened and started device. The backing image is filled with bytes that depend on their place.
struct TestDevice {
    const TempDir folder;
    CacheDevice device;
    std::string backingPath;
    std::string ssdPath;
    TestDevice(uint64_t deviceBytes, uint32_t slots);
};

// The byte that the backing image of a TestDevice has at `offset` at first.
char TestByte(uint64_t offset);

// `size` such bytes from `offset` on.
std::string TestBytes(uint64_t offset, size_t size);

// Creates a file of this size.
void TestMakeFile(const std::string &path, uint64_t size);

// Reads through the cache; a negative result becomes an empty string and a test failure.
std::string TestRead(CacheDevice &device, uint64_t offset, size_t size);

// The result of a read whose data does not matter.
int64_t TestReadResult(CacheDevice &device, uint64_t offset, size_t size);

// Reads one byte of each of these blocks, in this order.
void TestTouch(CacheDevice &device, const std::vector<uint64_t> &blocks);

// A bitmap of the device's length with these blocks' bits set.
std::vector<uint8_t> TestBitmap(const CacheDevice &device, const std::vector<uint64_t> &blocks);

// The cached blocks and the pinned blocks in ascending order.
std::vector<uint64_t> TestCached(CacheDevice &device);
std::vector<uint64_t> TestPinned(CacheDevice &device);

// Whether this kernel lets a process read another one's memory; an emulated one may not.
bool TestHasCallerMemory();
} // namespace vesk
