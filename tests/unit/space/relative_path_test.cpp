#include "space/relative_path.h"

#include "base/malloc_text.h"
#include "tests/support/captured_log.h"
#include "tests/support/leak_checked_test.h"

#include <gtest/gtest.h>

namespace vesk {
namespace {
const char kRefused[] = "(refused)";

// As the log shows a text with tabs.
std::string WithTabsWritten(std::string text) {
    for (size_t tab = text.find('\t'); tab != std::string::npos; tab = text.find('\t')) {
        text.replace(tab, 1, "\\x09");
    }
    return text;
}

std::string Relative(const std::string &mountPath, const std::string &filePath) {
    CapturedLog log;
    const MallocText path(FileGetRelativePathByMountPath(mountPath.c_str(), filePath.c_str()));
    EXPECT_EQ(log.Text(), path ? ""
                               : "tool: Failed to Get relative path (Volume path=" + mountPath +
                                     " File path=" + WithTabsWritten(filePath) + "\n");
    return path ? path.get() : kRefused;
}

std::string TopDir(const std::string &path, size_t size = 512) {
    CapturedLog log;
    std::string out(size + 1, '#');
    const int result = FileGetTopDir(path.c_str(), &out[0], size);
    EXPECT_EQ(out.back(), '#'); // nothing behind the buffer
    EXPECT_EQ(log.Text(),
              result == 0 ? "" : "tool: Get top directory of file (" + path + ") error\n\n");
    return result == 0 ? out.c_str() : kRefused;
}

using RelativePathTest = LeakCheckedTest;
using TopDirTest = LeakCheckedTest;
} // namespace

TEST_F(RelativePathTest, IsWhatStandsBehindTheMountPathAndASlash) {
    EXPECT_EQ(Relative("/volume1", "/volume1/a"), "a");
    EXPECT_EQ(Relative("/volume1", "/volume1/photo/2018/a.jpg"), "photo/2018/a.jpg");
    EXPECT_EQ(Relative("/volume1", "/volume1//a"), "/a");
    EXPECT_EQ(Relative("", "/a"), "a");
}

TEST_F(RelativePathTest, FileOutsideTheMountPathIsRefused) {
    EXPECT_EQ(Relative("/volume1", "/volume2/a"), kRefused);
    EXPECT_EQ(Relative("/volume1", "/volume10/a"), kRefused);
    EXPECT_EQ(Relative("/volume1", "/volume"), kRefused);
    EXPECT_EQ(Relative("/volume1", "volume1/a"), kRefused);
    EXPECT_EQ(Relative("/volume1", ""), kRefused);
}

TEST_F(RelativePathTest, TheMountPathItselfIsRefused) {
    EXPECT_EQ(Relative("/volume1", "/volume1"), kRefused);
    EXPECT_EQ(Relative("/volume1", "/volume1/"), kRefused);
}

TEST_F(RelativePathTest, MountPathWithATrailingSlashNeverMatches) {
    EXPECT_EQ(Relative("/volume1/", "/volume1/a"), kRefused);
}

TEST_F(RelativePathTest, PathIsCutAtTheFirstWhiteSpace) {
    EXPECT_EQ(Relative("/volume1", "/volume1/dir a/f"), "dir");
    for (const char space : {' ', '\t', '\n', '\v', '\f', '\r'}) {
        EXPECT_EQ(Relative("/volume1", std::string("/volume1/dir") + space + "f"), "dir");
    }
}

TEST_F(RelativePathTest, LeadingWhiteSpaceIsSkipped) {
    EXPECT_EQ(Relative("/volume1", "/volume1/ \t\na b"), "a");
    EXPECT_EQ(Relative("/volume1", "/volume1/  \t"), kRefused);
}

TEST_F(RelativePathTest, MountPathIsComparedLiterally) {
    EXPECT_EQ(Relative("/vol%s%n 1", "/vol%s%n 1/a"), "a");
    EXPECT_EQ(Relative("/vol 1", "/vol  1/a"), kRefused);
    EXPECT_EQ(Relative("/vol%%1", "/vol%1/a"), kRefused);
    EXPECT_EQ(Relative("/" + std::string(2000, 'm'), "/" + std::string(2000, 'm') + "/a"), "a");
}

TEST_F(RelativePathTest, HoldsUpTo511CharactersAndRefusesMore) {
    EXPECT_EQ(Relative("/v", "/v/" + std::string(511, 'x')), std::string(511, 'x'));
    EXPECT_EQ(Relative("/v", "/v/" + std::string(512, 'x')), kRefused);
    EXPECT_EQ(Relative("/v", "/v/" + std::string(511, 'x') + " y"), std::string(511, 'x'));
}

TEST_F(RelativePathTest, SaysTextAndAddressAtLevel2) {
    CapturedLog log(2);
    const MallocText path(FileGetRelativePathByMountPath("/volume1", "/volume1/a"));
    char expected[100];
    snprintf(expected, sizeof(expected),
             "FileGetRelativePathByMountPath() [N]: Get relative path = a (addr=%p)",
             static_cast<void *>(path.get()));
    EXPECT_EQ(log.Messages(), std::vector<std::string>{expected});
}

TEST_F(RelativePathTest, FailureHasTheErrorMarkerAtLevel2) {
    CapturedLog log(2);
    EXPECT_EQ(FileGetRelativePathByMountPath("/volume1", "/a"), nullptr);
    EXPECT_TRUE(log.Has("FileGetRelativePathByMountPath() [N] : ***** Failed to Get relative path "
                        "(Volume path=/volume1 File path=/a"));
}

TEST_F(RelativePathTest, BySpaceUuidUsesTheSpacesReferencePath) {
    CapturedLog log;
    FakeApplianceOneVolume("/dev/mapper/cachedev_0");
    const MallocText path(FileGetRelativePath("uuid-1", "/volume1/photo/a"));
    EXPECT_STREQ(path.get(), "photo/a");
    EXPECT_EQ(FileGetRelativePath("uuid-1", "/volume2/photo/a"), nullptr);
    EXPECT_EQ(log.Text(), "tool: Failed to Get relative path (Volume path=/volume1 File "
                          "path=/volume2/photo/a\n");
}

TEST_F(RelativePathTest, OfAnUnknownSpaceFails) {
    CapturedLog log(2);
    EXPECT_EQ(FileGetRelativePath("uuid-9", "/volume1/a"), nullptr);
    EXPECT_EQ(LastOf(log.Messages()), "FileGetRelativePath() [N] : ***** Can't get space's "
                                      "reference path. UUID = uuid-9");
}

TEST_F(TopDirTest, IsASlashAndTheFirstComponent) {
    EXPECT_EQ(TopDir("/volume1/a/b"), "/volume1");
    EXPECT_EQ(TopDir("/volume1/"), "/volume1");
    EXPECT_EQ(TopDir("/volume1"), "/volume1");
    EXPECT_EQ(TopDir("/vol 1/a"), "/vol 1");
    EXPECT_EQ(TopDir("/%s%n/a"), "/%s%n");
}

TEST_F(TopDirTest, PathWithoutAFirstComponentIsRefused) {
    EXPECT_EQ(TopDir("volume1/a"), kRefused);
    EXPECT_EQ(TopDir("/"), kRefused);
    EXPECT_EQ(TopDir("//volume1"), kRefused);
    EXPECT_EQ(TopDir(""), kRefused);
}

TEST_F(TopDirTest, IsCutToTheCallersBuffer) {
    EXPECT_EQ(TopDir("/volume1/a", 9), "/volume1");
    EXPECT_EQ(TopDir("/volume1/a", 8), "/volume");
    EXPECT_EQ(TopDir("/volume1/a", 1), "");
}

TEST_F(TopDirTest, ComponentOf1023CharactersIsTheLongest) {
    EXPECT_EQ(TopDir("/" + std::string(1023, 'x') + "/a", 2000), "/" + std::string(1023, 'x'));
    EXPECT_EQ(TopDir("/" + std::string(1024, 'x') + "/a", 2000), kRefused);
}

TEST_F(TopDirTest, MissingArgumentsAreRefused) {
    CapturedLog log(2);
    char out[10] = "#";
    EXPECT_EQ(FileGetTopDir(nullptr, out, sizeof(out)), -1);
    EXPECT_EQ(FileGetTopDir("/a", nullptr, 1), -1);
    EXPECT_EQ(FileGetTopDir("/a", out, 0), -1);
    EXPECT_STREQ(out, "#");
    EXPECT_EQ(log.Count("FileGetTopDir() [N] : ***** Incorrect parameter"), 3);
    EXPECT_EQ(log.Lines().size(), 3U);
}
} // namespace vesk
