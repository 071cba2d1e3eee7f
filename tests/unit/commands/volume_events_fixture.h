// What the tests of a volume's coming and going share: a configuration with records of two volumes.
#pragma once

#include "tests/unit/commands/commands_fixture.h"

#include <string>

namespace vesk {
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
} // namespace vesk
