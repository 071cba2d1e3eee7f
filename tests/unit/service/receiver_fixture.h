// What the receiver tests share.
#pragma once

#include "tests/support/queue_fixture.h"
#include "tests/support/thread_state.h"

#include "request/message_queue.h"
#include "request/request_record.h"
#include "service/receiver.h"
#include "state/service_state.h"

#include <atomic>
#include <filesystem>
#include <json/reader.h>
#include <pthread.h>
#include <sched.h>
#include <sstream>
#include <sys/stat.h>
#include <sys/syscall.h>
#include <unistd.h>

namespace vesk {
inline Json::Value ParseJson(const std::string &text) {
    Json::Value root;
    std::string errors;
    std::istringstream stream(text);
    EXPECT_TRUE(Json::parseFromStream(Json::CharReaderBuilder(), stream, &root, &errors)) << errors;
    return root;
}

// The receiver on a thread of its own. What is put into the queue before it starts is handled in
// order; it ends at the first record that it refuses.
class ReceiverTest : public QueueTest {
protected:
    void SetUp() override {
        QueueTest::SetUp();
        if (IsSkipped()) {
            return;
        }
        ASSERT_EQ(ServiceStateInitialize(), 0);
        std::filesystem::create_directory(volume_);
        queueId_ = MsgQueueGet(kMessageKeyFile);
        ASSERT_NE(queueId_, -1);
    }
    static void *Receive(void *configPath) {
        receiverThread_ = static_cast<pid_t>(syscall(SYS_gettid));
        GetRequests(static_cast<const char *>(configPath));
    }
    // Until the receiver has logged this and then sleeps: it can only wait for the service lock.
    static void AwaitAtLock(CapturedLog &log, const std::string &message) {
        while (!log.Has(message) || !ThreadSleeps(getpid(), receiverThread_)) {
            sched_yield();
        }
    }
    static inline std::atomic<pid_t> receiverThread_{0};

    void Put(const std::string &text, long type = 1) const {
        ASSERT_TRUE(PutMessage(queueId_, type, text));
    }
    void Put(int type, const std::string &mountPath, const std::string &data = "") const {
        Put(RecordBytes(type, mountPath, data));
    }
    // Puts a record that ends the receiver behind the others.
    void PutEnd() const { Put(kRequestReloadPinBlocks, ""); }

    void RunReceiver() {
        pthread_t thread{};
        ASSERT_EQ(pthread_create(&thread, nullptr, Receive, const_cast<char *>(config_.c_str())),
                  0);
        void *result = &thread;
        ASSERT_EQ(pthread_join(thread, &result), 0);
        EXPECT_EQ(result, nullptr);
    }
    std::string CreateFile(const std::string &name) const {
        WriteWhole(volume_ + "/" + name, "x");
        struct stat status {};
        EXPECT_EQ(stat((volume_ + "/" + name).c_str(), &status), 0);
        return std::to_string(static_cast<uint32_t>(status.st_ino));
    }
    const std::string config_ = folder_.Path("conf.json");
    const std::string volume_ = folder_.Path("volume1");
    int queueId_ = -1;
};
} // namespace vesk
