#include "tests/system/scripted/script.h"

#include "base/scoped_fd.h"

#include <cstdlib>
#include <fcntl.h>
#include <fstream>
#include <sstream>
#include <unistd.h>

using namespace vesk;

namespace {
std::string ScriptPath() {
    const char *path = getenv("VESK_SCRIPT");
    return path == nullptr ? "/nonexistent" : path;
}
} // namespace

std::vector<ScriptLine> ScriptLines(const std::string &name) {
    std::vector<ScriptLine> lines;
    std::ifstream file(ScriptPath());
    std::string text;
    while (std::getline(file, text)) {
        std::istringstream words(text);
        std::string word;
        if (!(words >> word) || word != name) {
            continue;
        }
        ScriptLine line;
        while (words >> word) {
            line.push_back(word);
        }
        lines.push_back(line);
    }
    return lines;
}

ScriptLine ScriptFirst(const std::string &name) {
    const std::vector<ScriptLine> lines = ScriptLines(name);
    return lines.empty() ? ScriptLine() : lines.front();
}

int ScriptNumber(const ScriptLine &line, size_t index, int fallback) {
    return index < line.size() ? atoi(line[index].c_str()) : fallback;
}

std::string ScriptText(const ScriptLine &line, size_t index) {
    return index < line.size() && line[index] != "-" ? line[index] : std::string();
}

void ScriptCall(const std::string &text) {
    const std::string line = text + "\n";
    const std::string path = ScriptPath() + ".calls";
    const ScopedFd file(open(path.c_str(), O_WRONLY | O_CREAT | O_APPEND | O_CLOEXEC, 0644));
    if (!file.IsOpen() ||
        write(file.Get(), line.data(), line.size()) != static_cast<ssize_t>(line.size())) {
        abort(); // a test must not pass by a call that is not seen
    }
}
