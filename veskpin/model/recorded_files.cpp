#include "model/recorded_files.h"

#include "base/malloc_text.h"
#include "model/look_errors.h"
#include "request/file_inode_list.h"
#include "space/relative_path.h"

#include <algorithm>
#include <map>

namespace vesk {
namespace {
struct Want {
    int type = kRequestUnknown;
    std::optional<uint32_t> inode; // absent: the service has not asked for it yet
};

// The last request for each path.
using Wanted = std::map<std::string, Want>;

void AddStored(const StoredRequest &request, KnownFiles *known, Wanted *wanted) {
    ++known->requests;
    std::vector<FileInfo> infos;
    if (RequestHasFiles(request.type) &&
        RequestDataGetFileInfos(request.data.c_str(), &infos) < 0) {
        known->problems.push_back("request " + request.number + ": " +
                                  LookLogTake("its list of files cannot be read"));
    }
    for (const FileInfo &info : infos) {
        (*wanted)[info.szRelativePath] = {request.type, static_cast<uint32_t>(info.inodeNum)};
    }
}

// The paths as the receiver will store them. It stores none of a request with one that it refuses,
// but then ends: until it is started again, who sent the others waits for them.
void AddSent(const RequestRecord &request, KnownFiles *known, Wanted *wanted) {
    ++known->sent;
    std::vector<std::string> paths;
    if (RequestHasFiles(request.type)) {
        SplitString(request.data, ";", &paths);
    }
    for (const std::string &path : paths) {
        const MallocText relativePath(
            FileGetRelativePathByMountPath(request.mountPath, path.c_str()));
        if (relativePath) {
            (*wanted)[relativePath.get()] = {request.type, std::nullopt};
        }
    }
    LookLogTake("");
}

bool IsBefore(const KnownFile &a, const KnownFile &b) {
    return a.relativePath < b.relativePath;
}
} // namespace

KnownFiles KnownFilesOf(const std::string &mountPath, RecordedVolume *volume,
                        const std::vector<StoredRequest> &requests,
                        const std::vector<RequestRecord> &sent) {
    KnownFiles known;
    Wanted wanted;
    for (const StoredRequest &request : requests) {
        if (request.mountPath == mountPath) {
            AddStored(request, &known, &wanted);
        }
    }
    for (const RequestRecord &request : sent) {
        if (request.mountPath == mountPath) {
            AddSent(request, &known, &wanted);
        }
    }
    if (volume != nullptr) {
        known.recorded = volume->files.size();
        known.files.reserve(volume->files.size() + wanted.size());
        for (RecordedFile &file : volume->files) {
            known.files.push_back({std::move(file.relativePath), file.inode, kRequestUnknown});
        }
        volume->files.clear();
    }
    const size_t recorded = known.files.size();
    for (const auto &[path, want] : wanted) {
        const auto [first, last] = std::equal_range(
            known.files.begin(), known.files.begin() + static_cast<std::ptrdiff_t>(recorded),
            KnownFile{path, std::nullopt, 0}, IsBefore);
        for (auto file = first; file != last; ++file) {
            file->stored = want.type;
            file->storedInode = want.inode;
        }
        if (first == last) {
            known.files.push_back({path, std::nullopt, want.type, want.inode});
        }
    }
    std::inplace_merge(known.files.begin(),
                       known.files.begin() + static_cast<std::ptrdiff_t>(recorded),
                       known.files.end(), IsBefore);
    for (size_t i = 0; i < known.files.size(); ++i) {
        const KnownFile &file = known.files[i];
        if (file.inode) {
            known.byInode.emplace_back(*file.inode, i);
        }
        if (file.storedInode && file.storedInode != file.inode) {
            known.byInode.emplace_back(*file.storedInode, i);
        }
    }
    std::sort(known.byInode.begin(), known.byInode.end());
    return known;
}

std::pair<size_t, size_t> KnownFilesAt(const KnownFiles &known, const std::string &relativePath) {
    const auto [first, last] = std::equal_range(known.files.begin(), known.files.end(),
                                                KnownFile{relativePath, std::nullopt, 0}, IsBefore);
    return {first - known.files.begin(), last - known.files.begin()};
}

std::pair<size_t, size_t> KnownFilesBelow(const KnownFiles &known, const std::string &folder) {
    if (folder.empty()) {
        return {0, known.files.size()};
    }
    // "0" is the character after "/".
    const auto at = [&](const std::string &text) {
        return std::lower_bound(known.files.begin(), known.files.end(),
                                KnownFile{text, std::nullopt, 0}, IsBefore) -
               known.files.begin();
    };
    return {at(folder + "/"), at(folder + "0")};
}

std::optional<KnownFile> KnownFileByInode(const KnownFiles &known, uint64_t inode) {
    const auto wanted = static_cast<uint32_t>(inode);
    std::optional<KnownFile> found;
    for (auto entry = std::lower_bound(known.byInode.begin(), known.byInode.end(),
                                       std::make_pair(wanted, size_t{0}));
         entry != known.byInode.end() && entry->first == wanted; ++entry) {
        const KnownFile &file = known.files[entry->second];
        const bool isRecorded = file.inode == wanted;
        if (!found || (isRecorded && !found->inode)) {
            found = {file.relativePath, isRecorded ? file.inode : std::nullopt,
                     found ? found->stored : kRequestUnknown};
        }
        if (file.stored != kRequestUnknown && file.storedInode.value_or(wanted) == wanted) {
            found->stored = file.stored;
        }
    }
    return found;
}
} // namespace vesk
