// system_bits FILE: the numbers of the set bits, ascending, a line each; the least significant bit
// of a byte comes first.
#include <cstdio>
#include <fstream>
#include <vector>

int main(int argc, char *argv[]) {
    std::ifstream file(argc == 2 ? argv[1] : "", std::ios::binary);
    if (!file.is_open()) {
        fprintf(stderr, "system_bits: a file expected\n");
        return 2;
    }
    std::vector<char> chunk(1 << 16);
    unsigned long long byteNumber = 0;
    while (file.read(chunk.data(), static_cast<std::streamsize>(chunk.size())), file.gcount() > 0) {
        for (std::streamsize i = 0; i < file.gcount(); ++i, ++byteNumber) {
            const unsigned byte = static_cast<unsigned char>(chunk[static_cast<size_t>(i)]);
            for (unsigned bit = 0; byte != 0 && bit < 8; ++bit) {
                if ((byte >> bit & 1) != 0) {
                    printf("%llu\n", byteNumber * 8 + bit);
                }
            }
        }
    }
    return 0;
}
