// The service lock over the cycles that change the configuration.
#include "config/pinned_files.h"
#include "config/request_queue.h"

#include "tests/support/config_fixture.h"
#include "tests/support/lock_probe.h"

#include <fcntl.h>
#include <functional>

namespace vesk {
class ConfigLockTest : public ConfigTest {
protected:
    // The cycle holds the lock when it reads the document and still when it writes the new one.
    void ExpectLocked(const std::function<int()> &cycle) {
        Store(kExampleDocument);
        LockProbe atRead;
        LockProbe atWrite;
        FakeLibc::onRead = [&](int, long long, size_t) { atRead.Look(); };
        FakeLibc::onOpen = [&](const std::string &, int flags, unsigned) {
            if ((flags & O_CREAT) != 0) {
                atWrite.Look();
            }
        };
        EXPECT_EQ(cycle(), 0);
        FakeLibc::onRead = nullptr;
        FakeLibc::onOpen = nullptr;
        EXPECT_TRUE(atRead.FoundItHeld());
        EXPECT_TRUE(atWrite.FoundItHeld());
        EXPECT_NE(Stored(), kExampleDocument);
    }
};

TEST_F(ConfigLockTest, AddingARequestHoldsIt) {
    const RequestRecord reload = MakeRecord(kRequestReloadPinBlocks, "/volume1");
    ExpectLocked([&] { return ConfigAddRequest(path_.c_str(), &reload); });
}

TEST_F(ConfigLockTest, RecordingAFinishedRequestHoldsIt) {
    const RequestRecord pin = MakeRecord(kRequestPinFiles, "/volume1", "share/b.bin#5678");
    ExpectLocked([&] { return ConfigUpdatedByFinishedRequest(path_.c_str(), &pin, "1"); });
}

TEST_F(ConfigLockTest, DroppingARequestHoldsIt) {
    ExpectLocked([&] { return ConfigDropErrorRequest(path_.c_str(), nullptr, "1"); });
}
} // namespace vesk
