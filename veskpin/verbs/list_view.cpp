#include "verbs/list.h"

#include "bitmap/pin_bitmap.h"
#include "text/escape.h"
#include "text/units.h"
#include "verbs/answer.h"

namespace vesk {
namespace {
const std::vector<int> kWidths = {-10, 8, 8, 8, 8, 8};

void PutFigures(JsonWriter &json, const std::optional<uint64_t> &blocks,
                const std::optional<uint64_t> &marked, const std::optional<uint64_t> &resident) {
    json.Number("blocks", blocks);
    json.Number("blocksMarked", marked);
    json.Number("blocksResident", resident);
}

int ColorOf(const std::optional<FileState> &state) {
    if (!state) {
        return 33;
    }
    switch (*state) {
    case FileState::Pinned: return 32;
    case FileState::Marked:
    case FileState::Pinning:
    case FileState::Unpinning: return 33;
    case FileState::Unpinned: return 0;
    default: return 31;
    }
}

std::string FolderText(const ListedFolder &folder) {
    const auto bytes = [](const std::optional<uint64_t> &blocks) {
        return blocks ? UnitsOfBytes(*blocks << kBitmapByteShift) : std::string("unknown");
    };
    return TextEscaped(folder.path) + ": " + std::to_string(folder.filesPinned) + " of " +
           UnitsOfThings(folder.files, "file") + " pinned; " + bytes(folder.blocks) +
           " in blocks, " + bytes(folder.marked) + " marked, " + bytes(folder.resident) +
           " on the SSD\n";
}
} // namespace

ListView::ListView(TextSink &out, bool json, bool color)
    : out_(out), writer_(out), json_(json), color_(color) {
    if (json_) {
        AnswerBegin(writer_, "list");
        writer_.BeginArray("files");
    }
}

void ListView::Put(const ListedFile &file) {
    isAllPinned_ = isAllPinned_ && file.state == FileState::Pinned;
    const FileFigures &figures = file.figures;
    if (json_) {
        writer_.BeginObject();
        file.volume.empty() ? writer_.Null("volume") : writer_.Path("volume", file.volume);
        writer_.Path("path", file.path);
        writer_.Number("inode", file.inode);
        file.state ? writer_.Text("state", FileStateText(*file.state)) : writer_.Null("state");
        file.pathNow == nullptr ? writer_.Null("pathNow") : writer_.Path("pathNow", *file.pathNow);
        writer_.Number("bytes", figures.bytes);
        PutFigures(writer_, figures.blocks, figures.marked, figures.resident);
        writer_.Number("extents", figures.extents);
        writer_.EndObject();
        return;
    }
    if (!hasHeader_) {
        out_.Put(Colored(
            TableRow({"STATE", "SIZE", "BLOCKS", "MARKED", "ON SSD", "EXTENTS", "FILE"}, kWidths),
            1, color_));
        hasHeader_ = true;
    }
    const std::string now =
        file.pathNow == nullptr ? "" : " (now " + TextEscaped(*file.pathNow) + ")";
    const std::string row =
        TableRow({file.state ? FileStateText(*file.state) : "unknown",
                  figures.bytes ? UnitsOfBytes(*figures.bytes) : "-", UnitsOfCount(figures.blocks),
                  UnitsOfCount(figures.marked), UnitsOfCount(figures.resident),
                  UnitsOfCount(figures.extents), TextEscaped(file.path) + now},
                 kWidths);
    const size_t stateEnd = row.find(' ');
    const int color = ColorOf(file.state);
    out_.Put(Colored(row.substr(0, stateEnd), color, color_ && color != 0) + row.substr(stateEnd));
}

void ListView::End(const std::vector<ListedFolder> &folders, const LookErrors &errors) {
    if (!json_) {
        for (const ListedFolder &folder : folders) {
            out_.Put((hasHeader_ ? "\n" : "") + FolderText(folder));
            hasHeader_ = false;
        }
        AnswerErrors(errors);
        return;
    }
    writer_.EndArray();
    writer_.BeginArray("folders");
    for (const ListedFolder &folder : folders) {
        writer_.BeginObject();
        writer_.Path("path", folder.path);
        writer_.Number("files", folder.files);
        writer_.Number("filesPinned", folder.filesPinned);
        PutFigures(writer_, folder.blocks, folder.marked, folder.resident);
        writer_.EndObject();
    }
    writer_.EndArray();
    AnswerEnd(writer_, out_, errors);
}
} // namespace vesk
