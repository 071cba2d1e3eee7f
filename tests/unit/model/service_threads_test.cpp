#include "model/service_look.h"

#include "tests/support/fake_proc.h"
#include "tests/support/look_fixture.h"

#include <unistd.h>

namespace vesk {
namespace {
const pid_t kPid = 100;

class ServiceThreadsTest : public LookTest {
protected:
    void SetUp() override {
        LookTest::SetUp();
        proc_.AddService(kPid, Serving());
    }
    Arguments Serving() const { return {"tool", "-c", "--config-path", config_}; }
    void Put(const FakeThread &thread) const { proc_.AddThread(kPid, thread, Serving()); }
    void PutWorker(const std::string &name, char state) const {
        Put({kPid + 1, name, state, "futex_wait_queue"});
    }
    // "waiting waiting": receiver and worker.
    std::string Look() {
        LookErrors errors;
        const std::vector<Service> services = ServicesLook({}, &errors, proc_.Path());
        if (services.size() != 1) {
            return "no service";
        }
        return ThreadLookText(services[0].receiver).value_or("unknown") + " " +
               ThreadLookText(services[0].worker).value_or("unknown");
    }

    const FakeProc proc_;
    const TempDir folder_;
    const std::string config_ = folder_.Path("pins.json");
};

const char kStored[] = R"({"requestQueue": ["1"], "requests": {"1": {"type": "reloadPinBlocks",
                           "mountPath": "/volume1", "data": null}}})";
} // namespace

TEST_F(ServiceThreadsTest, TheReceiverIsBusyOutsideItsWait) {
    Put({kPid, "veskcachepinfil", 'R', "0", "running"});
    EXPECT_EQ(Look(), "busy waiting");
    Put({kPid, "veskcachepinfil", 'S', "hrtimer_nanosleep", "35 0x7ffe 0x0"});
    EXPECT_EQ(Look(), "busy waiting");
}

TEST_F(ServiceThreadsTest, AReceiverThatStandsStillDoesNotWait) {
    for (const char state : {'T', 't'}) {
        Put({kPid, "veskcachepinfil", state, "do_msgrcv"});
        EXPECT_EQ(Look(), "busy waiting");
    }
}

TEST_F(ServiceThreadsTest, WhereTheKernelNamesNoPlaceTheCallTells) {
#ifdef SYS_msgrcv
    Put({kPid, "veskcachepinfil", 'S', "0", std::to_string(SYS_msgrcv) + " 0x1 0x7ffe"});
    EXPECT_EQ(Look(), "waiting waiting");
    Put({kPid, "veskcachepinfil", 'S', "0", std::to_string(SYS_msgrcv + 1) + " 0x1 0x7ffe"});
#else
    Put({kPid, "veskcachepinfil", 'S', "0", std::to_string(SYS_ipc) + " 0x1000c 0x1"});
    EXPECT_EQ(Look(), "waiting waiting");
    Put({kPid, "veskcachepinfil", 'S', "0", std::to_string(SYS_ipc) + " 0xb 0x1"});
#endif
    EXPECT_EQ(Look(), "busy waiting");
    std::filesystem::remove(proc_.Path("100/task/100/wchan"));
    EXPECT_EQ(Look(), "busy waiting");
    std::filesystem::remove(proc_.Path("100/task/100/syscall"));
    EXPECT_EQ(Look(), "unknown waiting");
}

TEST_F(ServiceThreadsTest, AnEndedReceiverLeavesTheOthersAndTheirCommandLine) {
    for (const char state : {'Z', 'X', 'x'}) {
        proc_.AddThread(kPid, {kPid, "veskcachepinfil", state, "0"}, {});
        EXPECT_EQ(Look(), "ended waiting") << state;
    }
    LookErrors errors;
    EXPECT_EQ(ServicesLook({}, &errors, proc_.Path()).at(0).config, config_);
}

TEST_F(ServiceThreadsTest, AProcessOfWhichNothingLivesIsNoService) {
    for (const pid_t id : {kPid, kPid + 1, kPid + 2}) {
        Put({id, "veskcachepinfil", 'Z'});
    }
    EXPECT_EQ(Look(), "no service");
}

TEST_F(ServiceThreadsTest, AFirstThreadThatCannotBeReadIsNotGuessedFromTheNext) {
    std::filesystem::remove(proc_.Path("100/task/100/stat"));
    EXPECT_EQ(Look(), "no service");
}

TEST_F(ServiceThreadsTest, TheWorkersStateIsThatOfTheStoredRequests) {
    EXPECT_EQ(Look(), "waiting waiting"); // no configuration is an empty one
    WriteWhole(config_, kStored);
    EXPECT_EQ(Look(), "waiting busy");
    WriteWhole(config_, "{}");
    EXPECT_EQ(Look(), "waiting waiting");
    WriteWhole(config_, "{");
    EXPECT_EQ(Look(), "waiting unknown");
    EXPECT_EQ(LookLogTake("none"), "none"); // told by those who ask for the document
}

