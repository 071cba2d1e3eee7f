// Loading and saving a bitmap file, against a plain loop over the same chunks.
#include "bench_names.h"

#include "base/log.h"
#include "base/scoped_fd.h"
#include "bitmap/bitmap_file.h"

#include <fcntl.h>
#include <unistd.h>
#include <vector>

namespace vesk {
namespace {
const char kPath[] = "/dev/shm/bitmap";
const int64_t kFullBytes = 32 << 20;
const size_t kChunk = 4096;

void MakeFile(const std::vector<unsigned char> &bytes) {
    const ScopedFd file(open(kPath, O_WRONLY | O_CREAT | O_TRUNC, 0644));
    benchmark::DoNotOptimize(write(file.Get(), bytes.data(), bytes.size()));
}

template <typename Operation> void WithFile(benchmark::State &state, Operation operation) {
    LogToSyslog = 0;
    std::vector<unsigned char> bytes(static_cast<size_t>(state.range(0)));
    MakeFile(bytes);
    PinBitmap bitmap{bytes.data(), static_cast<uint32_t>(bytes.size())};
    for (auto _ : state) {
        operation(&bitmap);
    }
    unlink(kPath);
}

void Load(benchmark::State &state) {
    WithFile(state, [](PinBitmap *bitmap) { BitmapInitByFile(kPath, bitmap); });
}

void LoadPlainly(benchmark::State &state) {
    WithFile(state, [](PinBitmap *bitmap) {
        const ScopedFd file(open(kPath, O_RDONLY));
        for (size_t at = 0; at < bitmap->size; at += kChunk) {
            benchmark::DoNotOptimize(read(file.Get(), bitmap->data + at, kChunk));
        }
    });
}

void Save(benchmark::State &state) {
    WithFile(state, [](PinBitmap *bitmap) { BitmapWriteToFile(bitmap, kPath); });
}

void SavePlainly(benchmark::State &state) {
    WithFile(state, [](PinBitmap *bitmap) {
        const ScopedFd file(open(kPath, O_RDWR | O_CREAT, 0644));
        for (size_t at = 0; at < bitmap->size; at += kChunk) {
            benchmark::DoNotOptimize(write(file.Get(), bitmap->data + at, kChunk));
        }
    });
}

const bool kRegistered = [] {
    BenchPair("bitmap_load", {kFullBytes / 16, kFullBytes / 4, kFullBytes}, Load, LoadPlainly);
    BenchPair("bitmap_save", {kFullBytes / 16, kFullBytes / 4, kFullBytes}, Save, SavePlainly);
    return true;
}();
} // namespace
} // namespace vesk
