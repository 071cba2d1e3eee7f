// system_message send KEY_FILE TYPE [COUNT] <TEXT
// system_message receive KEY_FILE TYPE >TEXT
// system_message make KEY_FILE MODE
// system_message record TYPE MOUNT_PATH DATA >TEXT
//
// Puts messages of any type and text on the queue that the key file names, or takes one off it, or
// makes one at the key that the tool makes of the file, with an octal mode. The last prints a
// request record: 4 bytes of type, then the texts, each cut or filled with NUL bytes to its field
// of 512 and 1024 bytes. Ends with 1 where the queue refuses: it is full, or holds no message of
// that type.
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

int Make(const char *keyFile, const char *mode) {
    const int flags = static_cast<int>(strtol(mode, nullptr, 8)) | IPC_CREAT | IPC_EXCL;
    return msgget(ftok(keyFile, 'x'), flags) < 0 ? Fail("make") : 0;
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

int PrintRecord(const char *type, const std::string &mountPath, const std::string &data) {
    const auto value = static_cast<unsigned long>(strtol(type, nullptr, 10));
    std::string record(4 + 512 + 1024, '\0');
    for (unsigned i = 0; i < 4; ++i) {
        record[i] = static_cast<char>(value >> (8 * i) & 255);
    }
    mountPath.copy(&record[4], 512);
    data.copy(&record[4 + 512], 1024);
    return fwrite(record.data(), 1, record.size(), stdout) == record.size() ? 0 : 1;
}
} // namespace

int main(int argc, char **argv) {
    if (argc < 4) {
        fputs("usage: system_message send|receive KEY_FILE TYPE [COUNT]\n"
              "       system_message make KEY_FILE MODE\n"
              "       system_message record TYPE MOUNT_PATH DATA\n",
              stderr);
        return 2;
    }
    if (strcmp(argv[1], "record") == 0 && argc == 5) {
        return PrintRecord(argv[2], argv[3], argv[4]);
    }
    if (strcmp(argv[1], "make") == 0) {
        return Make(argv[2], argv[3]);
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
