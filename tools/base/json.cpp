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

void JsonObject::AddName(std::string_view name) {
    out_ += std::exchange(separator_, ',');
    if (layout_ == Layout::kLineEach)
        out_ += "\n  ";
    AppendJsonString(out_, name);
    out_ += layout_ == Layout::kLineEach ? ": " : ":";
}

void JsonObject::End() {
    if (separator_ == '{')
        out_ += '{';
    out_ += layout_ == Layout::kLineEach ? "\n}\n" : "}";
}

void JsonObject::Add(std::string_view name, std::string_view text) {
    AddName(name);
    if (!AppendJsonString(out_, text))
        AddJson(std::string(name) + "_base64", '"' + Base64(text) + '"');
}

void JsonObject::AddJson(std::string_view name, std::string_view json) {
    AddName(name);
    out_ += json;
}

} // namespace kelo::tool
