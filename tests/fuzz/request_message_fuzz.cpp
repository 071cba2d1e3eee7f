// Messages of any bytes through the receiver, from a real queue into a configuration file. The
// document stays one that can be used, and every message is taken.
//
// Input: messages, each a length (2 bytes) and its text.
#include "tests/fuzz/fuzz_input.h"

#include "base/log.h"
#include "config/config_document.h"
#include "request/message_queue.h"
#include "service/receiver.h"
#include "service/signal_handler.h"
#include "state/service_state.h"
#include "tests/support/private_world.h"

#include <cstdio>
#include <cstdlib>
#include <filesystem>
#include <json/value.h>
#include <pthread.h>

namespace vesk {
namespace {
bool Prepare() {
    EnterPrivateWorld();
    if (!PrivateWorldMissing().empty()) {
        fprintf(stderr, "%s\n", PrivateWorldMissing().c_str());
        exit(77);
    }
    LogToSyslog = 0;
    LogLevel = 0;
    return true;
}

void *Receive(void *path) {
    GetRequests(static_cast<const char *>(path));
}

// A record that the receiver refuses, and so ends at.
std::string End() {
    return RecordBytes(6, "");
}
} // namespace

extern "C" int LLVMFuzzerTestOneInput(const uint8_t *data, size_t size) {
    static const bool prepared = Prepare();
    static const std::string path = FuzzPath("config.json");
    if (!prepared) {
        return 0;
    }
    EmptyPrivateWorld();
    std::filesystem::remove(path);
    ServiceStateInitialize();
    SetServiceThreads(2); // this one's end must not look like the service's
    const int queue = MsgQueueGet(kMessageKeyFile);
    FuzzInput input(data, size);
    for (int messages = 0; messages < 8 && !input.IsEmpty(); ++messages) {
        PutMessage(queue, kRequestMessageType,
                   input.Text(input.Number(2) % (kRequestMessageBytes + 1)));
    }
    PutMessage(queue, kRequestMessageType, End());
    pthread_t thread{};
    FuzzExpect(pthread_create(&thread, nullptr, Receive, const_cast<char *>(path.c_str())) == 0,
               "a thread can be made");
    pthread_join(thread, nullptr);
    Json::Value root;
    FuzzExpect(!std::filesystem::exists(path) || ConfigReadDocument(path.c_str(), &root) == 0,
               "the document can be used");
    return 0;
}
} // namespace vesk
