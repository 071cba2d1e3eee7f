// Loading and saving a bitmap file, against a plain loop over the same chunks.
#include "bench_names.h"

#include "base/log.h"
#include "base/scoped_fd.h"
#include "bitmap/bitmap_file.h"

#include <fcntl.h>
#include <unistd.h>
#include <vector>

namespace {

const char path[] = "/dev/shm/bitmap";
const int64_t fullBytes = 32 << 20;
const size_t chunk = 4096;

void MakeFile(const std::vector<unsigned char> &bytes) {
    const ScopedFd file(open(path, O_WRONLY | O_CREAT | O_TRUNC, 0644));
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
    unlink(path);
}

void Load(benchmark::State &state) {
    WithFile(state, [](PinBitmap *bitmap) { BitmapInitByFile(path, bitmap); });
}

void LoadPlainly(benchmark::State &state) {
    WithFile(state, [](PinBitmap *bitmap) {
        const ScopedFd file(open(path, O_RDONLY));
        for (size_t at = 0; at < bitmap->size; at += chunk) {
            benchmark::DoNotOptimize(read(file.Get(), bitmap->data + at, chunk));
        }
    });
}

void Save(benchmark::State &state) {
    WithFile(state, [](PinBitmap *bitmap) { BitmapWriteToFile(bitmap, path); });
}

void SavePlainly(benchmark::State &state) {
    WithFile(state, [](PinBitmap *bitmap) {
        const ScopedFd file(open(path, O_RDWR | O_CREAT, 0644));
        for (size_t at = 0; at < bitmap->size; at += chunk) {
            benchmark::DoNotOptimize(write(file.Get(), bitmap->data + at, chunk));
        }
    });
}

const bool registered = [] {
    BenchPair("bitmap_load", {fullBytes / 16, fullBytes / 4, fullBytes}, Load, LoadPlainly);
    BenchPair("bitmap_save", {fullBytes / 16, fullBytes / 4, fullBytes}, Save, SavePlainly);
    return true;
}();

} // namespace
