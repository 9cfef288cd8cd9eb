#pragma once

#include <json/json.h>

#include <string>
#include <string_view>
#include <utility>

namespace kelo::tool {

// The object in the text. Throws std::runtime_error when there is none or it is nested deeply.
Json::Value ParseJson(const std::string &text);

enum class JsonTexts { kUtf8, kAscii };

// The value on one line that ends in a line feed. In ASCII other characters are escaped, bytes that are not
// UTF-8 become U+FFFD, and fractions have up to two decimals.
std::string WriteJsonLine(const Json::Value &value, JsonTexts texts = JsonTexts::kUtf8);

// The name of a member, escaped once for all the objects that have it.
class JsonName {
public:
    explicit JsonName(std::string_view name);

private:
    friend class JsonObject;
    std::string text_; // with its quotes
};

// Appends an object with its members in the order of the calls; Json::Value would sort them.
class JsonObject {
public:
    enum class Layout { kOneLine, kLineEach };

    explicit JsonObject(std::string &out, Layout layout = Layout::kOneLine) : out_(out), layout_(layout) {}
    // A text; of one that is no UTF-8, the member "NAME_base64" behind it has the bytes.
    void Add(const JsonName &name, std::string_view text);
    void Add(std::string_view name, std::string_view text) { Add(JsonName(name), text); }
    // A value that is JSON: a number, true, null.
    void AddJson(const JsonName &name, std::string_view json);
    void AddJson(std::string_view name, std::string_view json) { AddJson(JsonName(name), json); }
    void End();

private:
    void AddName(const JsonName &name);

    std::string &out_;
    Layout layout_;
    char separator_ = '{';
};

// Appends an array with a line for each item, or only the lines (JSON Lines).
class JsonLines {
public:
    explicit JsonLines(bool inArray) : inArray_(inArray) {}
    void Begin(std::string &out) const { out += inArray_ ? "[" : ""; }
    void BeginItem(std::string &out) { out += inArray_ ? std::exchange(separator_, ",\n") : ""; }
    void EndItem(std::string &out) const { out += inArray_ ? "" : "\n"; }
    void End(std::string &out) const { out += inArray_ ? "\n]\n" : ""; }

private:
    bool inArray_;
    const char *separator_ = "\n";
};

} // namespace kelo::tool
