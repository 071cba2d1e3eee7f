#include "service/next_request.h"

#include "state/service_state.h"
#include "tests/support/config_fixture.h"
#include "tests/support/lock_probe.h"

#include <fcntl.h>
#include <sys/stat.h>

namespace vesk {
namespace {
const char kPinA[] = R"({"type" : "pinFiles", "mountPath" : "/volume1", "data" : "a#1"})";
} // namespace

class NextRequestTest : public ConfigTest {
protected:
    void SetUp() override {
        ConfigTest::SetUp();
        FakeApplianceOneVolume("/dev/cachedev_0");
    }
    NextRequest Next(const PutOffRequests &putOff = {}) {
        record_ = RequestRecord{};
        num_ = "old";
        return ConfigParseAndGetNextAvailableRequest(path_.c_str(), &record_, &num_, putOff);
    }
    // Two queued requests, numbers 0 and 1, and records of both volumes.
    void StoreTwo(const std::string &first, const std::string &second) {
        Store(R"({"nextRequestNum" : 2, "requestQueue" : ["0", "1"], "requests" : {"0" : )" +
              first + ", \"1\" : " + second +
              R"(}, "volumes" : {"/volume1" : {"files" : {"7" : "x"}},
                                 "/volume9" : {"files" : {"8" : "y"}}}})");
    }
    static void SetPending(const char *path) {
        char text[512];
        snprintf(text, sizeof(text), "%s", path);
        ASSERT_EQ(ServiceAddPendingSpaceAtomic(text), 0);
    }
    RequestRecord record_{};
    std::string num_;
};

TEST_F(NextRequestTest, TheOldestRequestIsTakenAndStaysInTheFile) {
    Store(kExampleDocument);
    CapturedLog log;
    EXPECT_EQ(Next(), NextRequest::Taken);
    EXPECT_EQ(num_, "1");
    EXPECT_EQ(record_.type, kRequestPinFiles);
    EXPECT_STREQ(record_.mountPath, "/volume1");
    EXPECT_STREQ(record_.data, "share/b.bin#5678");
    EXPECT_EQ(log.Messages(), Messages{});
    EXPECT_EQ(Stored(), kExampleDocument);
}

TEST_F(NextRequestTest, RequestsOfAVolumeThatIsPutOffArePassedOverAndKeepTheirPlace) {
    FakeAppliance::spaces.push_back({"/dev/space9", "/volume9", "uuid-9"});
    FakeAppliance::caches.push_back({"uuid-9", "/dev/ssd9", "/dev/cachedev_9"});
    StoreTwo(kPinA, R"({"type" : "reloadPinBlocks", "mountPath" : "/volume9", "data" : null})");
    const std::string before = Stored();
    CapturedLog log;
    EXPECT_EQ(Next({{}, {"/volume1"}}), NextRequest::Taken);
    EXPECT_EQ(num_, "1");
    EXPECT_STREQ(record_.mountPath, "/volume9");
    EXPECT_EQ(Next({{}, {"/volume9"}}), NextRequest::Taken);
    EXPECT_EQ(num_, "0");
    EXPECT_EQ(Next({{}, {"/volume1", "/volume9"}}), NextRequest::None);
    EXPECT_EQ(log.Messages(), Messages{});
    EXPECT_EQ(Stored(), before);
}

TEST_F(NextRequestTest, ATakenRequestIsLoggedWithAnOpenParenthesis) {
    Store(kExampleDocument);
    CapturedLog log(2);
    EXPECT_EQ(Next(), NextRequest::Taken);
    EXPECT_EQ(MessagesOf(log, "ConfigParseAndGetNextAvailableRequest"),
              Messages{"ConfigParseAndGetNextAvailableRequest() [N]: Get request (request num = 1 "
                       "type = pinFiles data = share/b.bin#5678"});
}

TEST_F(NextRequestTest, NullDataGivesTheEmptyText) {
    StoreTwo(R"({"type" : "reloadPinBlocks", "mountPath" : "/volume1", "data" : null})", kPinA);
    EXPECT_EQ(Next(), NextRequest::Taken);
    EXPECT_EQ(num_, "0");
    EXPECT_EQ(record_.type, kRequestReloadPinBlocks);
    EXPECT_STREQ(record_.data, "");
}

