// passthrough FILE MOUNT_POINT: shows the file over the mount point through FUSE and hands reads on
// as they are: what a FUSE file costs without a cache behind it. Ends when it is unmounted.
#include <cerrno>
#include <cstdio>
#include <cstring>
#include <fcntl.h>
#include <sys/stat.h>
#include <unistd.h>

#define FUSE_USE_VERSION 312
#include <fuse_lowlevel.h>

namespace {
int backing = -1;

void GetAttributes(fuse_req_t request, fuse_ino_t /*inode*/, fuse_file_info * /*info*/) {
    struct stat status {};
    fstat(backing, &status);
    status.st_ino = FUSE_ROOT_ID;
    fuse_reply_attr(request, &status, 3600);
}

void Open(fuse_req_t request, fuse_ino_t /*inode*/, fuse_file_info *info) {
    info->fh = static_cast<uint64_t>(backing);
    fuse_reply_open(request, info);
}

void Read(fuse_req_t request, fuse_ino_t /*inode*/, size_t size, off_t offset,
          fuse_file_info * /*info*/) {
    fuse_bufvec buffer = FUSE_BUFVEC_INIT(size);
    buffer.buf[0].flags = static_cast<fuse_buf_flags>(FUSE_BUF_IS_FD | FUSE_BUF_FD_SEEK);
    buffer.buf[0].fd = backing;
    buffer.buf[0].pos = offset;
    fuse_reply_data(request, &buffer, FUSE_BUF_SPLICE_MOVE);
}

fuse_lowlevel_ops Operations() {
    fuse_lowlevel_ops operations{};
    operations.getattr = GetAttributes;
    operations.open = Open;
    operations.read = Read;
    return operations;
}
} // namespace

int main(int argc, char *argv[]) {
    if (argc != 3 || (backing = open(argv[1], O_RDONLY)) < 0) {
        fprintf(stderr, "usage: passthrough FILE MOUNT_POINT\n");
        return 2;
    }
    char *words[] = {argv[0], nullptr};
    fuse_args arguments = FUSE_ARGS_INIT(1, words);
    const fuse_lowlevel_ops operations = Operations();
    fuse_session *session = fuse_session_new(&arguments, &operations, sizeof(operations), nullptr);
    if (session == nullptr || fuse_session_mount(session, argv[2]) != 0) {
        return 1;
    }
    fuse_loop_config *config = fuse_loop_cfg_create();
    const int result = fuse_session_loop_mt(session, config);
    fuse_loop_cfg_destroy(config);
    fuse_session_unmount(session);
    fuse_session_destroy(session);
    return result;
}
