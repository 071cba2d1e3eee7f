// Letting go of a file lets go its blocks, also for those who share them: letting go knows no
// neighbours. So they are pinned again.
//
// Thread rule: one owner.
#pragma once

#include "act/request_batch.h"
#include "model/world.h"
#include "verbs/change_run.h"

#include <cstdint>
#include <map>
#include <string>
#include <unordered_set>

namespace vesk {
class Neighbours {
public:
    // A request to let files go was sent.
    void Note(const RequestBatch &batch, const World &world);

    // Sends the recorded files that share blocks with those, as they are now, to be pinned again.
    void Send(const std::string &configPath, ChangeRun &run) const;

private:
    struct LetGo {
        BlockSet blocks;
        std::unordered_set<uint32_t> inodes; // low 32 bits
    };
    std::map<std::string, LetGo> volumes_; // by mount path
};
} // namespace vesk
