// Reads, writes and requests of any kind to the emulated cache device, against a plain copy of what
// the backing image must hold. A request's argument is an address in a page of the input's bytes or
// one where nothing is.
//
// Input: operations, a byte each and what they need (see Step).
#include "tests/fuzz/fuzz_input.h"

#include "cachedev/pin_requests.h"
#include "tests/support/test_device.h"

#include <algorithm>
#include <cstring>
#include <memory>
#include <unistd.h>

namespace vesk {
namespace {
const uint64_t kBlocks = 10;
const uint64_t kDeviceBytes = kBlocks * kBlockBytes;
const uint32_t kSlots = 3;
const size_t kMemoryBytes = 32768; // holds a range list

const uint32_t kNumbers[] = {kRequestSetBitmap,   kRequestQueryBitmapSet,   kRequestUnpinRanges,
                             kRequestUnpinAll,    kRequestQueryAllUnpinned, kRequestGetSize64Bit,
                             kRequestGetSize32Bit};

struct Fixture {
    TestDevice test{kDeviceBytes, kSlots};
    std::string model = TestBytes(0, kDeviceBytes);
    // Where requests find their records, above 4 GiB or not.
    std::unique_ptr<unsigned char[]> memory{new unsigned char[kMemoryBytes]()};
};

void Read(Fixture &fixture, FuzzInput &input) {
    const uint64_t offset = input.Number(3) & 0xFFFFF; // up to 1 MiB
    const size_t size = static_cast<size_t>(input.Number(3)) % (4 * kBlockBytes);
    std::string got;
    const int64_t result =
        CacheDeviceRead(fixture.test.device, offset, size, [&got](const ImagePieces &pieces) {
            for (int i = 0; i < pieces.count; ++i) {
                got.append(static_cast<const char *>(pieces.parts[i].iov_base),
                           pieces.parts[i].iov_len);
            }
        });
    const std::string expected =
        offset < fixture.model.size() ? fixture.model.substr(offset, size) : "";
    FuzzExpect(result == static_cast<int64_t>(expected.size()), "a read gives what is there");
    FuzzExpect(got == expected, "a read gives the bytes that were written");
}

void Write(Fixture &fixture, FuzzInput &input) {
    const uint64_t offset = input.Number(3) & 0xFFFFF; // up to 1 MiB
    const std::string data(input.Number(2), static_cast<char>(input.Byte()));
    const int64_t result = CacheDeviceWrite(fixture.test.device, offset, data.data(), data.size());
    if (offset < fixture.model.size() && result > 0) {
        fixture.model.replace(offset, static_cast<size_t>(result), data, 0,
                              static_cast<size_t>(result));
    }
}

void Request(Fixture &fixture, FuzzInput &input) {
    const uint8_t choice = input.Byte();
    PinRequest request{};
    request.number = choice < 250 ? kNumbers[choice % std::size(kNumbers)]
                                  : static_cast<uint32_t>(input.Number(4));
    request.caller = {getpid(), (choice & 128) != 0};
    const std::string bytes = input.Text(input.Number(2) % kMemoryBytes);
    memcpy(fixture.memory.get(), bytes.data(), bytes.size());
    const auto address = reinterpret_cast<uint64_t>(fixture.memory.get());
    const uint8_t place = input.Byte();
    request.argument = place < 200 ? address + place : place;
    // A descriptor that points into the memory, as a real one does.
    if ((place & 1) != 0) {
        const uint64_t pointer = address + 64;
        memcpy(fixture.memory.get() + place, &pointer, sizeof(pointer));
        const uint64_t length = CacheDeviceBitmapBytes(fixture.test.device);
        memcpy(fixture.memory.get() + place + sizeof(pointer), &length, sizeof(length));
    }
    uint64_t answer = 0;
    request.data = (place & 2) != 0 ? &answer : nullptr;
    FuzzExpect(PinRequestHandle(fixture.test.device, request) <= 0,
               "a request ends with 0 or errno");
}

void Step(Fixture &fixture, FuzzInput &input) {
    switch (input.Byte() % 4) {
    case 0: Read(fixture, input); break;
    case 1: Write(fixture, input); break;
    default: Request(fixture, input); break;
    }
    const CacheSnapshot snapshot = CacheDeviceSnapshot(fixture.test.device);
    FuzzExpect(snapshot.cachedBlocks <= kSlots && snapshot.pinnedBlocks <= snapshot.cachedBlocks,
               "no more is pinned than cached, nor cached than there is room");
}
} // namespace

extern "C" int LLVMFuzzerTestOneInput(const uint8_t *data, size_t size) {
    // What is in the images decides nothing, so they are kept; the cache begins empty every time.
    static Fixture fixture;
    CacheDeviceUnpinAll(fixture.test.device);
    CacheDeviceStart(fixture.test.device);
    FuzzInput input(data, size);
    for (int steps = 0; steps < 64 && !input.IsEmpty(); ++steps) {
        Step(fixture, input);
    }
    return 0;
}
} // namespace vesk
