// A bitmap file of any bytes, and ranges set and cleared in it, against a bit-by-bit model.
//
// Input: length of the bitmap (2 bytes), number of ranges, for each a byte (bit 0: set) and two
// numbers of 8 bytes; the file.
#include "tests/fuzz/fuzz_input.h"

#include "base/log.h"
#include "bitmap/bitmap_file.h"
#include "bitmap/pin_bitmap.h"

#include <algorithm>
#include <cstdlib>
#include <vector>

namespace vesk {
namespace {
const uint64_t kBitmapBytesMax = 9000; // three chunks of a file

struct Range {
    bool set;
    uint64_t start; // sectors
    uint64_t count; // sectors
};

PinBitmap *NewBitmap(uint32_t bytes) {
    auto *bitmap = static_cast<PinBitmap *>(malloc(sizeof(PinBitmap)));
    bitmap->data = static_cast<unsigned char *>(calloc(std::max<uint32_t>(bytes, 1), 1));
    bitmap->size = bytes;
    return bitmap;
}

void ApplyToModel(const Range &range, std::vector<char> *bits) {
    const uint64_t last = (range.start + range.count - 1) >> kBitmapSectorShift;
    for (uint64_t bit = range.start >> kBitmapSectorShift; bit <= last && bit < bits->size();
         ++bit) {
        (*bits)[bit] = range.set ? 1 : 0;
    }
}

std::vector<char> BitsOf(const PinBitmap *bitmap) {
    std::vector<char> bits;
    for (size_t i = 0; i < size_t{bitmap->size} * 8; ++i) {
        bits.push_back(static_cast<char>(bitmap->data[i / 8] >> (i % 8) & 1));
    }
    return bits;
}
} // namespace

extern "C" int LLVMFuzzerTestOneInput(const uint8_t *data, size_t size) {
    LogToSyslog = 0;
    LogLevel = 0;
    FuzzInput input(data, size);
    PinBitmap *bitmap = NewBitmap(static_cast<uint32_t>(input.Number(2) % kBitmapBytesMax));
    std::vector<Range> ranges(input.Byte() % 16);
    for (Range &range : ranges) {
        range.set = (input.Byte() & 1) != 0;
        range.start = input.Number(8);
        range.count = input.Number(8);
    }
    const std::string content = input.Rest();
    static const std::string path = FuzzPath("bitmap");
    FuzzWrite(path, content);
    FuzzExpect(BitmapInitByFile(path.c_str(), bitmap) == 0, "a bitmap file is read");
    const size_t loaded = std::min<size_t>(content.size(), bitmap->size);
    FuzzExpect(
        std::equal(content.begin(), content.begin() + static_cast<long>(loaded), bitmap->data,
                   [](char a, unsigned char b) { return static_cast<unsigned char>(a) == b; }),
        "the bitmap has the file's bytes");
    std::vector<char> model = BitsOf(bitmap);
    for (const Range &range : ranges) {
        ApplyToModel(range, &model);
        if (range.set) {
            BitmapSetRange(bitmap, range.start, range.count);
        } else {
            BitmapUnsetRange(bitmap, range.start, range.count);
        }
    }
    FuzzExpect(BitsOf(bitmap) == model, "ranges change their bits and no others");
    FuzzExpect(BitmapWriteToFile(bitmap, path.c_str()) == 0, "a bitmap file is written");
    const std::string written = FuzzRead(path);
    FuzzExpect(
        written.size() == std::max<size_t>(content.size(), bitmap->size) &&
            written.compare(bitmap->size, std::string::npos,
                            content.size() > bitmap->size ? content.substr(bitmap->size) : "") == 0,
        "a longer file keeps its tail");
    BitmapFree(bitmap);
    return 0;
}
} // namespace vesk
