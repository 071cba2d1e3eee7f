// Parsing a command line in a test: the arguments without the program's name.
#pragma once

#include "tests/support/leak_checked_test.h"

#include "cli/options.h"

#include <string>
#include <utility>
#include <vector>

namespace vesk {
using Arguments = std::vector<std::string>;

inline Arguments operator+(Arguments left, const Arguments &right) {
    left.insert(left.end(), right.begin(), right.end());
    return left;
}

class OptionsTest : public LeakCheckedTest {
protected:
    // The parsed texts point into what this object keeps.
    int Parse(Arguments arguments) {
        words_ = std::move(arguments);
        words_.insert(words_.begin(), "tool");
        std::vector<char *> argv;
        for (std::string &word : words_) {
            argv.push_back(&word[0]);
        }
        argv.push_back(nullptr);
        parameters = ToolParameters();
        return GetOptions(static_cast<int>(words_.size()), argv.data(), &parameters);
    }

    // Whether the text is the very argument, not a copy.
    bool IsArgument(const char *text, size_t index) const {
        return text == words_[index + 1].c_str();
    }

    ToolParameters parameters;

private:
    Arguments words_;
};
} // namespace vesk