TEST_F(ServiceThreadsTest, RequestsOfHeldVolumesAreNoWork) {
    WriteWhole(config_, R"({"requestQueue": ["1", "2"],
        "requests": {"1": {"type": "reloadPinBlocks", "mountPath": "/volume1"},
                     "2": {"type": "reloadPinBlocks", "mountPath": "/volume2"}}})");
    LookErrors errors;
    const auto worker = [&](const std::set<std::string> &held) {
        return ServicesLook(held, &errors, proc_.Path()).at(0).worker;
    };
    EXPECT_EQ(worker({"/volume1", "/volume2"}), ThreadLook::Waiting);
    EXPECT_EQ(worker({"/volume1"}), ThreadLook::Busy);
    EXPECT_EQ(worker({"/volume"}), ThreadLook::Busy);
}

TEST_F(ServiceThreadsTest, WithoutAConfigurationTheWorkersStateIsUnknown) {
    proc_.AddThread(kPid, {kPid}, {"tool", "-c"});
    EXPECT_EQ(Look(), "waiting unknown");
}

TEST_F(ServiceThreadsTest, AWorkerThatIsNotThereHasEnded) {
    WriteWhole(config_, kStored);
    PutWorker("other", 'S');
    EXPECT_EQ(Look(), "waiting ended");
    PutWorker("worker2", 'S');
    EXPECT_EQ(Look(), "waiting ended");
    PutWorker("worker", 'Z');
    EXPECT_EQ(Look(), "waiting ended");
}

TEST_F(ServiceThreadsTest, AServiceThatHasJustBegunMayHaveItsWorkerYetToStart) {
    PutWorker("other", 'S');
    const auto ticks = static_cast<uint64_t>(sysconf(_SC_CLK_TCK));
    Put({kPid, "veskcachepinfil", 'S', "do_msgrcv", "", 999 * ticks});
    EXPECT_EQ(Look(), "waiting unknown");
    Put({kPid, "veskcachepinfil", 'S', "do_msgrcv", "", 998 * ticks + 1});
    EXPECT_EQ(Look(), "waiting unknown");
    Put({kPid, "veskcachepinfil", 'S', "do_msgrcv", "", 998 * ticks});
    EXPECT_EQ(Look(), "waiting ended");
    std::filesystem::remove(proc_.Path("uptime"));
    EXPECT_EQ(Look(), "waiting unknown");
}

TEST_F(ServiceThreadsTest, NamesThatLookLikeStatesAreNames) {
    Put({kPid, "x) Z 1 2 3 (y", 'S', "do_msgrcv"});
    PutWorker("other", 'S');
    EXPECT_EQ(Look(), "waiting ended"); // the begin, too, is read behind the last ")"
    Put({kPid, ") R", 'Z', "do_msgrcv"});
    EXPECT_EQ(Look(), "ended ended");
    Put({kPid + 1, "worker) Z", 'S'});
    EXPECT_EQ(Look(), "ended ended");
    Put({kPid + 1, "worker", 'D', "0"});
    EXPECT_EQ(Look(), "ended waiting");
}

TEST_F(ServiceThreadsTest, AThreadWhoseStatusIsCutIsLeftOut) {
    for (const char *stat :
         {"", "101", "101 (worker", "101 worker) S", "101 (worker)", "101 (worker) "}) {
        proc_.Write("100/task/101/stat", stat);
        EXPECT_EQ(Look(), "waiting ended") << stat;
    }
    proc_.Write("100/task/101/stat", "101 (worker) S");
    EXPECT_EQ(Look(), "waiting waiting");
    // Without the time of its begin the first thread counts as old.
    PutWorker("other", 'S');
    proc_.Write("100/task/100/stat", "100 (x) S 4 5");
    EXPECT_EQ(Look(), "waiting ended");
}

TEST(ThreadLookTextTest, EachStateHasItsWord) {
    EXPECT_EQ(ThreadLookText(ThreadLook::Waiting), "waiting");
    EXPECT_EQ(ThreadLookText(ThreadLook::Busy), "busy");
    EXPECT_EQ(ThreadLookText(ThreadLook::Ended), "ended");
    EXPECT_EQ(ThreadLookText(std::nullopt), std::nullopt);
}

// The real folder of processes: this one is no service, and whatever else runs is read without
// harm.
TEST_F(ServiceThreadsTest, TheMachinesOwnProcessesCanBeLookedAt) {
    LookErrors errors;
    for (const Service &service : ServicesLook({}, &errors)) {
        EXPECT_NE(service.pid, getpid());
    }
}
} // namespace vesk
