#pragma once

#include <string>

namespace kelo::tool {

// A text for a manual page. Options in it ("--since", "-n") become bold, and each word that is `placeholder`
// italic.
std::string Roff(const std::string &text, const std::string &placeholder = "");

// The same as a line with a full stop at its end; "" stays.
std::string RoffSentence(const std::string &text, const std::string &placeholder = "");

std::string RoffBold(const std::string &text);
std::string RoffItalic(const std::string &text);

} // namespace kelo::tool
