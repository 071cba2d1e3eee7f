// A configuration document of any bytes, through adding, selecting, finishing, dropping and
// removing. Whatever fails leaves the file as it was; whatever succeeds leaves a document that can
// be used.
//
// Input: a byte of operations (a bit each), a byte that chooses the request, the document.
#include "tests/fuzz/fuzz_input.h"

#include "base/log.h"
#include "config/config_document.h"
#include "config/pinned_files.h"
#include "config/request_queue.h"
#include "request/request_record.h"
#include "service/next_request.h"
#include "state/service_state.h"
#include "tests/support/fake_appliance.h"

#include <cstring>
#include <json/value.h>

namespace vesk {
namespace {
const char kVolume[] = "/volume1";

bool Prepare() {
    LogToSyslog = 0;
    LogLevel = 0;
    ServiceStateInitialize();
    FakeApplianceOneVolume("/dev/null", kVolume);
    return true;
}

RequestRecord Record(uint8_t choice) {
    RequestRecord record{};
    record.type = choice & 7;
    strcpy(record.mountPath, (choice & 8) != 0 ? "/gone" : kVolume);
    // What a finished request has; an added one names absolute paths.
    strcpy(record.data, (choice & 16) != 0 ? "a#12;b#13" : (choice & 32) != 0 ? "b#0" : "");
    return record;
}

// The file after an operation, compared with the one before.
void Check(const std::string &path, const std::string &before, bool succeeded, const char *what,
           ConfigShape hasShape = ConfigHasShape) {
    if (!succeeded) {
        FuzzExpect(FuzzRead(path) == before, what);
        return;
    }
    Json::Value root;
    FuzzExpect(ConfigReadDocument(path.c_str(), &root, hasShape) == 0, what);
}

bool HasRequests(const std::string &path) {
    const ServiceLockGuard lock;
    Json::Value root;
    int count = 0;
    return ConfigGetJsonAndNumRequest(path.c_str(), &root, &count) == 0 && count > 0;
}

// Selection waits where nothing is queued, which is somebody else's test.
void Select(const std::string &path, RequestRecord *record, std::string *number) {
    if (!HasRequests(path)) {
        return;
    }
    const std::string before = FuzzRead(path);
    RequestRecord taken{};
    const NextRequest result = ConfigParseAndGetNextAvailableRequest(path.c_str(), &taken, number);
    Check(path, before, result != NextRequest::Error, "selection");
    if (result == NextRequest::Taken) {
        FuzzExpect(memchr(taken.mountPath, 0, sizeof(taken.mountPath)) != nullptr &&
                       memchr(taken.data, 0, sizeof(taken.data)) != nullptr,
                   "the texts of a selected request end in their fields");
        *record = taken;
    }
}
} // namespace

extern "C" int LLVMFuzzerTestOneInput(const uint8_t *data, size_t size) {
    static const bool prepared = Prepare();
    FuzzInput input(data, size);
    const uint8_t operations = input.Byte();
    RequestRecord record = Record(input.Byte());
    static const std::string path = FuzzPath("config.json");
    FuzzWrite(path, input.Rest());
    std::string number = "1";
    if (!prepared) {
        return 0;
    }
    if ((operations & 1) != 0) {
        const std::string before = FuzzRead(path);
        Check(path, before, ConfigAddRequest(path.c_str(), &record) == 0, "addition");
    }
    if ((operations & 2) != 0) {
        Select(path, &record, &number);
    }
    if ((operations & 4) != 0) {
        const std::string before = FuzzRead(path);
        Check(path, before, ConfigUpdatedByFinishedRequest(path.c_str(), &record, number) == 0,
              "finish");
    }
    if ((operations & 8) != 0) {
        Select(path, &record, &number);
    }
    if ((operations & 16) != 0) {
        const std::string before = FuzzRead(path);
        Check(path, before, ConfigDropErrorRequest(path.c_str(), &record, number) == 0, "drop");
    }
    if ((operations & 32) != 0) {
        const std::string before = FuzzRead(path);
        Check(path, before, ConfigRemovePinFileVolume(path.c_str(), record.mountPath) == 0,
              "removal of a volume", ConfigHasVolumesShape);
    }
    return 0;
}
} // namespace vesk
