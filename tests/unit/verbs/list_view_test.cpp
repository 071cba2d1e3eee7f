#include "verbs/list.h"

#include <gtest/gtest.h>

namespace vesk {
namespace {
const std::string kVolume = "/volume1";
const std::string kNone;
const std::string kPath = "/volume1/share/a.txt";

FileFigures Figures() {
    FileFigures figures;
    figures.bytes = 70000;
    figures.extents = 2;
    figures.blocks = 3;
    figures.marked = 1;
    figures.resident = 0;
    return figures;
}

ListedFile File(FileState state, const std::string &path = kPath) {
    return {kVolume, path, 7, state, nullptr, Figures()};
}

// What is shown of these files and folders.
std::string Shown(bool json, bool color, const std::vector<ListedFile> &files,
                  const std::vector<ListedFolder> &folders = {}, const LookErrors &errors = {}) {
    TextSink sink;
    ListView view(sink, json, color);
    for (const ListedFile &file : files) {
        view.Put(file);
    }
    view.End(folders, errors);
    return sink.Kept();
}

const char kHeader[] = "STATE           SIZE    BLOCKS    MARKED    ON SSD   EXTENTS  FILE\n";
} // namespace

TEST(ListViewTest, ADocumentHasAllMembersOfEachFileAndFolder) {
    ListedFolder folder;
    folder.path = "/volume1/share";
    folder.files = 2;
    folder.filesPinned = 1;
    folder.blocks = 5;
    folder.marked = 4;
    LookErrors errors;
    LookErrorAdd(&errors, "/volume1/b", "is gone");
    EXPECT_EQ(Shown(true, false,
                    {File(FileState::Pinned), File(FileState::Partial, "/volume1/\xFF")}, {folder},
                    errors),
              R"({"command":"list","schema":1,"files":[{"volume":"/volume1",)"
              R"("path":"/volume1/share/a.txt","inode":7,"state":"pinned","pathNow":null,)"
              R"("bytes":70000,"blocks":3,"blocksMarked":1,"blocksResident":0,"extents":2},)"
              R"({"volume":"/volume1","path":"/volume1/\ufffd","pathBytes":"L3ZvbHVtZTEv/w==",)"
              R"("inode":7,"state":"partial","pathNow":null,"bytes":70000,"blocks":3,)"
              R"("blocksMarked":1,"blocksResident":0,"extents":2}],"folders":[)"
              R"({"path":"/volume1/share","files":2,"filesPinned":1,"blocks":5,"blocksMarked":4,)"
              R"("blocksResident":null}],"errors":[{"path":"/volume1/b","text":"is gone"}]})"
              "\n");
}

TEST(ListViewTest, WhatCannotBeHadIsNull) {
    const std::string now = "/volume1/now";
    EXPECT_EQ(Shown(true, false, {{kNone, kPath, std::nullopt, std::nullopt, &now, {}}}),
              R"({"command":"list","schema":1,"files":[{"volume":null,)"
              R"("path":"/volume1/share/a.txt","inode":null,"state":null,"pathNow":"/volume1/now",)"
              R"("bytes":null,"blocks":null,"blocksMarked":null,"blocksResident":null,)"
              R"("extents":null}],"folders":[],"errors":[]})"
              "\n");
}

TEST(ListViewTest, ATableHasARowForEachFile) {
    EXPECT_EQ(
        Shown(false, false, {File(FileState::Unreadable), File(FileState::Marked, "/v/a\nb c")}),
        std::string(kHeader) +
            "unreadable    68 KiB         3         1         0         2  "
            "/volume1/share/a.txt\n"
            "marked        68 KiB         3         1         0         2  /v/a\\x0ab c\n");
}

TEST(ListViewTest, ATableShowsADashForWhatCannotBeHadAndWhereAFileIsNow) {
    const std::string now = "/volume1/n\x1bw";
    EXPECT_EQ(Shown(false, false, {{kVolume, kPath, 7, std::nullopt, &now, {}}}),
              std::string(kHeader) +
                  "unknown            -         -         -         -         -  "
                  "/volume1/share/a.txt (now /volume1/n\\x1bw)\n");
}

TEST(ListViewTest, FoldersAreSummedUpBelowTheTable) {
    ListedFolder whole{"/v/a\n", 1, 1, 0, 3, 16};
    const ListedFolder unknown{"/v/b", 2, 0, {}, {}, {}};
    EXPECT_EQ(Shown(false, false, {File(FileState::Pinned)}, {whole, unknown}),
              std::string(kHeader) +
                  "pinned        68 KiB         3         1         0         2  "
                  "/volume1/share/a.txt\n"
                  "\n"
                  "/v/a\\x0a: 1 of 1 file pinned; 0 B in blocks, 192 KiB marked, 1.0 MiB on the "
                  "SSD\n"
                  "/v/b: 0 of 2 files pinned; unknown in blocks, unknown marked, unknown on the "
                  "SSD\n");
    EXPECT_EQ(Shown(false, false, {}, {unknown}),
              "/v/b: 0 of 2 files pinned; unknown in blocks, unknown marked, unknown on the SSD\n");
    EXPECT_EQ(Shown(false, false, {}), "");
}

TEST(ListViewTest, ErrorsOfATableGoToStandardError) {
    LookErrors errors;
    LookErrorAdd(&errors, "/v", "is gone");
    testing::internal::CaptureStderr();
    EXPECT_EQ(Shown(false, false, {}, {}, errors), "");
    EXPECT_EQ(testing::internal::GetCapturedStderr(), "veskpin: /v: is gone\n");
    testing::internal::CaptureStderr();
    Shown(true, false, {}, {}, errors);
    EXPECT_EQ(testing::internal::GetCapturedStderr(), "");
}

TEST(ListViewTest, ColourIsTheStates) {
    const std::pair<FileState, const char *> states[] = {
        {FileState::Pinned, "\033[32mpinned\033[0m "},
        {FileState::Marked, "\033[33mmarked\033[0m "},
        {FileState::Pinning, "\033[33mpinning\033[0m "},
        {FileState::Unpinning, "\033[33munpinning\033[0m "},
        {FileState::Partial, "\033[31mpartial\033[0m "},
        {FileState::Unmarked, "\033[31munmarked\033[0m "},
        {FileState::Replaced, "\033[31mreplaced\033[0m "},
        {FileState::Renamed, "\033[31mrenamed\033[0m "},
        {FileState::Missing, "\033[31mmissing\033[0m "},
        {FileState::Unreadable, "\033[31munreadable\033[0m "},
        {FileState::Unpinned, "unpinned "},
    };
    for (const auto &[state, expected] : states) {
        const std::string text = Shown(false, true, {File(state)});
        const std::string begin = "\033[1m" + std::string(kHeader) + "\033[0m" + expected;
        EXPECT_EQ(text.substr(0, begin.size()), begin);
    }
    const std::string unknown =
        Shown(false, true, {{kVolume, kPath, 7, std::nullopt, nullptr, {}}});
    EXPECT_NE(unknown.find("\033[33munknown\033[0m    "), std::string::npos) << unknown;
}

TEST(ListViewTest, AllIsPinnedOnlyWhereEachFileIs) {
    const auto isAllPinned = [](const std::vector<std::optional<FileState>> &states) {
        TextSink sink;
        ListView view(sink, true, false);
        for (const auto &state : states) {
            view.Put({kVolume, kPath, 7, state, nullptr, {}});
        }
        return view.IsAllPinned();
    };
    EXPECT_TRUE(isAllPinned({}));
    EXPECT_TRUE(isAllPinned({FileState::Pinned, FileState::Pinned}));
    EXPECT_FALSE(isAllPinned({FileState::Pinned, FileState::Marked, FileState::Pinned}));
    EXPECT_FALSE(isAllPinned({FileState::Unpinned, FileState::Pinned}));
    EXPECT_FALSE(isAllPinned({std::nullopt}));
}
} // namespace vesk
