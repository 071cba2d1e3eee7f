#include "storage_core/mount_table.h"

#include "base/deleter.h"

#include <libmount/libmount.h>

#include <algorithm>
#include <memory>

namespace vesk {
namespace {
std::string TextOrEmpty(const char *text) {
    return text == nullptr ? "" : text;
}

MountEntry EntryMake(libmnt_fs *fs) {
    MountEntry entry;
    entry.id = mnt_fs_get_id(fs);
    entry.parentId = mnt_fs_get_parent_id(fs);
    entry.device = mnt_fs_get_devno(fs);
    entry.root = TextOrEmpty(mnt_fs_get_root(fs));
    entry.target = TextOrEmpty(mnt_fs_get_target(fs));
    entry.type = TextOrEmpty(mnt_fs_get_fstype(fs));
    entry.source = TextOrEmpty(mnt_fs_get_source(fs));
    entry.options = TextOrEmpty(mnt_fs_get_fs_options(fs));
    return entry;
}

bool IsAtOrBelow(const std::string &path, const std::string &directory) {
    if (directory == "/") {
        return !path.empty() && path.front() == '/';
    }
    return path.compare(0, directory.size(), directory) == 0 &&
           (path.size() == directory.size() || path[directory.size()] == '/');
}

// The mounts at the top have one that the table does not show, or themselves.
bool HasParent(const MountEntry &entry, const std::vector<MountEntry> &entries) {
    return std::any_of(entries.begin(), entries.end(), [&](const MountEntry &other) {
        return other.id == entry.parentId && other.id != entry.id;
    });
}
} // namespace

bool MountTableRead(const char *path, std::vector<MountEntry> &entries) {
    entries.clear();
    const std::unique_ptr<libmnt_table, Deleter<mnt_unref_table>> table(mnt_new_table());
    const std::unique_ptr<libmnt_iter, Deleter<mnt_free_iter>> iterator(
        mnt_new_iter(MNT_ITER_FORWARD));
    // Not what makes a table of a file at once: that looks at the file's dates, where a 32-bit
    // build of the library knows none past 2038.
    if (table == nullptr || iterator == nullptr || mnt_table_parse_file(table.get(), path) != 0) {
        return false;
    }
    libmnt_fs *fs = nullptr;
    while (mnt_table_next_fs(table.get(), iterator.get(), &fs) == 0) {
        entries.push_back(EntryMake(fs));
    }
    return true;
}

const MountEntry *MountFindByDevice(const std::vector<MountEntry> &entries, dev_t device) {
    for (const MountEntry &entry : entries) {
        if (entry.device == device && entry.type != "autofs") {
            return &entry;
        }
    }
    return nullptr;
}

const MountEntry *MountFindByPath(const std::vector<MountEntry> &entries, const std::string &path) {
    // As the kernel walks: from the mount on which the walk stands to the first mount point on it
    // that the path meets. What lies below a mount point and was mounted before it is never met.
    const MountEntry *found = nullptr;
    for (size_t steps = 0; steps < entries.size(); ++steps) {
        const MountEntry *next = nullptr;
        for (const MountEntry &entry : entries) {
            if (entry.target.empty() || !IsAtOrBelow(path, entry.target)) {
                continue;
            }
            const bool isHere = found == nullptr
                                    ? !HasParent(entry, entries)
                                    : entry.parentId == found->id && entry.id != found->id;
            if (isHere && (next == nullptr || entry.target.size() < next->target.size())) {
                next = &entry;
            }
        }
        if (next == nullptr) {
            break;
        }
        found = next;
    }
    return found;
}

std::string MountOptionValue(const MountEntry &entry, const char *name) {
    char *value = nullptr;
    size_t length = 0;
    if (mnt_optstr_get_option(entry.options.c_str(), name, &value, &length) != 0 ||
        value == nullptr) {
        return {};
    }
    return std::string(value, length);
}

bool FileSystemIsMappable(const MountEntry &mount) {
    if (mount.type == "xfs") {
        // Extents on a separate realtime device are addressed from that device's start.
        return MountOptionValue(mount, "rtdev").empty();
    }
    return mount.type == "ext2" || mount.type == "ext3" || mount.type == "ext4";
}
} // namespace vesk
