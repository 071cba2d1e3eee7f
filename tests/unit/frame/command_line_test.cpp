#include "tests/unit/frame/command_line_fixture.h"

namespace vesk {
TEST_F(CommandLineTest, EachCommandIsKnownByItsName) {
    const std::pair<Arguments, Command> commands[] = {
        {{"status"}, StatusCommand}, {{"list"}, ListCommand},       {{"plan", "/v"}, PlanCommand},
        {{"export"}, ExportCommand}, {{"metrics"}, MetricsCommand},
    };
    for (const auto &[arguments, command] : commands) {
        ASSERT_TRUE(Read(arguments)) << said_;
        EXPECT_EQ(line_.command, command);
        EXPECT_EQ(said_ + printed_, "");
    }
}

TEST_F(CommandLineTest, WithoutOptionsEverythingIsAsItWasMeant) {
    ASSERT_TRUE(Read({"list"}));
    const Settings &settings = line_.settings;
    EXPECT_EQ(settings.configPath, "/var/lib/veskcachepinfiletool/pins.json");
    EXPECT_FALSE(settings.json);
    EXPECT_FALSE(settings.nulSeparated);
    EXPECT_FALSE(settings.search);
    EXPECT_EQ(settings.reservePercent, 10U);
    EXPECT_EQ(settings.output, "");
    EXPECT_EQ(settings.paths, Arguments{});
    EXPECT_EQ(settings.volumes, Arguments{});
}

TEST_F(CommandLineTest, GlobalOptionsStandAnywhere) {
    for (const Arguments &arguments :
         {Arguments{"--json", "--config", "/c", "--progress", "none", "list", "/v"},
          Arguments{"list", "--json", "/v", "--config", "/c", "--progress=json"},
          Arguments{"--config=/c", "list", "/v", "--json"}}) {
        ASSERT_TRUE(Read(arguments)) << said_;
        EXPECT_TRUE(line_.settings.json);
        EXPECT_EQ(line_.settings.configPath, "/c");
        EXPECT_EQ(line_.settings.paths, Arguments{"/v"});
    }
}

TEST_F(CommandLineTest, EachOptionIsItsCommands) {
    ASSERT_TRUE(Read({"list", "--search"}));
    EXPECT_TRUE(line_.settings.search);
    ASSERT_TRUE(Read({"plan", "--reserve", "0", "/v"}));
    EXPECT_EQ(line_.settings.reservePercent, 0U);
    ASSERT_TRUE(Read({"plan", "/v", "--reserve=100"}));
    EXPECT_EQ(line_.settings.reservePercent, 100U);
    ASSERT_TRUE(Read({"export", "-0", "/v1", "/v2"}));
    EXPECT_TRUE(line_.settings.nulSeparated);
    EXPECT_EQ(line_.settings.volumes, (Arguments{"/v1", "/v2"}));
    ASSERT_TRUE(Read({"status", "/v1"}));
    EXPECT_EQ(line_.settings.volumes, Arguments{"/v1"});
    ASSERT_TRUE(Read({"metrics", "--output", "/x.prom"}));
    EXPECT_EQ(line_.settings.output, "/x.prom");
}

TEST_F(CommandLineTest, TheEnvironmentNamesTheConfigurationUnlessTheLineDoes) {
    setenv("VESKPIN_CONFIG", "/from/environment", 1);
    ASSERT_TRUE(Read({"status"}));
    EXPECT_EQ(line_.settings.configPath, "/from/environment");
    ASSERT_TRUE(Read({"status", "--config", "/c"}));
    EXPECT_EQ(line_.settings.configPath, "/c");
    setenv("VESKPIN_CONFIG", "", 1);
    ASSERT_TRUE(Read({"status"}));
    EXPECT_EQ(line_.settings.configPath, "/var/lib/veskcachepinfiletool/pins.json");
    unsetenv("VESKPIN_CONFIG");
}

TEST_F(CommandLineTest, WrongUsageIsRefused) {
    for (const Arguments &arguments : {
             Arguments{},
             Arguments{"--json"},
             Arguments{"nothing"},
             Arguments{"Status"},
             Arguments{""},
             Arguments{"plan"},
             Arguments{"plan", "--reserve", "101", "/v"},
             Arguments{"plan", "--reserve", "-1", "/v"},
             Arguments{"plan", "--reserve", "10%", "/v"},
             Arguments{"plan", "--reserve", "", "/v"},
             Arguments{"plan", "/v", "--reserve"},
             Arguments{"list", "--reserve", "10"},
             Arguments{"list", "--unknown"},
             Arguments{"list", "-x"},
             Arguments{"list", ""},
             Arguments{"plan", "/v", ""},
             Arguments{"status", "--search"},
             Arguments{"metrics", "/v"},
             Arguments{"metrics", "--json"},
             Arguments{"--json", "metrics"},
             Arguments{"metrics", "--output"},
             Arguments{"--color", "yes", "status"},
             Arguments{"status", "--color"},
             Arguments{"--progress", "bar", "status"},
             Arguments{"--config", "/a", "--config", "/b", "status"},
             Arguments{"--json=maybe", "status"},
         }) {
        EXPECT_TRUE(IsRefused(arguments)) << testing::PrintToString(arguments) << said_;
    }
}

TEST_F(CommandLineTest, WhatIsWrongIsSaid) {
    Read({"plan"});
    EXPECT_EQ(said_, "veskpin: plan needs a PATH\n");
    Read({"metrics", "--json"});
    EXPECT_EQ(said_, "veskpin: metrics has a form of its own: no --json\n");
    Read({"list", ""});
    EXPECT_EQ(said_, "veskpin: an empty PATH\n");
    Read({"list", "--unkn\x1b[2Jown"});
    EXPECT_NE(said_.find("--unkn\\x1b[2Jown"), std::string::npos) << said_;
    EXPECT_NE(said_.find("\nTry \"veskpin --help\".\n"), std::string::npos) << said_;
}

TEST_F(CommandLineTest, HelpAndVersionArePrintedAndDone) {
    EXPECT_FALSE(Read({"--version"}));
    EXPECT_EQ(status_, ExitStatus::Done);
    EXPECT_EQ(printed_.compare(0, 8, "veskpin "), 0);
    EXPECT_EQ(printed_.find('\n'), printed_.size() - 1);
    EXPECT_FALSE(Read({"--help"}));
    EXPECT_EQ(status_, ExitStatus::Done);
    for (const char *name : {"status", "list", "plan", "export", "metrics", "--config", "--json"}) {
        EXPECT_NE(printed_.find(name), std::string::npos) << printed_;
    }
    EXPECT_FALSE(Read({"plan", "--help"}));
    EXPECT_EQ(status_, ExitStatus::Done);
    EXPECT_NE(printed_.find("--reserve"), std::string::npos) << printed_;
    EXPECT_EQ(said_, "");
}
} // namespace vesk
