// system_slots SSD BACKING <BLOCKS
//
// Each line is the number of a block of BACKING. Each of these blocks must be in SSD, in a slot of
// its own; in which one, the device does not tell. Ends with 1 and the block that is not there, or
// where there is no block at all.
#include <cstddef>
#include <cstdio>
#include <fstream>
#include <functional>
#include <iostream>
#include <string>
#include <unordered_map>

namespace {
constexpr size_t kBlockBytes = 65536;

using SlotIndex = std::unordered_multimap<size_t, long long>; // hash of the bytes -> slot number

bool Read(std::ifstream &file, long long number, std::string &bytes) {
    bytes.resize(kBlockBytes);
    file.clear();
    file.seekg(number * static_cast<long long>(kBlockBytes));
    return static_cast<bool>(file.read(bytes.data(), kBlockBytes));
}

SlotIndex SlotsOf(std::ifstream &ssd) {
    SlotIndex slots;
    std::string bytes;
    for (long long slot = 0; Read(ssd, slot, bytes); ++slot) {
        slots.emplace(std::hash<std::string>()(bytes), slot);
    }
    return slots;
}

// Takes a slot with these bytes out of the index; false where there is none.
bool TakeSlot(SlotIndex &slots, std::ifstream &ssd, const std::string &wanted) {
    std::string bytes;
    const auto found = slots.equal_range(std::hash<std::string>()(wanted));
    for (auto slot = found.first; slot != found.second; ++slot) {
        if (Read(ssd, slot->second, bytes) && bytes == wanted) {
            slots.erase(slot);
            return true;
        }
    }
    return false;
}
} // namespace

int main(int argc, char *argv[]) {
    if (argc != 3) {
        fprintf(stderr, "usage: system_slots SSD BACKING <BLOCKS\n");
        return 2;
    }
    std::ifstream ssd(argv[1], std::ios::binary);
    std::ifstream backing(argv[2], std::ios::binary);
    SlotIndex slots = SlotsOf(ssd);
    std::string bytes;
    long long block = 0;
    int lines = 0;
    for (; std::cin >> block; ++lines) {
        if (!Read(backing, block, bytes) || !TakeSlot(slots, ssd, bytes)) {
            printf("not on the SSD: block %lld\n", block);
            return 1;
        }
    }
    return lines > 0 ? 0 : 1;
}
