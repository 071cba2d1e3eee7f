// The answer of `plan`. Thread rule: no state.
#pragma once

#include "model/world.h"
#include "text/progress.h"
#include "text/text_sink.h"
#include "verbs/file_state.h"
#include "verbs/plan_figures.h"
#include "verbs/plan_reason.h"
#include "verbs/settings.h"

#include <functional>
#include <string>
#include <vector>

namespace vesk {
struct SkippedPath {
    std::string path;
    SkipReason reason;
};

struct PlannedVolume {
    std::string mountPath;
    PlanFigures figures;
};

struct Plan {
    std::vector<PlannedVolume> volumes;
    std::vector<SkippedPath> skipped;
    bool isAllFailed = false; // none of the paths could be looked at
};

// A file of the plan that was looked at, with its state now.
using PlanVisit = std::function<void(const WorldVolume &volume, const std::string &relativePath,
                                     const FileLook &look, std::optional<FileState> state)>;

// For whoever wants more than the figures; each may be empty.
struct PlanHooks {
    PlanVisit visit;              // is given each file when it is met
    std::function<bool()> goesOn; // false: no more files are looked at
};

// What pinning these files and folders would do.
Plan PlanLook(World &world, const std::vector<std::string> &paths, unsigned reservePercent,
              Progress &progress, const PlanHooks &hooks = {});

ExitStatus PlanStatus(const Plan &plan, const LookErrors &errors);
void PlanShowJson(const Plan &plan, const LookErrors &errors, TextSink &out);
void PlanShowTable(const Plan &plan, bool color, TextSink &out);
} // namespace vesk
