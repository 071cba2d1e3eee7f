// The command line and its usage text. Thread rule: called once, before any thread starts.
#pragma once

#include "request/tool_parameters.h"

namespace vesk {
// Fills `parameters`, which holds its initial values. 0, or -1 after an error message. --help
// prints the usage and ends the process with status 0 where it stands; a short option that nothing
// handles ("-d", "-e") aborts the process. Changes a trailing "/" of --mount-path in the argument
// vector.
int GetOptions(int argc, char *argv[], ToolParameters *parameters);

// The command's entry in the name table; from 16 on the table is shifted by one.
const char *ToolCommandToString(int command);

// Takes one "/" off the end of a text longer than that. Null is left alone.
void StripTrailingSlash(char *text);

// Prints the usage text, with ProgramName in its example lines, to standard output.
void Usage();
} // namespace vesk
