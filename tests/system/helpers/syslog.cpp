// system_syslog SOCKET FILE
//
// Owns the system log's socket and writes each datagram as one line to the file, with every line
// feed inside it as \n. The file exists as soon as the socket takes datagrams. On SIGTERM it writes
// what has been sent by then and ends with 0.
#include <cerrno>
#include <csignal>
#include <cstdio>
#include <cstring>
#include <poll.h>
#include <string>
#include <sys/socket.h>
#include <sys/un.h>
#include <unistd.h>

namespace {
volatile sig_atomic_t ending = 0;

void End(int /*signalNumber*/) {
    ending = 1;
}

// Lets SIGTERM come only during the waits with the returned mask.
sigset_t HoldTermination() {
    sigset_t termination;
    sigset_t before;
    sigemptyset(&termination);
    sigaddset(&termination, SIGTERM);
    sigprocmask(SIG_BLOCK, &termination, &before);
    signal(SIGTERM, End);
    return before;
}

int Fail(const char *what) {
    fprintf(stderr, "system_syslog: %s: %s\n", what, strerror(errno));
    return 1;
}

std::string LineOf(const char *bytes, size_t count) {
    std::string line;
    for (size_t i = 0; i < count; ++i) {
        if (bytes[i] == '\n') {
            line += "\\n";
        } else {
            line += bytes[i];
        }
    }
    return line + "\n";
}
} // namespace

int main(int argc, char **argv) {
    sockaddr_un address{};
    address.sun_family = AF_UNIX;
    if (argc != 3 || strlen(argv[1]) >= sizeof(address.sun_path)) {
        fputs("usage: system_syslog SOCKET FILE\n", stderr);
        return 2;
    }
    const sigset_t whileWaiting = HoldTermination();
    memcpy(address.sun_path, argv[1], strlen(argv[1]));
    unlink(argv[1]);
    const int log = socket(AF_UNIX, SOCK_DGRAM | SOCK_CLOEXEC, 0);
    if (log < 0 || bind(log, reinterpret_cast<sockaddr *>(&address), sizeof(address)) != 0) {
        return Fail(argv[1]);
    }
    FILE *file = fopen(argv[2], "we");
    if (file == nullptr) {
        return Fail(argv[2]);
    }
    pollfd readable = {log, POLLIN, 0};
    char datagram[65536];
    for (;;) {
        const ssize_t bytes = recv(log, datagram, sizeof(datagram), MSG_DONTWAIT);
        if (bytes < 0 && errno == EAGAIN) {
            if (ending != 0) {
                return 0;
            }
            ppoll(&readable, 1, nullptr, &whileWaiting);
            continue;
        }
        if (bytes < 0) {
            return Fail("recv");
        }
        const std::string line = LineOf(datagram, static_cast<size_t>(bytes));
        if (fwrite(line.data(), 1, line.size(), file) != line.size() || fflush(file) != 0) {
            return Fail("write");
        }
    }
}