TEST_F(NextRequestTest, ARequestOfAPendingSpaceIsPassedOverAndKeepsItsPlace) {
    FakeAppliance::spaces.push_back({"/dev/space2", "/volume2", "uuid-2"});
    FakeAppliance::caches.push_back({"uuid-2", "/dev/ssd2", "/dev/cachedev_1"});
    StoreTwo(kPinA, R"({"type" : "unpinFiles", "mountPath" : "/volume2", "data" : "b#2"})");
    const std::string before = Stored();
    SetPending("/volume1");
    CapturedLog log(2);
    EXPECT_EQ(Next(), NextRequest::Taken);
    EXPECT_EQ(num_, "1");
    EXPECT_EQ(record_.type, kRequestUnpinFiles);
    EXPECT_STREQ(record_.mountPath, "/volume2");
    EXPECT_EQ(MessagesOf(log, "ConfigParseAndGetNextAvailableRequest"),
              (Messages{
                  "ConfigParseAndGetNextAvailableRequest() [N]: Request num (0) volume (/volume1) "
                  "is pending",
                  "ConfigParseAndGetNextAvailableRequest() [N]: Get request (request num = 1 type "
                  "= unpinFiles data = b#2",
              }));
    EXPECT_EQ(Stored(), before);
}

TEST_F(NextRequestTest, WithOnlyPendingRequestsTheAnswerIsNoneAtOnce) {
    StoreTwo(kPinA, kPinA);
    SetPending("/volume1");
    CapturedLog log;
    EXPECT_EQ(Next(), NextRequest::None);
    EXPECT_EQ(num_, "old");
    EXPECT_EQ(record_.type, 0);
    EXPECT_EQ(log.Messages(), Messages{});
}

TEST_F(NextRequestTest, APendingSpaceIsComparedExactly) {
    StoreTwo(kPinA, kPinA);
    SetPending("/volume1/");
    EXPECT_EQ(Next(), NextRequest::Taken);
}

TEST_F(NextRequestTest, ARequestOfAVolumeWithoutCacheIsDroppedWithItsRecords) {
    StoreTwo(R"({"type" : "pinFiles", "mountPath" : "/volume9", "data" : "b#2"})", kPinA);
    FakeAppliance::spaces.push_back({"/dev/space9", "/volume9", "uuid-9"});
    CapturedLog log;
    EXPECT_EQ(Next(), NextRequest::Taken);
    EXPECT_EQ(num_, "1");
    EXPECT_EQ(log.Messages(), Messages{"Drop requests finish"});
    EXPECT_EQ(
        StoredDocument(),
        ParseDocument(R"({"nextRequestNum" : 2, "requestQueue" : ["1"], "requests" : {"1" : )" +
                      std::string(kPinA) +
                      R"(}, "volumes" : {"/volume1" : {"files" : {"7" : "x"}}}})"));
}

TEST_F(NextRequestTest, ADropIsLoggedAtLevel2) {
    StoreTwo(R"({"type" : "pinFiles", "mountPath" : "/volume9", "data" : "b#2"})", kPinA);
    FakeAppliance::spaces.push_back({"/dev/space9", "/volume9", "uuid-9"});
    CapturedLog log(2);
    EXPECT_EQ(Next(), NextRequest::Taken);
    EXPECT_EQ(
        MessagesOf(log, "ConfigParseAndGetNextAvailableRequest"),
        (Messages{
            "ConfigParseAndGetNextAvailableRequest() [N]: Delete the volume (/volume9) from config",
            "ConfigParseAndGetNextAvailableRequest() [N]: Get request (request num = 1 type = "
            "pinFiles data = a#1",
            "ConfigParseAndGetNextAvailableRequest() [N]: Remove request (0)",
            "ConfigParseAndGetNextAvailableRequest() [N] : Drop requests finish",
        }));
}

TEST_F(NextRequestTest, WhenAllAreDroppedTheAnswerIsNone) {
    FakeAppliance::caches[0].supportPin = 0;
    StoreTwo(kPinA, kPinA);
    CapturedLog log;
    EXPECT_EQ(Next(), NextRequest::None);
    EXPECT_EQ(log.Messages(), Messages{"Drop requests finish"});
    EXPECT_EQ(StoredDocument(), ParseDocument(R"({"nextRequestNum" : 2, "requestQueue" : null,
        "requests" : {}, "volumes" : {"/volume9" : {"files" : {"8" : "y"}}}})"));
}

TEST_F(NextRequestTest, ARunnableRequestEndsTheWalkBeforeALaterDrop) {
    StoreTwo(kPinA, R"({"type" : "pinFiles", "mountPath" : "/volume9", "data" : "b#2"})");
    const std::string before = Stored();
    EXPECT_EQ(Next(), NextRequest::Taken);
    EXPECT_EQ(num_, "0");
    EXPECT_EQ(Stored(), before);
}

TEST_F(NextRequestTest, ADropLeavesTheVolumesOwnPendingStateAlone) {
    FakeAppliance::caches.clear();
    StoreTwo(kPinA, kPinA);
    SetPending("/volume1");
    EXPECT_EQ(Next(), NextRequest::None);
    EXPECT_TRUE(ServiceIsPendingSpace("/volume1"));
}

TEST_F(NextRequestTest, ADropTakesTheEmptyPathOutOfThePendingList) {
    FakeAppliance::caches.clear();
    StoreTwo(kPinA, kPinA);
    SetPending("");
    SetPending("/volume1");
    CapturedLog log(2);
    EXPECT_EQ(Next(), NextRequest::None);
    EXPECT_FALSE(ServiceIsPendingSpace(""));
    EXPECT_TRUE(ServiceIsPendingSpace("/volume1"));
    EXPECT_EQ(log.Count("ConfigParseAndGetNextAvailableRequest() [N]: Remove space (/volume1) from "
                        "pending list"),
              1);
}

TEST_F(NextRequestTest, AQueueEntryWithoutItsRequestIsAnError) {
    Store(R"({"requestQueue" : ["4", "5"], "requests" : {"5" : {"type" : "ack"}}})");
    const std::string before = Stored();
    CapturedLog log;
    EXPECT_EQ(Next(), NextRequest::Error);
    EXPECT_EQ(Next(), NextRequest::Error); // for good
    EXPECT_EQ(log.Messages(), (Messages{
                                  "Can't find request number (4) in config",
                                  "Can't find request number (4) in config",
                              }));
    EXPECT_EQ(Stored(), before);
}

TEST_F(NextRequestTest, AnErrorBehindADropWritesNothing) {
    StoreTwo(R"({"type" : "pinFiles", "mountPath" : "/volume9", "data" : "b#2"})",
             R"({"type" : "what", "mountPath" : "/volume1"})");
    const std::string before = Stored();
    FakeAppliance::spaces.push_back({"/dev/space9", "/volume9", "uuid-9"});
    CapturedLog log;
    EXPECT_EQ(Next(), NextRequest::Error);
    EXPECT_EQ(log.Messages(), Messages{"Can't get correct request type"});
    EXPECT_EQ(Stored(), before);
}

TEST_F(NextRequestTest, AnUnknownTypeIsAnError) {
    for (const char *type : {"\"what\"", "\"unknown\"", "\"\"", "null", "1", "\"PinFiles\""}) {
        StoreTwo(std::string(R"({"mountPath" : "/volume1", "data" : "a#1", "type" : )") + type +
                     "}",
                 kPinA);
        CapturedLog log;
        EXPECT_EQ(Next(), NextRequest::Error) << type;
        EXPECT_EQ(log.Messages(), Messages{"Can't get correct request type"}) << type;
    }
}

TEST_F(NextRequestTest, ADamagedFileIsAnError) {
    Store("{");
    CapturedLog log(2);
    EXPECT_EQ(Next(), NextRequest::Error);
    EXPECT_EQ(
        MessagesOf(log, "ConfigParseAndGetNextAvailableRequest"),
        Messages{"ConfigParseAndGetNextAvailableRequest() [N] : ***** Get request from config "
                 "file (" +
                 path_ + ") error"});
    EXPECT_EQ(Stored(), "{");
}

TEST_F(NextRequestTest, ADropOfANumberThatStandsTwiceIsAnError) {
    FakeAppliance::caches.clear();
    Store(std::string(R"({"requestQueue" : ["0", "0"], "requests" : {"0" : )") + kPinA + "}}");
    const std::string before = Stored();
    CapturedLog log;
    EXPECT_EQ(Next(), NextRequest::Error);
    EXPECT_EQ(log.Messages(), (Messages{
                                  "Remove string error, count =2",
                                  "Can't remove request num (0) from request queue",
                                  "Can't remove request (0)",
                              }));
    EXPECT_EQ(Stored(), before);
}

TEST_F(NextRequestTest, ADropThatCannotBeWrittenIsAnError) {
    FakeAppliance::caches.clear();
    StoreTwo(kPinA, kPinA);
    const std::string before = Stored();
    chmod(folder_.Path().c_str(), 0755);
    chmod(path_.c_str(), 0444);
    CapturedLog log;
    {
        const OrdinaryUser user;
        EXPECT_EQ(Next(), NextRequest::Error);
    }
    EXPECT_EQ(log.Messages(), (Messages{
                                  "Can't open config file (" + path_ + ")",
                                  "Can't write to files",
                              }));
    EXPECT_EQ(Stored(), before);
}

TEST_F(NextRequestTest, TheVolumeIsLookedUpByItsWholePath) {
    const std::string shorter = "/" + std::string(510, 'm');
    const std::string whole = shorter + "m"; // which no space can have
    FakeAppliance::spaces[0].referencePath = shorter;
    StoreTwo(R"({"type" : "ack", "mountPath" : ")" + whole + R"("})",
             R"({"type" : "ack", "mountPath" : ")" + shorter + R"("})");
    CapturedLog log;
    EXPECT_EQ(Next(), NextRequest::Taken);
    EXPECT_EQ(num_, "1");
    EXPECT_EQ(log.Messages(), (Messages{
                                  "Can't get space uuid from mount path (" + whole + ")",
                                  "Drop requests finish",
                              }));
}

TEST_F(NextRequestTest, TheLockIsHeldOverTheChoiceAndItsDrops) {
    StoreTwo(R"({"type" : "pinFiles", "mountPath" : "/volume8", "data" : "b#2"})", kPinA);
    LockProbe atRead;
    LockProbe atLookup;
    LockProbe atWrite;
    FakeLibc::onRead = [&](int, long long, size_t) { atRead.Look(); };
    FakeAppliance::onConfigLookup = [&] { atLookup.Look(); };
    FakeLibc::onOpen = [&](const std::string &, int flags, unsigned) {
        if ((flags & O_CREAT) != 0) {
            atWrite.Look();
        }
    };
    CapturedLog log;
    EXPECT_EQ(Next(), NextRequest::Taken);
    FakeLibc::onRead = nullptr;
    FakeLibc::onOpen = nullptr;
    FakeAppliance::onConfigLookup = nullptr;
    EXPECT_TRUE(atRead.FoundItHeld());
    EXPECT_TRUE(atLookup.FoundItHeld());
    EXPECT_TRUE(atWrite.FoundItHeld());
}

TEST_F(NextRequestTest, LongTextsAreCutToTheRecordsFields) {
    const std::string mountPath = "/" + std::string(600, 'm');
    FakeAppliance::spaces[0].referencePath = mountPath.substr(0, 511);
    StoreTwo(R"({"type" : "ack", "mountPath" : ")" + mountPath.substr(0, 511) + R"(", "data" : ")" +
                 std::string(2000, 'd') + "\"}",
             kPinA);
    EXPECT_EQ(Next(), NextRequest::Taken);
    EXPECT_EQ(record_.type, kRequestAck);
    EXPECT_EQ(record_.mountPath, mountPath.substr(0, 511));
    EXPECT_EQ(record_.data, std::string(1023, 'd'));
}
} // namespace vesk
