#pragma once

#include <optional>
#include <string>
#include <string_view>
#include <utility>
#include <vector>

namespace kelo::tool {

// How a value is written so that it stays one value in its place.
enum class Encoding { Url, Json, Xml, None };

// The encoding of values in a body of this content type ("application/json; charset=utf-8"); nothing for a
// type that none is known for.
std::optional<Encoding> EncodingOf(const std::string &contentType);

// Words such as "%TITLE%" and their values.
using TemplateWords = std::vector<std::pair<std::string_view, std::string>>;

// The template with its words replaced by their encoded values, in one pass: what a value holds is not
// replaced again. Any other percent sign stands for itself.
std::string FillRequest(std::string_view text, const TemplateWords &words, Encoding encoding);

} // namespace kelo::tool
