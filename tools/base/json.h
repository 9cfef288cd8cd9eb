#pragma once

#include <json/json.h>

#include <string>

namespace kelo::tool {

// The object in the text. Throws std::runtime_error when there is none or it is nested deeply.
Json::Value ParseJson(const std::string &text);

// The value on one line that ends in a line feed.
std::string WriteJsonLine(const Json::Value &value);

} // namespace kelo::tool
