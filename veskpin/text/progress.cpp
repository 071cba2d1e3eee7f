#include "text/progress.h"

#include <string>

namespace vesk {
void Progress::Step() {
    ++files_;
    // The clock is asked now and then only: most steps take a few microseconds.
    if (line_.Form() == ProgressForm::None || files_ % 64 != 0 || !line_.IsDue()) {
        return;
    }
    const std::string files = std::to_string(files_);
    if (line_.Form() == ProgressForm::Json) {
        line_.Write("{\"files\":" + files +
                    ",\"total\":" + (total_ == 0 ? "null" : std::to_string(total_)) +
                    ",\"milliseconds\":" + std::to_string(line_.ElapsedMs()) + "}");
        return;
    }
    const std::string of = total_ == 0 ? "" : " of " + std::to_string(total_);
    line_.Write(files + of + " files looked at");
}
} // namespace vesk
