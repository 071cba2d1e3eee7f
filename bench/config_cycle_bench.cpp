// One cycle of the configuration file, adding a request and finishing it, with pinned files
// recorded; against the same two readings and writings with jsoncpp alone.
#include "bench_names.h"

#include "base/log.h"
#include "config/pinned_files.h"
#include "config/request_queue.h"
#include "request/request_record.h"
#include "state/service_state.h"

#include <cstdio>
#include <cstdlib>
#include <cstring>
#include <fstream>
#include <iterator>
#include <json/reader.h>
#include <json/writer.h>
#include <memory>
#include <unistd.h>

namespace vesk {
namespace {
const char kPath[] = "/dev/shm/pins.json";
const char kNewPath[] = "/dev/shm/pins.json.new";

void MakeDocument(int64_t files) {
    Json::Value root;
    root["nextRequestNum"] = 1;
    root["requestQueue"] = Json::Value();
    root["requests"] = Json::Value(Json::objectValue);
    for (int64_t i = 0; i < files; ++i) {
        root["volumes"]["/volume1"]["files"][std::to_string(100000 + i)] =
            "share/folder/file" + std::to_string(i);
    }
    std::ofstream(kPath) << root;
}

void Cycle(benchmark::State &state) {
    LogToSyslog = 0;
    ServiceStateInitialize();
    MakeDocument(state.range(0));
    RequestRecord record{};
    record.type = kRequestReloadPinBlocks;
    strcpy(record.mountPath, "/volume1");
    int number = 1;
    for (auto _ : state) {
        if (ConfigAddRequest(kPath, &record) != 0 ||
            ConfigUpdatedByFinishedRequest(kPath, &record, std::to_string(number++)) != 0) {
            abort();
        }
    }
    unlink(kPath);
}

Json::Value ReadPlainly() {
    std::ifstream file(kPath);
    const std::string text((std::istreambuf_iterator<char>(file)),
                           std::istreambuf_iterator<char>());
    Json::Value root;
    const std::unique_ptr<Json::CharReader> reader(Json::CharReaderBuilder().newCharReader());
    reader->parse(text.data(), text.data() + text.size(), &root, nullptr);
    return root;
}

void WritePlainly(const Json::Value &root) {
    const std::string text = Json::writeString(Json::StreamWriterBuilder(), root);
    FILE *file = fopen(kNewPath, "w");
    fwrite(text.data(), 1, text.size(), file);
    fsync(fileno(file));
    fclose(file);
    rename(kNewPath, kPath);
}

void PlainCycle(benchmark::State &state) {
    MakeDocument(state.range(0));
    int number = 1;
    for (auto _ : state) {
        const std::string name = std::to_string(number++);
        Json::Value root = ReadPlainly();
        root["requestQueue"].append(name);
        root["requests"][name]["type"] = "reloadPinBlocks";
        WritePlainly(root);
        Json::Value again = ReadPlainly();
        again["requestQueue"].clear();
        again["requests"].removeMember(name);
        WritePlainly(again);
    }
    unlink(kPath);
}

const bool kRegistered = [] {
    BenchPair("config_cycle", {0, 100, 10000, 100000}, Cycle, PlainCycle);
    return true;
}();
} // namespace
} // namespace vesk
