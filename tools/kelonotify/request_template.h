#pragma once

#include <optional>
#include <string>
#include <string_view>
#include <utility>
#include <vector>

namespace kelo::tool {

// The encoding that keeps a value one value in its context.
enum class Encoding { Url, Json, Xml, None };

// The encoding of values in a body of this content type ("application/json; charset=utf-8"); nothing for an
// unknown type.
std::optional<Encoding> EncodingOf(const std::string &contentType);

// Words such as "%TITLE%" and their values.
using TemplateWords = std::vector<std::pair<std::string_view, std::string>>;

// The template with its words replaced by their encoded values, in one pass: words in a value are not
// replaced. Any other percent sign is literal.
std::string FillRequest(std::string_view text, const TemplateWords &words, Encoding encoding);

} // namespace kelo::tool
