#include "tests/faults/walk_service.h"

#include "tests/faults/world.h"

#include <chrono>
#include <csignal>
#include <cstring>
#include <json/value.h>
#include <sstream>
#include <unistd.h>
#include <utility>

namespace vesk {
namespace {
using Clock = std::chrono::steady_clock;

const size_t kRecordBytes = 1540;
const size_t kDataAt = 4 + 512; // after type and mount path
const int32_t kPinFiles = 1;
const int32_t kUnpinFiles = 2;
const std::chrono::minutes kHang(5);
const useconds_t kPollMicroseconds = 500;

template <typename Condition> bool Await(Condition condition) {
    const Clock::time_point end = Clock::now() + kHang;
    while (!condition()) {
        if (Clock::now() > end) {
            return false;
        }
        usleep(kPollMicroseconds);
    }
    return true;
}

std::vector<std::string> Split(const std::string &text) {
    std::vector<std::string> parts;
    std::istringstream stream(text);
    for (std::string part; std::getline(stream, part, ';');) {
        parts.push_back(part);
    }
    return parts;
}

// "path#inode;path#inode"
StoredFiles OfList(bool isPin, const std::string &list) {
    StoredFiles request{isPin, {}};
    for (const std::string &entry : Split(list)) {
        const size_t at = entry.find('#');
        request.files.emplace_back(entry.substr(0, at),
                                   static_cast<uint32_t>(std::stoul(entry.substr(at + 1))));
    }
    return request;
}

// Absolute paths joined by ";". A path that is not there has no inode, 0.
StoredFiles OfPaths(bool isPin, const std::string &paths, const Disk &disk) {
    StoredFiles request{isPin, {}};
    for (const std::string &path : Split(paths)) {
        const std::string relativePath = path.substr(strlen(kWalkVolume) + 1);
        const auto file = disk.find(relativePath);
        request.files.emplace_back(relativePath, file == disk.end() ? 0 : file->second.inode);
    }
    return request;
}

Json::Value Document() {
    Json::Value root;
    WorldParse(WorldRead(kWalkConfig), root);
    return root;
}
} // namespace

void WalkService::Start() {
    read_ = 0;
    child_ = std::make_unique<Child>(
        program_, std::vector<std::string>{"--start-service", "--config-path", kWalkConfig},
        Fault{});
}

void WalkService::End(int signal, const Disk &disk) {
    const bool hasReceiverEnded = child_->HasFirstThreadEnded();
    child_->Signal(signal);
    const int status = child_->AwaitEnd();
    if (status != (signal == SIGKILL ? 128 + SIGKILL : 0)) {
        complaint_ = "the service ended with status " + std::to_string(status);
    }
    Learn(disk);
    NoteLost(signal == SIGKILL, hasReceiverEnded, disk);
    log_ += child_->Output();
    child_.reset();
}

void WalkService::NoteLost(bool mayBeLost, bool hasReceiverEnded, const Disk &disk) {
    const size_t lost = taken_.size() - learned_.size();
    bool mayBeRefused = false;
    if (lost == 1 && hasReceiverEnded) {
        for (const auto &[path, inode] : OfPaths(true, taken_.back().paths, disk).files) {
            mayBeRefused = mayBeRefused || inode == 0;
        }
    }
    if (lost > 1 || (lost == 1 && !mayBeLost && !mayBeRefused)) {
        complaint_ = "the service has lost a request";
    }
    if (hasReceiverEnded && lost == 0) {
        complaint_ = "the receiver has ended without a cause";
    }
    lost_ += lost;
    taken_.resize(learned_.size());
}

bool WalkService::AwaitTaken() const {
    return Await([&] { return WorldMessagesLeft() == 0 && child_->IsReceiverWaiting(); });
}

bool WalkService::IsIdle() const {
    return WorldMessagesLeft() == 0 && child_->AwaitQuiet() && Document()["requestQueue"].empty() &&
           WorldMessagesLeft() == 0;
}

bool WalkService::AwaitRest(const Disk &disk) {
    const bool isIdle = Await([&] {
        if (child_->HasFirstThreadEnded()) {
            End(SIGTERM, disk);
            Start();
        }
        return IsIdle();
    });
    Learn(disk);
    if (isIdle && learned_.size() < taken_.size()) {
        complaint_ = "the service has stored a request nowhere";
    }
    return isIdle;
}

void WalkService::ReadTaken() {
    const std::string report = child_->Report();
    for (; read_ + kRecordBytes <= report.size(); read_ += kRecordBytes) {
        int32_t type = 0;
        memcpy(&type, report.data() + read_, sizeof(type));
        if (type == kPinFiles || type == kUnpinFiles) {
            taken_.push_back({type == kPinFiles, report.data() + read_ + kDataAt});
        }
    }
}

void WalkService::Learn(const Disk &disk) {
    ReadTaken();
    const Json::Value document = Document();
    const long next = document.get("nextRequestNum", 0).asInt();
    while (learned_.size() < taken_.size()) {
        const Taken &taken = taken_[learned_.size()];
        const long number = first_ + static_cast<long>(learned_.size());
        if (number >= next) {
            return; // it is not stored
        }
        const Json::Value &stored = document["requests"][std::to_string(number)];
        learned_.push_back(stored.isNull() ? OfPaths(taken.isPin, taken.paths, disk)
                                           : OfList(taken.isPin, stored["data"].asString()));
    }
}

std::vector<StoredFiles> WalkService::Take() {
    first_ += static_cast<long>(learned_.size());
    taken_.clear();
    lost_ = 0;
    log_.clear();
    return std::exchange(learned_, {});
}
} // namespace vesk
