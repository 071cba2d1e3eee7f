#include "tests/unit/formats/doc_examples.h"

#include "tests/support/temp_dir.h"

#include <sstream>
#include <stdexcept>

namespace vesk {
std::string DocExample(const std::string &name) {
    const std::string page = ReadWhole(VESK_DOCS "/formats.md");
    const size_t mark = page.find(" " + name + "\n");
    const size_t start = page.find('\n', mark) + 1;
    const size_t end = page.find("```", start);
    if (mark == std::string::npos || page.rfind("```", mark) != page.rfind('\n', mark) + 1 ||
        end == std::string::npos) {
        throw std::runtime_error("docs/formats.md has no example " + name);
    }
    return page.substr(start, end - start);
}

std::string DocExampleBytes(const std::string &name) {
    std::istringstream numbers(DocExample(name));
    std::string bytes;
    std::string number;
    while (numbers >> number) {
        bytes += static_cast<char>(std::stoi(number, nullptr, 16));
    }
    return bytes;
}
} // namespace vesk
