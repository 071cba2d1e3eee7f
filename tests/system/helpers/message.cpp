// system_message send KEY_FILE TYPE [COUNT] <TEXT
// system_message receive KEY_FILE TYPE >TEXT
//
// Puts messages of any type and text on the queue that the key file names, or takes one off it.
// Ends with 1 where the queue refuses: it is full, or holds no message of that type.
#include <cerrno>
#include <cstdio>
#include <cstdlib>
#include <cstring>
#include <fstream>
#include <iostream>
#include <iterator>
#include <string>
#include <sys/ipc.h>
#include <sys/msg.h>
#include <vector>

namespace {

constexpr size_t kTextBytes = 8192; // the largest message that Linux allows by default

struct Message {
    long type;
    char text[kTextBytes];
};

int Fail(const char *what) {
    fprintf(stderr, "system_message: %s: %s\n", what, strerror(errno));
    return 1;
}

int OpenQueue(const char *keyFile) {
    std::ifstream stream(keyFile);
    int key = 0;
    stream >> key;
    return stream.fail() ? -1 : msgget(key, 0);
}

int Send(int queue, Message &message, long count) {
    std::vector<char> text((std::istreambuf_iterator<char>(std::cin)),
                           std::istreambuf_iterator<char>());
    if (text.size() > sizeof(message.text)) {
        errno = EMSGSIZE;
        return Fail("send");
    }
    if (!text.empty()) {
        memcpy(message.text, text.data(), text.size());
    }
    for (long i = 0; i < count; ++i) {
        if (msgsnd(queue, &message, text.size(), IPC_NOWAIT) != 0) {
            return Fail("send");
        }
    }
    return 0;
}

int Receive(int queue, Message &message) {
    const ssize_t bytes = msgrcv(queue, &message, sizeof(message.text), message.type, IPC_NOWAIT);
    if (bytes < 0) {
        return Fail("receive");
    }
    return fwrite(message.text, 1, static_cast<size_t>(bytes), stdout) ==
                       static_cast<size_t>(bytes) &&
                   fflush(stdout) == 0
               ? 0
               : Fail("write");
}

} // namespace

int main(int argc, char **argv) {
    if (argc < 4) {
        fputs("usage: system_message send|receive KEY_FILE TYPE [COUNT]\n", stderr);
        return 2;
    }
    const int queue = OpenQueue(argv[2]);
    if (queue < 0) {
        return Fail(argv[2]);
    }
    Message message{};
    message.type = strtol(argv[3], nullptr, 10);
    if (strcmp(argv[1], "send") == 0) {
        return Send(queue, message, argc > 4 ? strtol(argv[4], nullptr, 10) : 1);
    }
    return Receive(queue, message);
}
