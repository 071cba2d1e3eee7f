// The worked examples of docs/formats.md: code blocks marked "```<kind> <name>".
#pragma once

#include <string>

namespace vesk {
// The text of the block with this name, its last line feed included. Throws where there is none.
std::string DocExample(const std::string &name);

// The bytes of a block of hexadecimal numbers.
std::string DocExampleBytes(const std::string &name);
} // namespace vesk
