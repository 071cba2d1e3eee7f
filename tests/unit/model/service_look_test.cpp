#include "model/service_look.h"

#include "tests/support/fake_proc.h"
#include "tests/support/look_fixture.h"
#include "tests/support/ordinary_user.h"

#include <sys/stat.h>

namespace vesk {
namespace {
class ServiceLookTest : public LookTest {
protected:
    Arguments Serving() const { return {"tool", "--start-service", "--config-path", config_}; }
    std::vector<Service> Look() {
        errors_ = {};
        return ServicesLook({}, &errors_, proc_.Path());
    }
    // Their numbers.
    std::vector<pid_t> Seen() {
        std::vector<pid_t> pids;
        for (const Service &service : Look()) {
            pids.push_back(service.pid);
        }
        return pids;
    }
    // The configuration of the one service that these arguments make; "-" of a service without one.
    std::string ConfigOf(const Arguments &arguments) {
        proc_.AddService(100, arguments);
        const std::vector<Service> services = Look();
        return services.empty() ? "(no service)" : services[0].config.value_or("-");
    }

    const FakeProc proc_;
    const TempDir folder_;
    const std::string config_ = folder_.Path("pins.json");
    LookErrors errors_;
};

using Pids = std::vector<pid_t>;
} // namespace

TEST_F(ServiceLookTest, AServiceAtRestIsSeenWhole) {
    proc_.AddService(100, Serving());
    const std::vector<Service> services = Look();
    ASSERT_EQ(services.size(), 1U);
    EXPECT_EQ(services[0].pid, 100);
    EXPECT_EQ(services[0].config, config_);
    EXPECT_EQ(services[0].receiver, ThreadLook::Waiting);
    EXPECT_EQ(services[0].worker, ThreadLook::Waiting);
    EXPECT_EQ(services[0].otherNamespaces, Texts{});
    EXPECT_EQ(TextsOf(errors_), Texts{});
}

TEST_F(ServiceLookTest, AllServicesAreSeenInOrderOfTheirNumbers) {
    for (const pid_t pid : {90, 1000, 100}) {
        proc_.AddService(pid, Serving());
    }
    EXPECT_EQ(Seen(), (Pids{90, 100, 1000}));
}

TEST_F(ServiceLookTest, OtherProcessesAreNoServices) {
    proc_.AddService(100, {"tool", "--check-pin", "x", "--config-path", config_});
    proc_.AddService(200, Serving());
    proc_.Write("200/comm", "veskcachepinfi\n");
    proc_.AddService(300, Serving());
    proc_.Write("300/comm", "veskcachepinfil2\n");
    proc_.AddProcess(400); // gone meanwhile: no threads
    proc_.Write("500/comm", "bash\n");
    proc_.Write("version", "6.1");
    proc_.Write("0600/comm", "veskcachepinfil\n");
    EXPECT_EQ(Seen(), Pids{});
    EXPECT_EQ(TextsOf(errors_), Texts{});
    EXPECT_EQ(ServicesLook({}, &errors_, folder_.Path("gone")).size(), 0U);
}

TEST_F(ServiceLookTest, OnlyRootsAndTheCallersOwnServicesAreTrusted) {
    proc_.AddService(100, Serving());
    proc_.AddProcess(100, 4711); // effective user; every other is 4711, too
    EXPECT_EQ(Seen(), Pids{});
    proc_.AddProcess(100, geteuid());
    EXPECT_EQ(Seen(), Pids{100});
    proc_.AddProcess(100, 0);
    EXPECT_EQ(Seen(), Pids{100});
    for (const char *status : {"", "Name:\tveskcachepinfil\n", "Name:\tUid:\t0\t0\n", "\nUid:\t0\n",
                               "Name:\tx\\nUid:\t0\t0\nUid:\t4711\t4711\t0\t0\n"}) {
        proc_.Write("100/status", status);
        EXPECT_EQ(Seen(), Pids{}) << status;
    }
}

TEST_F(ServiceLookTest, TheConfigurationIsNamedInEveryWayThatTheToolTakes) {
    const std::string c = "/etc/c.json";
    EXPECT_EQ(ConfigOf({"tool", "--config-path", c, "--start-service"}), c);
    EXPECT_EQ(ConfigOf({"tool", "--config-path=" + c, "--start-service"}), c);
    EXPECT_EQ(ConfigOf({"tool", "--conf", c, "--start-serv"}), c);
    EXPECT_EQ(ConfigOf({"tool", "--co=" + c, "--start-ser"}), c);
    EXPECT_EQ(ConfigOf({"tool", "-c", "-f", c}), c);
    EXPECT_EQ(ConfigOf({"tool", "-f" + c, "-yc"}), c);
    EXPECT_EQ(ConfigOf({"tool", "-cf", c}), c);
    EXPECT_EQ(ConfigOf({"tool", "-ycf" + c}), c);
    EXPECT_EQ(ConfigOf({"tool", "-c", "--config-path", "/first", "--config-path", c}), c);
    EXPECT_EQ(ConfigOf({"tool", "--config-path", "--start-service", "-c"}), "/srv/--start-service");
}

TEST_F(ServiceLookTest, WhatOnlyLooksLikeAnOptionIsNone) {
    EXPECT_EQ(ConfigOf({"tool", "--start-sector"}), "(no service)");
    EXPECT_EQ(ConfigOf({"tool", "--start-se"}), "(no service)");
    EXPECT_EQ(ConfigOf({"--start-service"}), "(no service)");  // its own name
    EXPECT_EQ(ConfigOf({"tool", "-j", "-c"}), "(no service)"); // a value
    EXPECT_EQ(ConfigOf({"tool", "-jc"}), "(no service)");
    EXPECT_EQ(ConfigOf({"tool", "--", "--start-service"}), "(no service)");
    EXPECT_EQ(ConfigOf({"tool", "", "-", "c"}), "(no service)");
    EXPECT_EQ(ConfigOf({}), "(no service)");
    EXPECT_EQ(ConfigOf({"tool", "-c", "--c", "/x"}), "-");
    EXPECT_EQ(ConfigOf({"tool", "-c", "--config-paths", "/x"}), "-");
    EXPECT_EQ(ConfigOf({"tool", "-c", "--config-path"}), "-");
    EXPECT_EQ(ConfigOf({"tool", "-c", "-f"}), "-");
    EXPECT_EQ(ConfigOf({"tool", "-c", "-w", "-f/x"}), "-");
}

TEST_F(ServiceLookTest, ARelativeConfigurationIsTakenFromTheServicesFolder) {
    EXPECT_EQ(ConfigOf({"tool", "-c", "-f", "etc/c.json"}), "/srv/etc/c.json");
    EXPECT_EQ(ConfigOf({"tool", "-c", "--config-path="}), "/srv/");
    std::filesystem::remove(proc_.Path("100/task/100/cwd"));
    const std::vector<Service> services = Look();
    ASSERT_EQ(services.size(), 1U);
    EXPECT_EQ(services[0].config, std::nullopt);
}

TEST_F(ServiceLookTest, ACommandLineWhoseLastArgumentIsNotEndedIsReadAllTheSame) {
    proc_.AddService(100, {});
    proc_.Write("100/task/100/cmdline", std::string("tool\0-c\0-f/x", 12));
    const std::vector<Service> services = Look();
    ASSERT_EQ(services.size(), 1U);
    EXPECT_EQ(services[0].config, "/x");
}

TEST_F(ServiceLookTest, OtherNamespacesAreNamed) {
    proc_.AddService(100, Serving());
    proc_.Link("100/task/100/ns/ipc", "ipc:[2]");
    EXPECT_EQ(Look().at(0).otherNamespaces, Texts{"ipc"});
    proc_.Link("100/task/100/ns/mnt", "mnt:[2]");
    EXPECT_EQ(Look().at(0).otherNamespaces, (Texts{"ipc", "mnt"}));
    proc_.Link("self/ns/ipc", "ipc:[2]");
    EXPECT_EQ(Look().at(0).otherNamespaces, Texts{"mnt"});
    EXPECT_EQ(TextsOf(errors_), Texts{});
}

TEST_F(ServiceLookTest, NamespacesThatCannotBeToldAreNotTakenForOurs) {
    proc_.AddService(100, Serving());
    std::filesystem::remove(proc_.Path("100/task/100/ns/mnt"));
    EXPECT_EQ(Look().at(0).otherNamespaces, std::nullopt);
    const Texts told{proc_.Path("100") +
                         ": what the service and its threads do cannot be seen, or not yet",
                     "unknown"};
    EXPECT_EQ(TextsOf(errors_), told);
    proc_.Link("100/task/100/ns/mnt", "mnt:[1]");
    std::filesystem::remove(proc_.Path("self/ns/ipc"));
    EXPECT_EQ(Look().at(0).otherNamespaces, std::nullopt);
    EXPECT_EQ(TextsOf(errors_), told);
}

// A folder in a file's place cannot be read, whoever asks.
TEST_F(ServiceLookTest, AProcessThatCannotBeReadMayBeAService) {
    proc_.AddService(100, Serving());
    std::filesystem::create_directories(proc_.Path("200/comm"));
    const Texts told{proc_.Path() + ": not every process can be looked at: Invalid argument",
                     "unknown"};
    EXPECT_EQ(Seen(), Pids{100});
    EXPECT_EQ(TextsOf(errors_), told);
    std::filesystem::remove_all(proc_.Path("200"));
    std::filesystem::remove(proc_.Path("100/status"));
    std::filesystem::create_directories(proc_.Path("100/status"));
    EXPECT_EQ(Seen(), Pids{});
    EXPECT_EQ(TextsOf(errors_), told);
}

TEST_F(ServiceLookTest, AThreadThatCannotBeReadMayBeTheWorker) {
    proc_.AddService(100, Serving());
    std::filesystem::remove(proc_.Path("100/task/101/stat"));
    std::filesystem::create_directories(proc_.Path("100/task/101/stat"));
    EXPECT_EQ(Look().at(0).worker, std::nullopt);
    EXPECT_EQ(
        TextsOf(errors_),
        (Texts{
            proc_.Path("100") + ": what the service and its threads do cannot be seen, or not yet",
            proc_.Path() + ": not every process can be looked at: Invalid argument", "unknown"}));
}

TEST_F(ServiceLookTest, WithoutTheRightToLookThereIsNoAnswer) {
    SKIP_WITHOUT_ROOT();
    proc_.AddService(100, Serving());
    chmod(proc_.Path().c_str(), 0755);
    for (const char *file : {"wchan", "syscall"}) {
        chmod(proc_.Path("100/task/100/" + std::string(file)).c_str(), 0400);
    }
    const OrdinaryUser user;
    const std::vector<Service> services = Look();
    ASSERT_EQ(services.size(), 1U);
    EXPECT_EQ(services[0].receiver, std::nullopt);
    EXPECT_EQ(TextsOf(errors_),
              (Texts{proc_.Path("100") +
                         ": what the service and its threads do cannot be seen, or not yet",
                     "unknown"}));
}
} // namespace vesk
