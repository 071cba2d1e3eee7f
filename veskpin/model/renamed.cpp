#include "model/renamed.h"

#include "files/file_whole.h"
#include "model/path_walk.h"
#include "json/json_text.h"

#include <cerrno>
#include <cstdlib>
#include <cstring>

namespace vesk {
namespace {
const char kLastFolder[] = "/var/lib/veskpin/last/";
const size_t kLastMaxBytes = size_t{256} << 20;

using Births = std::map<uint32_t, int64_t>; // inode, birth time

uint32_t InodeOf(const std::string &text) {
    return static_cast<uint32_t>(strtoull(text.c_str(), nullptr, 10));
}

Births LastBirths(const std::string &uuid, LookErrors *errors) {
    const std::string path = kLastFolder + uuid + ".json";
    std::string text;
    const int error = FileReadAll(path, kLastMaxBytes, &text);
    if (error != 0) {
        if (error != ENOENT) {
            LookUnknownAdd(errors, path, strerror(error));
        }
        return {};
    }
    const auto records = JsonReadRecords(text, "files");
    if (!records) {
        LookUnknownAdd(errors, path, "no copy of records");
        return {};
    }
    Births births;
    for (const JsonRecord &record : *records) {
        const auto inode = record.find("inode");
        const auto birth = record.find("birth");
        if (inode != record.end() && birth != record.end()) {
            births[InodeOf(inode->second)] = strtoll(birth->second.c_str(), nullptr, 10);
        }
    }
    return births;
}

// The birth times of the recorded files that are not at their paths.
Births WantedOf(const WorldVolume &world, const Births &last, FileLooker &looker) {
    Births wanted;
    for (const KnownFile &file : world.known.files) {
        const auto birth = file.inode ? last.find(*file.inode) : last.end();
        if (birth == last.end() || birth->second == 0) {
            continue;
        }
        FileStat status{};
        const int error = looker.Stat(file.relativePath, &status);
        if (error != 0 || static_cast<uint32_t>(status.inode) != *file.inode) {
            wanted.insert(*birth);
        }
    }
    return wanted;
}
} // namespace

RenamedFiles RenamedFind(const WorldVolume &world, ProgressForm progress, LookErrors *errors) {
    RenamedFiles found;
    if (!world.volume.isMounted || !world.volume.uuid) {
        return found;
    }
    FileLooker looker(world.volume.mountPath);
    if (looker.Error() != 0) {
        return found;
    }
    const Births wanted = WantedOf(world, LastBirths(*world.volume.uuid, errors), looker);
    if (wanted.empty()) {
        return found;
    }
    Progress walked(progress, 0);
    PathWalk(looker, "", [&](const WalkEntry &entry) {
        walked.Step();
        if (entry.kind != WalkKind::File) {
            return true;
        }
        const auto file = wanted.find(static_cast<uint32_t>(entry.status.inode));
        if (file != wanted.end() && file->second == entry.status.birth) {
            found.emplace(file->first, entry.relativePath);
        }
        return true;
    });
    return found;
}
} // namespace vesk
