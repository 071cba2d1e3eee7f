#include "request/file_inode_list.h"

#include "tests/support/config_fixture.h"

#include <filesystem>
#include <sys/stat.h>

namespace vesk {
class FileInodeListTest : public ConfigTest {
protected:
    // Of the absolute paths on the test's volume, into a buffer of this size.
    int MakeList(const std::string &absolutePaths, size_t size = 1024) {
        list_.assign(size, 'x');
        const int result =
            AbsolutePathsToFileInodeList(volume_.c_str(), absolutePaths.c_str(), &list_[0], size);
        list_.resize(strlen(list_.c_str()));
        return result;
    }
    std::string list_;
};

TEST_F(FileInodeListTest, EachFileGivesRelativePathAndInode) {
    const std::string a = CreateFile("share/a.txt");
    const std::string b = CreateFile("b");
    CapturedLog log;
    EXPECT_EQ(MakeList(volume_ + "/share/a.txt;" + volume_ + "/b"), 0);
    EXPECT_EQ(list_, "share/a.txt#" + a + ";b#" + b);
    EXPECT_EQ(log.Messages(), Messages{});
}

TEST_F(FileInodeListTest, TheLargestInodeIsListedWhole) {
    CreateFile("a");
    FakeLibc::onStat = [](struct stat *status) { status->st_ino = UINT32_MAX; };
    EXPECT_EQ(MakeList(volume_ + "/a"), 0);
    EXPECT_EQ(list_, "a#4294967295");
}

TEST_F(FileInodeListTest, EmptyPiecesAreSkipped) {
    const std::string a = CreateFile("a");
    const std::string b = CreateFile("b");
    EXPECT_EQ(MakeList(";;" + volume_ + "/a;;;" + volume_ + "/b;"), 0);
    EXPECT_EQ(list_, "a#" + a + ";b#" + b);
}

TEST_F(FileInodeListTest, NoPathsGiveTheEmptyList) {
    EXPECT_EQ(MakeList(";;"), 0);
    EXPECT_EQ(list_, "");
    EXPECT_EQ(MakeList(""), 0);
    EXPECT_EQ(list_, "");
}

TEST_F(FileInodeListTest, AFileOfAnotherVolumeFails) {
    CreateFile("a");
    CapturedLog log;
    EXPECT_EQ(MakeList(volume_ + "/a;/volume2/b"), -1);
    EXPECT_EQ(log.Messages(), Messages{"Failed to Get relative path (Volume path=" + volume_ +
                                       " File path=/volume2/b"});
}

TEST_F(FileInodeListTest, AMissingFileFails) {
    CapturedLog log;
    EXPECT_EQ(MakeList(volume_ + "/missing"), -1);
    EXPECT_EQ(log.Messages(), (Messages{
                                  "Stat file " + volume_ + "/missing error",
                                  "Cant' get inode number of file (" + volume_ + "/missing)",
                              }));
}

TEST_F(FileInodeListTest, AListThatDoesNotFitIsRefused) {
    const std::string entry = "a#" + CreateFile("a");
    EXPECT_EQ(MakeList(volume_ + "/a", entry.size() + 1), 0);
    EXPECT_EQ(list_, entry);
    CapturedLog log;
    EXPECT_EQ(MakeList(volume_ + "/a", entry.size()), -1);
    EXPECT_EQ(log.Messages(), Messages{"File inode list doesn't fit in " +
                                       std::to_string(entry.size()) + " bytes"});
    EXPECT_EQ(MakeList(volume_ + "/a;" + volume_ + "/a", 2 * entry.size() + 2), 0);
    EXPECT_EQ(MakeList(volume_ + "/a;" + volume_ + "/a", 2 * entry.size() + 1), -1);
}

TEST_F(FileInodeListTest, OnlyTheFirst1024BytesOfThePathsCount) {
    const std::string a = CreateFile("a");
    const std::string path = volume_ + "/a";
    EXPECT_EQ(MakeList(path + std::string(1024 - path.size(), ';') + "/volume2/other"), 0);
    EXPECT_EQ(list_, "a#" + a);
}

TEST_F(FileInodeListTest, ConversionCharactersAreOrdinaryCharacters) {
    const std::string inode = CreateFile("50%s%n/a");
    EXPECT_EQ(MakeList(volume_ + "/50%s%n/a"), 0);
    EXPECT_EQ(list_, "50%s%n/a#" + inode);
}

TEST_F(FileInodeListTest, AtLevel2TheStepsAreLogged) {
    const std::string a = CreateFile("a");
    const std::string b = CreateFile("b");
    CapturedLog log(2);
    ASSERT_EQ(MakeList(volume_ + "/a;" + volume_ + "/b"), 0);
    char where[40];
    snprintf(where, sizeof(where), "%p", static_cast<void *>(&list_[0]));
    const std::string first = "a#" + a;
    EXPECT_EQ(
        MessagesOf(log, "AbsolutePathsToFileInodeList"),
        (Messages{
            "AbsolutePathsToFileInodeList() [N] : +++++",
            std::string("AbsolutePathsToFileInodeList() [N]: szFormat=%s%s#%lu pszRelativePath=a "
                        "szFileInodeList=") +
                where + " size=1024 len=0",
            std::string("AbsolutePathsToFileInodeList() [N]: szFormat=%s%s#%lu pszRelativePath=b "
                        "szFileInodeList=") +
                where + " size=1024 len=" + std::to_string(first.size()),
            "AbsolutePathsToFileInodeList() [N]: Get relativePaths = " + first + ";b#" + b,
            "AbsolutePathsToFileInodeList() [N] : -----",
        }));
}

TEST_F(FileInodeListTest, SplitReplacesThePieces) {
    std::vector<std::string> pieces = {"old"};
    SplitString(";a;b,c;;", ";,", &pieces);
    EXPECT_EQ(pieces, (std::vector<std::string>{"a", "b", "c"}));
    SplitString("", ";", &pieces);
    EXPECT_EQ(pieces, std::vector<std::string>{});
}

TEST_F(FileInodeListTest, SplitLooksAt1024Bytes) {
    std::vector<std::string> pieces;
    SplitString((std::string(1020, 'a') + ";bcdef").c_str(), ";", &pieces);
    EXPECT_EQ(pieces, (std::vector<std::string>{std::string(1020, 'a'), "bcd"}));
}

TEST_F(FileInodeListTest, ParsingGivesRecordsInOrder) {
    std::vector<FileInfo> infos(1);
    CapturedLog log(2);
    EXPECT_EQ(RequestDataGetFileInfos("a#1;share/b c#4294967295", &infos), 0);
    ASSERT_EQ(infos.size(), 3U); // appended
    EXPECT_STREQ(infos[1].szRelativePath, "a");
    EXPECT_EQ(infos[1].inodeNum, 1UL);
    EXPECT_STREQ(infos[2].szRelativePath, "share/b c");
    EXPECT_EQ(infos[2].inodeNum, 4294967295UL);
    EXPECT_EQ(
        log.Messages(),
        (Messages{
            "RequestDataGetFileInfos() [N]: info.szRelativePath=a info.inodeNum=1",
            "RequestDataGetFileInfos() [N]: info.szRelativePath=share/b c info.inodeNum=4294967295",
        }));
}

TEST_F(FileInodeListTest, AnEmptyListGivesNoRecords) {
    std::vector<FileInfo> infos;
    EXPECT_EQ(RequestDataGetFileInfos("", &infos), 0);
    EXPECT_EQ(RequestDataGetFileInfos(";;", &infos), 0);
    EXPECT_TRUE(infos.empty());
}

TEST_F(FileInodeListTest, WhatFollowsTheNumberIsIgnored) {
    std::vector<FileInfo> infos;
    EXPECT_EQ(RequestDataGetFileInfos("a#12xy;b#007", &infos), 0);
    ASSERT_EQ(infos.size(), 2U);
    EXPECT_EQ(infos[0].inodeNum, 12UL);
    EXPECT_EQ(infos[1].inodeNum, 7UL);
}

TEST_F(FileInodeListTest, ABadEntryEndsTheParsingAndKeepsTheOnesBefore) {
    std::vector<FileInfo> infos;
    CapturedLog log;
    EXPECT_EQ(RequestDataGetFileInfos("a#1;a#x;b#2", &infos), -1);
    EXPECT_EQ(infos.size(), 1U);
    EXPECT_EQ(log.Messages(), Messages{"Parse file inode from string (a#x) failed"});
}

TEST_F(FileInodeListTest, EntriesThatAreNoneFail) {
    const std::string longPath(512, 'p');
    for (const std::string &entry :
         {std::string("#5"), std::string("a"), std::string("a#"), std::string("a#-1"),
          std::string("a#+1"), std::string("a# 1"), std::string("a##1"), std::string("a#1#2"),
          std::string("a#1x#"), std::string("a#b#1"), std::string("a#4294967296"),
          std::string("a#99999999999999999999999"), std::string("a#%d"), longPath + "#1"}) {
        std::vector<FileInfo> infos;
        CapturedLog log;
        EXPECT_EQ(RequestDataGetFileInfos(entry.c_str(), &infos), -1) << entry;
        EXPECT_EQ(log.Messages(), Messages{"Parse file inode from string (" + entry + ") failed"});
        EXPECT_TRUE(infos.empty());
    }
}

TEST_F(FileInodeListTest, APathOf511CharactersFits) {
    std::vector<FileInfo> infos;
    EXPECT_EQ(RequestDataGetFileInfos((std::string(511, 'p') + "#1").c_str(), &infos), 0);
    ASSERT_EQ(infos.size(), 1U);
    EXPECT_EQ(infos[0].szRelativePath, std::string(511, 'p'));
}
} // namespace vesk
