#include "cachedev/cachedev_options.h"

#include <gtest/gtest.h>

#include <cerrno>
#include <climits>
#include <unistd.h>

namespace vesk {
namespace {
struct OptionsTest : testing::Test {
    CachedevOptions options;
    std::string error;

    bool Parse(std::vector<std::string> arguments) {
        arguments.insert(arguments.begin(), "veskcachedev");
        std::vector<char *> argv;
        argv.reserve(arguments.size() + 1);
        for (std::string &argument : arguments) {
            argv.push_back(argument.data());
        }
        const int argc = static_cast<int>(argv.size());
        argv.push_back(nullptr);
        return CachedevOptionsParse(argc, argv.data(), options, error);
    }

    // With the three that are always needed.
    bool ParseMore(std::vector<std::string> arguments) {
        for (const char *needed : {"--device=/run/vesk/cachedev_0", "--backing=b", "--ssd=s"}) {
            arguments.emplace_back(needed);
        }
        return Parse(arguments);
    }
};
} // namespace

TEST_F(OptionsTest, TheUsualOnes) {
    ASSERT_TRUE(Parse({"--device", "/run/vesk/cachedev_0", "--backing", "b.img", "--ssd", "s.img"}))
        << error;
    EXPECT_EQ(options.folder, "/run/vesk");
    EXPECT_EQ(options.deviceName, "cachedev_0");
    EXPECT_EQ(options.backingPath, "b.img");
    EXPECT_EQ(options.ssdPath, "s.img");
    EXPECT_EQ(options.pidFile, "");
    EXPECT_EQ(options.settings.missDelayMs, 0U);
    EXPECT_EQ(options.settings.faults.shortAt, UINT64_MAX);
    EXPECT_TRUE(options.settings.faults.failRequest.empty());
    EXPECT_TRUE(options.settings.faults.failRead.empty());
    EXPECT_FALSE(options.foreground);
    EXPECT_FALSE(options.help);
}

TEST_F(OptionsTest, AllOthers) {
    ASSERT_TRUE(ParseMore({"--miss-delay-ms=25", "--foreground", "--pid-file=/p", "--fail-ioctl",
                           "0xFECF:5", "--fail-ioctl=65233:16", "--fail-read=4096:5",
                           "--fail-read=0x100000000:61", "--short-at=123456789012"}))
        << error;
    const CacheFaults &faults = options.settings.faults;
    EXPECT_EQ(options.settings.missDelayMs, 25U);
    EXPECT_TRUE(options.foreground);
    EXPECT_EQ(options.pidFile, "/p");
    EXPECT_EQ(faults.failRequest, (std::map<uint32_t, int>{{0xFECF, EIO}, {0xFED1, EBUSY}}));
    EXPECT_EQ(faults.failRead, (std::map<uint64_t, int>{{4096, EIO}, {0x100000000, ENODATA}}));
    EXPECT_EQ(faults.shortAt, 123456789012U);
}

TEST_F(OptionsTest, RelativePathsAreMadeAbsolute) {
    char folder[PATH_MAX];
    ASSERT_NE(getcwd(folder, sizeof folder), nullptr);
    ASSERT_TRUE(Parse({"--device", "x/../dev", "--backing=b", "--ssd=s", "--pid-file=p"})) << error;
    EXPECT_EQ(options.folder, folder);
    EXPECT_EQ(options.deviceName, "dev");
    EXPECT_EQ(options.pidFile, std::string(folder) + "/p");
}

TEST_F(OptionsTest, WhatIsNeededIsMissing) {
    EXPECT_FALSE(Parse({}));
    EXPECT_FALSE(Parse({"--device=/a/b", "--backing=b"}));
    EXPECT_FALSE(Parse({"--device=/a/b", "--ssd=b"}));
    EXPECT_FALSE(Parse({"--backing=b", "--ssd=s"}));
    EXPECT_NE(error.find("--device, --backing and --ssd"), std::string::npos) << error;
}

TEST_F(OptionsTest, HelpNeedsNothing) {
    EXPECT_TRUE(Parse({"--help"}));
    EXPECT_TRUE(options.help);
    for (const char *name : {"--device", "--backing", "--ssd", "--miss-delay-ms", "--foreground",
                             "--pid-file", "--fail-ioctl", "--fail-read", "--short-at", "--help"}) {
        EXPECT_NE(std::string(CachedevUsage()).find(name), std::string::npos) << name;
    }
}

TEST_F(OptionsTest, BadValuesAreNamed) {
    for (const char *bad : {"--device=",
                            "--device=/a/",
                            "--device=/",
                            "--device=/a/..",
                            "--miss-delay-ms=",
                            "--miss-delay-ms=-1",
                            "--miss-delay-ms= 1",
                            "--miss-delay-ms=1x",
                            "--miss-delay-ms=60001",
                            "--fail-ioctl=0xFECF",
                            "--fail-ioctl=0xFECF:",
                            "--fail-ioctl=:5",
                            "--fail-ioctl=1:0",
                            "--fail-ioctl=1:4096",
                            "--fail-ioctl=0x100000000:5",
                            "--fail-ioctl=1:EIO",
                            "--fail-read=5",
                            "--fail-read=-5:5",
                            "--fail-read=18446744073709551616:5",
                            "--short-at=",
                            "--short-at=0x",
                            "--short-at=ten"}) {
        EXPECT_FALSE(ParseMore({bad})) << bad;
        EXPECT_EQ(error.rfind("bad value for --", 0), 0U) << error;
    }
}

TEST_F(OptionsTest, WhatIsUnknownIsNamed) {
    EXPECT_FALSE(ParseMore({"--frobnicate"}));
    EXPECT_EQ(error, "unknown option --frobnicate");
    EXPECT_FALSE(ParseMore({"-xy"}));
    EXPECT_EQ(error, "unknown option -x");
    EXPECT_FALSE(Parse({"--device"}));
    EXPECT_EQ(error, "no value after --device");
    EXPECT_FALSE(ParseMore({"stray"}));
    EXPECT_EQ(error, "unexpected argument stray");
}
} // namespace vesk
