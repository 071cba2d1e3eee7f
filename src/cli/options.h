// The command line: parsing it and checking that the chosen command has what it needs.
//
// Thread rule: called once, before any thread starts.
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

// Fills `parameters`, which holds its initial values. 0, or -1 after an error message. --help
// prints the usage and ends the process with status 0 where it stands; a short option that nothing
// handles
// ("-d", "-e") aborts the process. Changes a trailing "/" of --mount-path in the argument vector.
int GetOptions(int argc, char *argv[], ToolParameters *parameters);

// 0 when everything required is there, else -1 after an error message about the first that is not.
int CheckParameter(const RequiredParameters *required, const ToolParameters *parameters);

// The command's entry in the name table; from 16 on the table is shifted by one.
const char *ToolCommandToString(int command);

// Takes one "/" off the end of a text longer than that. Null is left alone.
void StripTrailingSlash(char *text);

} // namespace vesk
