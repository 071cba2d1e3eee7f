// JSON: documents written member by member, so that one of any length needs little memory, and
// numbers read from small ones.
//
// Thread rule: a writer has one owner; the rest has no state.
#pragma once

#include "text/text_sink.h"

#include <cstdint>
#include <map>
#include <optional>
#include <string>
#include <string_view>
#include <vector>

namespace vesk {
// Values and members in the order of the calls. An empty name: an element of an array, or the
// document itself. What is written is valid JSON when every Begin has its End; texts become valid
// UTF-8 whatever they hold.
class JsonWriter {
public:
    explicit JsonWriter(TextSink &sink) : sink_(sink) {}

    void BeginObject(std::string_view name = {});
    void EndObject();
    void BeginArray(std::string_view name);
    void EndArray();
    void Text(std::string_view name, std::string_view value);
    void Text(std::string_view name, const std::optional<std::string> &value);
    void Text(std::string_view name, const char *value) { Text(name, std::string_view(value)); }
    void Number(std::string_view name, const std::optional<uint64_t> &value);
    void Signed(std::string_view name, const std::optional<int64_t> &value);
    void Bool(std::string_view name, const std::optional<bool> &value);
    void Null(std::string_view name);
    // A path, and its bytes beside it where it is no UTF-8: `name` and `name` + "Bytes".
    void Path(std::string_view name, const std::string &path);

private:
    void Begin(std::string_view name);
    TextSink &sink_;
    bool needsComma_ = false;
};

// The members of a JSON object that are whole numbers from 0 on. Nothing: no object.
std::optional<std::map<std::string, uint64_t>> JsonReadNumbers(const std::string &text);

// The objects in the array of this name, each with its members that are texts or whole numbers, as
// texts. Nothing: no object, or no such array of objects.
using JsonRecord = std::map<std::string, std::string>;
std::optional<std::vector<JsonRecord>> JsonReadRecords(const std::string &text,
                                                       const std::string &name);
} // namespace vesk
