// The random walk: steps on the system, and the model beside it.
#pragma once

#include "tests/faults/walk_judge.h"
#include "tests/faults/walk_scene.h"
#include "tests/faults/walk_service.h"

#include <map>
#include <memory>
#include <random>
#include <string>
#include <vector>

namespace vesk {
class Walk {
public:
    // The companion, the service's tool with its preload.
    Walk(const std::string &companion, const Program &tool, unsigned seed);
    Walk(const Walk &) = delete;
    Walk &operator=(const Walk &) = delete;

    // One step; what is wrong after it, empty: nothing.
    std::string Step();
    // What it has done.
    const std::string &Told() const { return told_; }
    // How often what has happened.
    const std::map<std::string, size_t> &Counts() const { return counts_; }

private:
    struct Client {
        Attempt attempt;
        std::unique_ptr<Child> child;
    };
    void ChangeFiles(size_t changes);
    void Prepare(const Scene &scene);
    void RunTool(const std::vector<std::string> &arguments);
    void StartClients(const Scene &scene);
    void AwaitClient(Client *client);
    void AwaitClients();
    void Disturb(const Scene &scene);
    void KillService();
    void AwaitHeld();
    void EndPending(const Scene &scene);
    void Finish(const Scene &scene);
    std::string Judge(const Scene &scene);
    void Count(const Scene &scene, const std::vector<StoredFiles> &requests);

    const std::string companion_;
    const Program tool_;
    std::mt19937 random_;
    const std::string cacheList_;
    WalkService service_;
    Pins pins_;
    Disk begin_; // the files when the clients began,
    Disk disk_;  // and as they are
    std::vector<Client> clients_;
    std::string told_;
    std::string complaint_;
    std::map<std::string, size_t> counts_;
};
} // namespace vesk
