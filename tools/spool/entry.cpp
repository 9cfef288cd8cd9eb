#include "spool/entry.h"

#include <stdexcept>

#include "base/json.h"

namespace kelo::tool {
namespace {

std::string Text(const Json::Value &root, const char *field) {
    if (!root[field].isString())
        throw std::runtime_error(std::string("damaged entry: no text \"") + field + "\"");
    return root[field].asString();
}

std::vector<std::string> Texts(const Json::Value &list) {
    std::vector<std::string> texts;
    if (!list.isArray() || list.empty())
        throw std::runtime_error("damaged entry: no channels");
    for (const Json::Value &item : list) {
        if (!item.isString())
            throw std::runtime_error("damaged entry: a channel is no text");
        texts.push_back(item.asString());
    }
    return texts;
}

} // namespace

bool IsEntryId(const std::string &text) {
    constexpr const char *kCharacters = "0123456789abcdefghijklmnopqrstuvwxyzABCDEFGHIJKLMNOPQRSTUVWXYZ.-_";
    return !text.empty() && text.size() <= 100 && text[0] != '.' &&
           text.find_first_not_of(kCharacters) == std::string::npos;
}

Entry ParseEntry(const std::string &content, const std::string &id) {
    const Json::Value root = ParseJson(content);
    if (!root["version"].isInt() || !root["time"].isInt64())
        throw std::runtime_error("damaged entry: no version or time");
    if (root["version"].asInt() != 1)
        throw std::runtime_error("entry of unknown version " + std::to_string(root["version"].asInt()));
    Entry entry;
    entry.id = Text(root, "id");
    if (entry.id != id)
        throw std::runtime_error("damaged entry: its id is not the file's name");
    entry.time = root["time"].asInt64();
    entry.tag = Text(root, "tag");
    entry.className = Text(root, "class");
    entry.channels = Texts(root["channels"]);
    entry.title = Text(root, "title");
    entry.body = Text(root, "body");
    return entry;
}

} // namespace kelo::tool
