// The walk over a bitmap after a mount. The device is a sparse file in memory, so a read costs what
// the kernel needs for a zero page and no more.
#include "bench_names.h"

#include "base/log.h"
#include "base/scoped_fd.h"
#include "bitmap/bit_runs.h"
#include "bitmap/pin_bitmap.h"
#include "state/service_state.h"
#include "warming/read_range.h"
#include "warming/reload_blocks.h"

#include <cstdlib>
#include <cstring>
#include <fcntl.h>
#include <random>
#include <unistd.h>
#include <vector>

namespace vesk {
namespace {
const char kDevice[] = "/dev/shm/device";
const int64_t kFullBytes = 32 << 20;

using Bytes = std::vector<unsigned char>;

Bytes Empty(size_t size) {
    return Bytes(size);
}

// One run; its length in bytes has no low 32 bits at full size, so nothing is read.
Bytes Full(size_t size) {
    return Bytes(size, 0xFF);
}

Bytes Alternating(size_t size) {
    return Bytes(size, 0x55);
}

Bytes OnePercent(size_t size) {
    Bytes bytes(size);
    std::mt19937_64 random(1);
    for (size_t i = 0; i < size * 8 / 100; ++i) {
        const uint64_t bit = random() % (size * 8);
        bytes[bit / 8] = static_cast<unsigned char>(bytes[bit / 8] | 1U << bit % 8);
    }
    return bytes;
}

void MakeDevice(size_t bitmapBytes) {
    const ScopedFd file(open(kDevice, O_RDWR | O_CREAT, 0600));
    if (!file.IsOpen() ||
        ftruncate(file.Get(), static_cast<off_t>(bitmapBytes) << kBitmapSizeShift) != 0) {
        abort();
    }
}

template <Bytes (*make)(size_t)> void Walk(benchmark::State &state) {
    LogToSyslog = 0;
    ServiceStateInitialize();
    Bytes bytes = make(static_cast<size_t>(state.range(0)));
    MakeDevice(bytes.size());
    const PinBitmap bitmap{bytes.data(), static_cast<uint32_t>(bytes.size())};
    for (auto _ : state) {
        if (ReloadPinBlocksToCache(&bitmap, kDevice, "/volume1") != WorkResult::Done) {
            abort();
        }
    }
    unlink(kDevice);
}

// Looking at every byte once: for the one that is not there.
template <Bytes (*make)(size_t)> void Scan(benchmark::State &state) {
    const Bytes bytes = make(static_cast<size_t>(state.range(0)));
    for (auto _ : state) {
        benchmark::DoNotOptimize(memchr(bytes.data(), 1, bytes.size()));
    }
}

// The reads of the walk alone, from a list of runs.
template <Bytes (*make)(size_t)> void Reads(benchmark::State &state) {
    const Bytes bytes = make(static_cast<size_t>(state.range(0)));
    MakeDevice(bytes.size());
    const std::vector<BitRun> runs = BitRunsOf(bytes.data(), bytes.size());
    const WarmBuffer buffer = WarmBufferAllocate();
    for (auto _ : state) {
        const ScopedFd file(open(kDevice, O_RDONLY | O_DIRECT));
        for (const BitRun &run : runs) {
            for (uint64_t block = 0; block < run.count; ++block) {
                lseek(file.Get(), static_cast<off_t>((run.first + block) << kBitmapByteShift),
                      SEEK_SET);
                benchmark::DoNotOptimize(read(file.Get(), buffer.get(), kWarmBufferBytes));
            }
        }
    }
    unlink(kDevice);
}

const bool kRegistered = [] {
    BenchPair("reload_empty", {kFullBytes / 16, kFullBytes / 4, kFullBytes}, Walk<Empty>,
              Scan<Empty>);
    BenchPair("reload_full", {kFullBytes}, Walk<Full>, Scan<Full>);
    BenchPair("reload_alternating", {1024, 4096, 16384}, Walk<Alternating>, Reads<Alternating>);
    BenchPair("reload_random", {1 << 16, 1 << 18, 1 << 20}, Walk<OnePercent>, Reads<OnePercent>);
    return true;
}();
} // namespace
} // namespace vesk
