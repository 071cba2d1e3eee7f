// In place of the fuzzing engine: gives every file of the folders that are named to the target,
// once. Messages of the code under test go nowhere. Prints how many there were; none is a failure.
#include "tests/fuzz/fuzz_input.h"

#include <cstdio>
#include <fcntl.h>
#include <filesystem>
#include <unistd.h>

using namespace vesk;

int main(int argc, char *argv[]) {
    const int quiet = open("/dev/null", O_WRONLY | O_CLOEXEC);
    if (quiet < 0 || dup2(quiet, STDOUT_FILENO) < 0) {
        return 2;
    }
    int inputs = 0;
    for (int i = 1; i < argc; ++i) {
        for (const auto &entry : std::filesystem::directory_iterator(argv[i])) {
            fprintf(stderr, "%s\n", entry.path().c_str()); // the last one is the one that failed
            const std::string input = FuzzRead(entry.path());
            LLVMFuzzerTestOneInput(reinterpret_cast<const uint8_t *>(input.data()), input.size());
            ++inputs;
        }
    }
    fprintf(stderr, "%d inputs\n", inputs);
    return inputs > 0 ? 0 : 1;
}
