// The answer of `list`, shown file by file, so that a hundred thousand need no more memory than
// their records.
//
// Thread rule: one owner.
#pragma once

#include "model/world.h"
#include "text/progress.h"
#include "text/text_sink.h"
#include "verbs/file_state.h"
#include "json/json_text.h"

#include <functional>
#include <optional>
#include <string>
#include <vector>

namespace vesk {
struct ListedFile {
    const std::string &volume; // mount path; empty: lies on no volume
    const std::string &path;   // absolute
    std::optional<uint64_t> inode;
    std::optional<FileState> state;
    const std::string *pathNow = nullptr; // of a renamed one
    FileFigures figures;
};

// A folder that was asked for. Blocks that its files share count once.
struct ListedFolder {
    std::string path;
    uint64_t files = 0; // that are there
    uint64_t filesPinned = 0;
    std::optional<uint64_t> blocks;
    std::optional<uint64_t> marked;
    std::optional<uint64_t> resident;
};

class ListView {
public:
    ListView(TextSink &out, bool json, bool color);
    void Put(const ListedFile &file);
    void End(const std::vector<ListedFolder> &folders, const LookErrors &errors);
    bool IsAllPinned() const { return isAllPinned_; }

private:
    TextSink &out_;
    JsonWriter writer_;
    const bool json_;
    const bool color_;
    bool isAllPinned_ = true;
    bool hasHeader_ = false;
};

struct ListResult {
    std::vector<ListedFolder> folders; // those among the paths, summed up
    size_t failedPaths = 0;            // paths that could not be looked at
};

// Looks at everything that is recorded or requested, or at the paths, and gives each file to
// `visit`. With `search` renamed files are looked for, and it is how that is shown.
ListResult ListLook(World &world, const std::vector<std::string> &paths,
                    std::optional<ProgressForm> search,
                    const std::function<void(const ListedFile &)> &visit);
} // namespace vesk
