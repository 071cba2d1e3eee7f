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
#include <utility>
#include <vector>

namespace vesk {
class Neighbours {
public:
    // What keeps one from being found becomes an error: it may have lost blocks.
    explicit Neighbours(LookErrors &errors) : errors_(errors) {}

    // A request to let files go was sent.
    void Note(const RequestBatch &batch, const World &world);

    // A request of neighbours was sent.
    void NoteAgain(const RequestBatch &batch);

    // Sends the recorded files that share blocks with those, as they are now, to be pinned again.
    void Send(const std::string &configPath, ChangeRun &run);

    // Once all is carried out: what was let go may have had more blocks by then, or have been
    // another file. Sends those who have lost a block all the same.
    void SendOfLost(const std::string &configPath, ChangeRun &run);

    uint64_t Count() const { return count_; }
    // Absolute paths of those that could not be sent any more, once each.
    std::vector<std::string> TakeUnsent() { return std::exchange(unsent_, {}); }

private:
    struct LetGo {
        BlockSet blocks;
        BlockSet owed;                       // marked before, or to be by a stored pin
        std::unordered_set<uint32_t> inodes; // low 32 bits
        std::unordered_set<uint32_t> again;  // of neighbours that were sent
    };
    static void FindLost(const Volume &volume, LetGo *letGo);
    void SendOf(const WorldVolume &world, LetGo *letGo, ChangeRun &run);
    LookErrors &errors_;
    bool isAllDone_ = false; // what was sent is carried out, or given up
    uint64_t count_ = 0;
    std::vector<std::string> unsent_;
    std::map<std::string, LetGo> volumes_; // by mount path
};
} // namespace vesk
