#include "verbs/change_view.h"

#include <gtest/gtest.h>

namespace vesk {
namespace {
const std::string kA = "/volume1/a";
const std::string kB = "/volume1/b\xFF";

Settings SettingsOf(bool json, bool waits, bool color = false) {
    Settings settings;
    settings.json = json;
    settings.waits = waits;
    settings.color = color;
    return settings;
}

class ChangeViewTest : public testing::Test {
protected:
    TextSink sink_;
};
} // namespace

TEST_F(ChangeViewTest, ADocumentHasAllMembersInOrder) {
    const Settings settings = SettingsOf(true, true);
    ChangeView view("pin", FileState::Pinned, FileState::Pinning, settings, sink_);
    view.Put({kA, FileState::Pinned, std::nullopt});
    view.Put({kB, std::nullopt, ChangeReason::Vanished});
    view.Skip("/volume1/c d", SkipReason::Name);
    LookErrors errors;
    LookErrorAdd(&errors, "", "the service has ended");
    view.End(2, {"/volume1/e"}, errors);
    EXPECT_EQ(sink_.Kept(),
              R"({"command":"pin","schema":1,"files":[{"path":"/volume1/a","state":"pinned",)"
              R"("reason":null},{"path":"/volume1/b\ufffd","pathBytes":"L3ZvbHVtZTEvYv8=",)"
              R"("state":null,"reason":"vanished"}],"skipped":[{"path":"/volume1/c d",)"
              R"("reason":"name"}],"requestsSent":2,"repinned":["/volume1/e"],)"
              R"("errors":[{"path":"","text":"the service has ended"}]})"
              "\n");
}

TEST_F(ChangeViewTest, ADocumentWithoutAnythingHasItsListsToo) {
    const Settings settings = SettingsOf(true, true);
    ChangeView("unpin", FileState::Unpinned, FileState::Unpinning, settings, sink_).End(0, {}, {});
    EXPECT_EQ(sink_.Kept(), R"({"command":"unpin","schema":1,"files":[],"skipped":[],)"
                            R"("requestsSent":0,"repinned":[],"errors":[]})"
                            "\n");
}

TEST_F(ChangeViewTest, PeopleAreToldWhatIsNotAsAskedAndHowMuchIs) {
    const Settings settings = SettingsOf(false, true);
    ChangeView view("pin", FileState::Pinned, FileState::Pinning, settings, sink_);
    view.Put({kA, FileState::Pinned, std::nullopt});
    EXPECT_TRUE(view.IsAllAsAsked());
    view.Put({kB, FileState::Pinning, ChangeReason::NotTaken});
    EXPECT_FALSE(view.IsAllAsAsked());
    view.Skip("/volume1/c\n", SkipReason::Name);
    view.Skip("/volume1/d", SkipReason::NoBlocks);
    view.Skip("/volume1/e ", SkipReason::Name);
    view.End(1, {"/volume1/e\n"}, {});
    EXPECT_EQ(sink_.Kept(), "pinning  /volume1/b\\xff: not-taken\n"
                            "left out  /volume1/c\\x0a: name\n"
                            "left out  /volume1/d: no-blocks\n"
                            "left out  /volume1/e : name\n"
                            "1 file pinned, 1 not, 3 left out (2 name, 1 no-blocks), in 1 request; "
                            "1 neighbour pinned again\n");
}

TEST_F(ChangeViewTest, WhoDoesNotWaitIsContentWithWhatIsUnderway) {
    for (const bool waits : {true, false}) {
        const Settings settings = SettingsOf(false, waits);
        ChangeView view("pin", FileState::Pinned, FileState::Pinning, settings, sink_);
        view.Put({kA, FileState::Pinning, std::nullopt});
        EXPECT_EQ(view.IsAllAsAsked(), !waits);
        view.Put({kA, FileState::Partial, std::nullopt});
        EXPECT_FALSE(view.IsAllAsAsked());
    }
    const Settings settings = SettingsOf(false, false);
    TextSink sink;
    ChangeView view("pin", FileState::Pinned, FileState::Pinning, settings, sink);
    view.Put({kA, FileState::Pinning, std::nullopt});
    view.End(1, {}, {});
    EXPECT_EQ(sink.Kept(), "1 file pinned or pinning, 0 not, 0 left out, in 1 request\n");
}

TEST_F(ChangeViewTest, WhatIsLeftOutIsNotAsAsked) {
    const Settings settings = SettingsOf(false, true, true);
    ChangeView view("unpin", FileState::Unpinned, FileState::Unpinning, settings, sink_);
    view.Put({kA, FileState::Missing, ChangeReason::NeedsRepair});
    EXPECT_EQ(sink_.Kept(), "\033[31mmissing\033[0m  /volume1/a: needs-repair\n");
    TextSink sink;
    ChangeView other("pin", FileState::Pinned, FileState::Pinning, settings, sink);
    other.Skip(kA, SkipReason::NoRoom);
    EXPECT_FALSE(other.IsAllAsAsked());
}

TEST_F(ChangeViewTest, EachReasonHasItsName) {
    EXPECT_STREQ(ChangeReasonText(ChangeReason::Dropped), "dropped");
    EXPECT_STREQ(ChangeReasonText(ChangeReason::Vanished), "vanished");
    EXPECT_STREQ(ChangeReasonText(ChangeReason::NotTaken), "not-taken");
    EXPECT_STREQ(ChangeReasonText(ChangeReason::NeedsRepair), "needs-repair");
}
} // namespace vesk
