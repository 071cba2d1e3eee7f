#include "act/request_batch.h"

#include <gtest/gtest.h>

namespace vesk {
namespace {
RequestBatch Batch(const std::vector<BatchFile> &files) {
    RequestBatch batch{"/volume1", kRequestPinFiles, {}, {}};
    for (const BatchFile &file : files) {
        EXPECT_TRUE(BatchAdd(&batch, file));
    }
    return batch;
}
} // namespace

TEST(RequestBatchTest, BothFormsNameEachFile) {
    const RequestBatch batch = Batch({{"a", 11, 1, 1, 128}, {"d/b", 4294967295, 1, 1, 128}});
    EXPECT_EQ(BatchPaths(batch), "/volume1/a;/volume1/d/b");
    EXPECT_TRUE(BatchIsStoredAs(batch, "a#11;d/b#4294967295"));
    EXPECT_TRUE(BatchIsStoredAs(batch, "a#12;d/b#1")); // replaced before the receiver looked
    for (const char *other :
         {"", "a#11", "a#11;d/b", "a#11;d/c#1", "d/b#1;a#11", "a#11;d/b#1;c#2", "aa#11;d/b#1"}) {
        EXPECT_FALSE(BatchIsStoredAs(batch, other)) << other;
    }
    EXPECT_EQ(BatchPaths(Batch({})), "");
    EXPECT_TRUE(BatchIsStoredAs(Batch({}), ""));
}

TEST(RequestBatchTest, AFullOneTakesNoMore) {
    RequestBatch batch = Batch({});
    const std::string name(100, 'x');
    size_t files = 0;
    while (BatchAdd(&batch, {name, 1, 1, 1, 128})) {
        ++files;
    }
    // "/volume1/" and the name, separated: 110 bytes each of 1023.
    EXPECT_EQ(files, 9U);
    EXPECT_EQ(batch.files.size(), files);
    EXPECT_EQ(BatchPaths(batch).size(), 9 * 110U - 1);
    EXPECT_TRUE(BatchAdd(&batch, {"short", 1, 1, 1, 128}));
}
} // namespace vesk
