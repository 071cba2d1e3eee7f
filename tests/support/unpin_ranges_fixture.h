// What the tests of unpinning share: the lists of ranges that the driver is sent, byte for byte.
#pragma once

#include "tests/support/captured_log.h"
#include "tests/support/leak_checked_test.h"
#include "tests/support/messages_of.h"

#include "driver/pin_interface.h"

#include <gtest/gtest.h>
#include <string>
#include <vector>

namespace vesk {
inline const char kDevice[] =
    "/dev/null"; // can be opened; what it is asked is answered by the test

// Range i of a list: no field of it is zero and no two are alike.
inline UnpinInfo Range(uint64_t i) {
    return {0x0101000000000000 + i, 0x0202000000000000 + 3 * i};
}

class UnpinRangesTest : public LeakCheckedTest {
protected:
    void SetUp() override {
        LeakCheckedTest::SetUp();
        FakeLibc::onIoctl = [this](unsigned long request, void *data) {
            EXPECT_EQ(request, 0xFED0UL);
            sent.emplace_back(static_cast<const char *>(data), 16384);
            return static_cast<int>(sent.size()) == refused ? -1 : 0;
        };
    }

    // A whole request: the records of ranges `first` to `last` - 1, then zeros.
    static std::string Request(uint64_t first, uint64_t last) {
        std::string bytes;
        for (uint64_t i = first; i < last; ++i) {
            for (const uint64_t word : {Range(i).startSector, Range(i).numSectors}) {
                for (unsigned shift = 0; shift < 64; shift += 8) {
                    bytes.push_back(static_cast<char>(word >> shift & 0xFF));
                }
            }
        }
        bytes.resize(16384, '\0');
        return bytes;
    }

    void ExpectSent(const std::vector<std::string> &requests) {
        ASSERT_EQ(sent.size(), requests.size());
        for (size_t i = 0; i < requests.size(); ++i) {
            EXPECT_TRUE(sent[i] == requests[i]) << "request " << i;
        }
    }

    std::vector<std::string> sent;
    int refused = 0; // the number of the request that the driver refuses; 0: none
};
} // namespace vesk
