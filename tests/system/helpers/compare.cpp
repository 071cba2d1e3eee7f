// system_compare A B <RANGES
//
// Each line "START_A START_B BYTES" names a range of file A and one of file B that must hold the
// same bytes. Ends with 1 and the line where they do not, or where there is no line at all.
#include <cstdio>
#include <cstring>
#include <fstream>
#include <iostream>
#include <vector>

namespace {
bool Read(std::ifstream &file, long long start, std::vector<char> &bytes) {
    file.clear();
    file.seekg(start);
    return static_cast<bool>(file.read(bytes.data(), static_cast<std::streamsize>(bytes.size())));
}
} // namespace

int main(int argc, char *argv[]) {
    if (argc != 3) {
        fprintf(stderr, "usage: system_compare A B <RANGES\n");
        return 2;
    }
    std::ifstream a(argv[1], std::ios::binary);
    std::ifstream b(argv[2], std::ios::binary);
    long long startA = 0;
    long long startB = 0;
    long long count = 0;
    int lines = 0;
    for (; std::cin >> startA >> startB >> count; ++lines) {
        std::vector<char> fromA(static_cast<size_t>(count));
        std::vector<char> fromB(static_cast<size_t>(count));
        if (!Read(a, startA, fromA) || !Read(b, startB, fromB) || fromA != fromB) {
            printf("differ: %lld %lld %lld\n", startA, startB, count);
            return 1;
        }
    }
    return lines > 0 ? 0 : 1;
}
