#include "request/request_fill.h"

#include "request/file_inode_list.h"
#include "request/request_record.h"
#include "tests/support/captured_log.h"
#include "tests/support/leak_checked_test.h"
#include "tests/support/temp_dir.h"

#include <cstring>
#include <filesystem>
#include <gtest/gtest.h>
#include <sys/stat.h>

namespace vesk {
namespace {
const std::string kMount = "/volume1";

std::string Below(const std::string &relativePath) {
    return kMount + "/" + relativePath;
}

// A path below the mount point of so many bytes in all.
std::string PathOf(size_t bytes, char letter = 'x') {
    return Below(std::string(bytes - kMount.size() - 1, letter));
}
} // namespace

TEST(RequestPathCheckTest, WhatSeparatesOrEndsPathsIsTheNamesFault) {
    for (const char letter : std::string(";# \t\n\v\f\r")) {
        for (const std::string &name :
             {std::string(1, letter), "a" + std::string(1, letter),
              "a" + std::string(1, letter) + "b", "a" + std::string(1, letter) + "/b"}) {
            EXPECT_EQ(RequestPathCheck(kMount, Below(name), 1), RequestPathFault::Name)
                << static_cast<int>(letter);
        }
    }
    EXPECT_EQ(RequestPathCheck(kMount, Below("a\"'$`*?!&|<>(){}[]\\,:\x01\x7F\xFF"), 1),
              RequestPathFault::None);
}

TEST(RequestPathCheckTest, OfTheMountPathOnlyWhatSeparatesPathsIsAFault) {
    EXPECT_EQ(RequestPathCheck("/my volume#1", "/my volume#1/a", 1), RequestPathFault::None);
    EXPECT_EQ(RequestPathCheck("/my;volume", "/my;volume/a", 1), RequestPathFault::Name);
}

TEST(RequestPathCheckTest, ARelativePathHas511Bytes) {
    EXPECT_EQ(RequestPathCheck(kMount, Below(std::string(511, 'x')), 4294967295),
              RequestPathFault::None);
    EXPECT_EQ(RequestPathCheck(kMount, Below(std::string(512, 'x')), 1), RequestPathFault::TooLong);
}

TEST(RequestPathCheckTest, TheFolderOfALongPathHas510Bytes) {
    // From a longer one the service would make a shorter: it cuts the path at 512 bytes first.
    const std::string mount = "/" + std::string(509, 'm');
    EXPECT_EQ(RequestPathCheck(mount, mount + "/" + std::string(511, 'x'), 1),
              RequestPathFault::None);
    EXPECT_EQ(RequestPathCheck(mount, mount + "/" + std::string(512, 'x'), 1),
              RequestPathFault::TooLong);
    EXPECT_EQ(RequestPathCheck(mount + "m", mount + "m/x", 1), RequestPathFault::TooLong);
    EXPECT_EQ(RequestPathCheck(mount + "m", mount + "m/", 1), RequestPathFault::None); // 512 in all
    const std::string folder = kMount + std::string("/") + std::string(502, 'f');
    EXPECT_EQ(RequestPathCheck(kMount, folder + "/x", 1), RequestPathFault::TooLong);
    EXPECT_EQ(RequestPathCheck(kMount, folder.substr(0, 510) + "/xx", 1), RequestPathFault::None);
}

TEST(RequestFillTest, PathsFillARequestToItsLastByte) {
    RequestFill fill;
    EXPECT_TRUE(RequestFillAdd(&fill, kMount, PathOf(500), 1));
    EXPECT_EQ(fill.files, 1U);
    EXPECT_EQ(fill.pathBytes, 500U);
    EXPECT_EQ(fill.listBytes, 500U - 9 + 2);
    const RequestFill before = fill;
    EXPECT_FALSE(RequestFillAdd(&fill, kMount, PathOf(523), 1)); // 500 + ";" + 523
    EXPECT_EQ(fill.files, before.files);
    EXPECT_EQ(fill.pathBytes, before.pathBytes);
    EXPECT_EQ(fill.listBytes, before.listBytes);
    EXPECT_TRUE(RequestFillAdd(&fill, kMount, PathOf(522), 1));
    EXPECT_EQ(fill.files, 2U);
    EXPECT_EQ(fill.pathBytes, 1023U);
    EXPECT_FALSE(RequestFillAdd(&fill, kMount, Below("x"), 1));
}

TEST(RequestFillTest, TheListFillsARequestToItsLastByte) {
    const std::string mount = "/v"; // shorter than an inode's digits
    const auto path = [&](size_t bytes) { return mount + "/" + std::string(bytes, 'x'); };
    RequestFill fill;
    EXPECT_TRUE(RequestFillAdd(&fill, mount, path(500), 4294967295)); // 500 + "#" + 10 = 511
    EXPECT_EQ(fill.listBytes, 511U);
    EXPECT_FALSE(RequestFillAdd(&fill, mount, path(501), 1000000000)); // 1024
    EXPECT_FALSE(RequestFillAdd(&fill, mount, path(509), 100));        // 511 + 1 + 509 + 4 = 1025
    EXPECT_TRUE(RequestFillAdd(&fill, mount, path(500), 1000000000));
    EXPECT_EQ(fill.listBytes, 1023U);
    EXPECT_EQ(fill.pathBytes, 503U + 1 + 503);
}

// What the receiver makes of the paths: it takes just those requests that count as full or less.
TEST(RequestFillFilesTest, AgreesWithTheListThatIsMadeOfThePaths) {
    const TempDir folder;
    const std::string mount = folder.Path();
    for (const size_t last : {1U, 40U, 41U, 42U, 43U, 44U, 45U, 46U, 47U, 48U, 49U, 50U, 60U}) {
        RequestFill fill;
        std::string paths;
        const auto add = [&](const std::string &path) {
            WriteWhole(path, "");
            struct stat status {};
            EXPECT_EQ(stat(path.c_str(), &status), 0);
            paths += (paths.empty() ? "" : ";") + path;
            return RequestFillAdd(&fill, mount, path, static_cast<uint32_t>(status.st_ino));
        };
        bool fits = true;
        const size_t each = mount.size() + 200 + 2;
        for (int i = 0; paths.size() + each < 1023 - mount.size() - 60; ++i) {
            fits = add(mount + "/" + std::string(200, 'x') + std::to_string(i)) && fits;
        }
        fits = add(mount + "/" + std::string(last, 'y')) && fits;
        CapturedLog log;
        char list[kRequestDataBytes];
        const int result =
            AbsolutePathsToFileInodeList(mount.c_str(), paths.c_str(), list, sizeof(list));
        EXPECT_EQ(fits, result == 0 && paths.size() < kRequestDataBytes) << last;
        if (fits) {
            EXPECT_EQ(strlen(list), fill.listBytes);
            EXPECT_EQ(paths.size(), fill.pathBytes);
        }
    }
}
} // namespace vesk
