#include "verbs/change_view.h"

#include "text/escape.h"
#include "text/units.h"
#include "verbs/answer.h"

namespace vesk {
const char *ChangeReasonText(ChangeReason reason) {
    switch (reason) {
    case ChangeReason::Dropped: return "dropped";
    case ChangeReason::Vanished: return "vanished";
    case ChangeReason::NotTaken: return "not-taken";
    case ChangeReason::NeedsRepair: break;
    }
    return "needs-repair";
}

ChangeView::ChangeView(const char *command, FileState wanted, std::optional<FileState> underway,
                       const Settings &settings, TextSink &out)
    : wanted_(wanted), underway_(settings.waits ? std::nullopt : underway), out_(out), writer_(out),
      json_(settings.json), color_(settings.color) {
    if (json_) {
        AnswerBegin(writer_, command);
        writer_.BeginArray("files");
    }
}

void ChangeView::Skip(const std::string &path, SkipReason reason) {
    BeginSkipped();
    ++skipped_[reason];
    if (!json_) {
        out_.Put("left out  " + TextEscaped(path) + ": " + SkipReasonText(reason) + "\n");
        return;
    }
    writer_.BeginObject();
    writer_.Path("path", path);
    writer_.Text("reason", SkipReasonText(reason));
    writer_.EndObject();
}

void ChangeView::BeginSkipped() {
    if (!hasSkipped_ && json_) {
        writer_.EndArray();
        writer_.BeginArray("skipped");
    }
    hasSkipped_ = true;
}

void ChangeView::Put(const ChangedFile &file) {
    const bool isAsAsked =
        file.state && !file.reason && (*file.state == wanted_ || file.state == underway_);
    (isAsAsked ? asAsked_ : others_) += 1;
    const char *state = file.state ? FileStateText(*file.state) : nullptr;
    if (!json_) {
        if (!isAsAsked) {
            out_.Put(Colored(state == nullptr ? "unknown" : state, 31, color_) + "  " +
                     TextEscaped(file.path) +
                     (file.reason ? std::string(": ") + ChangeReasonText(*file.reason) : "") +
                     "\n");
        }
        return;
    }
    writer_.BeginObject();
    writer_.Path("path", file.path);
    state == nullptr ? writer_.Null("state") : writer_.Text("state", state);
    file.reason ? writer_.Text("reason", ChangeReasonText(*file.reason)) : writer_.Null("reason");
    writer_.EndObject();
}

// "3 left out (2 name, 1 no-blocks)".
std::string ChangeView::SkippedText() const {
    std::string reasons;
    uint64_t count = 0;
    for (const auto &[reason, files] : skipped_) {
        count += files;
        reasons +=
            (reasons.empty() ? " (" : ", ") + std::to_string(files) + " " + SkipReasonText(reason);
    }
    return std::to_string(count) + " left out" + reasons + (reasons.empty() ? "" : ")");
}

void ChangeView::End(uint64_t requestsSent, const std::vector<std::string> &repinned,
                     const LookErrors &errors) {
    BeginSkipped();
    if (json_) {
        writer_.EndArray();
        writer_.Number("requestsSent", requestsSent);
        writer_.BeginArray("repinned");
        for (const std::string &path : repinned) {
            writer_.Text("", std::string_view(path));
        }
        writer_.EndArray();
        AnswerEnd(writer_, out_, errors);
        return;
    }
    const std::string also = underway_ ? std::string(" or ") + FileStateText(*underway_) : "";
    out_.Put(UnitsOfThings(asAsked_, "file") + " " + FileStateText(wanted_) + also + ", " +
             std::to_string(others_) + " not, " + SkippedText() + ", in " +
             UnitsOfThings(requestsSent, "request") +
             (repinned.empty()
                  ? ""
                  : "; " + UnitsOfThings(repinned.size(), "neighbour") + " pinned again") +
             "\n");
    AnswerErrors(errors);
}
} // namespace vesk
