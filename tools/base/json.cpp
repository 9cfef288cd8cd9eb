#include "base/json.h"

#include <memory>
#include <stdexcept>

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

std::string WriteJsonLine(const Json::Value &value) {
    Json::StreamWriterBuilder builder;
    builder["indentation"] = "";
    builder["emitUTF8"] = true;
    return Json::writeString(builder, value) + "\n";
}

} // namespace kelo::tool
