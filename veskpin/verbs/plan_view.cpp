#include "verbs/plan.h"

#include "bitmap/pin_bitmap.h"
#include "text/escape.h"
#include "text/units.h"
#include "verbs/answer.h"

#include <cstdlib>

namespace vesk {
namespace {
std::string BlocksText(uint64_t blocks) {
    return std::to_string(blocks) + " blocks (" + UnitsOfBytes(blocks << kBitmapByteShift) + ")";
}

std::string RoomText(const PlanFigures &figures, bool color) {
    if (!figures.marked) {
        return "what is marked cannot be read";
    }
    if (!figures.ssdBlocks || !figures.headroom) {
        return BlocksText(*figures.marked) + " marked; the SSD's size is not known";
    }
    const auto left = static_cast<uint64_t>(llabs(*figures.headroom));
    const std::string room =
        *figures.headroom >= 0
            ? Colored("fits", 32, color) + ", " + BlocksText(left) + " to spare"
            : Colored("does not fit", 31, color) + ", " + BlocksText(left) + " too many";
    return BlocksText(*figures.marked) + " of " + std::to_string(*figures.ssdBlocks) +
           " marked: " + room;
}
} // namespace

void PlanShowJson(const Plan &plan, const LookErrors &errors, TextSink &out) {
    JsonWriter json(out);
    AnswerBegin(json, "plan");
    json.BeginArray("volumes");
    for (const PlannedVolume &volume : plan.volumes) {
        const PlanFigures &figures = volume.figures;
        json.BeginObject();
        json.Path("volume", volume.mountPath);
        json.Number("fileCount", figures.files);
        json.Number("bytes", figures.bytes);
        json.Number("extents", figures.extents);
        json.Number("blocks", figures.blocks);
        json.Number("blocksNew", figures.blocksNew);
        json.Signed("roundingBytes", figures.roundingBytes);
        json.Number("ssdBlocks", figures.ssdBlocks);
        json.Number("blocksMarked", figures.marked);
        json.Signed("headroomBlocks", figures.headroom);
        json.Bool("fits", figures.fits);
        json.Number("requestsNeeded", figures.requests);
        json.Number("secondsEstimated", figures.seconds);
        json.EndObject();
    }
    json.EndArray();
    json.BeginArray("skipped");
    for (const SkippedPath &skipped : plan.skipped) {
        json.BeginObject();
        json.Path("path", skipped.path);
        json.Text("reason", SkipReasonText(skipped.reason));
        json.EndObject();
    }
    json.EndArray();
    AnswerEnd(json, out, errors);
}

void PlanShowTable(const Plan &plan, bool color, TextSink &out) {
    for (const PlannedVolume &volume : plan.volumes) {
        const PlanFigures &figures = volume.figures;
        out.Put(Colored(TextEscaped(volume.mountPath), 1, color) + ": " +
                UnitsOfThings(figures.files, "file") + ", " + UnitsOfBytes(figures.bytes) + " in " +
                UnitsOfThings(figures.extents, "extent") + "\n");
        out.Put(
            "  cost    " + (figures.blocks ? BlocksText(*figures.blocks) : std::string("unknown")) +
            (figures.blocksNew ? ", " + std::to_string(*figures.blocksNew) + " of them new" : "") +
            "\n");
        out.Put("  room    " + RoomText(figures, color) + "\n");
        out.Put("  time    " + UnitsOfThings(figures.requests, "request") + ", about " +
                UnitsOfSeconds(figures.seconds) + "\n");
    }
    for (const SkippedPath &skipped : plan.skipped) {
        out.Put("left out  " + TextEscaped(skipped.path) + ": " + SkipReasonText(skipped.reason) +
                "\n");
    }
}

ExitStatus PlanStatus(const Plan &plan, const LookErrors &errors) {
    bool isUnknown = errors.isUnknown || plan.isAllFailed;
    bool fits = true;
    for (const PlannedVolume &volume : plan.volumes) {
        isUnknown = isUnknown || !volume.figures.fits;
        fits = fits && volume.figures.fits.value_or(false);
    }
    return ExitStatusOf(isUnknown, fits && plan.skipped.empty());
}
} // namespace vesk
