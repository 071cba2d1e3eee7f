// What the tests of a volume's coming and going share: a configuration with records of two volumes.
#ifndef TESTS_UNIT_COMMANDS_VOLUME_EVENTS_FIXTURE_H
#define TESTS_UNIT_COMMANDS_VOLUME_EVENTS_FIXTURE_H

#include "tests/unit/commands/commands_fixture.h"

#include <string>

class VolumeEventsTest : public CommandsTest {
protected:
    void SetUp() override {
        CommandsTest::SetUp();
        WriteWhole(config_, document_);
    }
    const std::string config_ = folder_.Path("conf.json");
    const std::string document_ = R"({"requestQueue" : ["0"],
        "requests" : {"0" : {"type" : "reloadPinBlocks", "mountPath" : ")" +
                                  volume_ + R"("}},
        "volumes" : {")" + volume_ +
                                  R"(" : {"files" : {"1" : "a"}},
                     "/volume2" : {"files" : {"2" : "b"}}}})";
    const std::string recordsRemoved_ = "Remove pin file volume (" + volume_ + ") from config file";
};

#endif
