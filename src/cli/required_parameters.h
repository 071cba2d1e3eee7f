// Whether the command line gives what its commands need. Thread rule: no state.
#pragma once

#include "request/tool_parameters.h"

namespace vesk {
// What the command options ask for; several command options add up.
struct RequiredParameters {
    int cachePath = 0;
    int configPath = 0;
    int spaceUuid = 0; // asked for by no option
    int files = 0;
    int mountPath = 0;
    int startSector = 0;
    int numSectors = 0;
};

// 0 when everything required is there, else -1 after an error message about the first that is not.
int CheckParameter(const RequiredParameters *required, const ToolParameters *parameters);

// 0 when every path of the list, joined by ";", exists and there is at least one; otherwise -1
// after an error message about the first that does not. Empty pieces are skipped; only the first
// 512 characters count.
int CheckFilesExist(const char *paths);
} // namespace vesk
