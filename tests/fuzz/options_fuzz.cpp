// A command line of any words. Those that end the process where they stand (--help and the short
// options that nothing handles) are left out.
//
// Input: the words, a NUL behind each.
#include "tests/fuzz/fuzz_input.h"

#include "base/log.h"
#include "cli/options.h"
#include "request/tool_parameters.h"
#include "tests/support/fake_appliance.h"

#include <getopt.h>
#include <vector>

namespace vesk {
namespace {
bool EndsTheProcess(const std::string &word) {
    if (word.rfind("--h", 0) == 0) {
        return true;
    }
    return word.size() > 1 && word[0] == '-' && word[1] != '-' &&
           word.find_first_of("deh") != std::string::npos;
}
} // namespace

extern "C" int LLVMFuzzerTestOneInput(const uint8_t *data, size_t size) {
    FakeApplianceOneVolume("/dev/null");
    std::vector<std::string> words = {"veskcachepinfiletool"};
    words.emplace_back();
    for (size_t i = 0; i < size; ++i) {
        if (data[i] == 0) {
            words.emplace_back();
        } else {
            words.back() += static_cast<char>(data[i]);
        }
    }
    if (words.back().empty()) {
        words.pop_back();
    }
    std::vector<char *> arguments;
    for (std::string &word : words) {
        if (EndsTheProcess(word)) {
            return 0;
        }
        arguments.push_back(&word[0]);
    }
    arguments.push_back(nullptr);
    opterr = 0; // getopt_long would write to standard error itself
    optind = 0; // starts anew
    LogToSyslog = 0;
    LogLevel = 0;
    ToolParameters parameters;
    const int result =
        GetOptions(static_cast<int>(arguments.size()) - 1, arguments.data(), &parameters);
    FuzzExpect(result == 0 || result == -1, "parsing ends with 0 or -1");
    FuzzExpect(ToolCommandToString(parameters.command) != nullptr, "every command has a name");
    return 0;
}
} // namespace vesk
