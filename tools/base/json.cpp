#include "base/json.h"

#include <memory>
#include <stdexcept>

#include "base/text_encoding.h"

namespace kelo::tool {

Json::Value ParseJson(const std::string &text) {
    Json::CharReaderBuilder builder;
    builder["stackLimit"] = 20; // the reader throws beyond it instead of recursing
    builder["collectComments"] = false;
    builder["failIfExtra"] = true;
    const std::unique_ptr<Json::CharReader> reader(builder.newCharReader());
    Json::Value value;
    std::string errors;
    bool isRead = false;
    try {
        isRead = reader->parse(text.data(), text.data() + text.size(), &value, &errors);
    } catch (const Json::Exception &) {
        isRead = false;
    }
    if (!isRead || !value.isObject())
        throw std::runtime_error("not a JSON object");
    return value;
}

std::string WriteJsonLine(const Json::Value &value, JsonTexts texts) {
    Json::StreamWriterBuilder builder;
    builder["indentation"] = "";
    builder["emitUTF8"] = texts == JsonTexts::kUtf8;
    if (texts == JsonTexts::kAscii) {
        builder["precision"] = 2;
        builder["precisionType"] = "decimal";
    }
    return EscapeDirections(Json::writeString(builder, value)) + "\n";
}

JsonName::JsonName(std::string_view name) {
    AppendJsonString(text_, name);
}

void JsonObject::AddName(const JsonName &name) {
    out_ += std::exchange(separator_, ',');
    if (layout_ == Layout::kLineEach)
        out_ += "\n  ";
    out_ += name.text_;
    out_ += layout_ == Layout::kLineEach ? ": " : ":";
}

void JsonObject::End() {
    if (separator_ == '{')
        out_ += '{';
    out_ += layout_ == Layout::kLineEach ? "\n}\n" : "}";
}

void JsonObject::Add(const JsonName &name, std::string_view text) {
    AddName(name);
    if (AppendJsonString(out_, text))
        return;
    JsonName bytes = name;
    bytes.text_.insert(bytes.text_.size() - 1, "_base64");
    AddJson(bytes, '"' + Base64(text) + '"');
}

void JsonObject::AddJson(const JsonName &name, std::string_view json) {
    AddName(name);
    out_ += json;
}

} // namespace kelo::tool
