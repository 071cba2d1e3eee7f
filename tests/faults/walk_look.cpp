#include "tests/faults/walk_look.h"

#include "tests/faults/walk_service.h"
#include "tests/faults/world.h"

#include <algorithm>
#include <json/value.h>

namespace vesk {
namespace {
const char kDeviceState[] = "/run/vesk1/cachedev_1.json";
const size_t kSsdBlocks = 256;

Blocks BitsOf(const std::string &bitmap) {
    Blocks bits;
    for (size_t bit = 0; bit < bitmap.size() * 8; ++bit) {
        if ((static_cast<unsigned char>(bitmap[bit / 8]) >> (bit % 8) & 1) != 0) {
            bits.insert(bit);
        }
    }
    return bits;
}

// Of [first, number] pairs.
Blocks BlocksOfRuns(const Json::Value &runs) {
    Blocks blocks;
    for (const Json::Value &run : runs) {
        for (uint64_t i = 0; i < run[1].asUInt64(); ++i) {
            blocks.insert(run[0].asUInt64() + i);
        }
    }
    return blocks;
}

std::map<uint32_t, std::string> Records() {
    Json::Value root;
    WorldParse(WorldRead(kWalkConfig), root);
    std::map<uint32_t, std::string> records;
    const Json::Value &files = root["volumes"][kWalkVolume]["files"];
    for (auto file = files.begin(); file != files.end(); ++file) {
        records[static_cast<uint32_t>(std::stoul(file.name()))] = file->asString();
    }
    return records;
}

template <typename Set> Set Without(const Set &a, const Set &b) {
    Set rest;
    std::set_difference(a.begin(), a.end(), b.begin(), b.end(), std::inserter(rest, rest.end()));
    return rest;
}

std::string Text(const std::pair<const uint32_t, std::string> &record) {
    return std::to_string(record.first) + ":" + record.second;
}
std::string Text(uint64_t block) {
    return std::to_string(block);
}

// What one has beyond the other.
template <typename Set>
std::string Difference(const char *what, const Set &seen, const Set &expected) {
    if (seen == expected) {
        return "";
    }
    std::string text = std::string(what) + ": ";
    for (const auto &one : Without(seen, expected)) {
        text += " too many " + Text(one);
    }
    for (const auto &one : Without(expected, seen)) {
        text += " missing " + Text(one);
    }
    return text + "\n";
}
} // namespace

std::string WalkCompare(const Pins &pins) {
    Json::Value device;
    WorldParse(WorldRead(kDeviceState), device);
    const Blocks pinned = BlocksOfRuns(device["pinned"]);
    std::string text =
        Difference("records", Records(), pins.records) +
        Difference("bitmap file",
                   BitsOf(WorldRead(std::string(kWalkVolume) + "/" + kWalkBitmapFile)), pins.bits) +
        Difference("driver's bitmap", BlocksOfRuns(device["bitmapBits"]),
                   pins.driverHasBitmap ? pins.bits : Blocks());
    if (device["bitmapSet"].asBool() != pins.driverHasBitmap) {
        text += "the driver has a bitmap, or none, against the model\n";
    }
    if (const Blocks orphans = Without(pinned, pins.bits); !orphans.empty()) {
        text += Difference("pinned on the SSD without a bit", orphans, Blocks());
    }
    // More than there is room for cannot be kept.
    if (const Blocks absent = Without(pins.warm, pinned);
        !absent.empty() && pins.bits.size() <= kSsdBlocks) {
        text += Difference("read and not pinned on the SSD", Blocks(), absent);
    }
    return text;
}
} // namespace vesk
