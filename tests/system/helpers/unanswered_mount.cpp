// system_unanswered_mount MOUNT_POINT SOURCE
//
// Makes a FUSE mount as any user may, with fusermount3 and "allow_other", and answers nothing:
// whoever asks the mounted file system for anything waits until this program ends. Prints "mounted"
// when it is.
#include "base/scoped_fd.h"

#include <cstdio>
#include <cstdlib>
#include <cstring>
#include <string>
#include <sys/socket.h>
#include <sys/wait.h>
#include <unistd.h>

using namespace vesk;

namespace {
// The descriptor that the other end sends, or none.
ScopedFd Receive(int socket) {
    char letter = 0;
    iovec text{&letter, 1};
    alignas(cmsghdr) char control[CMSG_SPACE(sizeof(int))];
    msghdr message{};
    message.msg_iov = &text;
    message.msg_iovlen = 1;
    message.msg_control = control;
    message.msg_controllen = sizeof(control);
    if (recvmsg(socket, &message, 0) <= 0) {
        return ScopedFd();
    }
    const cmsghdr *header = CMSG_FIRSTHDR(&message);
    int fd = -1;
    if (header != nullptr && header->cmsg_type == SCM_RIGHTS) {
        memcpy(&fd, CMSG_DATA(header), sizeof(fd));
    }
    return ScopedFd(fd);
}
} // namespace

int main(int argc, char *argv[]) {
    if (argc != 3) {
        fprintf(stderr, "system_unanswered_mount: two arguments expected\n");
        return 2;
    }
    int ends[2];
    if (socketpair(AF_UNIX, SOCK_STREAM, 0, ends) != 0) {
        return 1;
    }
    const ScopedFd ours(ends[0]);
    const pid_t child = fork();
    if (child == 0) {
        setenv("_FUSE_COMMFD", std::to_string(ends[1]).c_str(), 1);
        const std::string options = std::string("allow_other,fsname=") + argv[2];
        execlp("fusermount3", "fusermount3", "-o", options.c_str(), "--", argv[1], nullptr);
        _exit(127);
    }
    close(ends[1]);
    const ScopedFd connection = Receive(ours.Get());
    int status = 0;
    if (waitpid(child, &status, 0) != child || status != 0 || !connection.IsOpen()) {
        fprintf(stderr, "system_unanswered_mount: fusermount3 mounts nothing\n");
        return 1;
    }
    printf("mounted\n");
    fflush(stdout);
    for (;;) {
        pause();
    }
}
