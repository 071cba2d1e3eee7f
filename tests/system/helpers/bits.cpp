// system_bits FILE: the numbers of the set bits, ascending, a line each; the least significant bit
// of a byte comes first.
#include "bitmap/bit_runs.h"

#include <cstdio>
#include <fstream>
#include <iterator>
#include <string>

using namespace vesk;

int main(int argc, char *argv[]) {
    std::ifstream file(argc == 2 ? argv[1] : "", std::ios::binary);
    if (!file.is_open()) {
        fprintf(stderr, "system_bits: a file expected\n");
        return 2;
    }
    const std::string text(std::istreambuf_iterator<char>(file), {});
    const auto *bytes = reinterpret_cast<const unsigned char *>(text.data());
    for (const BitRun &run : BitRunsOf(bytes, text.size())) {
        for (uint64_t i = 0; i < run.count; ++i) {
            printf("%llu\n", static_cast<unsigned long long>(run.first + i));
        }
    }
    return 0;
}
