// A cache device for tests: a sparse file that takes direct reads, with the device's size and the
// driver's requests answered here. What happens to it is noted in order.
//
// One at a time: it takes FakeLibc's onIoctl and onRead for as long as it lives.
#pragma once

#include <cstdint>
#include <functional>
#include <string>
#include <vector>

namespace vesk {
// Bytes as two hexadecimal digits each.
std::string Hex(const std::string &bytes);

class FakeCacheDevice {
public:
    explicit FakeCacheDevice(uint64_t bytes);
    ~FakeCacheDevice();
    FakeCacheDevice(const FakeCacheDevice &) = delete;
    FakeCacheDevice &operator=(const FakeCacheDevice &) = delete;

    const std::string &Path() const { return path_; }
    // False where no folder that such a file may lie in does.
    static bool TakesDirectReads();

    // In order:
    //   "bitmap 0180"        set-bitmap request with these bytes; with bitmapFile set,
    //   "bitmap 0180 file 0180"   also what that file holds at that moment
    //   "query"              query-bitmap-set request
    //   "ranges 8+16 0+1"    unpin-ranges request: start sector + number of sectors
    //   "unpin all"
    //   "read 65536+512"     read call on the device: offset + bytes
    std::vector<std::string> events;
    std::string bitmapFile;

    unsigned failingRequest = 0;   // that the driver refuses with EIO
    int bitmapSet = 0;             // its answer to the query
    std::function<void()> onRead;  // called before each read, after it was noted
    std::function<void()> onQuery; // called at the query-bitmap-set request

private:
    int Answer(unsigned long request, void *argument);
    void NoteRead(int fd, long long offset, size_t bytes);
    std::string path_;
    uint64_t bytes_;
};
} // namespace vesk
