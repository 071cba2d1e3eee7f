#include "act/last_look.h"

#include "tests/support/fake_appliance.h"
#include "tests/support/look_fixture.h"

#include <filesystem>
#include <sys/stat.h>

namespace vesk {
namespace {
// A volume that is a folder; each file has as many blocks as it has bytes.
class LastLookTest : public LookTest {
protected:
    void SetUp() override {
        LookTest::SetUp();
        std::filesystem::create_directory(volume_);
        FakeAppliance::onLookup = [this](const std::string &, uint64_t inode, int,
                                         FileMappingTable &table) {
            const auto bytes = bytesOf_.find(static_cast<uint32_t>(inode));
            if (bytes != bytesOf_.end() && bytes->second > 0) {
                table.entries.push_back(FakeExtent(0, bytes->second * 128, 128));
            }
            return 0;
        };
    }
    BatchFile Make(const std::string &name, size_t bytes) {
        const std::string path = volume_ + "/" + name;
        WriteWhole(path, std::string(bytes, 'x'));
        struct stat status {};
        EXPECT_EQ(lstat(path.c_str(), &status), 0);
        const auto inode = static_cast<uint32_t>(status.st_ino);
        bytesOf_[inode] = bytes;
        return {name, inode, bytes, bytes, bytes * 128};
    }
    RequestBatch Batch(const std::vector<BatchFile> &files) const {
        RequestBatch batch{volume_, kRequestPinFiles, {}, {}};
        for (const BatchFile &file : files) {
            EXPECT_TRUE(BatchAdd(&batch, file));
        }
        return batch;
    }
    static std::string Names(const std::vector<BatchFile> &files) {
        std::string text;
        for (const BatchFile &file : files) {
            text += file.relativePath + " ";
        }
        return text;
    }
    const TempDir folder_;
    const std::string volume_ = folder_.Path("volume1");
    std::map<uint32_t, uint64_t> bytesOf_;
};
} // namespace

TEST_F(LastLookTest, FilesAsTheyWereAreCalm) {
    const LastLook last = LastLookAt(Batch({Make("a", 1), Make("b", 3)}));
    EXPECT_EQ(Names(last.calm.files), "a b ");
    EXPECT_EQ(last.calm.mountPath, volume_);
    EXPECT_EQ(last.calm.type, kRequestPinFiles);
    EXPECT_EQ(BatchPaths(last.calm), volume_ + "/a;" + volume_ + "/b");
    EXPECT_TRUE(last.changed.empty());
    EXPECT_TRUE(last.gone.files.empty());
}

TEST_F(LastLookTest, WhatHasGrownHasChanged) {
    const BatchFile a = Make("a", 1);
    BatchFile b = Make("b", 3);
    b.blocks = 2;
    Make("a", 5);
    const LastLook last = LastLookAt(Batch({a, b, Make("c", 1)}));
    EXPECT_EQ(Names(last.calm.files), "c ");
    EXPECT_EQ(Names(last.changed), "a b ");
    EXPECT_EQ(last.changed[0].bytes, 5U);
    EXPECT_EQ(last.changed[0].blocks, 5U);
    EXPECT_EQ(last.changed[1].blocks, 3U);
}

TEST_F(LastLookTest, WhatIsNoLongerThereIsGone) {
    const BatchFile gone = Make("gone", 1);
    BatchFile other = Make("other", 1);
    const BatchFile empty = Make("empty", 1);
    const BatchFile link = Make("link", 1);
    std::filesystem::remove(volume_ + "/gone");
    ++other.inode;
    bytesOf_[empty.inode] = 0;
    std::filesystem::rename(volume_ + "/link", volume_ + "/target");
    std::filesystem::create_symlink("target", volume_ + "/link");
    const LastLook last = LastLookAt(Batch({gone, other, empty, link, Make("c", 1)}));
    EXPECT_EQ(Names(last.calm.files), "c ");
    EXPECT_EQ(Names(last.gone.files), "gone other link ");
    EXPECT_EQ(Names(last.empty.files), "empty ");
    EXPECT_EQ(Names(last.unreadable.files), "");
    EXPECT_EQ(last.gone.mountPath, volume_);
    EXPECT_EQ(LookLogTake("silent"), "silent");
}

TEST_F(LastLookTest, WithoutItsVolumeEverythingIsGone) {
    const BatchFile a = Make("a", 1);
    std::filesystem::remove_all(volume_);
    EXPECT_EQ(Names(LastLookAt(Batch({a})).gone.files), "a ");
}

TEST_F(LastLookTest, WhoseBlocksCannotBeSeenIsToldApart) {
    const BatchFile a = Make("a", 1);
    FakeAppliance::onLookup = [](const std::string &, uint64_t, int, FileMappingTable &) {
        return -1;
    };
    EXPECT_EQ(Names(LastLookAt(Batch({a})).unreadable.files), "a ");
}
} // namespace vesk
