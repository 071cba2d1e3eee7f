#include "tests/support/config_fixture.h"

#include "state/service_state.h"
#include "tests/support/private_mounts.h"

#include <chrono>
#include <cstdio>
#include <filesystem>
#include <future>
#include <json/reader.h>
#include <memory>
#include <sstream>
#include <sys/stat.h>
#include <thread>

namespace vesk {
namespace {
// A private /tmp in memory, where making a file durable costs nothing.
const bool kPrivateMounts = UsePrivateMounts();
} // namespace

const char kExampleDocument[] = R"({
   "nextRequestNum" : 3,
   "requestQueue" : [ "1", "2" ],
   "requests" : {
      "1" : {
         "data" : "share/b.bin#5678",
         "mountPath" : "/volume1",
         "type" : "pinFiles"
      },
      "2" : {
         "data" : null,
         "mountPath" : "/volume1",
         "type" : "reloadPinBlocks"
      }
   },
   "volumes" : {
      "/volume1" : {
         "files" : {
            "1234" : "share/a.txt"
         }
      }
   }
}
)";

Json::Value ParseDocument(const std::string &text) {
    Json::Value root;
    std::string errors;
    std::istringstream stream(text);
    EXPECT_TRUE(Json::parseFromStream(Json::CharReaderBuilder(), stream, &root, &errors)) << errors;
    return root;
}

RequestRecord MakeRecord(int type, const std::string &mountPath, const std::string &data) {
    RequestRecord record{};
    record.type = type;
    snprintf(record.mountPath, sizeof(record.mountPath), "%s", mountPath.c_str());
    snprintf(record.data, sizeof(record.data), "%s", data.c_str());
    return record;
}

bool ServiceLockIsFree() {
    auto taken = std::make_shared<std::promise<void>>();
    std::future<void> result = taken->get_future();
    std::thread other([taken] {
        ServiceLock();
        ServiceUnlock();
        taken->set_value();
    });
    if (result.wait_for(std::chrono::seconds(30)) != std::future_status::ready) {
        other.detach(); // it may wait for ever
        return false;
    }
    // Sanitizers open files while a thread ends, which must not look like a leak.
    other.join();
    return true;
}

void ConfigTest::SetUp() {
    LeakCheckedTest::SetUp();
    std::filesystem::create_directory(volume_);
    ASSERT_EQ(ServiceStateInitialize(), 0);
}

void ConfigTest::TearDown() {
    EXPECT_TRUE(ServiceLockIsFree());
    LeakCheckedTest::TearDown();
}

std::string ConfigTest::Stored() const {
    return std::filesystem::exists(path_) ? ReadWhole(path_) : kNoFile;
}

void ConfigTest::ExpectStored(const std::string &document) const {
    EXPECT_EQ(Stored(), ParseDocument(document).toStyledString());
}

std::string ConfigTest::CreateFile(const std::string &relativePath) const {
    const std::string path = volume_ + "/" + relativePath;
    std::filesystem::create_directories(std::filesystem::path(path).parent_path());
    WriteWhole(path, "x");
    struct stat status {};
    EXPECT_EQ(stat(path.c_str(), &status), 0);
    return std::to_string(static_cast<uint32_t>(status.st_ino));
}
} // namespace vesk
