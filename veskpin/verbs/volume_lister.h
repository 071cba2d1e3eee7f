// The files of one volume as `list` tells of them. Thread rule: one owner.
#pragma once

#include "model/file_look.h"
#include "model/renamed.h"
#include "model/world.h"
#include "text/progress.h"
#include "verbs/list.h"

#include <functional>
#include <optional>
#include <string>
#include <utility>

namespace vesk {
// A folder that is being summed up, with its blocks.
struct ListSum {
    ListedFolder folder;
    BlockSet blocks;
};

class VolumeLister {
public:
    using Visit = std::function<void(const ListedFile &)>;

    // What cannot be looked at goes to the world's errors. With `search` renamed files are looked
    // for first.
    VolumeLister(const WorldVolume &volume, std::optional<ProgressForm> search, World &world,
                 const Visit &visit);

    // The known files with these indexes, each path once. `sum` may be null, here and below.
    void ListKnown(std::pair<size_t, size_t> range, ListSum *sum);

    // A file that was asked for.
    void ListAsked(const std::string &relativePath);

    // The files of a folder that the configuration does not know by their paths.
    void ListUnknown(const std::string &folder, ListSum *sum);

    ListSum SumOf(const std::string &path) const;
    ListedFolder Total(ListSum sum) const;

private:
    std::string PathOf(const std::string &relativePath) const;
    const KnownFile *KnownOf(std::pair<size_t, size_t> range, const FileLook &look);
    void ListPath(const std::string &relativePath, const FileStat *status,
                  std::pair<size_t, size_t> range, ListSum *sum);
    std::optional<FileState> StateOf(const KnownFile *known, const FileLook &look,
                                     const FileFigures &figures);
    void ListRenamed(const std::string &path, uint32_t inode, const std::string &relativePath);
    void NoteWhatIsHidden(const std::string &path, const FileLook &look);

    const WorldVolume &world_;
    LookErrors &errors_;
    const Visit &visit_;
    const bool isConfigKnown_; // without it, and the queue, no file's state can be told
    FileLooker looker_;
    RenamedFiles renamed_;
    FileLook absent_;                  // of every file where the volume is not there
    std::optional<KnownFile> ofInode_; // what KnownOf points to
};
} // namespace vesk
