#include "model/recorded_files.h"

#include "tests/support/look_fixture.h"

namespace vesk {
namespace {
using RecordedFilesTest = LookTest;

const char kMount[] = "/volume1";

// Each entry as "path inode", "-" without one, and what is stored of it.
Texts TextsOf(const KnownFiles &known) {
    Texts texts;
    for (const KnownFile &file : known.files) {
        std::string text =
            file.relativePath + " " + (file.inode ? std::to_string(*file.inode) : "-");
        if (file.stored != kRequestUnknown) {
            text += std::string(" ") + RequestTypeToString(file.stored);
        }
        texts.push_back(text);
    }
    return texts;
}

StoredRequest Request(int type, const std::string &data, const std::string &mountPath = kMount) {
    return {"7", type, mountPath, data};
}

KnownFiles Known(std::vector<RecordedFile> files, const std::vector<StoredRequest> &requests) {
    RecordedVolume volume{kMount, std::move(files)};
    KnownFiles known = KnownFilesOf(kMount, &volume, requests);
    EXPECT_TRUE(volume.files.empty());
    return known;
}

RequestRecord Sent(int type, const std::string &data, const std::string &mountPath = kMount) {
    RequestRecord record{};
    record.type = type;
    mountPath.copy(record.mountPath, sizeof(record.mountPath) - 1);
    data.copy(record.data, sizeof(record.data) - 1);
    return record;
}

// The paths of a range.
Texts Paths(const KnownFiles &known, std::pair<size_t, size_t> range) {
    Texts paths;
    for (size_t i = range.first; i < range.second; ++i) {
        paths.push_back(known.files.at(i).relativePath);
    }
    return paths;
}
} // namespace

TEST_F(RecordedFilesTest, RecordsAndRequestsStandTogetherInOrderOfTheirPaths) {
    const KnownFiles known = Known({{11, "a"}, {13, "c"}}, {Request(kRequestPinFiles, "b#12;d#14"),
                                                            Request(kRequestUnpinFiles, "c#13")});
    EXPECT_EQ(TextsOf(known), (Texts{"a 11", "b - pinFiles", "c 13 unpinFiles", "d - pinFiles"}));
    EXPECT_EQ(known.recorded, 2U);
    EXPECT_EQ(known.requests, 2U);
    EXPECT_EQ(known.problems, Texts{});
}

TEST_F(RecordedFilesTest, WithoutAnythingThereIsNothing) {
    const KnownFiles known = KnownFilesOf(kMount, nullptr, {});
    EXPECT_EQ(TextsOf(known), Texts{});
    EXPECT_EQ(known.recorded, 0U);
    EXPECT_EQ(known.requests, 0U);
    EXPECT_FALSE(KnownFileByInode(known, 0));
    EXPECT_EQ(KnownFilesAt(known, "a"), (std::pair<size_t, size_t>{0, 0}));
    EXPECT_EQ(KnownFilesBelow(known, ""), (std::pair<size_t, size_t>{0, 0}));
}

TEST_F(RecordedFilesTest, TheLastStoredRequestForAPathIsTheOneThatCounts) {
    const KnownFiles known = Known({{11, "a"}}, {Request(kRequestPinFiles, "a#11;b#12"),
                                                 Request(kRequestUnpinFiles, "b#12;a#11"),
                                                 Request(kRequestPinFiles, "b#12")});
    EXPECT_EQ(TextsOf(known), (Texts{"a 11 unpinFiles", "b - pinFiles"}));
    EXPECT_EQ(known.requests, 3U);
}

TEST_F(RecordedFilesTest, OtherVolumesRequestsAndThoseWithoutFilesNameNone) {
    const KnownFiles known =
        Known({{11, "a"}}, {Request(kRequestUnpinFiles, "a#11", "/volume10"),
                            Request(kRequestReloadPinBlocks, "a#11"),
                            Request(kRequestReloadPinBlocks, "no list at all")});
    EXPECT_EQ(TextsOf(known), Texts{"a 11"});
    EXPECT_EQ(known.requests, 2U);
    EXPECT_EQ(known.problems, Texts{});
}

TEST_F(RecordedFilesTest, WhatWaitsInTheQueueComesAfterWhatIsStored) {
    RecordedVolume volume{kMount, {{11, "a"}, {12, "b"}}};
    const KnownFiles known =
        KnownFilesOf(kMount, &volume, {Request(kRequestPinFiles, "a#11;c#13")},
                     {Sent(kRequestUnpinFiles, "/volume1/a;/volume1/d e"),
                      Sent(kRequestPinFiles, "/volume1/b;;/volume10/x;/volume1/f"),
                      Sent(kRequestReloadPinBlocks, "/volume1/a"),
                      Sent(kRequestPinFiles, "/volume2/a", "/volume2")});
    EXPECT_EQ(TextsOf(known), (Texts{"a 11 unpinFiles", "b 12 pinFiles", "c - pinFiles",
                                     "d - unpinFiles", "f - pinFiles"}));
    EXPECT_EQ(known.requests, 1U);
    EXPECT_EQ(known.sent, 3U);
    EXPECT_EQ(known.problems, Texts{});
    EXPECT_EQ(LookLogTake("none"), "none");
    EXPECT_EQ(KnownFileByInode(known, 13)->relativePath, "c");
}

TEST_F(RecordedFilesTest, AReplacedFilesPathStandsThereOnceForEachInode) {
    const KnownFiles known =
        Known({{11, "a"}, {22, "a"}, {12, "b"}}, {Request(kRequestUnpinFiles, "a#22")});
    EXPECT_EQ(TextsOf(known), (Texts{"a 11 unpinFiles", "a 22 unpinFiles", "b 12"}));
    EXPECT_EQ(KnownFilesAt(known, "a"), (std::pair<size_t, size_t>{0, 2}));
    EXPECT_EQ(KnownFilesAt(known, "b"), (std::pair<size_t, size_t>{2, 3}));
    EXPECT_EQ(KnownFilesAt(known, "aa"), (std::pair<size_t, size_t>{2, 2}));
}

TEST_F(RecordedFilesTest, OfADamagedListTheEntriesBeforeTheDamageCount) {
    const KnownFiles known = Known({}, {Request(kRequestPinFiles, "a#11;b;c#13")});
    EXPECT_EQ(TextsOf(known), Texts{"a - pinFiles"});
    EXPECT_EQ(known.problems, Texts{"request 7: Parse file inode from string (b) failed"});
    EXPECT_EQ(LookLogTake("none"), "none");
}

TEST_F(RecordedFilesTest, AFolderHasWhatLiesBelowItAndNoNeighbour) {
    const KnownFiles known = Known(
        {{1, "a"}, {2, "a-b"}, {3, "a/b"}, {4, "a/b-c"}, {5, "a/b/c"}, {6, "a0"}, {7, "b"}}, {});
    EXPECT_EQ(Paths(known, KnownFilesBelow(known, "a")), (Texts{"a/b", "a/b-c", "a/b/c"}));
    EXPECT_EQ(Paths(known, KnownFilesBelow(known, "a/b")), Texts{"a/b/c"});
    EXPECT_EQ(Paths(known, KnownFilesBelow(known, "b")), Texts{});
    EXPECT_EQ(KnownFilesBelow(known, ""), (std::pair<size_t, size_t>{0, 7}));
    EXPECT_EQ(Paths(known, KnownFilesAt(known, "a")), Texts{"a"});
}

TEST_F(RecordedFilesTest, AnInodeIsFoundByItsLow32Bits) {
    const KnownFiles known = Known({{5, "b"}, {7, "c"}, {0xFFFFFFFF, "d"}, {0, "e"}},
                                   {Request(kRequestPinFiles, "f#6")});
    const auto pathOf = [&](uint64_t inode) {
        const auto file = KnownFileByInode(known, inode);
        return file ? file->relativePath : "(none)";
    };
    EXPECT_EQ(pathOf(5), "b");
    EXPECT_EQ(pathOf(0x100000005), "b");
    EXPECT_EQ(pathOf(0xFFFFFFFF), "d");
    EXPECT_EQ(pathOf(UINT64_MAX), "d");
    EXPECT_EQ(pathOf(0x700000000), "e");
    EXPECT_EQ(pathOf(6), "f"); // only in a request
    EXPECT_EQ(pathOf(8), "(none)");
}

TEST_F(RecordedFilesTest, AnInodeThatIsRecordedTwiceIsItsFirstPath) {
    const KnownFiles known = Known({{5, "x"}, {5, "y"}}, {});
    ASSERT_TRUE(KnownFileByInode(known, 5));
    EXPECT_EQ(KnownFileByInode(known, 5)->relativePath, "x");
}

TEST_F(RecordedFilesTest, ARequestForARecordedPathIsThatOfItsOwnInode) {
    const KnownFiles known = Known({{5, "x"}, {6, "b"}}, {Request(kRequestPinFiles, "x#7"),
                                                          Request(kRequestUnpinFiles, "a#6")});
    const auto old = KnownFileByInode(known, 5); // of the file that was there before
    EXPECT_EQ(old->inode, 5U);
    EXPECT_EQ(old->stored, kRequestUnknown);
    const auto now = KnownFileByInode(known, 7);
    EXPECT_EQ(now->inode, std::nullopt);
    EXPECT_EQ(now->stored, kRequestPinFiles);
    // Recorded under one path, in a request under another.
    const auto renamed = KnownFileByInode(known, 6);
    EXPECT_EQ(renamed->relativePath, "b");
    EXPECT_EQ(renamed->inode, 6U);
    EXPECT_EQ(renamed->stored, kRequestUnpinFiles);
}
} // namespace vesk
