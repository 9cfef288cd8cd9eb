#pragma once

#include <string>
#include <string_view>

#include "text/sz_hash.h"

namespace kelo::platform {

// A key among the values that is not a placeholder: it names the application of the desktop notification.
inline constexpr std::string_view kClassKey = "DESKTOP_NOTIFY_CLASSNAME";

// The text for the reader.
struct Message {
    std::string title; // one line, at most 250 bytes
    std::string body;  // lines that end with line feeds
};

// The template with its placeholders filled: "%NAME%" (capitals, digits and underscores) by the value of that
// key, or "-" if there is none. One pass: placeholders in a value are not filled. "\n" gives a line feed and
// "\\" a backslash; any other backslash or percent sign is literal.
//
// The values of the keys in the list `jsonEscaped` come with quotes and backslashes escaped, which is undone.
std::string FillTemplate(std::string_view text, const TORVSZHASH &values, std::string_view jsonEscaped);

// The message of `tag` out of the file "LANGUAGE/notify" in the folder `textsDir`; if the language lacks
// it, the English one; if that lacks it too, a plain message that lists all values.
Message RenderMessage(const std::string &tag, const std::string &textsDir, const std::string &language,
                      const TORVSZHASH &values);

} // namespace kelo::platform
