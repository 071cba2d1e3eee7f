// veskpin: sees and plans what is pinned. All but this file is in libraries.
#include "frame/command_line.h"
#include "model/look_errors.h"
#include "text/escape.h"

#include <unistd.h>

#include <cerrno>
#include <cstdio>
#include <cstring>
#include <exception>

using namespace vesk;

namespace {
ExitStatus Run(int argc, char *argv[], TextSink &out) {
    ExitStatus status = ExitStatus::Usage;
    const auto line = CommandLineRead(argc, argv, out, &status);
    if (!line) {
        return status;
    }
    LookLogBegin();
    return line->command(line->settings, out);
}
} // namespace

int main(int argc, char *argv[]) {
    TextSink out(STDOUT_FILENO);
    ExitStatus status = ExitStatus::Unknown;
    try {
        status = Run(argc, argv, out);
    } catch (const std::exception &error) {
        // A lack of memory above all.
        fprintf(stderr, "veskpin: %s\n", TextEscaped(error.what()).c_str());
    }
    if (!out.Flush()) {
        if (errno != EINTR) { // which nobody would read either
            fprintf(stderr, "veskpin: standard output: %s\n", strerror(errno));
        }
        status = status == ExitStatus::Done ? ExitStatus::NotSo : status;
    }
    return static_cast<int>(status);
}
