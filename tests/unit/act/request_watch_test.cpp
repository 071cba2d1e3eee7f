#include "act/request_watch.h"

#include "tests/support/look_fixture.h"

namespace vesk {
namespace {
class RequestWatchTest : public LookTest {
protected:
    static RequestBatch Batch(const std::string &path, RequestType type = kRequestPinFiles) {
        RequestBatch batch{"/volume1", type, {}, {}};
        EXPECT_TRUE(BatchAdd(&batch, {path, 11, 1, 1, 128}));
        return batch;
    }
    // A document in which these file-inode lists are stored as requests to pin.
    void Store(const Texts &lists, const std::string &volume = "/volume1") const {
        std::string queue;
        std::string requests;
        for (const std::string &list : lists) {
            const std::string number = std::to_string(requests.size() + 1);
            const std::string comma = queue.empty() ? "" : ",";
            queue += comma + "\"" + number + "\"";
            requests += comma + "\"" + number + "\": {\"type\": \"pinFiles\", \"mountPath\": \"" +
                        volume + "\", \"data\": \"" + list + "\"}";
        }
        WriteWhole(config_,
                   "{\"requestQueue\": [" + queue + "], \"requests\": {" + requests + "}}");
    }
    // The paths of those that are taken out.
    Texts Finished() {
        Texts paths;
        for (const RequestBatch &batch : watch_.TakeFinished()) {
            paths.push_back(BatchPaths(batch));
        }
        return paths;
    }
    const TempDir folder_;
    const std::string config_ = folder_.Path("pins.json");
    RequestWatch watch_{config_};
};
} // namespace

TEST_F(RequestWatchTest, WhatIsNoLongerStoredIsFinished) {
    watch_.Add(Batch("a"));
    watch_.Add(Batch("b"));
    Store({"a#11", "b#11"});
    EXPECT_EQ(Finished(), Texts{});
    EXPECT_EQ(watch_.Waiting().size(), 2U);
    Store({"b#11"});
    EXPECT_EQ(Finished(), Texts{"/volume1/a"});
    Store({});
    EXPECT_EQ(Finished(), Texts{"/volume1/b"});
    EXPECT_EQ(Finished(), Texts{});
}

TEST_F(RequestWatchTest, OnlyTheSameRequestIsTheOne) {
    watch_.Add(Batch("a"));
    Store({"a#12"}); // replaced before the receiver looked at it
    EXPECT_EQ(Finished(), Texts{});
    Store({"b#11"});
    EXPECT_EQ(Finished(), Texts{"/volume1/a"});
    watch_.Add(Batch("a"));
    Store({"a#11"}, "/volume10");
    EXPECT_EQ(Finished(), Texts{"/volume1/a"});
    watch_.Add(Batch("a", kRequestUnpinFiles));
    Store({"a#11"});
    EXPECT_EQ(Finished(), Texts{"/volume1/a"});
}

TEST_F(RequestWatchTest, OneThatWasCarriedOutBeforeItWasLookedForIsFinished) {
    Store({});
    watch_.Add(Batch("a"));
    EXPECT_EQ(Finished(), Texts{"/volume1/a"});
    watch_.Add(Batch("b"));
    EXPECT_EQ(Finished(), Texts{"/volume1/b"});
}

TEST_F(RequestWatchTest, ADocumentThatCannotBeReadFinishesNothing) {
    watch_.Add(Batch("a"));
    WriteWhole(config_, "{");
    EXPECT_EQ(Finished(), Texts{});
    WriteWhole(config_, R"({"requestQueue": 7})");
    EXPECT_EQ(Finished(), Texts{});
    EXPECT_EQ(LookLogTake("none"), "none");
    EXPECT_EQ(watch_.TakeAll().size(), 1U);
    EXPECT_EQ(watch_.Waiting().size(), 0U);
}
} // namespace vesk
