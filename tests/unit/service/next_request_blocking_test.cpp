#include "service/next_request.h"

#include "config/request_queue.h"
#include "state/service_state.h"
#include "tests/support/config_fixture.h"
#include "tests/support/thread_state.h"

#include <atomic>
#include <sys/syscall.h>
#include <thread>
#include <unistd.h>

namespace vesk {
// The selection on a thread of its own; it ends when it has found something.
class NextRequestBlockingTest : public ConfigTest {
protected:
    void SetUp() override {
        ConfigTest::SetUp();
        FakeApplianceOneVolume("/dev/cachedev_0");
    }
    void Start() {
        selection_ = std::thread([this] {
            thread_ = static_cast<pid_t>(syscall(SYS_gettid));
            result_ = ConfigParseAndGetNextAvailableRequest(path_.c_str(), &record_, &num_);
        });
    }
    // Until the selection has begun to wait for the n-th time: it says so before it waits, and it
    // holds the lock from then on until it waits.
    static void AwaitWaiting(CapturedLog &log, int times) {
        while (log.Count("ConfigParseAndGetNextAvailableRequest() [N]: Go to block mode") < times) {
            std::this_thread::yield();
        }
        ServiceLock();
        ServiceUnlock();
    }
    std::thread selection_;
    std::atomic<pid_t> thread_{0};
    RequestRecord record_{};
    std::string num_;
    NextRequest result_ = NextRequest::None;
};

TEST_F(NextRequestBlockingTest, WithoutAFileItWaitsForTheFirstRequest) {
    CapturedLog log(2);
    Start();
    AwaitWaiting(log, 1);
    EXPECT_EQ(Stored(), kNoFile);
    const RequestRecord reload = MakeRecord(kRequestReloadPinBlocks, "/volume1");
    ASSERT_EQ(ConfigAddRequest(path_.c_str(), &reload), 0);
    ServiceSignalRequest();
    selection_.join();
    EXPECT_EQ(result_, NextRequest::Taken);
    EXPECT_EQ(num_, "0");
    EXPECT_EQ(record_.type, kRequestReloadPinBlocks);
    EXPECT_EQ(MessagesOf(log, "ConfigParseAndGetNextAvailableRequest"),
              (Messages{
                  "ConfigParseAndGetNextAvailableRequest() [N]: Config doesn't exist",
                  "ConfigParseAndGetNextAvailableRequest() [N]: Go to block mode",
                  "ConfigParseAndGetNextAvailableRequest() [N]: Wake up",
                  "ConfigParseAndGetNextAvailableRequest() [N]: Get request (request num = 0 type "
                  "= reloadPinBlocks data = ",
              }));
}

TEST_F(NextRequestBlockingTest, ItWaitsForASignalAndForNothingElse) {
    CapturedLog log(2);
    Start();
    AwaitWaiting(log, 1);
    while (!ThreadSleeps(getpid(), thread_)) {
        std::this_thread::yield();
    }
    EXPECT_TRUE(ThreadAwaitsConditionForGood(getpid(), thread_)); // neither a pause nor a time-out
    const RequestRecord reload = MakeRecord(kRequestReloadPinBlocks, "/volume1");
    ASSERT_EQ(ConfigAddRequest(path_.c_str(), &reload), 0);
    ServiceSignalRequest();
    selection_.join();
    EXPECT_EQ(log.Count("ConfigParseAndGetNextAvailableRequest() [N]: Go to block mode"), 1);
    EXPECT_EQ(FakeLibc::sleeps, 0);
}

TEST_F(NextRequestBlockingTest, ASignalWithoutARequestIsWaitedOn) {
    Store("{\"requestQueue\" : []}");
    CapturedLog log(2);
    Start();
    AwaitWaiting(log, 1);
    ServiceSignalRequest();
    AwaitWaiting(log, 2);
    const RequestRecord reload = MakeRecord(kRequestReloadPinBlocks, "/volume1");
    ASSERT_EQ(ConfigAddRequest(path_.c_str(), &reload), 0);
    ServiceSignalRequest();
    selection_.join();
    EXPECT_EQ(result_, NextRequest::Taken);
    EXPECT_EQ(log.Count("ConfigParseAndGetNextAvailableRequest() [N]: Wake up"), 2);
    EXPECT_EQ(log.Count("ConfigParseAndGetNextAvailableRequest() [N]: Config doesn't exist"), 0);
}

TEST_F(NextRequestBlockingTest, AFileThatIsDamagedMeanwhileEndsTheWaitWithAnError) {
    CapturedLog log(2);
    Start();
    AwaitWaiting(log, 1);
    Store("damaged");
    ServiceSignalRequest();
    selection_.join();
    EXPECT_EQ(result_, NextRequest::Error);
}
} // namespace vesk
