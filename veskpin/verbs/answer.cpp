#include "verbs/answer.h"

#include "act/interrupt.h"
#include "text/escape.h"

#include <unistd.h>

#include <algorithm>
#include <cstdlib>

namespace vesk {
namespace {
const uint64_t kSchema = 1;

// Characters of a text that is valid UTF-8: all bytes but those that continue one.
size_t LettersOf(const std::string &text) {
    return static_cast<size_t>(std::count_if(text.begin(), text.end(), [](char byte) {
        return (static_cast<unsigned char>(byte) & 0xC0) != 0x80;
    }));
}

// Those that are listed, and how many are not.
std::vector<LookError> Shown(const LookErrors &errors) {
    std::vector<LookError> shown = errors.list;
    if (errors.more > 0) {
        shown.push_back({"", "and " + std::to_string(errors.more) + " more"});
    }
    return shown;
}
} // namespace

void AnswerBegin(JsonWriter &json, const char *command) {
    json.BeginObject();
    json.Text("command", std::string_view(command));
    json.Number("schema", kSchema);
}

void AnswerEnd(JsonWriter &json, TextSink &out, const LookErrors &errors) {
    json.BeginArray("errors");
    for (const LookError &error : Shown(errors)) {
        json.BeginObject();
        json.Path("path", error.path);
        json.Text("text", std::string_view(error.text));
        json.EndObject();
    }
    json.EndArray();
    json.EndObject();
    out.Put("\n");
}

void AnswerErrors(const LookErrors &errors) {
    TextSink told(STDERR_FILENO);
    told.GiveUpWhen([] { return InterruptSignal() != 0; });
    for (const LookError &error : Shown(errors)) {
        const std::string path = error.path.empty() ? "" : TextEscaped(error.path) + ": ";
        told.Put("veskpin: " + path + TextEscaped(error.text) + "\n");
    }
    told.Flush();
}

std::string TableRow(const std::vector<std::string> &cells, const std::vector<int> &widths) {
    std::string row;
    for (size_t i = 0; i < cells.size(); ++i) {
        if (i >= widths.size()) {
            row += cells[i];
            continue;
        }
        const auto width = static_cast<size_t>(abs(widths[i]));
        const size_t letters = LettersOf(cells[i]);
        const size_t blanks = width > letters ? width - letters : 0;
        row += widths[i] < 0 ? cells[i] + std::string(blanks, ' ')
                             : std::string(blanks, ' ') + cells[i];
        row += "  ";
    }
    row.erase(row.find_last_not_of(' ') + 1);
    return row + "\n";
}

std::string Colored(const std::string &text, int code, bool color) {
    return color ? "\033[" + std::to_string(code) + "m" + text + "\033[0m" : text;
}
} // namespace vesk
