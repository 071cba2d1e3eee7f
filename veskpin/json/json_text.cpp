#include "json/json_text.h"

#include "text/utf8.h"

#include <json/json.h>

#include <algorithm>
#include <charconv>
#include <memory>

namespace vesk {
namespace {
// What most names are: quoted as it is.
bool IsPlain(std::string_view text) {
    return std::all_of(text.begin(), text.end(), [](char letter) {
        return letter >= 0x20 && letter < 0x7F && letter != '"' && letter != '\\';
    });
}

std::string Quoted(std::string_view text) {
    const std::string valid = Utf8IsValid(text) ? std::string(text) : Utf8Repaired(text);
    std::string quoted = Json::valueToQuotedString(valid.c_str());
    // The library's function takes a text up to its first NUL.
    for (size_t nul = valid.find('\0'); nul != std::string::npos; nul = valid.find('\0', nul + 1)) {
        quoted.pop_back();
        quoted += "\\u0000" + Json::valueToQuotedString(valid.c_str() + nul + 1).substr(1);
    }
    return quoted;
}

template <typename Value> void PutNumber(TextSink &sink, const std::optional<Value> &value) {
    if (!value) {
        sink.Put("null");
        return;
    }
    char digits[24];
    const char *end = std::to_chars(digits, digits + sizeof(digits), *value).ptr;
    sink.Put(std::string_view(digits, static_cast<size_t>(end - digits)));
}

bool ParseObject(const std::string &text, Json::Value *root) {
    const std::unique_ptr<Json::CharReader> reader(Json::CharReaderBuilder().newCharReader());
    try {
        return reader->parse(text.data(), text.data() + text.size(), root, nullptr) &&
               root->isObject();
    } catch (const Json::Exception &) {
        return false; // nested too deeply
    }
}
} // namespace

void JsonWriter::Begin(std::string_view name) {
    if (needsComma_) {
        sink_.Put(',');
    }
    if (!name.empty()) {
        sink_.Put('"');
        sink_.Put(name);
        sink_.Put("\":");
    }
    needsComma_ = true;
}

void JsonWriter::BeginObject(std::string_view name) {
    Begin(name);
    sink_.Put('{');
    needsComma_ = false;
}

void JsonWriter::BeginArray(std::string_view name) {
    Begin(name);
    sink_.Put('[');
    needsComma_ = false;
}

void JsonWriter::EndObject() {
    sink_.Put('}');
    needsComma_ = true;
}

void JsonWriter::EndArray() {
    sink_.Put(']');
    needsComma_ = true;
}

void JsonWriter::Text(std::string_view name, std::string_view value) {
    Begin(name);
    if (!IsPlain(value)) {
        sink_.Put(Quoted(value));
        return;
    }
    sink_.Put('"');
    sink_.Put(value);
    sink_.Put('"');
}

void JsonWriter::Text(std::string_view name, const std::optional<std::string> &value) {
    value ? Text(name, std::string_view(*value)) : Null(name);
}

void JsonWriter::Number(std::string_view name, const std::optional<uint64_t> &value) {
    Begin(name);
    PutNumber(sink_, value);
}

void JsonWriter::Signed(std::string_view name, const std::optional<int64_t> &value) {
    Begin(name);
    PutNumber(sink_, value);
}

void JsonWriter::Bool(std::string_view name, const std::optional<bool> &value) {
    Begin(name);
    sink_.Put(!value ? "null" : *value ? "true" : "false");
}

void JsonWriter::Null(std::string_view name) {
    Begin(name);
    sink_.Put("null");
}

void JsonWriter::Path(std::string_view name, const std::string &path) {
    Text(name, std::string_view(path));
    if (!IsPlain(path) && !Utf8IsValid(path)) {
        Text(std::string(name) + "Bytes", std::string_view(Base64Of(path)));
    }
}

std::optional<std::map<std::string, uint64_t>> JsonReadNumbers(const std::string &text) {
    Json::Value root;
    if (!ParseObject(text, &root)) {
        return std::nullopt;
    }
    std::map<std::string, uint64_t> numbers;
    for (auto member = root.begin(); member != root.end(); ++member) {
        if (member->isUInt64()) {
            numbers.emplace(member.name(), member->asUInt64());
        }
    }
    return numbers;
}

std::optional<std::vector<JsonRecord>> JsonReadRecords(const std::string &text,
                                                       const std::string &name) {
    Json::Value root;
    if (!ParseObject(text, &root) || !root[name].isArray()) {
        return std::nullopt;
    }
    std::vector<JsonRecord> records;
    for (const Json::Value &element : root[name]) {
        if (!element.isObject()) {
            return std::nullopt;
        }
        JsonRecord record;
        for (auto member = element.begin(); member != element.end(); ++member) {
            if (member->isString() || member->isIntegral()) {
                record.emplace(member.name(), member->asString());
            }
        }
        records.push_back(std::move(record));
    }
    return records;
}
} // namespace vesk
