#include "tests/faults/world.h"

#include <cstdlib>
#include <cstring>
#include <filesystem>
#include <fstream>
#include <json/reader.h>
#include <memory>
#include <sstream>
#include <sys/ipc.h>
#include <sys/msg.h>
#include <sys/stat.h>
#include <unistd.h>

namespace vesk {
namespace {
const char kKeyFile[] = "/run/veskcachepinfile-msg-server.key";
const char kBitmapFile[] = "/volume1/veskcachepinfile.bitmap";
const size_t kBitmapBytes = 128; // of the 64 MiB volume

size_t messagesSent = 0;

struct Message {
    long type = 1;
    struct {
        int32_t type = 0;
        char mountPath[512] = {};
        char data[1024] = {};
    } record;
};

std::string Inode(const char *path) {
    struct stat status = {};
    stat(path, &status);
    return std::to_string(status.st_ino);
}

int Queue() {
    const key_t key = ftok(kKeyFile, 'x');
    return key == -1 ? -1 : msgget(key, 0);
}

void RemoveQueue() {
    const int queue = Queue();
    if (queue != -1) {
        msgctl(queue, IPC_RMID, nullptr);
    }
    std::filesystem::remove(kKeyFile);
}

void Send(const std::vector<char> &messages) {
    WorldWrite(kKeyFile, "");
    const key_t key = ftok(kKeyFile, 'x');
    const int queue = msgget(key, IPC_CREAT | 0644);
    WorldWrite(kKeyFile, std::to_string(key));
    for (const char kind : messages) {
        Message message;
        message.record.type = kind == 'u' ? 2 : kind == 'r' || kind == 'g' ? 6 : 1;
        strcpy(message.record.mountPath, kind == 'g' ? "/gone" : "/volume1");
        strcpy(message.record.data, kind == 'a'   ? "/volume1/a"
                                    : kind == 'c' ? "/volume1/c"
                                    : kind == 'u' ? "/volume1/b"
                                                  : "");
        msgsnd(queue, &message, sizeof(message.record), 0);
    }
}

long NextNumberIn(const std::string &text) {
    const std::string key = "\"nextRequestNum\" : ";
    const size_t at = text.find(key);
    return at == std::string::npos ? 0 : strtol(text.c_str() + at + key.size(), nullptr, 10);
}
} // namespace

std::string WorldDocument() {
    Json::Value root;
    root["nextRequestNum"] = 1;
    root["volumes"]["/volume1"]["files"][Inode("/volume1/b")] = "b";
    root["volumes"]["/gone"]["files"]["5"] = "x";
    return root.toStyledString();
}

std::string WorldBitmap() {
    std::string bitmap(kBitmapBytes, '\0');
    bitmap[1] = 1; // sectors 1024 to 1151
    return bitmap;
}

void WorldReset(const char *config, const std::vector<char> &messages) {
    const std::filesystem::path folder = std::filesystem::path(config).parent_path();
    std::filesystem::remove_all(folder);
    std::filesystem::create_directories(folder);
    WorldWrite(config, WorldDocument());
    WorldWrite(kBitmapFile, WorldBitmap());
    RemoveQueue();
    messagesSent = messages.size();
    if (!messages.empty()) {
        Send(messages);
    }
}

size_t WorldMessages() {
    return messagesSent;
}

int WorldMessagesLeft() {
    msqid_ds state = {};
    const int queue = Queue();
    return queue == -1 || msgctl(queue, IPC_STAT, &state) != 0 ? 0
                                                               : static_cast<int>(state.msg_qnum);
}

bool WorldSendPin(const std::string &paths, bool waiting) {
    Message message;
    message.record.type = 1;
    strcpy(message.record.mountPath, "/volume1");
    strncpy(message.record.data, paths.c_str(), sizeof(message.record.data) - 1);
    return msgsnd(Queue(), &message, sizeof(message.record), waiting ? 0 : IPC_NOWAIT) == 0;
}

bool WorldSendPending(bool isPending) {
    Message message;
    message.record.type = isPending ? 4 : 5;
    strcpy(message.record.mountPath, "/volume1");
    return msgsnd(Queue(), &message, sizeof(message.record), 0) == 0;
}

void WorldAwaitQueue() {
    while (Queue() == -1) {
        usleep(1000);
    }
}

long WorldRecords(const char *config) {
    Json::Value root;
    WorldParse(WorldRead(config), root);
    return static_cast<long>(root["volumes"]["/volume1"]["files"].size());
}

std::string WorldComplaint(const std::string &text) {
    if (text.empty()) {
        return "";
    }
    Json::Value root;
    if (!WorldParse(text, root)) {
        return "the configuration file is damaged";
    }
    if (root["requestQueue"].size() != root["requests"].size()) {
        return "queue and requests differ in number";
    }
    for (const Json::Value &number : root["requestQueue"]) {
        if (!root["requests"].isMember(number.asString())) {
            return "a queued number has no request";
        }
    }
    return "";
}

long WorldNextNumber(const char *config) {
    return NextNumberIn(WorldRead(config));
}

bool WorldIsIdle(const char *config, long next) {
    // The queue first: what is not there any more is then in the document or on its way to it,
    // which shows by the number.
    const bool allTaken = WorldMessagesLeft() == 0;
    const std::string text = WorldRead(config);
    return allTaken && NextNumberIn(text) == next &&
           (text.find("\"requestQueue\" : null") != std::string::npos ||
            text.find("\"requestQueue\"") == std::string::npos);
}

bool WorldParse(const std::string &text, Json::Value &root) {
    const std::unique_ptr<Json::CharReader> reader(Json::CharReaderBuilder().newCharReader());
    return reader->parse(text.data(), text.data() + text.size(), &root, nullptr);
}

std::string WorldRead(const std::string &path) {
    // By a stream and not by iterators, which throw where a process ends while its status is read.
    std::ostringstream content;
    content << std::ifstream(path, std::ios::binary).rdbuf();
    return content.str();
}

void WorldWrite(const std::string &path, const std::string &content) {
    std::ofstream(path, std::ios::binary | std::ios::trunc) << content;
}

bool WorldLeftovers(const std::string &path) {
    for (const auto &entry :
         std::filesystem::directory_iterator(std::filesystem::path(path).parent_path())) {
        const std::string name = entry.path().filename();
        if (entry.path() != path && name != "output" && name != "report") {
            return true;
        }
    }
    return false;
}
} // namespace vesk
