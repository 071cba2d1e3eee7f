#include "cachedev/caller_memory.h"

#include "tests/support/test_device.h"

#include <gtest/gtest.h>

#include <cerrno>
#include <csignal>
#include <cstring>
#include <sys/mman.h>
#include <sys/prctl.h>
#include <sys/wait.h>
#include <unistd.h>

namespace vesk {
namespace {
const Caller kSelf = {getpid(), sizeof(void *) == 4};

uint64_t AddressOf(const void *memory) {
    return reinterpret_cast<uintptr_t>(memory);
}

struct CallerMemoryTest : testing::Test {
    void SetUp() override {
        if (!TestHasCallerMemory()) {
            GTEST_SKIP() << "needs process_vm_readv";
        }
    }
};
} // namespace

TEST_F(CallerMemoryTest, ReadsAndWritesAnotherProcess) {
    // The child has the same layout and its own copy of this variable.
    static volatile int value = 1;
    const pid_t child = fork();
    ASSERT_GE(child, 0);
    if (child == 0) {
        prctl(PR_SET_PDEATHSIG, SIGKILL);
        value = 42;
        while (value == 42) {
            usleep(1000);
        }
        _exit(value);
    }
    const Caller caller = {child, sizeof(void *) == 4};
    const uint64_t address = reinterpret_cast<uintptr_t>(&value);
    int seen = 0;
    while (CallerRead(caller, address, &seen, sizeof seen) == 0 && seen != 42) {
        usleep(1000);
    }
    EXPECT_EQ(seen, 42);
    const int written = 7;
    EXPECT_EQ(CallerWrite(caller, address, &written, sizeof written), 0);
    // It is gone then, but not its number, which could be another's.
    siginfo_t end = {};
    ASSERT_EQ(waitid(P_PID, static_cast<id_t>(child), &end, WEXITED | WNOWAIT), 0);
    EXPECT_EQ(CallerRead(caller, address, &seen, sizeof seen), -EFAULT);
    EXPECT_EQ(CallerWrite(caller, address, &written, sizeof written), -EFAULT);
    int status = 0;
    ASSERT_EQ(waitpid(child, &status, 0), child);
    EXPECT_TRUE(WIFEXITED(status));
    EXPECT_EQ(WEXITSTATUS(status), 7);
    EXPECT_EQ(value, 1);
}

TEST_F(CallerMemoryTest, MemoryThatIsNotThereIsRefused) {
    char byte = 0;
    EXPECT_EQ(CallerRead(kSelf, 0, &byte, 1), -EFAULT);
    EXPECT_EQ(CallerRead(kSelf, 16, &byte, 1), -EFAULT);
    EXPECT_EQ(CallerRead(kSelf, UINT64_MAX, &byte, 1), -EFAULT);
    EXPECT_EQ(CallerWrite(kSelf, 16, &byte, 1), -EFAULT);
    EXPECT_EQ(CallerRead({0, false}, AddressOf(&byte), &byte, 1), -EFAULT);
    EXPECT_EQ(CallerRead({-1, false}, AddressOf(&byte), &byte, 1), -EFAULT);
}

TEST_F(CallerMemoryTest, NothingToReadNeedsNoMemory) {
    EXPECT_EQ(CallerRead(kSelf, 0, nullptr, 0), 0);
    EXPECT_EQ(CallerWrite(kSelf, 16, nullptr, 0), 0);
}

TEST_F(CallerMemoryTest, MemoryThatEndsTooEarlyIsRefused) {
    const auto page = static_cast<size_t>(sysconf(_SC_PAGESIZE));
    void *const pages =
        mmap(nullptr, 2 * page, PROT_READ | PROT_WRITE, MAP_PRIVATE | MAP_ANONYMOUS, -1, 0);
    ASSERT_NE(pages, MAP_FAILED);
    ASSERT_EQ(munmap(static_cast<char *>(pages) + page, page), 0);
    char buffer[32] = {};
    const uint64_t end = AddressOf(pages) + page;
    EXPECT_EQ(CallerRead(kSelf, end - sizeof buffer, buffer, sizeof buffer), 0);
    EXPECT_EQ(CallerRead(kSelf, end - sizeof buffer + 1, buffer, sizeof buffer), -EFAULT);
    EXPECT_EQ(CallerWrite(kSelf, end - 1, buffer, 2), -EFAULT);
    munmap(pages, page);
}

TEST(DescriptorDecodeTest, The64BitForm) {
    unsigned char bytes[kDescriptorBytes64];
    memset(bytes, 0xEE, sizeof bytes); // the padding is not looked at
    const uint64_t address = 0x0123456789ABCDEFULL;
    const uint32_t length = 0x89ABCDEF;
    memcpy(bytes, &address, sizeof address);
    memcpy(bytes + 8, &length, sizeof length);
    EXPECT_EQ(DescriptorBytes(false), sizeof bytes);
    const BitmapDescriptor descriptor = DescriptorDecode(bytes, false);
    EXPECT_EQ(descriptor.address, address);
    EXPECT_EQ(descriptor.length, length);
}

TEST(DescriptorDecodeTest, The32BitForm) {
    unsigned char bytes[kDescriptorBytes32];
    const uint32_t address = 0xF1234567; // its top bit is not a sign
    const uint32_t length = 0x00012345;
    memcpy(bytes, &address, sizeof address);
    memcpy(bytes + 4, &length, sizeof length);
    EXPECT_EQ(DescriptorBytes(true), sizeof bytes);
    const BitmapDescriptor descriptor = DescriptorDecode(bytes, true);
    EXPECT_EQ(descriptor.address, 0xF1234567U);
    EXPECT_EQ(descriptor.length, length);
}
} // namespace vesk
