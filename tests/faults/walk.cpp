#include "tests/faults/walk.h"

#include "tests/faults/walk_look.h"
#include "tests/faults/walk_order.h"
#include "tests/faults/world.h"

#include <algorithm>
#include <csignal>
#include <cstdlib>
#include <filesystem>
#include <unistd.h>

namespace vesk {
namespace {
const char kFolder[] = "/run/faults/";
const char kCacheListVariable[] = "VESK_FLASHCACHE_CONFIG";
const char kNoCaches[] = "{\"caches\":[]}\n";
const char kSectors[] = "131072"; // of the 64 MiB volume
const useconds_t kPollMicroseconds = 1000;
const int kSettledPolls = 100; // in which no further request is taken

// Whoever reads it sees the old or the new one.
void SetCacheList(const std::string &text) {
    const std::string path = getenv(kCacheListVariable);
    WorldWrite(path + ".new", text);
    std::filesystem::rename(path + ".new", path);
}

std::string Absolute(const std::string &path) {
    return std::string(kWalkVolume) + (path.empty() ? "" : "/") + path;
}
} // namespace

Walk::Walk(const std::string &companion, const Program &tool, unsigned seed)
    : companion_(companion), tool_(tool), random_(seed),
      cacheList_(WorldRead(getenv(kCacheListVariable))), service_(tool) {
    std::filesystem::create_directories(kFolder);
    DiskMake(random_);
    disk_ = DiskLook();
    service_.Start();
    service_.AwaitRest(disk_);
}

std::string Walk::Step() {
    told_.clear();
    ChangeFiles(Pick(random_, 4));
    const Scene scene = SceneChoose(random_, disk_, pins_);
    told_ += SceneText(scene) + "\n";
    Prepare(scene);
    StartClients(scene);
    Disturb(scene);
    Finish(scene);
    complaint_ += service_.Complaint();
    const std::string judged = complaint_.empty() ? Judge(scene) : "";
    return complaint_ + judged;
}

void Walk::ChangeFiles(size_t changes) {
    for (size_t i = 0; i < changes; ++i) {
        const std::string change = DiskChange(random_);
        told_ += change + (change.empty() ? "" : "\n");
    }
    disk_ = DiskLook();
}

void Walk::RunTool(const std::vector<std::string> &arguments) {
    Command command{{tool_.tool, "--stdout"}, "", std::string(kFolder) + "tool", "", ""};
    command.words.insert(command.words.end(), arguments.begin(), arguments.end());
    Child child(command);
    if (child.AwaitEnd() != 0) {
        complaint_ += arguments.front() + " has failed: " + child.Output();
    }
}

void Walk::Prepare(const Scene &scene) {
    if (scene.clearsMarks) {
        RunTool({"--unset-bitmap", "--mount-path", kWalkVolume, "--start-sector", "0",
                 "--num-sectors", kSectors});
        pins_.bits.clear();
    }
    if (scene.clearsMarks || scene.forgetsDriver) {
        RunTool({"--unpin-all", "--mount-path", kWalkVolume});
        PinsForgetDriver(&pins_);
    }
    if (scene.ending == Ending::ServiceAbsent) {
        service_.End(SIGTERM, disk_);
    }
    if (scene.ending == Ending::CacheAbsent) {
        SetCacheList(kNoCaches);
    }
    disk_ = DiskLook(); // the first bitmap file may have been made
    begin_ = disk_;
    if (scene.isPending) {
        WorldSendPending(true);
        service_.AwaitTaken();
    }
}

void Walk::StartClients(const Scene &scene) {
    clients_.clear();
    for (const Wish &wish : scene.wishes) {
        const std::string file = kFolder + std::to_string(clients_.size());
        Command command{{companion_, "--config", kWalkConfig, "--json"}, "", file, file + "e", ""};
        WorldWrite(command.output, ""); // it may be ended before it has a word
        WorldWrite(command.errors, "");
        command.words.emplace_back(wish.isPin ? "pin" : "unpin");
        if (!wish.waits) {
            command.words.emplace_back("--no-wait");
        }
        for (const std::string &target : wish.targets) {
            command.words.push_back(Absolute(target));
        }
        if (!scene.isAtOnce && !clients_.empty()) {
            AwaitClient(&clients_.back());
        }
        clients_.push_back({{}, std::make_unique<Child>(command)});
        clients_.back().attempt.wish = wish;
    }
}

void Walk::AwaitClient(Client *client) {
    if (!client->child) {
        return;
    }
    client->attempt.status = client->child->AwaitEnd();
    client->attempt.output = client->child->Output();
    client->attempt.errors = client->child->Errors();
    client->child.reset();
    if (client->attempt.status == -1) {
        complaint_ += "a client does not end\n";
    }
}

void Walk::AwaitClients() {
    for (Client &client : clients_) {
        AwaitClient(&client);
    }
}

void Walk::KillService() {
    service_.End(SIGKILL, disk_);
    for (Client &client : clients_) {
        client.attempt.wasServiceEnded = true;
    }
}

void Walk::Disturb(const Scene &scene) {
    switch (scene.ending) {
    case Ending::ClientSignal:
        usleep(scene.momentUs);
        clients_.front().attempt.signal = scene.signal;
        clients_.front().child->Signal(scene.signal);
        break;
    case Ending::ServiceKill:
        usleep(scene.momentUs);
        KillService();
        service_.Start();
        break;
    case Ending::ServiceGone:
        usleep(scene.momentUs);
        KillService();
        AwaitClients();
        service_.Start();
        break;
    case Ending::ServiceAbsent:
        clients_.front().attempt.wasServiceEnded = true;
        AwaitClients();
        service_.Start();
        break;
    case Ending::CacheAbsent:
        clients_.front().attempt.wasCacheAbsent = true;
        AwaitClients();
        SetCacheList(cacheList_);
        break;
    case Ending::Calm:
    case Ending::CacheLost: break;
    }
    if (scene.isPending) {
        EndPending(scene);
    }
}

// Until the clients have ended or wait: then they have sent what they send now.
void Walk::AwaitHeld() {
    size_t taken = 0;
    for (int same = 0; same < kSettledPolls; ++same) {
        const bool haveEnded =
            std::all_of(clients_.begin(), clients_.end(), [](const Client &client) {
                return !client.child || client.child->HasEnded();
            });
        service_.AwaitTaken();
        service_.Learn(disk_);
        if (haveEnded) {
            return;
        }
        if (service_.TakenCount() != taken) {
            same = 0;
            taken = service_.TakenCount();
        }
        usleep(kPollMicroseconds);
    }
}

void Walk::EndPending(const Scene &scene) {
    AwaitHeld();
    ChangeFiles(scene.changes);
    if (scene.ending == Ending::CacheLost) {
        SetCacheList(kNoCaches);
        clients_.front().attempt.wasCacheLost = true;
        AwaitClients();
        service_.AwaitRest(disk_);
        SetCacheList(cacheList_);
    }
    service_.AwaitTaken();
    service_.Learn(disk_);
    WorldSendPending(false);
}

void Walk::Finish(const Scene & /*scene*/) {
    AwaitClients();
    if (!service_.AwaitRest(disk_)) {
        complaint_ += "the service does not come to rest\n";
    }
    for (Client &client : clients_) {
        client.attempt.wasServiceEnded = client.attempt.wasServiceEnded || service_.Lost() > 0;
    }
}

std::string Walk::Judge(const Scene &scene) {
    const Pins before = pins_;
    const std::string log = service_.Log();
    const std::vector<StoredFiles> requests = service_.Take();
    if (scene.ending == Ending::CacheLost) {
        if (!requests.empty()) {
            pins_.records.clear();
        }
    } else {
        pins_ = PinsAfter(before, requests, disk_);
    }
    Count(scene, requests);
    std::vector<Attempt> attempts;
    for (const Client &client : clients_) {
        attempts.push_back(client.attempt);
    }
    const std::string complaint =
        WalkCompare(pins_) + JudgeOrders(attempts, scene.isAtOnce, before, begin_, disk_, requests);
    if (complaint.empty()) {
        return "";
    }
    std::string text = complaint;
    for (const StoredFiles &request : requests) {
        text += request.isPin ? "stored: pin" : "stored: unpin";
        for (const auto &[path, inode] : request.files) {
            text += " " + path + "#" + std::to_string(inode);
        }
        text += "\n";
    }
    for (const Attempt &attempt : attempts) {
        text += "status " + std::to_string(attempt.status) + ": " + attempt.output +
                attempt.errors + "\n";
    }
    return text + log;
}

void Walk::Count(const Scene &scene, const std::vector<StoredFiles> &requests) {
    counts_["requests"] += requests.size();
    counts_["requests lost"] += service_.Lost();
    for (const StoredFiles &request : requests) {
        counts_["requests given up"] += RequestBlocks(request, disk_) ? 0 : 1;
    }
    for (const Client &client : clients_) {
        ++counts_["status " + std::to_string(client.attempt.status)];
        counts_["clients ended"] += client.attempt.status > 128 ? 1 : 0;
        counts_["neighbours pinned again"] +=
            client.attempt.output.find("\"repinned\":[\"") != std::string::npos ? 1 : 0;
    }
    counts_["pending"] += scene.isPending ? 1 : 0;
    counts_["services killed"] += scene.ending == Ending::ServiceKill ? 1 : 0;
    counts_["caches lost"] += scene.ending == Ending::CacheLost ? 1 : 0;
}
} // namespace vesk
