// walk_runner VESKPIN TOOL PRELOAD STEPS [SEED]
//
// A random walk of STEPS steps: files are pinned and unpinned by veskpin, one after the other and
// two at once, waited for and not, while files are made, grow, go, get other names and give way to
// others, clients and the service are killed at random moments, the volume is pending, and its
// cache is not there for a while. After each step everything comes to rest. What veskpin has sent
// and told, the records, the bitmap file and the driver's pins must then be what a model of them
// says; what of a killed client's or service's requests was stored is learned from the document. To
// be run in a private world with a volume at /volume1. Prints the seed, and where something is
// wrong what the steps did; ends with 1 then.
#include "tests/faults/walk.h"

#include <cstdio>
#include <cstdlib>
#include <deque>
#include <random>

using namespace vesk;

namespace {
const size_t kStepsTold = 4;
// A walk of so many steps must have come by all that is counted.
const long kStepsOfAll = 300;

// Names are made long by many of the same character.
std::string Shortened(const std::string &text) {
    std::string shortened;
    for (size_t at = 0; at < text.size(); ++at) {
        const size_t end = text.find_first_not_of(text[at], at);
        const size_t run = (end == std::string::npos ? text.size() : end) - at;
        shortened += text[at];
        if (run > 20) {
            shortened += "..";
            at += run - 1;
        }
    }
    return shortened;
}

bool IsCountMissing(const Walk &walk) {
    bool isMissing = false;
    for (const char *name : {"neighbours pinned again", "requests given up", "services killed",
                             "caches lost", "clients ended", "status 0", "status 1", "status 4"}) {
        const auto count = walk.Counts().find(name);
        if (count == walk.Counts().end() || count->second == 0) {
            printf("never happened: %s\n", name);
            isMissing = true;
        }
    }
    return isMissing;
}
} // namespace

int main(int argc, char *argv[]) {
    const long steps = argc == 5 || argc == 6 ? strtol(argv[4], nullptr, 10) : 0;
    if (steps < 1) {
        fprintf(stderr, "usage: walk_runner VESKPIN TOOL PRELOAD STEPS [SEED]\n");
        return 2;
    }
    const auto seed =
        argc == 6 ? static_cast<unsigned>(strtoul(argv[5], nullptr, 10)) : std::random_device()();
    printf("seed %u\n", seed);
    fflush(stdout);
    Walk walk(argv[1], {argv[2], argv[3]}, seed);
    std::deque<std::string> told;
    for (long step = 1; step <= steps; ++step) {
        const std::string complaint = walk.Step();
        told.push_back("--- step " + std::to_string(step) + "\n" + walk.Told());
        if (told.size() > kStepsTold) {
            told.pop_front();
        }
        if (!complaint.empty()) {
            for (const std::string &text : told) {
                printf("%s", Shortened(text).c_str());
            }
            printf("--- wrong after step %ld of the walk with seed %u:\n%s\n", step, seed,
                   Shortened(complaint).c_str());
            printf("Again: run-faults BIN walk_runner librecord_messages.so %ld %u\n", step, seed);
            return 1;
        }
    }
    printf("%ld steps:", steps);
    for (const auto &[name, count] : walk.Counts()) {
        printf(" %zu %s,", count, name.c_str());
    }
    printf(" nothing wrong\n");
    return steps >= kStepsOfAll && IsCountMissing(walk) ? 1 : 0;
}
