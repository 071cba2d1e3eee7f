// What the tests of the message queue share: an empty private world and a key file of their own.
#pragma once

#include "tests/support/captured_log.h"
#include "tests/support/fake_libc.h"
#include "tests/support/leak_checked_test.h"
#include "tests/support/messages_of.h"
#include "tests/support/private_world.h"
#include "tests/support/temp_dir.h"

namespace vesk {
class QueueTest : public LeakCheckedTest {
protected:
    void SetUp() override {
        LeakCheckedTest::SetUp();
        SKIP_WITHOUT_PRIVATE_WORLD();
        EmptyPrivateWorld();
    }
    void TearDown() override {
        LeakCheckedTest::TearDown();
        EmptyPrivateWorld();
    }
    const char *KeyFile() const { return keyFile_.c_str(); }
    const TempDir folder_;
    const std::string keyFile_ = folder_.Path("key");
};
} // namespace vesk
